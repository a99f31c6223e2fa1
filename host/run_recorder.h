#pragma once

#include <memory>

#include "host/explanation.h"
#include "host/run_shares.h"
#include "host/trace.h"
#include "records/fact_observer.h"

namespace host {

// The run's observer: keeps its facts, traces each as it is told, and shows progress. Nothing that goes wrong here
// reaches the run.
class RunRecorder final : public records::FactObserver {
 public:
  // Facts are traced, too, where `trace` is not null.
  explicit RunRecorder(std::shared_ptr<Trace> trace) : _trace{std::move(trace)} {}
  // How many version steps the run has to take, for its progress.
  void expect(std::size_t steps) { _shares.expect(steps); }

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
  RunShares _shares;
  Explanation _explanation;
};

}  // namespace host
