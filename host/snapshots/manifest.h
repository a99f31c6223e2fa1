#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "host/snapshots/file_state.h"

namespace host::snapshots {

// The time as manifests, traces and explanations have it: in UTC, as in 2026-03-07T10:15:00Z.
[[nodiscard]] std::string universalTime(std::chrono::system_clock::time_point time);

// The device that a snapshot belongs to.
struct DevicePlace {
  std::string root;
  std::string home;

  bool operator==(const DevicePlace&) const = default;
};

// What a snapshot is: everything but the bytes of the files.
struct Manifest {
  std::string id;
  std::string taken;    // the universal time
  std::string release;  // of the host
  std::string reason;   // kRun, kRestore
  DevicePlace device;
  std::string lockName;
  std::string versionKey;
  std::optional<std::int64_t> dataVersion;
  std::optional<std::string> outcome;  // nothing until what it was taken for has ended
  std::vector<std::string> keptFor;    // why it is kept beyond the count, a line each; empty where it is not
  std::vector<KeptFile> files;

  [[nodiscard]] bool isKept() const { return !keptFor.empty(); }

  static constexpr const char* kRun = "run";
  static constexpr const char* kRestore = "restore";
};

// The manifest as a file: one JSON object with a checksum of itself. Throws a Problem where a path is no UTF-8.
[[nodiscard]] std::string textOf(const Manifest& manifest);

// Reads it back; nothing where a single byte of it is wrong, where it has another format, or where it names a copy that
// is not in the snapshot's own directory.
[[nodiscard]] std::optional<Manifest> manifestFrom(std::string_view text);

// The name of a part of the footprint, as manifests and listings have it.
[[nodiscard]] std::string nameOf(Part part);

}  // namespace host::snapshots
