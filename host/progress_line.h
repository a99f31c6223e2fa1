#pragma once

#include <chrono>
#include <memory>
#include <string_view>

#include "platform/platform.h"

namespace host {

// One line on a terminal that says where a long run is, written over again and again. Nothing is shown in the first
// second, nor more often than ten times in one, nor where the descriptor is no terminal.
class ProgressLine {
 public:
  explicit ProgressLine(int descriptor);

  // Shows the text in place of what is shown, when it is time to.
  void show(std::string_view text) noexcept;
  // Takes the line away, for something else to be written.
  void clear() noexcept;
  [[nodiscard]] bool isOnTerminal() const { return _isOnTerminal; }

 private:
  using Time = std::chrono::steady_clock::time_point;

  int _descriptor;
  bool _isOnTerminal;
  bool _isShown = false;
  Time _next;  // when to show something again
};

// Keeps the progress line out of the way of the console's messages.
void putConsoleInFrontOf(const std::shared_ptr<ProgressLine>& progress, platform::Platform& platform);

}  // namespace host
