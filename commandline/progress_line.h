#pragma once

#include <atomic>
#include <mutex>
#include <optional>
#include <thread>

#include "commandline/progress_estimate.h"

namespace commandline {

// One line on a terminal that says how far a long piece of work is, written over again and again, also while the work
// itself has nothing to report. Nothing is shown in the first second, nor where the descriptor is no terminal.
class ProgressLine {
 public:
  explicit ProgressLine(int descriptor);
  ProgressLine(const ProgressLine&) = delete;
  ProgressLine& operator=(const ProgressLine&) = delete;
  ~ProgressLine() { end(); }

  // From the first call to `end`, the line is kept up to date.
  void show(Progress progress) noexcept;
  // Takes the line away. What is shown next is another piece of work.
  void end() noexcept;
  // Takes the line away for as long as the answer lives, for something else to be written.
  [[nodiscard]] std::unique_lock<std::mutex> hide() noexcept;

 private:
  void keepUpToDate(const std::stop_token& stop);
  void draw();
  void wipe() noexcept;

  int _descriptor;
  std::atomic<bool> _mayBeTerminal = true;  // no line is drawn once it is known to be none
  std::mutex _mutex;                        // of all below, and of the terminal's last line
  bool _isShown = false;
  std::optional<ProgressEstimate> _estimate;  // none before the first call
  std::jthread _drawing;
};

// The process's own, on standard error. What this folder says there is said around it.
[[nodiscard]] ProgressLine& progressLine();

}  // namespace commandline
