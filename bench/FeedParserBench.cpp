#include <benchmark/benchmark.h>

#include <cstdint>
#include <memory>
#include <stdexcept>
#include <string>
#include <string_view>

#include "bench/SampleFeed.h"
#include "platform/xml/XMLParser.h"
#include "sources/FeedParser.h"

namespace {

struct NoEvents : platform::XMLParserEvents {
  void didStartElement(const platform::XMLName&, const platform::XMLAttributes&) override {}
  void didEndElement(const platform::XMLName&) override {}
  void foundCharacters(std::string_view) override {}
};

/// The part of parsing a feed that is XML and nothing else: what no feed parser can go below.
void parseXMLOnly(benchmark::State& state) {
  const std::string feed = sampleFeed(static_cast<int>(state.range(0)));
  for (auto _ : state) {
    NoEvents events;
    platform::XMLParser parser(feed, events);
    std::optional<platform::XMLFault> fault;
    if (!parser.parse(fault)) throw std::runtime_error("the feed was refused");
  }
  state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(feed.size()));
  state.SetItemsProcessed(state.iterations() * state.range(0));
}
BENCHMARK(parseXMLOnly)->Arg(10)->Arg(1'000)->Arg(10'000)->Unit(benchmark::kMillisecond);

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
