#pragma once

#include <string_view>

namespace platform {

// Is told of each stage of a migration run as it begins and ends. Silent by default: nothing is computed for an
// observer that is not there.
class RunObserver {
 public:
  virtual ~RunObserver() = default;
  virtual void stageBegan(std::string_view stage) = 0;
  virtual void stageEnded(std::string_view stage) = 0;
};

}  // namespace platform
