#include "commandline/progress_line.h"

#include <unistd.h>

#include <condition_variable>
#include <string>
#include <string_view>
#include <utility>

#include "commandline/terminal.h"
#include "commandline/text.h"

namespace commandline {
namespace {

using Clock = std::chrono::steady_clock;

constexpr std::chrono::milliseconds kPatience{1000};
constexpr std::chrono::milliseconds kInterval{100};
constexpr std::string_view kWipe = "\r\x1b[K";

// What cannot be shown is not worth a word.
void put(int descriptor, std::string_view text) {
  if (::write(descriptor, text.data(), text.size()) < 0) return;
}

}  // namespace

ProgressLine::ProgressLine(int descriptor) : _descriptor{descriptor} {}

void ProgressLine::show(Progress progress) noexcept {
  if (!_drawing.joinable() && _mayBeTerminal) _mayBeTerminal = ::isatty(_descriptor) == 1;
  if (!_mayBeTerminal) return;
  try {
    const std::unique_lock lock{_mutex};
    const auto now = Clock::now();
    if (!_estimate) _estimate.emplace(now);
    _estimate->reached(std::move(progress), now);
    if (!_drawing.joinable()) _drawing = std::jthread{[this](const std::stop_token& stop) { keepUpToDate(stop); }};
  } catch (...) {
    return;  // without memory, or a thread, it stays as it is
  }
}

void ProgressLine::end() noexcept {
  _drawing.request_stop();
  if (_drawing.joinable()) _drawing.join();
  wipe();
  _estimate.reset();
}

std::unique_lock<std::mutex> ProgressLine::hide() noexcept {
  std::unique_lock lock{_mutex};
  wipe();
  return lock;
}

void ProgressLine::keepUpToDate(const std::stop_token& stop) {
  std::condition_variable_any stopped;
  std::unique_lock lock{_mutex};
  const auto waits = [&](auto time) {
    return !stopped.wait_for(lock, stop, time, [&] { return stop.stop_requested(); });
  };
  for (auto pause = kPatience; waits(pause); pause = kInterval) draw();
}

void ProgressLine::draw() {
  try {
    const auto columns = pageOn(_descriptor).columns.value_or(0);
    const std::string text = shortened(printable(_estimate->textAt(Clock::now())), columns > 1 ? columns - 1 : 1);
    put(_descriptor, std::string{kWipe} + text);
    _isShown = true;
  } catch (...) {
    return;
  }
}

void ProgressLine::wipe() noexcept {
  if (std::exchange(_isShown, false)) put(_descriptor, kWipe);
}

ProgressLine& progressLine() {
  static ProgressLine line{STDERR_FILENO};
  return line;
}

}  // namespace commandline
