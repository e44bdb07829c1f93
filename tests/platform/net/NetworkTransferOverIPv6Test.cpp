#include <gtest/gtest.h>

#include <optional>
#include <string>

#include "platform/net/ResourceReader.h"
#include "tests/support/HTTPTestServer.h"

namespace platform {
namespace {

class NetworkTransferOverIPv6Test : public testing::Test {
 protected:
  void SetUp() override {
    if (!HTTPTestServer::isToBeHad(HTTPTestServer::Family::kIPv6)) {
      GTEST_SKIP() << "there is no IPv6 here";
    }
    server_.emplace(HTTPTestServer::Family::kIPv6);
  }
  /// What the answer's body is read as; the cause of a failure.
  std::string read(const std::string& answer) {
    server_->serve("/", answer);
    ErrorSlot error;
    auto source = readResource(URL::parse(server_->url("/")).value(), error, kWholeReadLimit, 0);
    return source ? source->readAll(error).value_or("") : error->description;
  }

  std::optional<HTTPTestServer> server_;
};

TEST_F(NetworkTransferOverIPv6Test, TransfersShareAConnection) {
  for (int i = 0; i < 3; ++i) EXPECT_EQ(read(HTTPTestServer::response("x")), "x");
  EXPECT_EQ(server_->connections(), 1);
  EXPECT_TRUE(server_->requests().front().find("\r\nHost: [::1]:") != std::string::npos);
}

TEST_F(NetworkTransferOverIPv6Test, WhatLiesBehindAnAnswerIsNotTheNextOne) {
  EXPECT_EQ(read(HTTPTestServer::response("first") + HTTPTestServer::response("second")), "first");
  EXPECT_EQ(read(HTTPTestServer::response("third")), "third");
}

}  // namespace
}  // namespace platform
