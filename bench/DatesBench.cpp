#include <benchmark/benchmark.h>

#include <chrono>

#include "dates/RFC822Parsing.h"
#include "platform/plist/PropertyListDate.h"
#include "platform/time/DateFormatter.h"
#include "platform/time/PointInTime.h"

namespace {

using platform::PointInTime;

void readDate(benchmark::State& state, const char* text) {
  for (auto _ : state) benchmark::DoNotOptimize(dateWithRFC822String(text));
  state.SetItemsProcessed(state.iterations());
}
BENCHMARK_CAPTURE(readDate, offset, "Thu, 01 Jan 2026 06:00:00 +0200");
BENCHMARK_CAPTURE(readDate, gmt, "Thu, 01 Jan 2026 06:00:00 GMT");
BENCHMARK_CAPTURE(readDate, region, "Wed, 01 Jul 2026 06:00:00 PDT");
BENCHMARK_CAPTURE(readDate, unknownZone, "Wed, 01 Jul 2026 06:00:00 Europe/Berlin");

void writeDate(benchmark::State& state) {
  const platform::DateFormatter formatter("EEE, dd MMM yyyy HH:mm:ss ZZZZ");
  PointInTime date{};
  for (auto _ : state) {
    benchmark::DoNotOptimize(formatter.format(date));
    date += std::chrono::hours(7);
  }
  state.SetItemsProcessed(state.iterations());
}
BENCHMARK(writeDate);

void readPropertyListDate(benchmark::State& state) {
  for (auto _ : state) {
    benchmark::DoNotOptimize(platform::dateFromPropertyListText("2026-01-01T06:00:00Z"));
  }
  state.SetItemsProcessed(state.iterations());
}
BENCHMARK(readPropertyListDate);

}  // namespace
