#pragma once

#include "host/snapshots/file_state.h"
#include "platform/data_class_migrator.h"

namespace host {

// The mark of a run that changes the device without a snapshot to go back to (platform::runMarkOf). The first save of a
// chain of version steps already writes the current version, so the settings alone do not tell that a run was killed
// after it. To be used under the migration lock.
class RunMark {
 public:
  explicit RunMark(snapshots::Storage storage) : _storage{std::move(storage)} {}

  // Whether a run that was killed left its mark.
  bool isLeft();
  // The mark is no promise of the run: where it cannot be made, the run goes on, and its saves say what is wrong.
  void set();
  // Removes what is left or set; without either, nothing is looked at.
  void remove();

 private:
  snapshots::Storage _storage;
  bool _isThere = false;
};

// Whether steps of a run that left its mark may be missing, which the next one does not take up: the settings are
// current, and the copy that the run made of them is of an older version or is not there.
[[nodiscard]] bool mayMissSteps(const platform::MigrationFootprint& footprint);

}  // namespace host
