#include "platform/process/EndingSignals.h"

#include <array>
#include <csignal>

namespace platform {
namespace {

constexpr std::array kSignals = {SIGINT, SIGTERM, SIGHUP};

volatile std::sig_atomic_t signalThatCame = 0;

void setHandler(int signal, void (*handler)(int), int flags) {
  struct sigaction action {};
  action.sa_handler = handler;
  action.sa_flags = flags;
  ::sigaction(signal, &action, nullptr);
}

}  // namespace

EndingSignals::EndingSignals() {
  signalThatCame = 0;
  for (const int signal : kSignals) {
    struct sigaction current {};
    ::sigaction(signal, nullptr, &current);
    if (current.sa_handler == SIG_IGN) continue;
    setHandler(
        signal, [](int which) { signalThatCame = which; }, static_cast<int>(SA_RESETHAND));
  }
}

EndingSignals::~EndingSignals() {
  for (const int signal : kSignals) {
    struct sigaction current {};
    ::sigaction(signal, nullptr, &current);
    if (current.sa_handler != SIG_IGN) setHandler(signal, SIG_DFL, 0);
  }
}

bool EndingSignals::hasCome() {
  return signalThatCame != 0;
}

void EndingSignals::passOn() {
  if (signalThatCame == 0) return;
  setHandler(signalThatCame, SIG_DFL, 0);
  ::raise(signalThatCame);
}

}  // namespace platform
