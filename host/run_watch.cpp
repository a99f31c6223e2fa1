#include "host/run_watch.h"

#include <string>
#include <utility>

namespace host {
namespace {

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

template <typename Action>
void RunWatch::attempt(const Action& action) noexcept {
  try {
    action();
  } catch (...) {
    _explanation.loseTrack();
  }
}

void RunWatch::stageBegan(std::string_view stage, std::string_view words) {
  attempt([&] {
    _explanation.began(stage, words);
    _progress->show(stage);
  });
}

void RunWatch::stageEnded(std::string_view /*stage*/) {
  attempt([&] { _explanation.ended(); });
}

void RunWatch::told(const records::RunFact& fact) {
  attempt([&] {
    if (_trace) _trace->step(_explanation.stage(), _explanation.outerStage(), fact);
    _explanation.add(fact);
  });
}

void RunWatch::progressed(std::size_t done, std::size_t total) {
  attempt([&] {
    _progress->show(std::string{_explanation.stage()} + ": " + std::to_string(done) + " of " + std::to_string(total) +
                    " accounts");
  });
}

void putConsoleInFrontOf(const std::shared_ptr<ProgressLine>& progress, platform::Platform& platform) {
  if (!progress->isOnTerminal()) return;
  platform.console = std::make_shared<WipingConsoleLog>(std::move(platform.console), progress);
}

}  // namespace host
