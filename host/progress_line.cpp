#include "host/progress_line.h"

#include <unistd.h>

namespace host {
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

ProgressLine::ProgressLine(int descriptor)
    : _descriptor{descriptor}, _isOnTerminal{::isatty(descriptor) == 1}, _next{Clock::now() + kPatience} {}

void ProgressLine::show(std::string_view text) noexcept {
  const Time now = Clock::now();
  if (!_isOnTerminal || now < _next) return;
  _next = now + kInterval;
  _isShown = true;
  try {
    put(_descriptor, std::string{kWipe} + std::string{text});
  } catch (...) {
    return;
  }
}

void ProgressLine::clear() noexcept {
  if (!_isShown) return;
  _isShown = false;
  put(_descriptor, kWipe);
}

}  // namespace host
