#include <benchmark/benchmark.h>

#include <cstddef>
#include <cstdint>
#include <stdexcept>
#include <string>
#include <string_view>

#include "bench/SamplePodcast.h"
#include "platform/plist/PropertyListReader.h"
#include "platform/plist/PropertyListWriter.h"
#include "sources/QELReferenceFilePodcastSource.h"

namespace {

void readReferenceFile(benchmark::State& state) {
  const std::string file = sampleReferenceFile(static_cast<int>(state.range(0)));
  for (auto _ : state) {
    std::optional<platform::PropertyListFault> fault;
    const auto value = platform::readPropertyList(file, fault);
    if (!value) throw std::runtime_error("the reference file was refused");
    benchmark::DoNotOptimize(value);
  }
  state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(file.size()));
  state.SetItemsProcessed(state.iterations() * state.range(0));
}
BENCHMARK(readReferenceFile)->Arg(10)->Arg(1'000)->Arg(10'000)->Unit(benchmark::kMillisecond);

void writeReferenceFile(benchmark::State& state) {
  const auto reference = sampleReference(static_cast<int>(state.range(0)));
  std::size_t size = 0;
  for (auto _ : state) {
    size = 0;
    const bool written = platform::writePropertyList(*reference, [&size](std::string_view bytes) {
      size += bytes.size();
      return true;
    });
    if (!written) throw std::runtime_error("nothing was written");
  }
  state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(size));
  state.SetItemsProcessed(state.iterations() * state.range(0));
}
BENCHMARK(writeReferenceFile)->Arg(10)->Arg(1'000)->Arg(10'000)->Unit(benchmark::kMillisecond);

/// From the dictionary to the podcast and its episodes.
void loadReference(benchmark::State& state) {
  const auto reference = sampleReference(static_cast<int>(state.range(0)));
  for (auto _ : state) {
    const auto source = QELReferenceFilePodcastSource::initWithDictionary(reference);
    platform::ErrorSlot error;
    if (!source->loadSourceWithError(error)) throw std::runtime_error("nothing was loaded");
  }
  state.SetItemsProcessed(state.iterations() * state.range(0));
}
BENCHMARK(loadReference)->Arg(1'000)->Unit(benchmark::kMillisecond);

}  // namespace
