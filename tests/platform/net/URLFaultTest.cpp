#include "platform/net/URLFault.h"

#include <gtest/gtest.h>

#include "platform/net/URL.h"

namespace platform {
namespace {

TEST(URLFaultTest, SaysHowAURLIsMended) {
  struct Row {
    std::string_view url;
    std::string_view fault;
  };
  for (const Row& row : {
           Row{"https://h/a b", "\" \" is written %20"},
           Row{"https://h/a|b", "\"|\" is written %7C"},
           Row{"https://h/a\x01", "it holds a control character"},
           Row{"https://h/a\u0085", "it holds a control character"},
           Row{"https://h/a\x7F", "it holds a control character"},
           Row{"https://h/a\u009F", "it holds a control character"},
           Row{"https://h/\u00A0\u00FC b", "\" \" is written %20"},
           Row{"https://h/\xFF b", "\" \" is written %20"},
           Row{"https://h/100%", "\"%\" is written %25"},
           Row{"https://h/%2F%zz", "\"%\" is written %25"},
           Row{"https://h/%2F%aZ", "\"%\" is written %25"},
           Row{"https://h/%2Fa b%", "\" \" is written %20"},
           Row{"https://h/%2", "\"%\" is written %25"},
           Row{"https://h/[1]", "\"[\" is written %5B"},
           Row{"https://h/1]", "\"]\" is written %5D"},
           Row{"https://h/#x#y", "a second \"#\" is written %23"},
           Row{"https:///a", "it has no host"},
           Row{"https://user@/a", "it has no host"},
           Row{"https://:80/a", "it has no host"},
           Row{"http:a", "it has no host"},
           Row{"https://h:http/a", "\"http\" is no port"},
           Row{"https://[::1]:65536/a", "\"65536\" is no port"},
           Row{"https://[::x]/a", "\"[::x]\" is no host"},
           Row{"file://h/a", "a file: URL begins with file:///, and \"h\" is taken for a host"},
           Row{"file:a", "the path of a file: URL begins with a /"},
           Row{"ftp://h/a", "only http:, https: and file: URLs are fetched"},
           Row{"", "only http:, https: and file: URLs are fetched"},
       }) {
    EXPECT_EQ(urlFault(row.url), row.fault) << row.url;
  }
}

TEST(URLFaultTest, AURLThatIsTakenHasNone) {
  for (const std::string_view url :
       {"https://h/a%20b?x#y", "HTTP://user@h:80", "file:///a", "https://h/\u00FC"}) {
    EXPECT_EQ(urlFault(url), "") << url;
    EXPECT_TRUE(URL::parse(url)) << url;
  }
}

TEST(URLFaultTest, TellsWhatLooksLikeAURL) {
  for (const std::string_view text : {"http:", "HTTPS:x", "file:a", "a+b.c-9://", "pcast://h"}) {
    EXPECT_TRUE(looksLikeURL(text)) << text;
  }
  for (const std::string_view text : {"", "a", "://h", "9a://h", "a b://h", "httpd:x", "files:"}) {
    EXPECT_FALSE(looksLikeURL(text)) << text;
  }
  EXPECT_TRUE(hasFetchedScheme("hTTps:"));
  EXPECT_FALSE(hasFetchedScheme("pcast://h"));
}

}  // namespace
}  // namespace platform
