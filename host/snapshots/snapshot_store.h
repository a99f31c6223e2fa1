#pragma once

#include <string>
#include <vector>

#include "host/snapshots/manifest.h"

namespace host::snapshots {

// The snapshots in one directory, under its lock. Every call throws a Problem where it fails.
class SnapshotStore {
 public:
  SnapshotStore(Storage storage, Path directory) : _storage{std::move(storage)}, _directory{std::move(directory)} {}

  // Removes what a dead host left half made or half removed: everything that is named with a dot in front.
  void sweep() const;

  // The identifiers of the snapshots, oldest first.
  [[nodiscard]] std::vector<std::string> identifiers() const;

  // An identifier that there is no snapshot of is wrong use, a damaged manifest a failure.
  [[nodiscard]] Manifest manifest(const std::string& id) const;

  // Nothing where it is damaged or there is none.
  [[nodiscard]] std::optional<Manifest> undamagedManifest(const std::string& id) const;

  // Makes a snapshot of the files that the description names, as they stand: sets its identifier, its time and its
  // files, and puts it on stable storage. It is there whole, its copies read again and compared, or not at all.
  [[nodiscard]] Manifest take(Manifest description) const;

  // Replaces the manifest of a snapshot in one step.
  void rewrite(const Manifest& manifest) const;

  // The bytes of a file's copy, which are those that the manifest tells of.
  [[nodiscard]] platform::Bytes copyOf(const Manifest& manifest, const KeptFile& file) const;
  // Whether the copy is there and undamaged.
  [[nodiscard]] bool hasCopyOf(const Manifest& manifest, const KeptFile& file) const;

  // Removes the oldest snapshots but the newest `count`, not counting those that are kept. One with a damaged manifest
  // is neither counted nor removed.
  void prune(std::size_t count) const;

 private:
  void removeIfThere(const Path& path) const;
  void build(Manifest& manifest) const;
  void keepCopy(KeptFile& file, std::size_t number) const;
  [[nodiscard]] std::string nextIdentifier(std::string time) const;

  Storage _storage;
  Path _directory;
};

}  // namespace host::snapshots
