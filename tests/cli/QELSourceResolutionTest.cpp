#include "cli/QELSourceResolution.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <string>

#include "sources/QELFeedPodcastSource.h"
#include "sources/QELReferenceFilePodcastSource.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

class QELSourceResolutionTest : public testing::Test {
 protected:
  TemporaryDirectory directory_;
};

constexpr const char* kReferenceFile = "<plist version=\"1.0\"><dict/></plist>";

TEST_F(QELSourceResolutionTest, WhatIsToBeAURL) {
  EXPECT_EQ(QELURLTextOf("https://a.example/"), "https://a.example/");
  EXPECT_EQ(QELURLTextOf("pcasts://a b"), "https://a b");
  EXPECT_EQ(QELURLTextOf("file:relative"), "file:relative");
  for (const char* path : {"", "/a", "file", "HTTP://a.example/", "Pcast://a.example/"}) {
    EXPECT_EQ(QELURLTextOf(path), std::nullopt) << path;
  }
}

TEST_F(QELSourceResolutionTest, Validation) {
  const struct {
    std::optional<std::string_view> source;
    bool valid;
  } rows[] = {
      {"http://a.example/feed", true},
      {"https://a.example", true},
      {"pcast://a.example/feed", true},
      {"pcasts://a.example/feed", true},
      {"file:///tmp/feed.xml", true},
      {"http", false},
      {"http:", false},
      {"http://", false},
      {"httpd.plist", false},  // begins like a URL, and is none
      {"pcast", false},
      {"pcast:feed", false},
      {"file:", false},
      {"file:relative", false},
      {"http://a.example/a b", false},
      {"HTTP://a.example/a b", true},  // a path
      {"nowhere.plist", true},
      {"", true},
      {std::nullopt, false},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(QELValidateSource(row.source, false), row.valid) << row.source.value_or("(absent)");
  }
}

TEST_F(QELSourceResolutionTest, URLsNameFeeds) {
  for (const char* source : {"http://a.example/feed", "https://a.example", "pcast://a.example/feed",
                             "file:///nowhere/a.plist", "file:///nowhere/a.podcast"}) {
    const auto resolved = initWithSourceString(source);
    EXPECT_NE(dynamic_cast<QELFeedPodcastSource*>(resolved.get()), nullptr) << source;
  }
}

TEST_F(QELSourceResolutionTest, FeedsAreReadUnderThePrefixes) {
  const std::string url = "file://" + directory_.addFile("feed.xml",
                                                         "<rss><orvane:category text='O'/>"
                                                         "<acme:category text='A'/></rss>");
  const auto category = [](const std::unique_ptr<QELPodcastSource>& source) {
    platform::ErrorSlot error;
    EXPECT_TRUE(source->loadSourceWithError(error));
    return source->category();
  };
  EXPECT_EQ(category(initWithSourceString(url)), "O");
  EXPECT_EQ(category(initWithSourceString(url, {"acme"})), "A");
}

TEST_F(QELSourceResolutionTest, MalformedURLsNameNothing) {
  EXPECT_EQ(initWithSourceString("http:"), nullptr);
  EXPECT_EQ(initWithSourceString("file:relative"), nullptr);
}

TEST_F(QELSourceResolutionTest, UpperCaseSchemeIsAPath) {
  EXPECT_EQ(initWithSourceString("HTTP://a.example/feed"), nullptr);
}

TEST_F(QELSourceResolutionTest, ExtensionTellsTheKindOfAPath) {
  for (const char* name : {"a.plist", "b.PLIST", "c.d.pList"}) {
    const auto resolved = initWithSourceString(directory_.addFile(name, kReferenceFile));
    EXPECT_NE(dynamic_cast<QELReferenceFilePodcastSource*>(resolved.get()), nullptr) << name;
  }
  for (const char* name : {"a.xml", "plist", ".plist", "a.plist.", "a.plist~"}) {
    EXPECT_EQ(initWithSourceString(directory_.addFile(name, kReferenceFile)), nullptr) << name;
  }
}

TEST_F(QELSourceResolutionTest, MissingPathsNameNothing) {
  EXPECT_EQ(initWithSourceString(""), nullptr);
  EXPECT_EQ(initWithSourceString(directory_ / "nowhere.plist"), nullptr);
  EXPECT_EQ(initWithSourceString(directory_ / "nowhere.podcast"), nullptr);
}

TEST_F(QELSourceResolutionTest, FileThatIsNoPropertyListNamesNothing) {
  EXPECT_EQ(initWithSourceString(directory_.addFile("a.plist", "text")), nullptr);
}

TEST_F(QELSourceResolutionTest, StandardInputIsReadUntilItHoldsAPropertyList) {
  const std::string faulty = directory_.addFile("faulty", "text");
  const std::string sound = directory_.addFile("sound", kReferenceFile);
  EXPECT_EQ(exitStatusOfChild([&] {
              const auto readFrom = [](const std::string& path) {
                if (std::freopen(path.c_str(), "rb", stdin) == nullptr) return 1;
                return QELPodcastFromStandardInput() ? 2 : 3;
              };
              const bool isReadAgain = readFrom(faulty) == 3 && readFrom(sound) == 2;
              const auto cached = QELPodcastFromStandardInput();
              const bool isKept = readFrom(faulty) == 2 && QELPodcastFromStandardInput() == cached;
              return isReadAgain && isKept ? 0 : 1;
            }),
            0);
}

}  // namespace
