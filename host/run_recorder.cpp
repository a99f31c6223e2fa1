#include "host/run_recorder.h"

#include "commandline/progress_line.h"

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
    _shares.stageBegan(stage, words);
    commandline::progressLine().show(_shares.progress());
  });
}

void RunRecorder::stageEnded(std::string_view /*stage*/) {
  attempt([&] {
    _explanation.ended();
    _shares.stageEnded();
  });
}

void RunRecorder::told(const records::Fact& fact) {
  attempt([&] {
    if (_trace) _trace->fact(_explanation.stage(), _explanation.outerStage(), fact);
    _explanation.add(fact);
  });
}

void RunRecorder::progressed(std::size_t done, std::size_t total) {
  attempt([&] {
    _shares.progressed(done, total);
    commandline::progressLine().show(_shares.progress());
  });
}

}  // namespace host
