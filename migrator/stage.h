#pragma once

#include <memory>
#include <string_view>

#include "platform/platform.h"

namespace migrator {

// One stage of a run: tells the run's observer, where there is one, that it began and, on every way out, that it ended.
// `name` must outlive the object. What an observer throws at the end of a stage is dropped.
class Stage {
 public:
  explicit Stage(std::string_view name) : _observer{platform::current().observer}, _name{name} {
    if (_observer) _observer->stageBegan(_name);
  }
  Stage(const Stage&) = delete;
  Stage& operator=(const Stage&) = delete;
  ~Stage() {
    try {
      if (_observer) _observer->stageEnded(_name);
    } catch (...) {
      _observer = nullptr;
    }
  }

 private:
  std::shared_ptr<platform::RunObserver> _observer;
  std::string_view _name;
};

}  // namespace migrator
