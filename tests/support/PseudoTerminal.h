#pragma once

#include <fcntl.h>
#include <gtest/gtest.h>
#include <termios.h>

#include <array>
#include <cstddef>
#include <cstdlib>
#include <string>

#include "platform/files/FileDescriptor.h"

/// A terminal of the test's own, which passes on every byte as it is.
class PseudoTerminal {
 public:
  PseudoTerminal()
      : user_(::posix_openpt(O_RDWR | O_NOCTTY)),
        screen_(::unlockpt(user_.get()) == 0
                    ? platform::FileDescriptor::open(::ptsname(user_.get()), O_RDWR)
                    : platform::FileDescriptor()) {
    termios settings{};
    EXPECT_EQ(::tcgetattr(screen_.get(), &settings), 0);
    ::cfmakeraw(&settings);
    EXPECT_EQ(::tcsetattr(screen_.get(), TCSANOW, &settings), 0);
  }

  /// What a process has as its standard stream.
  [[nodiscard]] int screen() const { return screen_.get(); }

  /// What was written to it by now, and not seen yet: up to 4096 bytes.
  [[nodiscard]] std::string seen() const {
    std::array<char, 4096> bytes{};
    const std::ptrdiff_t count = platform::readSome(user_.get(), bytes.data(), bytes.size());
    return {bytes.data(), static_cast<std::size_t>(count > 0 ? count : 0)};
  }

 private:
  platform::FileDescriptor user_;
  platform::FileDescriptor screen_;
};
