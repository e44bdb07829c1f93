#include "cli/QELSourceResolution.h"

#include <string>
#include <utility>

#include "platform/files/FileManager.h"
#include "platform/files/Paths.h"
#include "platform/files/StandardStreams.h"
#include "platform/net/URL.h"
#include "platform/plist/PropertyListReader.h"
#include "platform/text/Case.h"
#include "sources/QELBundlePodcastSource.h"
#include "sources/QELFeedPodcastSource.h"
#include "sources/QELReferenceFilePodcastSource.h"

std::optional<std::string> QELURLTextOf(std::string_view source) {
  constexpr std::string_view kPcast = "pcast";
  if (source.starts_with(kPcast)) return "http" + std::string(source.substr(kPcast.size()));
  if (source.starts_with("http") || source.starts_with("file:")) return std::string(source);
  return std::nullopt;
}

bool QELValidateSource(std::optional<std::string_view> source, bool readStandardInput) {
  if (!source) return readStandardInput && QELPodcastFromStandardInput();
  const std::optional<std::string> url = QELURLTextOf(*source);
  return !url || platform::URL::parse(*url).has_value();
}

std::shared_ptr<const platform::PropertyListValue> QELPodcastFromStandardInput() {
  static std::shared_ptr<const platform::PropertyListValue> cached;
  if (!cached) {
    // What is wrong with the input is not told apart here.
    std::optional<platform::PropertyListFault> ignored;
    if (auto value = platform::readPropertyList(platform::readStandardInput(), ignored)) {
      cached = std::make_shared<const platform::PropertyListValue>(std::move(*value));
    }
  }
  return cached;
}

std::unique_ptr<QELPodcastSource> initWithSourceString(std::string_view source,
                                                       std::vector<std::string> directoryPrefixes,
                                                       int stallLimit) {
  if (const std::optional<std::string> url = QELURLTextOf(source)) {
    auto feed = QELFeedPodcastSource::initWithURL(platform::URL::parse(*url));
    if (!feed) return nullptr;
    feed->setDirectoryPrefixes(std::move(directoryPrefixes));
    feed->setStallLimit(stallLimit);
    return feed;
  }

  const std::string path(source);
  if (!platform::fileExists(path)) return nullptr;
  const std::string extension = platform::lowercased(platform::pathExtension(path));
  if (extension == "podcast") return QELBundlePodcastSource::initWithPath(path);
  if (extension == "plist") return QELReferenceFilePodcastSource::initWithPath(path);
  return nullptr;
}

std::unique_ptr<QELPodcastSource> initWithStandardInput() {
  return QELReferenceFilePodcastSource::initWithDictionary(
      QELSharedDictionary(QELPodcastFromStandardInput()));
}
