#include "companions/publish/QELPublishDriver.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "companions/common/QELCommandLine.h"
#include "tests/support/EnvironmentGuard.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

using testing::HasSubstr;
using testing::Not;

class QELPublishDriverTest : public testing::Test {
 protected:
  /// The status of publishing a show without episodes where SOURCE_DATE_EPOCH is that.
  int statusWith(const char* epoch) {
    const EnvironmentGuard guard("SOURCE_DATE_EPOCH", epoch);
    const std::vector<const char*> words = {source_.c_str(), feed_.c_str()};
    testing::internal::CaptureStderr();
    const int status = QELRunPublish(words);
    errors_ = testing::internal::GetCapturedStderr();
    return status;
  }

  TemporaryDirectory directory_;
  std::string source_ = directory_.addFile(
      "a.plist", "<plist><dict><key>PodcastName</key><string>n</string></dict></plist>");
  std::string feed_ = directory_ / "feed.xml";
  std::string errors_;
};

TEST_F(QELPublishDriverTest, AFeedCarriesTheDateThatTheEnvironmentGives) {
  EXPECT_EQ(statusWith("0"), kAllWell);
  EXPECT_THAT(contentOf(feed_), HasSubstr("Thu, 01 Jan 1970 00:00:00"));
  EXPECT_EQ(statusWith("253402300799"), kAllWell);
  EXPECT_THAT(contentOf(feed_), HasSubstr("Fri, 31 Dec 9999 23:59:59"));
  for (const char* epoch : {static_cast<const char*>(nullptr), ""}) {
    EXPECT_EQ(statusWith(epoch), kAllWell);
    EXPECT_THAT(contentOf(feed_), Not(HasSubstr("1970")));
    EXPECT_THAT(contentOf(feed_), Not(HasSubstr("9999")));
  }
}

TEST_F(QELPublishDriverTest, WhatIsNoNumberOfSecondsIsRefused) {
  for (const char* epoch : {"-1", "1x", " 1", "253402300800", "99999999999999999999"}) {
    EXPECT_EQ(statusWith(epoch), kNothingDone) << epoch;
    EXPECT_EQ(errors_, "qel-publish: SOURCE_DATE_EPOCH is not a number of seconds since 1970\n");
  }
  EXPECT_EQ(contentOf(feed_), "");
}

}  // namespace
