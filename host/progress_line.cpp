#include "host/progress_line.h"

#include <unistd.h>

#include <string>
#include <utility>

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

class WipingConsoleLog final : public platform::ConsoleLog {
 public:
  WipingConsoleLog(std::shared_ptr<platform::ConsoleLog> inner, std::shared_ptr<ProgressLine> progress)
      : _inner{std::move(inner)}, _progress{std::move(progress)} {}
  void write(std::string_view message) override {
    _progress->clear();
    _inner->write(message);
  }

 private:
  std::shared_ptr<platform::ConsoleLog> _inner;
  std::shared_ptr<ProgressLine> _progress;
};

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

void putConsoleInFrontOf(const std::shared_ptr<ProgressLine>& progress, platform::Platform& platform) {
  if (!progress->isOnTerminal()) return;
  platform.console = std::make_shared<WipingConsoleLog>(std::move(platform.console), progress);
}

}  // namespace host
