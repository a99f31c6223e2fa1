#pragma once

#include <cstddef>
#include <string_view>

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

}  // namespace platform
