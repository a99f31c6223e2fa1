#pragma once

#include <memory>

#include "platform/platform.h"
#include "platform/run_observer.h"
#include "records/fact.h"

namespace records {

// An observer of a run that is also told what each stage did. Facts are computed for such an observer only.
class FactObserver : public platform::RunObserver {
 public:
  // One fact of the stage that began last and has not ended, in the order in which they are found out.
  virtual void told(const Fact& fact) = 0;
  // Facts are missing from here on, since memory ran out while they were gathered.
  virtual void lostTrack() noexcept = 0;
};

// The observer that wants facts; null where none does, and nothing need be computed.
[[nodiscard]] inline std::shared_ptr<FactObserver> factObserver() {
  return std::dynamic_pointer_cast<FactObserver>(platform::current().observer);
}

// Tells the fact that `makeFact` makes, if anybody wants it. Whatever goes wrong with that is no failure of the run.
template <typename MakeFact>
void tellFact(const MakeFact& makeFact) noexcept {
  std::shared_ptr<FactObserver> observer;
  try {
    observer = factObserver();
    if (observer) observer->told(makeFact());
  } catch (...) {
    if (observer) observer->lostTrack();
  }
}

}  // namespace records
