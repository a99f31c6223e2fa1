#pragma once

#include <chrono>

namespace bench {

// Measures from its making on and prints, as one JSON object, the time, how much of it was the processor's own and how
// much went by waiting for stable storage, and the process's largest memory.
class Measurement {
 public:
  Measurement();
  void print() const;

 private:
  std::chrono::steady_clock::time_point _start;
  std::chrono::nanoseconds _processorStart;
};

}  // namespace bench
