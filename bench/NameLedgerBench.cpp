#include <benchmark/benchmark.h>

#include <cstdint>
#include <string>

#include "generators/QELNameLedger.h"

namespace {

void reserveOneName(benchmark::State& state) {
  for (auto _ : state) {
    QELNameLedger ledger;
    for (std::int64_t episode = 0; episode < state.range(0); ++episode) {
      benchmark::DoNotOptimize(ledger.reserve("walk"));
    }
  }
  state.SetItemsProcessed(state.iterations() * state.range(0));
}
BENCHMARK(reserveOneName)->Arg(1'000)->Arg(100'000)->Unit(benchmark::kMillisecond);

void reserveManyNames(benchmark::State& state) {
  for (auto _ : state) {
    QELNameLedger ledger;
    for (std::int64_t episode = 0; episode < state.range(0); ++episode) {
      benchmark::DoNotOptimize(ledger.reserve("walk-" + std::to_string(episode)));
    }
  }
  state.SetItemsProcessed(state.iterations() * state.range(0));
}
BENCHMARK(reserveManyNames)->Arg(1'000)->Arg(100'000)->Unit(benchmark::kMillisecond);

}  // namespace
