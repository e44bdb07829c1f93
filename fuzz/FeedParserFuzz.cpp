#include <algorithm>
#include <array>
#include <memory>
#include <string>
#include <variant>

#include "fuzz/FuzzTarget.h"
#include "platform/plist/PropertyListValue.h"
#include "platform/xml/XMLEscaping.h"
#include "sources/FeedParser.h"

namespace {

bool isTextKey(std::string_view key) {
  static constexpr std::array<std::string_view, 9> kKeys = {"title",     "author",   "description",
                                                            "copyright", "keywords", "category",
                                                            "poster",    "QELUUID",  "order"};
  return std::find(kKeys.begin(), kKeys.end(), key) != kKeys.end();
}

bool isEnclosureKey(std::string_view key) {
  return key == "url" || key == "contentType" || key == "contentLength";
}

void requireSound(const platform::Dictionary& dictionary, bool isItem) {
  for (const auto& [key, value] : dictionary) {
    requireThat(isItem || !isEnclosureKey(key), "only items have enclosures");
    if (key == "date") {
      requireThat(value.asDate().has_value(), "a date is a date");
      continue;
    }
    if (key == "contentLength") {
      requireThat(
          std::holds_alternative<std::int64_t>(value.storage()) && value.asSignedInteger() > 0,
          "a length is a number over 0");
      continue;
    }
    const auto* text = std::get_if<platform::Text>(&value.storage());
    requireThat(text != nullptr, "every other value is a text");
    requireThat(platform::isXMLText(*text), "what XML held can be written as XML");
    if (key == "advisoryLabel") {
      requireThat(*text == "Explicit" || *text == "Clean", "there are two advisory labels");
    } else {
      requireThat(isTextKey(key) || isEnclosureKey(key), "there are no other keys");
    }
  }
}

}  // namespace

/// Any bytes as a feed: they are refused with a cause, or give dictionaries of the documented keys.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const auto parser = FeedParser::parserWithFeedData(std::string(inputText(data, size)));
  platform::ErrorSlot error;
  if (!parser->parseWithError(error)) {
    requireTold(error);
    return 0;
  }
  requireThat(!error, "a feed that is accepted leaves the slot alone");
  requireThat(parser->feedType() == "rss", "a feed that is accepted is RSS");
  requireSound(parser->feedAttributes(), false);
  for (const platform::Dictionary& item : parser->episodes()) requireSound(item, true);
  return 0;
}
