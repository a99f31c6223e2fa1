#include "host/run_shares.h"

#include <algorithm>
#include <memory>
#include <utility>

#include "commandline/progress_line.h"

namespace host {
namespace {

// How long the parts of a run take beside each other, measured with 20,000 accounts: reading and loading them, a
// version step with its save, and the last save.
constexpr std::size_t kLoad = 3;
constexpr std::size_t kStep = 2;
constexpr std::size_t kSave = 2;

constexpr std::string_view kSaveStage = "save";
constexpr std::size_t kOneOf = 50;  // so few are left where the last count was told
constexpr double kCounted = 0.5;    // of a part whose accounts were all counted: they are still to be written

class ConsoleAroundProgress final : public platform::ConsoleLog {
 public:
  explicit ConsoleAroundProgress(std::shared_ptr<platform::ConsoleLog> inner) : _inner{std::move(inner)} {}
  void write(std::string_view message) override {
    const auto hidden = commandline::progressLine().hide();
    _inner->write(message);
  }

 private:
  std::shared_ptr<platform::ConsoleLog> _inner;
};

}  // namespace

std::size_t RunShares::whole() const { return kLoad + std::max(_steps, _stepsBegun) * kStep + kSave; }

void RunShares::enter(std::size_t begin, std::size_t length) {
  _begin = begin;
  _length = length;
  _done = 0;
}

void RunShares::stageBegan(std::string_view stage, std::string_view words) {
  if (!words.empty()) {
    enter(kLoad + _stepsBegun * kStep, kStep);
    ++_stepsBegun;
  } else if (stage == kSaveStage && _open.empty()) {
    enter(whole() - kSave, kSave);
  } else if (_length == 0) {
    enter(0, kLoad);
  }
  _open.emplace_back(words.empty() ? stage : words);
  _count.clear();
}

void RunShares::stageEnded() {
  if (!_open.empty()) _open.pop_back();
  _count.clear();
}

void RunShares::progressed(std::size_t done, std::size_t total) {
  const bool isNearlyAll = total - std::min(done, total) <= total / kOneOf;
  _count = ", " + (isNearlyAll ? "" : std::to_string(done) + " of ") + std::to_string(total) + " accounts";
  _done = std::max(_done, kCounted * static_cast<double>(done) / static_cast<double>(std::max<std::size_t>(total, 1)));
}

commandline::Progress RunShares::progress() const {
  const auto all = static_cast<double>(whole());
  const auto begin = static_cast<double>(_begin);
  const auto length = static_cast<double>(_length);
  std::string what = _open.empty() ? std::string{} : _open.back();
  if (_open.size() > 1 && what == kSaveStage) what += " within " + _open[_open.size() - 2];
  return {.what = what + _count, .share = (begin + length * _done) / all, .upTo = (begin + length) / all};
}

void putConsoleAroundProgress(platform::Platform& platform) {
  platform.console = std::make_shared<ConsoleAroundProgress>(std::move(platform.console));
}

}  // namespace host
