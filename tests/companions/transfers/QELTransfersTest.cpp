#include "companions/transfers/QELTransfers.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <utility>

#include "tests/support/HTTPTestServer.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

using State = QELFetch::State;
using testing::ElementsAre;
using testing::IsEmpty;

class QELTransfersTest : public testing::Test {
 protected:
  std::shared_ptr<QELFetch> fetchOf(const std::string& path, const std::string& name) {
    return std::make_shared<QELFetch>("\"One\"", QELMediaReference(server_.url(path), "remote"),
                                      platform::FilePlace(open_, name), directory_.path(), true);
  }

  HTTPTestServer server_;
  TemporaryDirectory directory_;
  platform::ErrorSlot error_;
  platform::Directory open_ = std::move(*platform::Directory::open(directory_.path(), error_));
};

TEST_F(QELTransfersTest, NoMoreRunAtOnceThanAreAllowed) {
  for (const char* path : {"/1", "/2", "/3"}) {
    server_.serve(path, "HTTP/1.1 200 OK\r\nContent-Length: 10\r\n\r\nhalf");
  }
  QELTransfers transfers(2, 5);
  const auto one = fetchOf("/1", "1");
  const auto two = fetchOf("/2", "2");
  const auto three = fetchOf("/3", "3");
  for (const auto& fetch : {one, two, three}) transfers.add(fetch);
  while (one->progress().received + two->progress().received < 8) {
    EXPECT_THAT(transfers.run(), IsEmpty());
  }
  EXPECT_EQ(three->state(), State::kWaiting);
  EXPECT_EQ(server_.hits("/3"), 0);
  EXPECT_FALSE(transfers.hasEnded());
}

TEST_F(QELTransfersTest, CancellingEndsThoseThatRun) {
  server_.serve("/1", "HTTP/1.1 200 OK\r\nContent-Length: 10\r\nETag: \"v\"\r\n\r\nfirst");
  QELTransfers transfers(2, 5);
  const auto one = fetchOf("/1", "1");
  transfers.add(one);
  while (one->progress().received < 5) EXPECT_THAT(transfers.run(), IsEmpty());
  EXPECT_EQ(one->state(), State::kRunning);
  transfers.cancel();
  EXPECT_EQ(one->state(), State::kWaiting);
  EXPECT_EQ(contentOf(directory_ / one->partName()), "first");
}

TEST_F(QELTransfersTest, OfTwoOfOneURLOneHasThePart) {
  server_.serve("/1", HTTPTestServer::response("whole"));
  QELTransfers transfers(2, 5);
  const auto one = fetchOf("/1", "1");
  const auto again = fetchOf("/1", "2");
  transfers.add(one);
  transfers.add(again);
  EXPECT_NE(one->partName(), "");
  EXPECT_EQ(again->partName(), "");
  while (!transfers.hasEnded()) transfers.run();
  for (const auto& fetch : {one, again}) fetch->forgetPart();
  EXPECT_THAT(directory_.names(), ElementsAre("1", "2"));
  EXPECT_EQ(contentOf(directory_ / "2"), "whole");
}

}  // namespace
