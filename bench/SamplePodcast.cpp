#include "bench/SamplePodcast.h"

#include <stdexcept>

#include "bench/SampleFeed.h"
#include "generators/QELReferenceFilePodcastGenerator.h"
#include "platform/net/URL.h"
#include "platform/plist/PropertyListWriter.h"
#include "sources/QELFeedPodcastSource.h"
#include "tests/support/TemporaryDirectory.h"

std::unique_ptr<QELPodcastSource> samplePodcast(int items) {
  const TemporaryDirectory directory;
  const std::string path = directory.addFile("feed.xml", sampleFeed(items));
  auto source =
      QELFeedPodcastSource::initWithURL(platform::URL::parse(platform::fileURLText(path)));
  platform::ErrorSlot error;
  if (!source || !source->loadSourceWithError(error)) {
    throw std::runtime_error("the sample is wrong");
  }
  return source;
}

std::shared_ptr<const platform::Dictionary> sampleReference(int items) {
  const auto podcast = samplePodcast(items);
  QELReferenceFilePodcastGenerator generator;
  platform::ErrorSlot error;
  if (!generator.generateFromSource(*podcast, error)) throw std::runtime_error("no reference");
  return generator.referenceData();
}

std::string sampleReferenceFile(int items) {
  std::string file;
  platform::writePropertyList(*sampleReference(items), [&file](std::string_view bytes) {
    file += bytes;
    return true;
  });
  return file;
}
