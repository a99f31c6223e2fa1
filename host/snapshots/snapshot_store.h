#pragma once

#include <functional>
#include <string>
#include <vector>

#include "host/snapshots/manifest.h"

namespace host::snapshots {

// Throws a Problem where accounts may be in what stands there and no copy of it can be kept.
void requireKeepable(const Path& path, Part part, const FileState& state);

// The snapshots in one directory, under its lock. Every call throws a Problem where it fails.
class SnapshotStore {
 public:
  SnapshotStore(Storage storage, Path directory) : _storage{std::move(storage)}, _directory{std::move(directory)} {}

  // How many snapshots are kept beyond the count.
  static constexpr std::size_t kMaxKept = 20;

  // Removes what a dead host left half made or half removed.
  void sweep() const;

  // The identifiers of the snapshots, oldest first.
  [[nodiscard]] std::vector<std::string> identifiers() const;

  // The identifier that is meant by itself, by a beginning that no other has, or by "latest". That there is none, or
  // more than one, is wrong use.
  [[nodiscard]] std::string identifierMeantBy(const std::string& text) const;

  // An identifier that there is no snapshot of is wrong use, a damaged manifest a failure.
  [[nodiscard]] Manifest manifest(const std::string& id) const;

  // Nothing where it is damaged or there is none.
  [[nodiscard]] std::optional<Manifest> undamagedManifest(const std::string& id) const;

  // Makes a snapshot of the files that the description names, as they stand: sets its identifier, its time and its
  // files, and puts it on stable storage. It is there whole, its copies read again and compared, or not at all. A file
  // of which no copy can be kept is a failure where accounts are in it; else it is said to `warn`.
  [[nodiscard]] Manifest take(Manifest description, const std::function<void(const std::string&)>& warn) const;

  // Replaces the manifest of a snapshot in one step.
  void rewrite(const Manifest& manifest) const;

  // Puts a file of that name beside the snapshot's copies; what it is about can be read back.
  void keepRecord(const std::string& id, const std::string& name, std::string_view text) const;
  // Nothing where there is none.
  [[nodiscard]] std::optional<std::string> record(const std::string& id, const std::string& name) const;

  // The bytes of a file's copy, which are those that the manifest tells of.
  [[nodiscard]] platform::Bytes copyOf(const Manifest& manifest, const KeptFile& file) const;
  // The paths whose copies are gone or damaged.
  [[nodiscard]] std::vector<Path> damageOf(const Manifest& manifest) const;

  void remove(const std::string& id) const;

  // Removes the oldest snapshots but the newest `count`, not counting those that are kept. One with a damaged manifest
  // is neither counted nor removed.
  void prune(std::size_t count) const;

  // The identifiers of the snapshots that are kept, oldest first.
  [[nodiscard]] std::vector<std::string> kept() const;

 private:
  void removeIfThere(const Path& path) const;
  void build(Manifest& manifest, const std::function<void(const std::string&)>& warn) const;
  void keepCopy(KeptFile& file, std::size_t number, const std::function<void(const std::string&)>& warn) const;
  [[nodiscard]] std::string nextIdentifier(std::string time) const;

  Storage _storage;
  Path _directory;
};

}  // namespace host::snapshots
