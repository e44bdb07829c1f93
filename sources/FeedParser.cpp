#include "sources/FeedParser.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <utility>

#include "cli/common/QELError.h"
#include "dates/RFC822Parsing.h"
#include "platform/text/Case.h"
#include "platform/text/Characters.h"
#include "platform/text/LeadingInteger.h"
#include "platform/text/Text.h"

namespace {

using platform::Dictionary;
using platform::Text;
using platform::operator""_text;  // NOLINT(misc-unused-using-decls): used in literals

/// The local names of the elements whose start empties the text buffer.
constexpr std::array<std::string_view, 11> RSScdataElements = {
    "title", "pubDate", "description", "author",   "creator", "link",
    "url",   "uuid",    "copyright",   "keywords", "explicit"};
/// The place for Atom's, should Atom be read one day.
[[maybe_unused]] constexpr std::array<std::string_view, 0> AtomcdataElements{};

/// Of the keys in the dictionary of an item, see the class.
constexpr std::size_t kMostItemKeys = 14;

/// The length of a uuid in its 8-4-4-4-12 form (RFC 4122), in characters.
constexpr std::size_t kUuidLength = 36;

/// The uuid at the start of the text; absent when the text is too short to hold one.
std::optional<std::string_view> leadingUuid(std::optional<std::string_view> text) {
  if (!text) return std::nullopt;
  const std::string_view uuid = platform::firstCharacters(*text, kUuidLength);
  if (platform::characterCount(uuid) < kUuidLength) return std::nullopt;
  return uuid;
}

}  // namespace

std::optional<std::string_view> FeedParser::MarkerSearch::textBehindMarker(std::string_view text) {
  const std::size_t found = text.find(marker_, start_);
  if (found == std::string_view::npos) {
    // A marker may have begun in the last bytes.
    start_ = std::max(start_, text.size() - std::min(text.size(), marker_.size() - 1));
    return std::nullopt;
  }
  start_ = found;
  return text.substr(found + marker_.size());
}

std::unique_ptr<FeedParser> FeedParser::parserWithFeedData(
    std::optional<platform::ByteSource> data) {
  if (!data) return nullptr;
  return std::unique_ptr<FeedParser>(new FeedParser(std::move(*data)));
}

bool FeedParser::parseWithError(platform::ErrorSlot& error) {
  if (!feedParser_.parse(fault_)) {
    error = fault_->record();
    return false;
  }
  if (feedType_ == "rss" || feedType_ == "atom") return true;
  error = QELError(3, "The feed was neither RSS nor Atom");
  return false;
}

void FeedParser::didStartElement(const platform::XMLName& name,
                                 const platform::XMLAttributes& attributes) {
  if (name.local == "rss") {
    setFeedType("rss");
    return;
  }
  if (!readsRSS()) return;

  if (name.local == "item") {
    endItem();
    currentEpisode_ = &episodes_.emplace_back();
    currentEpisode_->reserve(kMostItemKeys);
    feedParser_.count([](platform::MemoryBudget& budget) { return budget.takeRecords(); });
  } else if (name.local == "enclosure") {
    readEnclosure(attributes);
  } else if (name.local == "image") {
    parsingImage_ = true;
    if (isOfDirectory(name)) {
      if (const auto href = attributes.value("href")) {
        countField(*href);
        take(target(), "poster"_text, Text(*href));
      }
    }
  } else if (name.local == "category" && isOfDirectory(name)) {
    // The first category wins: later ones and nested subcategories find the key taken.
    if (const auto text = attributes.value("text")) {
      countField(*text);
      takeFirst("category"_text, *text);
    }
  }

  const auto* const end = RSScdataElements.end();
  if (std::find(RSScdataElements.begin(), end, name.local) != end) emptyBuffer();
}

