#include "companions/check/QELFeedCheck.h"

#include <algorithm>
#include <array>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "companions/common/QELFaultAdvice.h"
#include "companions/common/QELMediaType.h"
#include "dates/RFC822Faults.h"
#include "model/QELEpisodeMatching.h"
#include "platform/net/URL.h"
#include "platform/net/URLFault.h"
#include "platform/plist/PropertyListDate.h"
#include "platform/text/ASCII.h"
#include "platform/text/Case.h"
#include "sources/FeedParser.h"

namespace {

using platform::Dictionary;
using platform::TextPosition;

constexpr std::string_view kRightDate = "Sat, 04 Apr 2026 04:30:00 GMT";

/// Watches the tool's parser at its work.
class Watch final : public FeedParser {
 public:
  Watch(platform::ByteSource bytes, const QELDirectory& directory, bool isForPublishing,
        QELFindings& findings)
      : FeedParser(std::move(bytes)), isForPublishing_(isForPublishing), findings_(findings) {
    setDirectoryPrefixes({directory.prefix});
    setItemReceiver([](const Dictionary&) {});
  }

  void check() {
    platform::ErrorSlot error;
    if (parseWithError(error)) {
      if (isForPublishing_) checkChannel();
      tellNumbers();
    } else if (fault()) {
      const bool isMarkup = !root_.empty() || !fault()->description.starts_with("not well");
      findings_.add(QELSeverity::kError, {.position = fault()->position},
                    isMarkup ? "%@" : "this is no feed, no reference file and no bundle",
                    {QELWithAdvice(fault()->description)});
    } else {
      findings_.add(QELSeverity::kError, {.position = TextPosition()},
                    "%@ (the first element here is %@)",
                    {QELWithAdvice(error->description), QELQuoted(root_)});
    }
  }

 private:
  struct Element {
    std::string name;
    TextPosition position;
    bool isTaken = false;
  };

  void didStartElement(const platform::XMLName& name,
                       const platform::XMLAttributes& attributes) override {
    if (open_.empty()) root_ = name.qualified;
    open_.push_back({std::string(name.qualified), position()});
    text_.clear();
    if (name.qualified == "channel") channelPosition_ = open_.back().position;
    if (name.local == "item") {
      if (isInItem()) endItem();  // as one within another does
      itemPosition_ = open_.back().position;
      hasGuid_ = false;
    }
    const bool isImage = name.local == "image";
    hasPoster_ |= isImage && !isInItem();
    const bool isOfOtherDirectory = name.qualified != name.local && !isOfDirectory(name) &&
                                    ((isImage && attributes.value("href")) ||
                                     (name.local == "category" && attributes.value("text")));
    if (isOfOtherDirectory && feedType()) {
      const std::string_view prefix =
          name.qualified.substr(0, name.qualified.size() - name.local.size() - 1);
      add(QELSeverity::kNote, open_.back().position,
          {"%@ is not taken: the option --directory %@=URI, with the URI that xmlns:%@ declares, "
           "reads it here and in qel-keep",
           std::string(name.qualified)},
          {QELQuoted(name.qualified), prefix, prefix});
    }
    FeedParser::didStartElement(name, attributes);
  }

  void didEndElement(const platform::XMLName& name) override {
    const bool isOfItem = isInItem();
    if (name.local == "item" && isOfItem) endItem();
    FeedParser::didEndElement(name);

    const Element& element = open_.back();
    if (feedType()) {
      const std::string_view text = platform::trimmed(text_);
      if (name.local == "pubDate" && isOfItem) checkDate(element);
      if (name.local == "explicit" && !element.isTaken) checkLabel(element, text);
      if (name.qualified == "guid" && isOfItem) checkGuid(element, std::string(text));
      if (name.qualified == "link" && !isOfItem) hasLink_ |= isAbsolute(text);
      if (name.qualified == "language" && !isOfItem) hasLanguage_ |= !text.empty();
      count(element);
    }
    open_.pop_back();
  }

  void foundCharacters(std::string_view text) override {
    text_ += text;
    FeedParser::foundCharacters(text);
  }

