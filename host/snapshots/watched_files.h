#pragma once

#include <map>
#include <memory>
#include <set>
#include <string>

#include "host/snapshots/forwarding_files.h"
#include "host/snapshots/manifest.h"
#include "host/snapshots/run_journal.h"

namespace host::snapshots {

// The device's files as the plug-in gets them during a run that can be undone: each change to a file of the snapshot,
// and each file that is newly made, is noted in the journal before it is made. A change that cannot be noted fails
// instead. All other calls are passed on as they are.
class WatchedFiles final : public ForwardingFiles {
 public:
  WatchedFiles(Storage storage, const Manifest& snapshot, RunJournal journal);

  platform::Status create(const Path& path, std::span<const std::uint8_t> bytes) override;
  platform::Status replace(const Path& path, std::span<const std::uint8_t> bytes) override;
  platform::Status copy(const Path& from, const Path& to) override;
  platform::Status remove(const Path& path) override;
  platform::Status rename(const Path& from, const Path& to) override;

 private:
  // Makes a change that leaves these contents at the path, noted first.
  template <typename Contents, typename Change>
  platform::Status noted(const Path& path, const Contents& contents, const Change& change, bool isMadeNew = false);
  void note(const Path& path, const std::string& contents, bool isMadeNew);
  void noteWhereEdited(const Path& path);
  [[nodiscard]] std::string contentsAt(const Path& path) const;

  Storage _storage;
  RunJournal _journal;
  std::map<Path, std::set<std::string>> _known;  // what may stand at a watched path unless somebody else was there
  std::map<Path, Part> _parts;
  std::set<Path> _edited;
};

}  // namespace host::snapshots