void FeedParser::didEndElement(const platform::XMLName& name) {
  if (!readsRSS()) return;

  const std::string_view local = name.local;
  if (local == "item") {
    endItem();
  } else if (local == "title") {
    takeText("title"_text);
  } else if (local == "author" || local == "creator") {
    takeText("author"_text);
  } else if (local == "description") {
    takeText("description"_text);
  } else if (local == "copyright") {
    takeText("copyright"_text);
  } else if (local == "keywords") {
    takeText("keywords"_text);
  } else if (local == "explicit") {
    readAdvisoryLabel();
  } else if (local == "pubDate") {
    readDate();
  } else if (local == "image") {
    parsingImage_ = false;
  } else if (local == "url") {
    if (parsingImage_) {
      countField(cdataBuffer_);
      takeFirst("poster"_text, cdataBuffer_);
    }
    emptyBuffer();
  } else if (local == "link") {
    readLink();
  } else if (name.qualified == "qel:uuid") {
    takeText("QELUUID"_text);
  } else if (name.qualified == "qel:order") {
    takeText("order"_text);
  }
}

bool FeedParser::isOfDirectory(const platform::XMLName& name) const {
  const std::size_t prefixed = name.qualified.size() - name.local.size();
  if (prefixed == 0) return false;
  const std::string_view prefix = name.qualified.substr(0, prefixed - 1);  // without its colon
  return std::find(directoryPrefixes_.begin(), directoryPrefixes_.end(), prefix) !=
         directoryPrefixes_.end();
}

void FeedParser::endItem() {
  const bool wasInItem = std::exchange(currentEpisode_, nullptr) != nullptr;
  if (!wasInItem || !itemReceiver_) return;
  itemReceiver_(episodes_.back());
  episodes_.pop_back();
}

void FeedParser::readEnclosure(const platform::XMLAttributes& attributes) {
  if (!currentEpisode_) return;
  if (const auto url = attributes.value("url")) {
    countField(*url);
    take(*currentEpisode_, "url"_text, Text(*url));
  }
  if (const auto length = attributes.value("length")) {
    const std::int64_t number = platform::leadingInteger(*length);
    if (number > 0) {
      countField();
      take(*currentEpisode_, "contentLength"_text, number);
    }
  }
  if (const auto type = attributes.value("type")) {
    countField(*type);
    take(*currentEpisode_, "contentType"_text, Text(*type));
  }
}

void FeedParser::readAdvisoryLabel() {
  countField();
  const std::string label = platform::lowercased(cdataBuffer_);
  if (label == "yes") {
    take(target(), "advisoryLabel"_text, "Explicit"_text);
  } else if (label == "clean") {
    take(target(), "advisoryLabel"_text, "Clean"_text);
  }
  emptyBuffer();
}

void FeedParser::readDate() {
  if (const auto date = dateWithRFC822String(cdataBuffer_)) {
    countField();
    take(target(), "date"_text, *date);
  }
  emptyBuffer();
}

/// A link itself is kept nowhere, but may carry the uuid of the podcast or of the episode. The
/// buffer is not emptied.
void FeedParser::readLink() {
  if (const auto uuid = leadingUuid(documentMarker_.textBehindMarker(cdataBuffer_))) {
    countField(*uuid);
    if (currentEpisode_) take(*currentEpisode_, "QELUUID"_text, Text(*uuid));
  } else if (const auto feedUuid = leadingUuid(collectionMarker_.textBehindMarker(cdataBuffer_))) {
    take(feedAttributes_, "QELUUID"_text, Text(*feedUuid));
  }
}

void FeedParser::take(Dictionary& target, const Text& key, platform::PropertyListValue value) {
  target.insert_or_assign(key, std::move(value));
}

void FeedParser::takeFirst(const Text& key, std::string_view value) {
  const Dictionary& taken = target();
  if (taken.find(key) == taken.end()) take(target(), key, Text(value));
}

void FeedParser::countField(std::string_view text) {
  feedParser_.count([text](platform::MemoryBudget& budget) {
    return budget.takeFields() && budget.takeWritten(text);
  });
}

void FeedParser::takeText(const Text& key) {
  countField(cdataBuffer_);
  take(target(), key, Text(std::string_view(cdataBuffer_)));
  emptyBuffer();
}

void FeedParser::emptyBuffer() {
  cdataBuffer_.clear();
  collectionMarker_.restart();
  documentMarker_.restart();
}
