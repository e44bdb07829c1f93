#include "fuzz/FeedRoundTrip.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "cli/common/QELReferenceType.h"
#include "fuzz/PropertyListRoundTrip.h"
#include "platform/net/URL.h"
#include "platform/plist/PropertyListDate.h"
#include "platform/text/Case.h"
#include "platform/text/Characters.h"
#include "platform/text/LeadingInteger.h"

namespace {

using platform::Dictionary;
using platform::PropertyListValue;
using platform::Text;
using platform::textForKey;

bool isDistant(platform::PointInTime date) {
  static const auto first = platform::dateFromPropertyListText("0100Z");
  static const auto last = platform::dateFromPropertyListText("280000Z");
  return date < *first || date > *last;
}

std::optional<Text> textInFeed(const std::optional<Text>& text) {
  if (!text) return std::nullopt;
  return Text(xmlText(*text));
}

/// The 36 characters behind the first marker; absent when there are fewer.
std::optional<std::string> uuidBehind(std::string_view marker, std::string_view text) {
  constexpr std::size_t kLength = 36;
  const std::size_t place = text.find(marker);
  if (place == std::string_view::npos) return std::nullopt;
  const std::string_view uuid =
      platform::firstCharacters(text.substr(place + marker.size()), kLength);
  if (platform::characterCount(uuid) < kLength) return std::nullopt;
  return std::string(uuid);
}

/// What is left of a podcast or of an episode.
class Item {
 public:
  /// `unread` is the text since the last element whose text is read; it goes on from item to item.
  Item(const Dictionary& record, std::string prefix, std::string& unread)
      : record_(record), prefix_(std::move(prefix)), unread_(unread) {}

  Dictionary podcast() {
    addCommonTexts();
    keep("Copyright");
    if (addLocation("PosterReference")) unread_.clear();  // the image's URL is read, too
    if (const auto link = textInFeed(text("Reference"))) {
      unread_ = link->string();
      const bool isOfEpisode = uuidBehind("document/uuid/", unread_).has_value();
      const auto uuid = uuidBehind("collection/uuid/", unread_);
      if (uuid && !isOfEpisode) result_.insert_or_assign(key("UUID"), *uuid);
    }
    return std::move(result_);
  }

  Dictionary episode() {
    addCommonTexts();
    addDate();
    addOrder();
    addLocation("PosterReference");
    if (addLocation("Reference")) {
      keep("Type");
      addSize();
    }
    return std::move(result_);
  }

 private:
  std::string key(std::string_view name) const { return prefix_ + std::string(name); }
  const PropertyListValue* value(std::string_view name) const {
    return platform::valueForKey(record_, key(name));
  }
  std::optional<Text> text(std::string_view name) const { return textForKey(record_, key(name)); }

  bool keep(std::string_view name) {
    const std::optional<Text> kept = textInFeed(text(name));
    if (kept) result_.insert_or_assign(key(name), *kept);
    return kept.has_value();
  }

  void addCommonTexts() {
    bool isRead = false;
    for (const char* name : {"Name", "Author", "Keywords"}) isRead = keep(name) || isRead;
    isRead = isRead || value("Date") != nullptr || (prefix_ == "Podcast" && text("Copyright"));
    keep("Category");
    isRead = keep("Description") || isRead;
    if (isRead) unread_.clear();
    // The summary is the description again, but is not read.
    if (const auto summary = textInFeed(text("Description"))) unread_ += summary->string() + " ";
    if (addAdvisoryLabel()) unread_.clear();
    if (keep("UUID")) unread_.clear();
  }

  bool addAdvisoryLabel() {
    const std::optional<Text> label = text("AdvisoryLabel");
    if (!label) return false;
    const std::string lowercased = platform::lowercased(*label);
    const bool isExplicit = lowercased == "explicit" || lowercased == "yes";
    if (!isExplicit && lowercased != "clean") return false;
    result_.insert_or_assign(key("AdvisoryLabel"), isExplicit ? "Explicit" : "Clean");
    return true;
  }

  void addDate() {
    const PropertyListValue* date = value("Date");
    if (date == nullptr) return;
    result_.insert_or_assign(key("Date"), afterWriting({{"Date", *date}}).find("Date")->second);
  }

  void addOrder() {
    const PropertyListValue* order = value("Order");
    if (order == nullptr) return;
    const std::int64_t number = platform::leadingInteger(unread_ + " " + order->asText()->string());
    if (number >= 0) result_.insert_or_assign(key("Order"), number);
    unread_.clear();
  }

  void addSize() {
    const PropertyListValue* size = value("FileSize");
    if (size == nullptr) return;
    constexpr auto kMost = static_cast<std::uint64_t>(std::numeric_limits<std::int64_t>::max());
    result_.insert_or_assign(key("FileSize"), std::min(*size->asUnsignedInteger(), kMost));
  }

  bool addLocation(std::string_view name) {
    const std::string typeKey = key(name) + "Type";
    const std::optional<Text> type = textForKey(record_, typeKey);
    std::optional<Text> location = text(name);
    const bool isLocal = type == Text(kReferenceTypeLocal);
    if (!location || (type && !isLocal && type != Text(kReferenceTypeRemote))) return false;
    if (isLocal && location->view().starts_with('/')) location = platform::fileURLText(*location);
    location = textInFeed(location);
    result_.insert_or_assign(key(name), *location);
    if (const auto newType = QELReferenceType(location)) {
      result_.insert_or_assign(typeKey, *newType);
    }
    return true;
  }

  const Dictionary& record_;
  std::string prefix_;
  std::string& unread_;
  Dictionary result_;
};

}  // namespace

Dictionary afterFeed(const Dictionary& record) {
  std::string unread;
  Dictionary result = Item(record, "Podcast", unread).podcast();
  const PropertyListValue* episodes = platform::valueForKey(record, "Episodes");
  if (episodes == nullptr) return result;
  PropertyListValue::Array items;
  for (const PropertyListValue& episode : *episodes->asArray()) {
    items.emplace_back(Item(*episode.asDictionary(), "Episode", unread).episode());
  }
  result.insert_or_assign("Episodes", std::move(items));
  return result;
}

bool holdsDistantDate(const Dictionary& record) {
  const PropertyListValue* episodes = platform::valueForKey(record, "Episodes");
  return episodes != nullptr &&
         std::any_of(episodes->asArray()->begin(), episodes->asArray()->end(),
                     [](const PropertyListValue& episode) {
                       const PropertyListValue* date =
                           platform::valueForKey(*episode.asDictionary(), "EpisodeDate");
                       return date != nullptr && isDistant(*date->asDate());
                     });
}
