#include "platform/process/EndingSignals.h"

#include <gtest/gtest.h>

#include <csignal>

namespace {

using platform::EndingSignals;

class EndingSignalsTest : public testing::Test {
 protected:
  // nohup, and shells that start something behind their back, have some of them ignored.
  void SetUp() override {
    for (const int signal : {SIGINT, SIGTERM, SIGHUP}) std::signal(signal, SIG_DFL);
  }
};

TEST_F(EndingSignalsTest, ASignalIsNotedAndPassedOn) {
  for (const int signal : {SIGINT, SIGTERM, SIGHUP}) {
    EXPECT_EXIT(
        {
          EndingSignals signals;
          if (EndingSignals::hasCome()) std::exit(1);
          std::raise(signal);
          if (!EndingSignals::hasCome()) std::exit(2);
          EndingSignals::passOn();
        },
        testing::KilledBySignal(signal), "")
        << signal;
  }
}

TEST_F(EndingSignalsTest, TheSecondOfAKindEndsTheProcess) {
  EXPECT_EXIT(
      {
        const EndingSignals signals;
        std::raise(SIGINT);
        std::raise(SIGINT);
      },
      testing::KilledBySignal(SIGINT), "");
}

TEST_F(EndingSignalsTest, NothingIsPassedOnWhenNothingCame) {
  EndingSignals signals;
  EndingSignals::passOn();
  EXPECT_FALSE(EndingSignals::hasCome());
}

TEST_F(EndingSignalsTest, AnIgnoredSignalStaysIgnored) {
  std::signal(SIGHUP, SIG_IGN);
  {
    const EndingSignals signals;
    std::raise(SIGHUP);
    EXPECT_FALSE(EndingSignals::hasCome());
  }
  EXPECT_EQ(std::signal(SIGHUP, SIG_DFL), SIG_IGN);
}

TEST_F(EndingSignalsTest, AfterwardsASignalEndsTheProcess) {
  { const EndingSignals signals; }
  EXPECT_EXIT(std::raise(SIGTERM), testing::KilledBySignal(SIGTERM), "");
}

}  // namespace
