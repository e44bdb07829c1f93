#include "model/QELEpisode.h"

#include <string_view>

#include "cli/common/QELProgress.h"
#include "cli/common/QELReferenceType.h"
#include "platform/text/FormattedText.h"

namespace {

using platform::Dictionary;
using platform::PointInTime;
using platform::Text;
using platform::textForKey;
using platform::operator""_text;  // NOLINT(misc-unused-using-decls): used in literals

std::optional<PointInTime> dateForKey(const Dictionary& dictionary, std::string_view key) {
  const platform::PropertyListValue* value = platform::valueForKey(dictionary, key);
  return value ? value->asDate() : std::nullopt;
}

std::int64_t orderForKey(const Dictionary& dictionary, std::string_view key) {
  const platform::PropertyListValue* value = platform::valueForKey(dictionary, key);
  return (value ? value->asSignedInteger() : std::nullopt).value_or(QELEpisode::kNoOrder);
}

std::uint64_t lengthForKey(const Dictionary& dictionary, std::string_view key) {
  const platform::PropertyListValue* value = platform::valueForKey(dictionary, key);
  return (value ? value->asUnsignedInteger() : std::nullopt).value_or(0);
}

/// The stored text, or what the function derives from the location when none is stored.
template <typename Function>
std::optional<Text> textOrDerived(std::optional<Text> stored, Function derive,
                                  const std::optional<Text>& location) {
  return stored ? std::move(stored) : derive(location);
}

}  // namespace

std::shared_ptr<QELEpisode> QELEpisode::episode() {
  return std::make_shared<QELEpisode>();
}

std::shared_ptr<QELEpisode> QELEpisode::episodeWithDictionary(const Dictionary* dictionary) {
  auto made = episode();
  made->initWithDictionary(dictionary);
  return made;
}

std::shared_ptr<QELEpisode> QELEpisode::episodeWithFeedDictionary(const Dictionary* dictionary) {
  auto made = episode();
  made->initWithFeedDictionary(dictionary);
  return made;
}

void QELEpisode::initWithDictionary(const Dictionary* dictionary) {
  setOrvaneOrder(kNoOrder);
  if (!dictionary) return;

  setUuid(textForKey(*dictionary, "EpisodeUUID"));
  setTitle(textForKey(*dictionary, "EpisodeName"));
  setAuthor(textForKey(*dictionary, "EpisodeAuthor"));
  setDate(dateForKey(*dictionary, "EpisodeDate"));
  setKeywords(textForKey(*dictionary, "EpisodeKeywords"));
  setEpisodeDescription(textForKey(*dictionary, "EpisodeDescription"));
  setCategory(textForKey(*dictionary, "EpisodeCategory"));
  setAdvisoryLabel(textForKey(*dictionary, "EpisodeAdvisoryLabel"));
  setOrvaneOrder(orderForKey(*dictionary, "EpisodeOrder"));

  // What follows is derived from the locations, which therefore come first.
  setLocation(textForKey(*dictionary, "EpisodeReference"));
  setReferenceType(
      textOrDerived(textForKey(*dictionary, "EpisodeReferenceType"), QELReferenceType, location()));
  setContentType(textOrDerived(textForKey(*dictionary, "EpisodeType"), QELMIMEType, location()));
  setContentLength(lengthForKey(*dictionary, "EpisodeFileSize"));
  setPosterLocation(textForKey(*dictionary, "EpisodePosterReference"));
  setPosterReferenceType(textOrDerived(textForKey(*dictionary, "EpisodePosterReferenceType"),
                                       QELReferenceType, posterLocation()));
}