  void take(Dictionary& target, const platform::Text& key,
            platform::PropertyListValue value) override {
    open_.back().isTaken = true;
    if (key == "date") date_ = value.asDate();
    const auto* const before = target.find(key);
    if (before != target.end()) tellReplaced(key, before->second, value);
    FeedParser::take(target, key, std::move(value));
  }

  void add(QELSeverity severity, const TextPosition& position, const QELFindingKind& kind,
           std::initializer_list<platform::FormatArgument> arguments = {}) {
    findings_.add(severity, {.position = position}, kind, arguments);
  }

  void tellReplaced(std::string_view key, const platform::PropertyListValue& before,
                    const platform::PropertyListValue& after) {
    const std::string was = before.asText().value_or(platform::Text()).string();
    const std::string becomes = after.asText().value_or(platform::Text()).string();
    // The poster of a directory takes precedence, and what belongs to a second file follows it.
    if (key == "poster" || key.starts_with("content") || key == "order") return;
    if (platform::trimmed(was) == platform::trimmed(becomes)) return;
    const Element& element = open_.back();
    if (key == "title" && open_.size() > 1 && open_[open_.size() - 2].name == "image") {
      add(QELSeverity::kWarning, element.position,
          "the title %@ of the image renames the show, which is %@: give both the same one",
          {QELQuoted(becomes), QELQuoted(was)});
      return;
    }
    const bool isMinor = key == "author" || key == "keywords" || key == "copyright";
    add(isMinor ? QELSeverity::kNote : QELSeverity::kWarning, element.position,
        {"%@ makes the %@ of the %@ %@, which was %@: the last one counts, whatever its prefix; "
         "leave one of them out",
         element.name + (isInItem() ? " item" : "")},
        {QELQuoted(element.name), key, isInItem() ? "episode" : "show", QELQuoted(becomes),
         QELQuoted(was)});
  }

  void checkDate(const Element& element) {
    const std::string_view fault = RFC822Fault(text_);
    if (!element.isTaken) {
      add(QELSeverity::kWarning, element.position,
          "%@ is no date, and the episode has none: write it like %@",
          {QELQuoted(text_), kRightDate});
    } else if (!fault.empty() && date_) {
      add(QELSeverity::kWarning, element.position, "%@ is taken for %@, but %@: write it like %@",
          {QELQuoted(text_), platform::propertyListDate(*date_), fault, kRightDate});
    }
  }

  void checkLabel(const Element& element, std::string_view text) {
    const std::string label = platform::lowercased(text);
    if (label.empty() || label == "no" || label == "false") return;
    add(QELSeverity::kNote, element.position,
        "%@ is not taken as an advisory label: qel knows \"yes\" and \"clean\"", {QELQuoted(text)});
  }

  void checkGuid(const Element& element, const std::string& guid) {
    hasGuid_ = !guid.empty();
    if (!hasGuid_ || guids_.insert(guid).second) return;
    add(QELSeverity::kWarning, element.position,
        "the guid %@ is that of an episode before: readers show one of the two; give each its own",
        {QELQuoted(guid)});
  }

  void endItem() {
    const Dictionary& item = episodes().back();
    ++episodeCount_;
    for (auto& [key, number] : facts_) number += has(item, key) ? 1U : 0U;
    const auto uuid = platform::textForKey(item, "QELUUID");
    const bool hasUUID = uuid && QELIsIdentifier(*uuid);
    if (hasUUID) ++uuidCount_;
    if (hasUUID && !uuids_.insert(QELComparableUUID(*uuid)).second) {
      add(QELSeverity::kWarning, itemPosition_,
          "the uuid %@ is that of an episode before: others take both for one; give each its "
          "own",
          {QELQuoted(*uuid)});
    }
    if (isForPublishing_) checkItem(item);
  }

  static bool has(const Dictionary& dictionary, std::string_view key) {
    return dictionary.find(key) != dictionary.end();
  }

  void demand(bool isThere, const TextPosition& position, const char* lack) {
    if (!isThere) add(QELSeverity::kWarning, position, lack);
  }

