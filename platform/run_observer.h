#pragma once

#include <cstddef>
#include <memory>
#include <string_view>
#include <utility>

#include "platform/platform.h"

namespace platform {

// Is told of each stage of a migration run as it begins and ends, stages within stages included. Where there is no
// observer, nothing is computed for it.
class RunObserver {
 public:
  virtual ~RunObserver() = default;
  // `words` say what the stage does, where its name says too little for people; may be empty.
  virtual void stageBegan(std::string_view stage, std::string_view words) = 0;
  virtual void stageEnded(std::string_view stage) = 0;

  // How many of its records the present stage is done with; told every few hundred of them.
  virtual void progressed(std::size_t /*done*/, std::size_t /*total*/) {}
};

// One stage of a run: tells the run's observer, where there is one, that it began and, on every way out, that it ended.
// `name` must outlive the object; `words` need not. What an observer throws at the end of a stage is dropped.
class RunStage {
 public:
  explicit RunStage(std::string_view name, std::string_view words = {}) : _observer{current().observer}, _name{name} {
    if (_observer) _observer->stageBegan(_name, words);
  }
  RunStage(const RunStage&) = delete;
  RunStage& operator=(const RunStage&) = delete;
  ~RunStage() {
    try {
      if (_observer) _observer->stageEnded(_name);
    } catch (...) {
      _observer = nullptr;
    }
  }

 private:
  std::shared_ptr<RunObserver> _observer;
  std::string_view _name;
};

// Counts the records that a stage is done with.
class RunProgress {
 public:
  explicit RunProgress(std::size_t total) : _observer{current().observer}, _total{total} {}
  void next() {
    ++_done;
    if (_observer && _done % kRecordsBetween == 0) _observer->progressed(_done, _total);
  }

 private:
  static constexpr std::size_t kRecordsBetween = 256;

  std::shared_ptr<RunObserver> _observer;
  std::size_t _done = 0;
  std::size_t _total;
};

}  // namespace platform
