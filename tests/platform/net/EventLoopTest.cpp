#include "platform/net/EventLoop.h"

#include <gtest/gtest.h>
#include <sys/resource.h>

#include <chrono>
#include <cstdio>
#include <string>
#include <thread>

#include "platform/net/Download.h"
#include "tests/support/HTTPTestServer.h"

namespace platform {
namespace {

using Connection = HTTPTestServer::Connection;

class Counter : public DownloadReceiver {
 public:
  int responses = 0;
  bool finished = false;
  bool failed = false;

  void didReceiveResponse(Download&, std::int64_t) override { ++responses; }
  void downloadDidFinish(Download&) override { finished = true; }
  void didFailWithError(Download&, const ErrorRecord&) override { failed = true; }
};

class EventLoopTest : public ::testing::Test {
 protected:
  ~EventLoopTest() override {
    std::remove(path("1").c_str());
    std::remove(path("2").c_str());
  }
  static std::string path(const char* name) {
    return ::testing::TempDir() + "EventLoopTest." + name;
  }

  HTTPTestServer server_;
};

TEST_F(EventLoopTest, HasNothingToWaitForWithoutADownload) {
  EXPECT_FALSE(runEventLoopOnce());
}

TEST_F(EventLoopTest, SourceThatNothingCanHappenToEndsTheWait) {
  class Idle : public EventSource {
   public:
    bool hasEvent() const override { return false; }
    void deliverEvent() override { ADD_FAILURE(); }
  };
  const Idle idle;
  EXPECT_FALSE(runEventLoopOnce());
}

TEST_F(EventLoopTest, EachRunDeliversAnEvent) {
  server_.serve("/a", HTTPTestServer::response(""));
  Counter counter;
  const Download download(*URL::parse(server_.url("/a")), path("1"), counter);
  EXPECT_TRUE(runEventLoopOnce());
  EXPECT_EQ(counter.responses, 1);
  EXPECT_FALSE(counter.finished);
  EXPECT_TRUE(runEventLoopOnce());
  EXPECT_TRUE(counter.finished);
  EXPECT_FALSE(runEventLoopOnce());
}

TEST_F(EventLoopTest, WaitsWithoutUsingTheProcessor) {
  server_.serve("/slow", [](Connection& connection) {
    std::this_thread::sleep_for(std::chrono::milliseconds(500));
    connection.send(HTTPTestServer::response("media"));
  });
  Counter counter;
  const Download download(*URL::parse(server_.url("/slow")), path("1"), counter);
  const auto usedMicroseconds = [] {
    rusage usage{};
    getrusage(RUSAGE_THREAD, &usage);
    return (usage.ru_utime.tv_sec + usage.ru_stime.tv_sec) * 1'000'000 + usage.ru_utime.tv_usec +
           usage.ru_stime.tv_usec;
  };
  const auto before = usedMicroseconds();
  while (!counter.finished) ASSERT_TRUE(runEventLoopOnce());
  EXPECT_LT(usedMicroseconds() - before, 100'000);
}

TEST_F(EventLoopTest, ServesSeveralDownloads) {
  server_.serve("/1", HTTPTestServer::response("one"));
  server_.serve("/2", HTTPTestServer::response("two"));
  Counter first;
  Counter second;
  const Download one(*URL::parse(server_.url("/1")), path("1"), first);
  const Download two(*URL::parse(server_.url("/2")), path("2"), second);
  while (runEventLoopOnce()) continue;
  EXPECT_TRUE(first.finished);
  EXPECT_TRUE(second.finished);
}

TEST_F(EventLoopTest, EveryThreadHasItsOwn) {
  server_.serve("/1", HTTPTestServer::response("one"));
  Counter counter;
  const Download download(*URL::parse(server_.url("/1")), path("1"), counter);
  std::thread([] { EXPECT_FALSE(runEventLoopOnce()); }).join();
  while (runEventLoopOnce()) continue;
  EXPECT_TRUE(counter.finished);
}

}  // namespace
}  // namespace platform
