#pragma once

#include <filesystem>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "platform/property_value.h"
#include "tests/support/mishap_file_system.h"

namespace tests {

// What a run of the migrator in a process of its own came to.
struct RunOutcome {
  bool died = false;       // of the mishap
  bool crashed = false;    // of anything else
  bool succeeded = false;  // performMigration answered true
  bool heldLock = false;   // the migration lock was not given back
  int operations = 0;      // file operations that were begun
  std::size_t allocations = 0;
  std::string failedOperation;       // the one that a mishap made fail: "rename /a/path"; the first of them
  std::vector<std::string> outputs;  // console lines and log messages
};

// A device in a scratch directory of its own, which goes with it. Every account that is put on it carries a "Marker",
// so that it can be found again whatever became of it.
class ScratchDevice {
 public:
  ScratchDevice();
  ScratchDevice(const ScratchDevice&) = delete;
  ScratchDevice& operator=(const ScratchDevice&) = delete;
  ~ScratchDevice();

  [[nodiscard]] const std::filesystem::path& root() const { return _root; }

  void putSettings(std::optional<std::uint64_t> version);
  void putLegacyMail();
  void putLegacyExchange();

  // Runs the real migrator over the real services in a child process, with one mishap, and with one allocation that
  // fails, counted from 1.
  RunOutcome run(const Mishap& mishap = {}, std::size_t failingAllocation = 0) const;

  // How often each marker stands in the settings file, and which stand in the legacy files that are there.
  [[nodiscard]] std::map<std::string, int> markersInSettings() const;
  [[nodiscard]] std::map<std::string, int> markersAnywhere() const;
  // The settings file's bytes; nothing where there is none.
  [[nodiscard]] std::optional<std::string> settingsBytes() const;
  // The settings file with identifiers that the run made up replaced by the place where they stand first; nothing where
  // it cannot be read.
  [[nodiscard]] std::optional<platform::Dictionary> comparableSettings() const;
  // The same of any property list of the device, by its path below the root.
  [[nodiscard]] std::optional<platform::Dictionary> comparableAt(const std::filesystem::path& path) const;
  // Every file of the device, relative to its root, in order.
  [[nodiscard]] std::vector<std::string> files() const;
  [[nodiscard]] std::vector<std::string> temporaryFiles() const;

 private:
  void write(const std::filesystem::path& path, const platform::Dictionary& contents) const;
  [[nodiscard]] std::optional<platform::Dictionary> read(const std::filesystem::path& path) const;
  platform::Dictionary marked(platform::Dictionary account);

  std::filesystem::path _root;
  int _markers = 0;
};

}  // namespace tests
