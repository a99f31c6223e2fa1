#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

#include "commandline/progress_estimate.h"
#include "platform/platform.h"

namespace host {

// Which share of a run is done, as far as its stages tell: how long each takes beside the others is roughly the same on
// every device.
class RunShares {
 public:
  // How many version steps the run has to take.
  void expect(std::size_t steps) { _steps = steps; }

  void stageBegan(std::string_view stage, std::string_view words);
  void stageEnded();
  void progressed(std::size_t done, std::size_t total);

  [[nodiscard]] commandline::Progress progress() const;

 private:
  [[nodiscard]] std::size_t whole() const;
  void enter(std::size_t begin, std::size_t length);

  std::size_t _steps = 0;
  std::size_t _stepsBegun = 0;
  std::vector<std::string> _open;  // the stages that began and did not end, as people read them
  std::string _count;              // of the accounts; empty where the stage has told none
  std::size_t _begin = 0;          // of the present part
  std::size_t _length = 0;
  double _done = 0;  // of the present part, from 0 to 1
};

// Keeps the process's progress line out of the way of the console's messages.
void putConsoleAroundProgress(platform::Platform& platform);

}  // namespace host
