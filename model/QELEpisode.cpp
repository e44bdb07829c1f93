#include "model/QELEpisode.h"

#include <string_view>
#include <type_traits>

#include "cli/common/QELProgress.h"
#include "cli/common/QELReferenceType.h"
#include "platform/text/FormattedText.h"

namespace {

using platform::Dictionary;
using platform::PropertyListValue;
using platform::Text;
using platform::operator""_text;  // NOLINT(misc-unused-using-decls): used in literals

/// What a field becomes by the value under its key, null where the key is missing. A value of an
/// unexpected kind counts as missing.
void read(const PropertyListValue* value, QELEpisode::OptionalText& field) {
  if (value) field = value->asText();
}
void read(const PropertyListValue* value, platform::AtomicValue<QELEpisode::OptionalDate>& field) {
  field.store(value ? value->asDate() : std::nullopt);
}
void read(const PropertyListValue* value, std::atomic<std::int64_t>& order) {
  order = (value ? value->asSignedInteger() : std::nullopt).value_or(QELEpisode::kNoOrder);
}
void read(const PropertyListValue* value, std::atomic<std::uint64_t>& length) {
  length = (value ? value->asUnsignedInteger() : std::nullopt).value_or(0);
}

/// What is written of a field; absent leaves its key out.
QELEpisode::OptionalDate written(const platform::AtomicValue<QELEpisode::OptionalDate>& date) {
  return date.load();
}
std::optional<std::int64_t> written(const std::atomic<std::int64_t>& order) {
  const std::int64_t number = order;
  return number >= 0 ? std::optional(number) : std::nullopt;
}
std::optional<std::uint64_t> written(const std::atomic<std::uint64_t>& length) {
  const std::uint64_t number = length;
  return number != 0 ? std::optional(number) : std::nullopt;
}

}  // namespace

/// The table of the fields, each with its key in an episode dictionary of a reference file and its
/// key in a feed item dictionary, empty where feed items have none. In the order of the former, so
/// that a dictionary is filled at its end. The visit is given a text as its TextField.
template <typename Episode, typename Visit>
void QELEpisode::forEachField(Episode& episode, Visit visit) {
  visit("EpisodeAdvisoryLabel"_text, "advisoryLabel", kAdvisoryLabel);
  visit("EpisodeAuthor"_text, "author", kAuthor);
  visit("EpisodeCategory"_text, "category", kCategory);
  visit("EpisodeDate"_text, "date", episode.date_);
  visit("EpisodeDescription"_text, "description", kDescription);
  visit("EpisodeFileSize"_text, "contentLength", episode.contentLength_);
  visit("EpisodeKeywords"_text, "keywords", kKeywords);
  visit("EpisodeName"_text, "title", kTitle);
  visit("EpisodeOrder"_text, "order", episode.orvaneOrder_);
  visit("EpisodePosterReference"_text, "poster", kPosterLocation);
  visit("EpisodePosterReferenceType"_text, "", kPosterReferenceType);
  visit("EpisodeReference"_text, "url", kLocation);
  visit("EpisodeReferenceType"_text, "", kReferenceType);
  visit("EpisodeType"_text, "contentType", kContentType);
  visit("EpisodeUUID"_text, "QELUUID", kUUID);
}

std::shared_ptr<QELEpisode> QELEpisode::episodeWithDictionary(const Dictionary* dictionary) {
  auto made = episode();
  made->initWithDictionary(dictionary, Keys::kOfReferenceFile);
  return made;
}

std::shared_ptr<QELEpisode> QELEpisode::episodeWithFeedDictionary(const Dictionary* dictionary) {
  auto made = episode();
  made->initWithDictionary(dictionary, Keys::kOfFeedItem);
  return made;
}

void QELEpisode::initWithDictionary(const Dictionary* dictionary, Keys keys) {
  setOrvaneOrder(kNoOrder);
  if (!dictionary) return;
  Texts::All texts;
  forEachField(*this, [&](const Text& key, std::string_view feedKey, auto&& field) {
    const std::string_view used = keys == Keys::kOfFeedItem ? feedKey : key.view();
    const auto* const value = used.empty() ? nullptr : platform::valueForKey(*dictionary, used);
    if constexpr (std::is_same_v<std::decay_t<decltype(field)>, TextField>) {
      read(value, texts[field]);
    } else {
      read(value, field);
    }
  });
  const auto derive = [&texts](TextField field, auto derived, TextField from) {
    if (!texts[field]) texts[field] = derived(texts[from]);
  };
  derive(kReferenceType, QELReferenceType, kLocation);
  derive(kContentType, QELMIMEType, kLocation);
  derive(kPosterReferenceType, QELReferenceType, kPosterLocation);
  texts_.storeAll(std::move(texts));
}

Dictionary QELEpisode::dictionary() const {
  Dictionary dictionary;
  constexpr std::size_t kMostEntries = 15;
  dictionary.reserve(kMostEntries);
  forEachField(*this, [&](const Text& key, std::string_view, const auto& field) {
    const auto value = [&] {
      if constexpr (std::is_same_v<std::decay_t<decltype(field)>, TextField>) {
        return texts_.load(field);
      } else {
        return written(field);
      }
    }();
    if (value) dictionary.emplace(key, *value);
  });
  dictionary.shrink_to_fit();  // there may be very many episodes with next to no entries
  return dictionary;
}

std::string QELEpisode::description() const {
  return platform::formattedText("<%@: \"%@\">", {"QELEpisode", title()});
}

bool QELEpisode::saveTo(const platform::FilePlace& place, const QELMediaReference& media) {
  return fetchTo(place, media, [this] {
    QELProgress("N", "Downloading episode entitled \"%@\" (%lu bytes)...", title(),
                contentLength());
    downloadingPoster_ = false;
  });
}

bool QELEpisode::savePosterTo(const platform::FilePlace& place, const QELMediaReference& poster) {
  return fetchTo(place, poster, [this] {
    QELProgress("N", "Downloading poster for episode entitled \"%@\"...", title());
    downloadingPoster_ = true;
  });
}

void QELEpisode::didReceiveResponse(platform::Download& /*download*/, std::int64_t expectedLength) {
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
