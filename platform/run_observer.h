#pragma once

#include <cstddef>
#include <string_view>

namespace platform {

struct RunFact;
class Status;

// Is told of each stage of a migration run as it begins and ends, stages within stages included, and of what each did.
// Silent by default: nothing is computed for an observer that is not there, and no fact for one that wants none.
class RunObserver {
 public:
  virtual ~RunObserver() = default;
  virtual void stageBegan(std::string_view stage) = 0;
  virtual void stageEnded(std::string_view stage) = 0;

  // Whether `told` is to be called; asked before a fact is computed.
  [[nodiscard]] virtual bool wantsFacts() const { return false; }
  // One fact of the stage that began last and has not ended, in the order in which they are found out.
  virtual void told(const RunFact& /*fact*/) {}
  // An attempt to save begins, and ends; one that an exception ends is not told to end.
  virtual void saveBegan() {}
  virtual void saveEnded(const Status& /*status*/) {}
  // How many of its records the present stage is done with; told every few hundred of them.
  virtual void progressed(std::size_t /*done*/, std::size_t /*total*/) {}
};

}  // namespace platform
