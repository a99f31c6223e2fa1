#pragma once

#include <map>
#include <optional>
#include <string>
#include <vector>

#include "tests/reliability/scratch_device.h"

namespace tests {

// What a run with snapshots, or a restore, in a process of its own came to.
struct UndoOutcome {
  bool died = false;        // of the mishap
  bool crashed = false;     // of anything else
  bool refused = false;     // with a Problem
  bool rolledBack = false;  // since it could not save
  bool succeeded = false;   // a run: performMigration answered true
  int operations = 0;       // file operations that were begun, of the host and of the plug-in; unless it died
  int operationsAhead = 0;  // of these, before the plug-in was called
};

// Runs the real migrator on the device, as the host does it with --snapshots.
[[nodiscard]] UndoOutcome runUndoable(const ScratchDevice& device, const Mishap& mishap = {});

// Brings the device back to the first snapshot that was taken of it, as the host does it with --restore.
[[nodiscard]] UndoOutcome restoreFirst(const ScratchDevice& device, const Mishap& mishap = {});

// What a device holds, snapshots and locks aside. Identifiers that a run made up are replaced by where they stand
// first.
struct EndState {
  std::optional<platform::Dictionary> settings;
  std::optional<platform::Dictionary> copyAside;
  std::map<std::string, std::string> otherFiles;  // their bytes, by path

  bool operator==(const EndState&) const = default;
};
[[nodiscard]] EndState endStateOf(const ScratchDevice& device);

// The same to the last bit: for each file its bytes, permissions and time of last change.
[[nodiscard]] std::map<std::string, std::string> exactStateOf(const ScratchDevice& device);

// What of the snapshots' directory is half made or half removed.
[[nodiscard]] std::vector<std::string> leftoversIn(const ScratchDevice& device);

}  // namespace tests
