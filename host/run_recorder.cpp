#include "host/run_recorder.h"

#include <string>

namespace host {

template <typename Action>
void RunRecorder::attempt(const Action& action) noexcept {
  try {
    action();
  } catch (...) {
    _explanation.loseTrack();
  }
}

void RunRecorder::stageBegan(std::string_view stage, std::string_view words) {
  attempt([&] {
    _explanation.began(stage, words);
    _progress->show(words.empty() ? stage : words);
  });
}

void RunRecorder::stageEnded(std::string_view /*stage*/) {
  attempt([&] { _explanation.ended(); });
}

void RunRecorder::told(const records::Fact& fact) {
  attempt([&] {
    if (_trace) _trace->fact(_explanation.stage(), _explanation.outerStage(), fact);
    _explanation.add(fact);
  });
}

void RunRecorder::progressed(std::size_t done, std::size_t total) {
  attempt([&] {
    _progress->show(std::string{_explanation.stage()} + ": " + std::to_string(done) + " of " + std::to_string(total) +
                    " accounts");
  });
}

}  // namespace host
