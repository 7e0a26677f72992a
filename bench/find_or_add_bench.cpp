// Find-or-add of file entries under one folder: adding N distinct names, then looking up N
// existing ones. The time per call should stay flat as N grows.
#include <benchmark/benchmark.h>
#include <fmt/format.h>

#include <algorithm>
#include <memory>
#include <numeric>
#include <random>
#include <string>
#include <vector>

#include "schema/schema.h"

namespace trl {
namespace {

struct Names {
  std::vector<std::string> texts;
  std::vector<std::string> encoded;
};

Names MakeNames(size_t count, const Schema& schema) {
  Names names;
  names.texts.reserve(count);
  names.encoded.reserve(count);
  for (size_t i = 0; i < count; ++i) {
    names.texts.push_back(fmt::format("File{:06}.DLL", i));
    names.encoded.push_back(schema.EncodeName(names.texts.back()));
  }
  return names;
}

void ReportPerCall(benchmark::State& state, size_t callsPerIteration) {
  const auto calls = static_cast<double>(callsPerIteration * state.iterations());
  state.SetItemsProcessed(static_cast<int64_t>(calls));
  state.counters["per_call"] =
      benchmark::Counter(calls, benchmark::Counter::kIsRate | benchmark::Counter::kInvert);
}

void AddDistinct(benchmark::State& state) {
  const auto count = static_cast<size_t>(state.range(0));
  Schema schema(std::vector<std::string>{});
  const Names names = MakeNames(count, schema);
  for (auto _ : state) {
    state.PauseTiming();
    auto document = std::make_unique<xml::Document>();
    document->LoadXml("<d/>");
    xml::Node folder = document->DocumentElement();
    int32_t counter = 0;
    state.ResumeTiming();
    for (size_t i = 0; i < count; ++i) {
      benchmark::DoNotOptimize(
          schema.AddFileEntry(names.texts[i], names.encoded[i], folder, counter));
    }
    state.PauseTiming();
    document.reset();
    state.ResumeTiming();
  }
  ReportPerCall(state, count);
}

// Looks up N existing names, in insertion order or shuffled (so that consecutive calls do not
// touch neighbouring entries and every call pays the memory latency of a large index).
void FindExisting(benchmark::State& state, bool shuffled) {
  const auto count = static_cast<size_t>(state.range(0));
  Schema schema(std::vector<std::string>{});
  const Names names = MakeNames(count, schema);
  xml::Document document;
  document.LoadXml("<d/>");
  xml::Node folder = document.DocumentElement();
  int32_t counter = 0;
  for (size_t i = 0; i < count; ++i) {
    schema.AddFileEntry(names.texts[i], names.encoded[i], folder, counter);
  }
  std::vector<size_t> order(count);
  std::iota(order.begin(), order.end(), size_t{0});
  if (shuffled) std::shuffle(order.begin(), order.end(), std::mt19937(42));
  for (auto _ : state) {
    for (size_t i : order) {
      benchmark::DoNotOptimize(
          schema.AddFileEntry(names.texts[i], names.encoded[i], folder, counter));
    }
  }
  if (counter != static_cast<int32_t>(count)) state.SkipWithError("a lookup added an entry");
  ReportPerCall(state, count);
}

void FindInOrder(benchmark::State& state) { FindExisting(state, false); }
void FindShuffled(benchmark::State& state) { FindExisting(state, true); }

BENCHMARK(AddDistinct)->Arg(10'000)->Arg(100'000)->Arg(1'000'000)->Unit(benchmark::kMillisecond);
BENCHMARK(FindInOrder)->Arg(10'000)->Arg(100'000)->Arg(1'000'000)->Unit(benchmark::kMillisecond);
BENCHMARK(FindShuffled)->Arg(10'000)->Arg(100'000)->Arg(1'000'000)->Unit(benchmark::kMillisecond);

}  // namespace
}  // namespace trl
