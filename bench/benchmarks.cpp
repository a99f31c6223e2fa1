// The pieces of a run with Google Benchmark, at two numbers of accounts; single operations on the store also at many
// accounts, of which every tenth has none, two or twenty children.
#include <benchmark/benchmark.h>

#include <string_view>

#include "bench/pieces.h"
#include "platform/linux/linux_platform.h"

namespace {

void measure(benchmark::State& state, const bench::Piece& piece) {
  const auto accounts = static_cast<std::size_t>(state.range(0));
  const auto children = static_cast<std::size_t>(state.range(1));
  for ([[maybe_unused]] auto each : state) {
    state.PauseTiming();
    {
      const std::function<void()> action = piece.prepare({.accounts = accounts, .children = children});
      state.ResumeTiming();
      action();
      state.PauseTiming();
    }
    state.ResumeTiming();
  }
  state.SetItemsProcessed(state.iterations() * state.range(0));
}

// What every line costs on a device, where nobody reads it, beyond the log of the pieces.
void askTheDevicesLog(benchmark::State& state) {
  const auto log = platform::makeLinuxPlatform().systemLog;
  for ([[maybe_unused]] auto each : state) benchmark::DoNotOptimize(log->hasReaders());
}

bool isSingleOperation(std::string_view name) {
  return name == "look-up" || name == "insert" || name == "update" || name == "remove";
}

}  // namespace

int main(int count, char** arguments) {
  // Preparing many accounts takes far longer than one operation on them, so they are few.
  constexpr benchmark::IterationCount kFewIterations = 5;
  for (const bench::Piece& piece : bench::pieces()) {
    const auto function = [&piece](benchmark::State& state) { measure(state, piece); };
    auto* const registered = benchmark::RegisterBenchmark(piece.name, function)->Unit(benchmark::kMicrosecond);
    registered->Args({100, 2})->Args({1000, 2});
    if (!isSingleOperation(piece.name)) continue;
    auto* const withMany = benchmark::RegisterBenchmark(piece.name, function)->Unit(benchmark::kMicrosecond);
    withMany->Args({10000, 0})->Args({10000, 2})->Args({10000, 20})->Iterations(kFewIterations);
  }
  benchmark::RegisterBenchmark("the device's log", &askTheDevicesLog);
  benchmark::Initialize(&count, arguments);
  if (benchmark::ReportUnrecognizedArguments(count, arguments)) return 1;
  benchmark::RunSpecifiedBenchmarks();
}
