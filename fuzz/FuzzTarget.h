#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string_view>

/// One run of the target with one input. Every source whose name ends in "Fuzz" defines it once:
/// the fuzzer, and in ordinary builds the replay, call it again and again in one process.
///
/// A find is whatever ends the process: a crash, a report of a sanitizer, a limit of time or
/// memory, and an invariant that does not hold.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size);

inline std::string_view inputText(const std::uint8_t* data, std::size_t size) {
  return {reinterpret_cast<const char*>(data), size};
}

/// Ends the process, with the invariant on standard error, unless it holds.
void requireThat(bool holds, std::string_view invariant);

/// That a description is one line of text that can be shown.
void requireShowable(std::string_view description);

/// That a refusal tells its cause.
template <typename Fault>
void requireTold(const std::optional<Fault>& fault) {
  requireThat(fault.has_value(), "a refusal tells its cause");
  requireShowable(fault->description);
}
