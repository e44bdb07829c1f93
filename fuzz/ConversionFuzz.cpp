#include <fstream>
#include <memory>
#include <optional>
#include <string>
#include <utility>

#include "fuzz/BinaryListInput.h"
#include "fuzz/FeedRoundTrip.h"
#include "fuzz/FuzzTarget.h"
#include "fuzz/PropertyListRoundTrip.h"
#include "generators/QELFeedPodcastGenerator.h"
#include "generators/QELReferenceFilePodcastGenerator.h"
#include "model/QELPodcastSource.h"
#include "platform/net/URL.h"
#include "platform/plist/PropertyListReader.h"
#include "sources/QELFeedPodcastSource.h"
#include "sources/QELReferenceFilePodcastSource.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

using platform::Dictionary;

std::unique_ptr<QELPodcastSource> referenceFileSource(std::string bytes) {
  std::optional<platform::PropertyListFault> fault;
  auto value = platform::readPropertyList(std::move(bytes), fault);
  if (!value) {
    requireTold(fault);
    return nullptr;
  }
  return QELReferenceFilePodcastSource::initWithDictionary(
      QELSharedDictionary(std::make_shared<const platform::PropertyListValue>(std::move(*value))));
}

/// A feed is read from a file, as the tool does it.
std::unique_ptr<QELPodcastSource> feedSource(std::string_view bytes) {
  static const TemporaryDirectory directory;
  static const std::string path = directory / "feed.xml";
  std::ofstream(path, std::ios::binary) << bytes;
  return QELFeedPodcastSource::initWithURL(platform::URL::parse(platform::fileURLText(path)));
}

bool load(QELPodcastSource& source) {
  platform::ErrorSlot error;
  if (source.loadSourceWithError(error)) return true;
  requireTold(error);
  return false;
}

/// The record as the reference dictionary that holds all of it.
Dictionary dictionaryOf(QELPodcastSource& source) {
  QELReferenceFilePodcastGenerator generator;
  platform::ErrorSlot error;
  requireThat(generator.generateFromSource(source, error) && generator.referenceData() != nullptr,
              "every record has a reference file");
  return *generator.referenceData();
}

std::string feedOf(QELPodcastSource& source) {
  QELFeedPodcastGenerator generator;
  generator.setGeneratePubDate(false);
  platform::ErrorSlot error;
  requireThat(generator.generateFromSource(source, error) && generator.xmlData() != nullptr,
              "every record has a feed");
  return *generator.xmlData();
}

/// A reference file gives the same record back, and that one the same reference file.
void requireSameAfterReferenceFile(QELPodcastSource& source) {
  const Dictionary record = dictionaryOf(source);
  const auto read = referenceFileSource(written(record));
  requireThat(read && load(*read), "a reference file that was written is accepted");
  const Dictionary again = dictionaryOf(*read);
  requireThat(areSame(again, afterWriting(record)), "a reference file keeps the record");
  requireThat(written(again) == written(afterWriting(record)),
              "a reference file is written as it was read");
}

/// A feed gives the record back but for what feeds do not hold.
std::unique_ptr<QELPodcastSource> readBackFromFeed(QELPodcastSource& source) {
  const Dictionary record = dictionaryOf(source);
  auto read = feedSource(feedOf(source));
  requireThat(read && load(*read), "a feed that was written is accepted");
  requireThat(areSame(dictionaryOf(*read), afterFeed(record)) || holdsDistantDate(record),
              "a feed keeps what feeds hold of the record");
  return read;
}

}  // namespace

/// Any bytes as a reference file or, if they are none, as a feed; behind a byte 1, any objects as a
/// binary reference file. They are refused with a cause, or make a record that survives being
/// written in both forms and read back, and so does what the feed gives back.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string_view input = inputText(data, size);
  const bool isObjects = input.starts_with('\1');
  std::unique_ptr<QELPodcastSource> source =
      referenceFileSource(isObjects ? binaryListOf(input.substr(1)) : std::string(input));
  if (!source && !isObjects) source = feedSource(input);
  if (!source || !load(*source) || isTooLargeToWrite(dictionaryOf(*source))) return 0;

  requireSameAfterReferenceFile(*source);
  const std::unique_ptr<QELPodcastSource> once = readBackFromFeed(*source);
  requireSameAfterReferenceFile(*once);
  readBackFromFeed(*once);
  return 0;
}
