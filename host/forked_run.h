#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>

#include "platform/status.h"

namespace host {

// What a run in a child of this process may cost; what is not set is not limited.
struct RunLimits {
  std::optional<double> seconds;
  std::optional<std::uint64_t> memory;  // bytes of address space
  std::optional<std::size_t> output;    // bytes
};

// How such a run ended, and what it said.
struct ForkedRun {
  enum class Stopped : std::uint8_t { no, timeout, tooMuchOutput };  // whether this process ended it, and why

  int status = 0;  // the exit status; negative: the signal
  Stopped stopped = Stopped::no;
  std::string output;
  std::string errors;  // at most a mebibyte, the rest is left out
  double seconds = 0;
  double processorSeconds = 0;
  std::uint64_t peakMemory = 0;  // bytes
};

// Does the work in a child of this process, so that whatever becomes of it there becomes of nothing else, and waits for
// its end; the work's answer is the child's exit status. What the child still holds then is not given back, but what it
// has printed is said. The child has what this process has loaded, no input, no
// descriptor of this process, a session of its own, and it dies with this process. What is left of the session after
// it is killed. `listener` is a descriptor of a pipe for whose reader all of it is done: where that has gone, the
// child is ended and the answer is a failure, as it is where no child can be made. To be called from one thread.
[[nodiscard]] platform::Result<ForkedRun> runForked(const std::function<int()>& work, const RunLimits& limits,
                                                    std::optional<int> listener = std::nullopt);

}  // namespace host
