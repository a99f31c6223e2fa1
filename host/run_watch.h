#pragma once

#include <memory>
#include <optional>

#include "host/explanation.h"
#include "host/progress_line.h"
#include "host/trace.h"
#include "platform/platform.h"
#include "records/fact_observer.h"

namespace host {

// The run's observer: keeps what is to be explained, traces each fact as it is told, and shows progress. Nothing that
// goes wrong here reaches the run.
class RunWatch final : public records::FactObserver {
 public:
  // Facts are traced, too, where `trace` is not null.
  RunWatch(std::shared_ptr<Trace> trace, std::shared_ptr<ProgressLine> progress)
      : _trace{std::move(trace)}, _progress{std::move(progress)} {}

  void stageBegan(std::string_view stage, std::string_view words) override;
  void stageEnded(std::string_view stage) override;
  void told(const records::RunFact& fact) override;
  void progressed(std::size_t done, std::size_t total) override;

  [[nodiscard]] const Explanation& explanation() const { return _explanation; }

 private:
  template <typename Action>
  void attempt(const Action& action) noexcept;

  std::shared_ptr<Trace> _trace;
  std::shared_ptr<ProgressLine> _progress;
  Explanation _explanation;
};

// Keeps the progress line out of the way of the console's messages.
void putConsoleInFrontOf(const std::shared_ptr<ProgressLine>& progress, platform::Platform& platform);

}  // namespace host