  void checkItem(const Dictionary& item) {
    const TextPosition& place = itemPosition_;
    demand(hasGuid_, place,
           "this episode has no \"guid\", by which readers know it again: qel-publish writes one");
    demand(has(item, "title"), place, "this episode has no \"title\": add one");
    demand(has(item, "date"), place,
           "this episode has no date, by which readers sort: add a \"pubDate\"");
    demand(has(item, "url"), place,
           "this episode has no \"enclosure\" with a \"url\", and so no media: add one");
    checkURL(item, "poster", place);
    if (!has(item, "url")) return;
    checkURL(item, "url", place);
    demand(has(item, "contentLength"), place,
           "the enclosure has no \"length\": write the size of the file in bytes");
    const auto type = platform::textForKey(item, "contentType").value_or(platform::Text());
    demand(!type.empty(), place, "the enclosure has no \"type\": write one such as audio/mpeg");
    if (type.empty() || QELIsMediaType(type)) return;
    add(QELSeverity::kWarning, place, "%@ is no MIME type: write one such as audio/mpeg",
        {QELQuoted(type)});
  }

  void checkURL(const Dictionary& dictionary, std::string_view key, const TextPosition& place) {
    const auto url = platform::textForKey(dictionary, key);
    if (!url || isAbsolute(*url)) return;
    const std::string fault = platform::looksLikeURL(*url) ? platform::urlFault(*url) : "";
    add(QELSeverity::kWarning, place, "%@ is no URL that readers can fetch: %@",
        {QELQuoted(*url), fault.empty() ? "qel-publish --base makes paths URLs" : fault});
  }

  void checkChannel() {
    const TextPosition& place = channelPosition_;
    demand(has(feedAttributes(), "title"), place, "the show has no \"title\": add one");
    demand(has(feedAttributes(), "description"), place, "the show has no \"description\": add one");
    demand(hasPoster_, place, "the show has no poster: add an \"image\"");
    checkURL(feedAttributes(), "poster", place);
    demand(hasLink_, place,
           "the show has no \"link\" with the URL of its home page: add one, or "
           "give it to qel-publish by --link");
    demand(hasLanguage_, place,
           "the show has no \"language\": add one such as en, or give it to "
           "qel-publish by --language");
  }

  void count(const Element& element) {
    constexpr std::array<std::string_view, 4> kFrames = {"rss", "channel", "item", "image"};
    if (element.isTaken) {
      ++taken_[element.name];
    } else if (std::find(kFrames.begin(), kFrames.end(), element.name) == kFrames.end()) {
      ++left_[element.name];
    }
  }

  void tellNumbers() {
    findings_.add(QELSeverity::kNote, {},
                  "qel takes %lu episodes: %lu with media, %lu with the size of them, %lu with a "
                  "date, %lu with a uuid, %lu with a poster",
                  {episodeCount_, facts_["url"], facts_["contentLength"], facts_["date"],
                   uuidCount_, facts_["poster"]});
    if (!taken_.empty()) findings_.add(QELSeverity::kNote, {}, "taken: %@", {QELListed(taken_)});
    if (!left_.empty()) findings_.add(QELSeverity::kNote, {}, "not taken: %@", {QELListed(left_)});
  }

  static bool isAbsolute(std::string_view text) {
    const std::optional<platform::URL> url = platform::URL::parse(text);
    return url && url->scheme().starts_with("http");
  }

  bool isForPublishing_;
  QELFindings& findings_;
  std::string root_;           // the name of the first element
  std::vector<Element> open_;  // the outermost first
  std::string text_;           // since the last start of one
  TextPosition channelPosition_;
  TextPosition itemPosition_;
  std::optional<platform::PointInTime> date_;  // the last one that was taken
  bool hasGuid_ = false;                       // of the item
  bool hasLink_ = false;                       // and these of the channel
  bool hasLanguage_ = false;
  bool hasPoster_ = false;
  std::set<std::string> guids_;
  std::set<std::string> uuids_;
  std::size_t episodeCount_ = 0;
  std::size_t uuidCount_ = 0;
  /// How many episodes have these.
  std::map<std::string_view, std::size_t> facts_ = {
      {"url", 0}, {"contentLength", 0}, {"date", 0}, {"poster", 0}};
  std::map<std::string, std::size_t> taken_;  // elements by their names
  std::map<std::string, std::size_t> left_;
};

}  // namespace

void QELCheckFeed(platform::ByteSource bytes, const QELDirectory& directory, bool isForPublishing,
                  QELFindings& findings) {
  Watch(std::move(bytes), directory, isForPublishing, findings).check();
}
