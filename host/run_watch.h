#pragma once

#include <memory>
#include <optional>

#include "host/explanation.h"
#include "host/progress_line.h"
#include "host/trace.h"
#include "platform/platform.h"
#include "platform/status.h"

namespace host {

// The run's observer: keeps what is to be explained, traces each fact as it is told, and shows progress. Nothing that
// goes wrong here reaches the run.
class RunWatch final : public platform::RunObserver {
 public:
  // Facts are kept, and traced where `trace` is not null, only where the run is to be explained.
  RunWatch(std::shared_ptr<Trace> trace, bool isExplained, std::shared_ptr<ProgressLine> progress)
      : _trace{std::move(trace)}, _isExplained{isExplained}, _progress{std::move(progress)} {}

  void stageBegan(std::string_view stage) override;
  void stageEnded(std::string_view stage) override;
  [[nodiscard]] bool wantsFacts() const override { return _isExplained; }
  void told(const platform::RunFact& fact) override;
  void saveBegan() override { _hasLastSaveFailed = true; }
  void saveEnded(const platform::Status& status) override { _hasLastSaveFailed = !status.isOk(); }
  void progressed(std::size_t done, std::size_t total) override;

  // Whether there was a save and the last one came to nothing, whatever ended it.
  [[nodiscard]] bool hasLastSaveFailed() const { return _hasLastSaveFailed; }
  [[nodiscard]] const Explanation& explanation() const { return _explanation; }

 private:
  template <typename Action>
  void attempt(const Action& action) noexcept;

  std::shared_ptr<Trace> _trace;
  bool _isExplained;
  bool _hasLastSaveFailed = false;
  std::shared_ptr<ProgressLine> _progress;
  Explanation _explanation;
};

// Keeps the progress line out of the way of the console's messages.
void putConsoleInFrontOf(const std::shared_ptr<ProgressLine>& progress, platform::Platform& platform);

}  // namespace host
