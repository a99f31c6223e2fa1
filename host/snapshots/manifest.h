#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "host/snapshots/kept_file.h"

namespace host::snapshots {

// The device that a snapshot belongs to.
struct DevicePlace {
  std::string root;
  std::string home;

  bool operator==(const DevicePlace&) const = default;
};

// What a snapshot is: everything but the bytes of the files.
struct Manifest {
  std::string id;
  std::string taken;    // the time in UTC
  std::string release;  // of the host
  std::string reason;   // kRun, kRestore
  DevicePlace device;
  std::string lockName;
  std::string versionKey;
  std::optional<std::int64_t> dataVersion;
  std::optional<std::string> outcome;  // nothing until what it was taken for has ended
  bool isKept = false;                 // beyond the count
  std::vector<KeptFile> files;

  static constexpr const char* kRun = "run";
  static constexpr const char* kRestore = "restore";
};

// The manifest as a file: one JSON object with a checksum of itself. Throws a Problem where a path is no UTF-8.
[[nodiscard]] std::string textOf(const Manifest& manifest);

// Reads it back; nothing where a single byte of it is wrong, or where it has another format.
[[nodiscard]] std::optional<Manifest> manifestFrom(std::string_view text);

// The name of a part of the footprint, as manifests and listings have it.
[[nodiscard]] std::string nameOf(platform::MigrationFile::Part part);

}  // namespace host::snapshots
