// What a run costs for each byte of its settings file: a few accounts, many times in one file, are migrated or refused
// in the time and the memory that a file of that size may take. An input that costs more for each byte than any before
// it is new to the engine, as if it reached another line, so that it climbs.
#include <malloc.h>
#include <time.h>

#include <algorithm>
#include <bit>
#include <cstdlib>
#include <new>

#include "fuzz/fuzzed_device.h"
#include "fuzz/require.h"
#include "migrator/accounts_data_migrator.h"

namespace {

using fuzz::FuzzedDevice;
using fuzz::require;

std::size_t liveBytes = 0;
std::size_t mostBytes = 0;

// Where the engine looks for what else than lines and branches an input reached: a counter for each power of two.
__attribute__((section("__libfuzzer_extra_counters"))) std::uint8_t reachedCosts[2][64];

double processorSeconds() {
  timespec time{};
  ::clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &time);
  return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_nsec) / 1e9;
}

// The most that any device has to bear.
constexpr double kSecondsAtMost = SECONDS_AT_MOST;
constexpr std::size_t kBytesAtMost = std::size_t{64} << 20U;
constexpr std::size_t kBytesForEachByte = 2'000;

void reach(std::uint8_t (&costs)[64], std::size_t cost) { costs[std::bit_width(cost) % 64] = 1; }

}  // namespace

void* operator new(std::size_t size) {
  void* const memory = std::malloc(size);
  if (memory == nullptr) throw std::bad_alloc{};
  liveBytes += ::malloc_usable_size(memory);
  mostBytes = std::max(mostBytes, liveBytes);
  return memory;
}

void operator delete(void* memory) noexcept {
  if (memory != nullptr) liveBytes -= ::malloc_usable_size(memory);
  std::free(memory);
}

void operator delete(void* memory, std::size_t) noexcept { ::operator delete(memory); }

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static FuzzedDevice device;
  fuzz::Input input{data, size};
  device.fillWithCopies(input);
  const std::size_t fileSize = device.settingsBytes().value_or(tests::Bytes{}).size();
  const std::size_t bytesBefore = liveBytes;
  const double began = processorSeconds();
  mostBytes = liveBytes;
  static_cast<void>(migrator::AccountsDataMigrator{}.performMigration());
  const double seconds = processorSeconds() - began;
  const std::size_t bytes = mostBytes - bytesBefore;
  reach(reachedCosts[0], bytes / (fileSize + 1));
  reach(reachedCosts[1], static_cast<std::size_t>(seconds * 1e9) / (fileSize + 1));
  require(seconds < kSecondsAtMost, std::to_string(seconds) + " seconds for " + std::to_string(fileSize) + " bytes");
  require(bytes < kBytesAtMost + kBytesForEachByte * fileSize,
          std::to_string(bytes) + " bytes of memory for " + std::to_string(fileSize) + " bytes");
  return 0;
}
