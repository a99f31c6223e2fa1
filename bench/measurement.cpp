#include "bench/measurement.h"

#include <sys/resource.h>

#include <cstdio>
#include <ctime>

#include "bench/sync_meter.h"

namespace bench {

namespace {

double seconds(std::chrono::nanoseconds time) { return std::chrono::duration<double>{time}.count(); }

std::chrono::nanoseconds processorTime() {
  timespec time{};
  ::clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &time);
  return std::chrono::seconds{time.tv_sec} + std::chrono::nanoseconds{time.tv_nsec};
}

}  // namespace

Measurement::Measurement() : _start{std::chrono::steady_clock::now()}, _processorStart{processorTime()} {}

void Measurement::print() const {
  const std::chrono::nanoseconds whole = std::chrono::steady_clock::now() - _start;
  rusage usage{};
  ::getrusage(RUSAGE_SELF, &usage);
  std::printf(R"({"seconds": %.9f, "processorSeconds": %.9f, "syncSeconds": %.9f, "peakKiB": %ld})"
              "\n",
              seconds(whole), seconds(processorTime() - _processorStart), seconds(timeSyncing()), usage.ru_maxrss);
}

}  // namespace bench
