#include "bench/measurement.h"

#include <sys/resource.h>

#include <cstdio>

#include "bench/sync_meter.h"

namespace bench {

Measurement::Measurement() : _start{std::chrono::steady_clock::now()} {}

void Measurement::print() const {
  const auto whole = std::chrono::nanoseconds{std::chrono::steady_clock::now() - _start};
  rusage usage{};
  ::getrusage(RUSAGE_SELF, &usage);
  std::printf(R"({"seconds": %.9f, "syncSeconds": %.9f, "peakKiB": %ld})"
              "\n",
              static_cast<double>(whole.count()) / 1e9, static_cast<double>(timeSyncing().count()) / 1e9,
              usage.ru_maxrss);
}

}  // namespace bench
