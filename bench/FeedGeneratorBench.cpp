#include <benchmark/benchmark.h>

#include <cstddef>
#include <cstdint>
#include <stdexcept>

#include "bench/SamplePodcast.h"
#include "generators/QELFeedPodcastGenerator.h"

namespace {

void writeFeed(benchmark::State& state) {
  const auto podcast = samplePodcast(static_cast<int>(state.range(0)));
  std::size_t size = 0;
  for (auto _ : state) {
    QELFeedPodcastGenerator generator;
    platform::ErrorSlot error;
    if (!generator.generateFromSource(*podcast, error)) {
      throw std::runtime_error("no feed was made");
    }
    size = generator.xmlData()->size();
  }
  state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(size));
  state.SetItemsProcessed(state.iterations() * state.range(0));
}
BENCHMARK(writeFeed)->Arg(10)->Arg(1'000)->Arg(10'000)->Unit(benchmark::kMillisecond);

}  // namespace
