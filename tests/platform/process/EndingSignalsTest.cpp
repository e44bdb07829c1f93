#include "platform/process/EndingSignals.h"

#include <gtest/gtest.h>

#include <csignal>

namespace {

using platform::EndingSignals;

TEST(EndingSignalsTest, ASignalIsNotedAndPassedOn) {
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

TEST(EndingSignalsTest, TheSecondOfAKindEndsTheProcess) {
  EXPECT_EXIT(
      {
        const EndingSignals signals;
        std::raise(SIGINT);
        std::raise(SIGINT);
      },
      testing::KilledBySignal(SIGINT), "");
}

TEST(EndingSignalsTest, NothingIsPassedOnWhenNothingCame) {
  EndingSignals signals;
  EndingSignals::passOn();
  EXPECT_FALSE(EndingSignals::hasCome());
}

TEST(EndingSignalsTest, AnIgnoredSignalStaysIgnored) {
  std::signal(SIGHUP, SIG_IGN);
  {
    const EndingSignals signals;
    std::raise(SIGHUP);
    EXPECT_FALSE(EndingSignals::hasCome());
  }
  EXPECT_EQ(std::signal(SIGHUP, SIG_DFL), SIG_IGN);
}

TEST(EndingSignalsTest, AfterwardsASignalEndsTheProcess) {
  { const EndingSignals signals; }
  EXPECT_EXIT(std::raise(SIGTERM), testing::KilledBySignal(SIGTERM), "");
}

}  // namespace