void QELEpisode::initWithFeedDictionary(const Dictionary* dictionary) {
  setOrvaneOrder(kNoOrder);
  if (!dictionary) return;

  setUuid(textForKey(*dictionary, "QELUUID"));
  setTitle(textForKey(*dictionary, "title"));
  setAuthor(textForKey(*dictionary, "author"));
  setDate(dateForKey(*dictionary, "date"));
  setKeywords(textForKey(*dictionary, "keywords"));
  setEpisodeDescription(textForKey(*dictionary, "description"));
  setCategory(textForKey(*dictionary, "category"));
  setAdvisoryLabel(textForKey(*dictionary, "advisoryLabel"));
  setOrvaneOrder(orderForKey(*dictionary, "order"));

  setLocation(textForKey(*dictionary, "url"));
  setReferenceType(QELReferenceType(location()));
  setContentType(textOrDerived(textForKey(*dictionary, "contentType"), QELMIMEType, location()));
  setContentLength(lengthForKey(*dictionary, "contentLength"));
  setPosterLocation(textForKey(*dictionary, "poster"));
  setPosterReferenceType(QELReferenceType(posterLocation()));
}

Dictionary QELEpisode::dictionary() const {
  Dictionary dictionary;
  // In the order of their keys, so that each goes to the end.
  constexpr std::size_t kMostEntries = 15;
  dictionary.reserve(kMostEntries);
  const auto set = [&dictionary](const Text& key, const auto& value) {
    if (value) dictionary.emplace(key, *value);
  };

  set("EpisodeAdvisoryLabel"_text, advisoryLabel());
  set("EpisodeAuthor"_text, author());
  set("EpisodeCategory"_text, category());
  set("EpisodeDate"_text, date());
  set("EpisodeDescription"_text, episodeDescription());
  const std::uint64_t length = contentLength();
  set("EpisodeFileSize"_text, length != 0 ? std::optional(length) : std::nullopt);
  set("EpisodeKeywords"_text, keywords());
  set("EpisodeName"_text, title());
  const std::int64_t order = orvaneOrder();
  set("EpisodeOrder"_text, order >= 0 ? std::optional(order) : std::nullopt);
  set("EpisodePosterReference"_text, posterLocation());
  set("EpisodePosterReferenceType"_text, posterReferenceType());
  set("EpisodeReference"_text, location());
  set("EpisodeReferenceType"_text, referenceType());
  set("EpisodeType"_text, contentType());
  set("EpisodeUUID"_text, uuid());
  dictionary.shrink_to_fit();  // there may be very many episodes with next to no entries
  return dictionary;
}

std::string QELEpisode::description() const {
  return platform::formattedText("<%@: \"%@\">", {"QELEpisode", title()});
}

bool QELEpisode::saveToPath(const std::string& path) {
  return QELFetchToPath(location(), referenceType(), path, *this, download_, [this] {
    QELProgress("N", "Downloading episode entitled \"%@\" (%lu bytes)...", title(),
                contentLength());
    downloadingPoster_ = false;
    totalDownloaded_ = 0;
  });
}

bool QELEpisode::savePosterToPath(const std::string& path) {
  return QELFetchToPath(posterLocation(), posterReferenceType(), path, *this, download_, [this] {
    QELProgress("N", "Downloading poster for episode entitled \"%@\"...", title());
    downloadingPoster_ = true;
    totalDownloaded_ = 0;
  });
}

void QELEpisode::didReceiveResponse(platform::Download& /*download*/, std::int64_t expectedLength) {
  download_ = QELDownloadState();
  totalDownloaded_ = 0;
  // Of a poster too: the file size of a bundle's entry is that of what was fetched last.
  if (expectedLength >= 0) setContentLength(static_cast<std::uint64_t>(expectedLength));
}

void QELEpisode::didReceiveDataOfLength(platform::Download& /*download*/, std::uint64_t length) {
  totalDownloaded_ += length;
  const std::uint64_t expected = contentLength();
  if (downloadingPoster_ || expected == 0) return;

  constexpr double kAll = 100.0;
  const double percentage = totalDownloaded_ > expected ? kAll
                                                        : static_cast<double>(totalDownloaded_) /
                                                              static_cast<double>(expected) * kAll;
  QELProgress(std::nullopt, "-- %lu / %lu (%0.1f%%)", totalDownloaded_, expected, percentage);
}

void QELEpisode::downloadDidFinish(platform::Download& /*download*/) {
  download_ = {.downloadFinished = true, .downloadSuccess = true};
}

void QELEpisode::didFailWithError(platform::Download& /*download*/,
                                  const platform::ErrorRecord& /*error*/) {
  download_ = {.downloadFinished = true, .downloadSuccess = false};
}
