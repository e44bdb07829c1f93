#include "bench/SampleFeed.h"

#include <string_view>

namespace {

constexpr std::string_view kHead =
    R"(<?xml version="1.0" encoding="UTF-8"?>
<rss version="2.0" xmlns:dc="http://purl.org/dc/elements/1.1/"
  xmlns:content="http://purl.org/rss/1.0/modules/content/"
  xmlns:orvane="https://orvane.example/ns/podcast-1.0">
  <channel>
    <title>The Long Way Round</title>
    <link>https://round.example/</link>
    <description><![CDATA[<p>A walk a day &amp; what was heard on it.</p>]]></description>
    <orvane:author>Ann &amp; Bob Round</orvane:author>
    <orvane:image href="https://round.example/cover.jpg?w=3000&amp;h=3000"/>
)";
constexpr std::string_view kTail = "  </channel>\n</rss>\n";

constexpr std::string_view kParagraph =
    R"(<p>Down to the old mill &amp; back, with “Ann” listening—and the river’s sound on <em>every</em>)"
    R"( step. The map is at <a href="https://places.example/mill?ref=feed&amp;via=notes")"
    R"( rel="noopener">places.example/mill</a>, for those who follow.</p>)"
    "\n";
constexpr std::string_view kSentence =
    "Down to the old mill and back, with Ann listening to the river on every step. ";

std::string repeated(std::string_view text, int times) {
  std::string result;
  for (int time = 0; time < times; ++time) result += text;
  return result;
}

std::string escaped(std::string_view text) {
  std::string result;
  for (const char character : text) {
    switch (character) {
      case '&':
        result += "&amp;";
        break;
      case '<':
        result += "&lt;";
        break;
      case '>':
        result += "&gt;";
        break;
      default:
        result += character;
    }
  }
  return result;
}

/// Markup of one to four paragraphs as an element's content.
std::string markup(int number, int paragraphs) {
  const std::string text = repeated(kParagraph, paragraphs);
  return number % 4 == 0 ? escaped(text) : "<![CDATA[" + text + "]]>";
}

std::string item(int number) {
  const std::string name = std::to_string(number);
  const std::string uuid = "3f2a51c7-98be-4d06-a1f4-" + std::to_string(100'000'000'000 + number);
  return "    <item>\n      <title>" + name + ": The Mill &amp; the Weir</title>\n" +
         "      <orvane:title>" + name + ": The Mill &amp; the Weir</orvane:title>\n" +
         "      <guid isPermaLink=\"false\">" + uuid + "</guid>\n" +
         "      <link>https://round.example/episodes/" + name +
         "?utm_source=feed&amp;utm_medium=rss</link>\n" + "      <pubDate>Thu, " +
         std::to_string(1 + number % 28) + " Jan 2026 06:00:00 " +
         (number % 2 == 0 ? "+0200" : "EST") + "</pubDate>\n" + "      <description>" +
         markup(number, 2 + number % 3) + "</description>\n" + "      <content:encoded>" +
         markup(number, 1 + number % 2) + "</content:encoded>\n" + "      <orvane:summary>" +
         repeated(kSentence, 3) + "</orvane:summary>\n" +
         "      <orvane:author>Ann &amp; Bob Round</orvane:author>\n" +
         "      <orvane:keywords>walks,places,sounds</orvane:keywords>\n" +
         "      <orvane:explicit>no</orvane:explicit>\n" +
         "      <orvane:image href=\"https://img.round.example/" + uuid +
         "/cover.jpg?w=1400&amp;h=1400\"/>\n" +
         "      <enclosure url=\"https://media.round.example/track/" + uuid + "/walk-" + name +
         ".mp3?source=feed&amp;t=" + name + R"(" length="34216300" type="audio/mpeg"/>)" +
         "\n    </item>\n";
}

}  // namespace

std::string sampleFeed(int items) {
  std::string feed(kHead);
  for (int number = 1; number <= items; ++number) feed += item(number);
  feed += kTail;
  return feed;
}
