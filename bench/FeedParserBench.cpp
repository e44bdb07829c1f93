#include <benchmark/benchmark.h>

#include <cstdint>
#include <memory>
#include <stdexcept>
#include <string>

#include "bench/SampleFeed.h"
#include "sources/FeedParser.h"

namespace {

void parseFeed(benchmark::State& state) {
  const std::string feed = sampleFeed(static_cast<int>(state.range(0)));
  for (auto _ : state) {
    const auto parser = FeedParser::parserWithFeedData(feed);
    platform::ErrorSlot error;
    if (!parser->parseWithError(error)) throw std::runtime_error("the feed was refused");
    benchmark::DoNotOptimize(parser->episodes().data());
  }
  state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(feed.size()));
  state.SetItemsProcessed(state.iterations() * state.range(0));
}
BENCHMARK(parseFeed)->Arg(10)->Arg(1'000)->Arg(10'000)->Unit(benchmark::kMillisecond);

}  // namespace
