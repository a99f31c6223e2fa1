#include "bench/sync_meter.h"

#include <sys/syscall.h>
#include <unistd.h>

namespace {

bool isSyncing = true;
std::chrono::nanoseconds syncing{0};

}  // namespace

namespace bench {

void setSyncing(bool syncs) { isSyncing = syncs; }

std::chrono::nanoseconds timeSyncing() { return syncing; }

}  // namespace bench

extern "C" __attribute__((visibility("default"))) int fsync(int descriptor) {
  if (!isSyncing) return 0;
  const auto start = std::chrono::steady_clock::now();
  const auto result = static_cast<int>(::syscall(SYS_fsync, descriptor));
  syncing += std::chrono::steady_clock::now() - start;
  return result;
}
