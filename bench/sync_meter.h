#pragma once

#include <chrono>

namespace bench {

// A program that links this waits for stable storage only where it is told to, and knows how long that took: its own
// `fsync` stands before the system's. It is the same for a program of ours and for the floor.
void setSyncing(bool syncs);
[[nodiscard]] std::chrono::nanoseconds timeSyncing();

}  // namespace bench
