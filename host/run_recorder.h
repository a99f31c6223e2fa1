#pragma once

#include <memory>

#include "host/explanation.h"
#include "host/progress_line.h"
#include "host/trace.h"
#include "records/fact_observer.h"

namespace host {

// The run's observer: keeps its facts, traces each as it is told, and shows progress. Nothing that goes wrong here
// reaches the run.
class RunRecorder final : public records::FactObserver {
 public:
  // Facts are traced, too, where `trace` is not null.
  RunRecorder(std::shared_ptr<Trace> trace, std::shared_ptr<ProgressLine> progress)
      : _trace{std::move(trace)}, _progress{std::move(progress)} {}

  void stageBegan(std::string_view stage, std::string_view words) override;
  void stageEnded(std::string_view stage) override;
  void told(const records::Fact& fact) override;
  void lostTrack() noexcept override { _explanation.loseTrack(); }
  void progressed(std::size_t done, std::size_t total) override;

  [[nodiscard]] const Explanation& explanation() const { return _explanation; }

 private:
  template <typename Action>
  void attempt(const Action& action) noexcept;

  std::shared_ptr<Trace> _trace;
  std::shared_ptr<ProgressLine> _progress;
  Explanation _explanation;
};

}  // namespace host
