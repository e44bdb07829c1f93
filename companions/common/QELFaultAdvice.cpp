#include "companions/common/QELFaultAdvice.h"

#include <algorithm>
#include <array>
#include <string_view>

#include "platform/plist/PropertyListReader.h"

namespace {

struct Advice {
  std::string_view fault;  // how its description begins
  std::string_view text;
};

constexpr auto kAdvice = std::to_array<Advice>({
    {"syntax error", "give a feed, a reference file or a bundle"},
    {"not well-formed", "\"&\" and \"<\" in a text are written &amp; and &lt;"},
    {"undefined entity",
     "write the character itself; XML knows only &amp; &lt; &gt; &quot; &apos;"},
    {"mismatched tag", "each <x> ends with its </x>, the one opened last before the others"},
    {"unclosed token", "the file is cut off: take it from where it came once more"},
    {"no element found", "the file is empty or cut off: take it from where it came once more"},
    {"junk after document element", "remove what follows the end of the first element"},
    {"unknown encoding", "save the file as UTF-8, and say so in its first line"},
    {"a document whose root", "put <plist version=\"1.0\"> before it and </plist> behind it"},
    {"a property list without", "put a <dict> with the podcast's keys into it"},
    {"a second value", "remove it, or put it into the first one"},
    {"an unexpected element",
     "values are string, integer, date, array and dict; a \"<\" of a text is written &lt;"},
    {"an element \"", "write its \"<\" as &lt; or put the text into <![CDATA[...]]>"},
    {"text outside", "put it into <string> and </string>"},
    {"a key without a value", "write the value behind it, or remove the key before this"},
    {"a key outside", "put <dict> before it, and </dict> behind its value"},
    {"a value without a key", "write <key>, its name and </key> before it"},
    {"an integer that", "write digits alone, such as 12044"},
    {"a date that", "write it in UTC and like 2026-04-04T04:30:00Z"},
    {"a real that", "write it like 1.5"},
    {"data that", "remove it: a reference file has no data"},
    {platform::kPropertyListTooDeep, "a reference file has three levels"},
    {"The feed was neither", "give the address of the podcast's RSS feed"},
});

}  // namespace

std::string QELWithAdvice(const std::string& fault) {
  const auto* const found = std::find_if(kAdvice.begin(), kAdvice.end(), [&](const Advice& advice) {
    return std::string_view(fault).starts_with(advice.fault);
  });
  if (found == kAdvice.end()) return fault + "; take the file from where it came once more";
  return fault + "; " + std::string(found->text);
}
