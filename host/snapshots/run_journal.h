#pragma once

#include <map>
#include <optional>
#include <set>
#include <string>

#include "host/snapshots/file_state.h"

namespace host::snapshots {

// What is known of a run or a restore that is under way, or that died.
struct RunMark {
  std::string snapshot;                        // of the state before it
  std::optional<std::string> restores;         // the snapshot that a restore brings back; nothing for a run
  std::map<Path, std::set<std::string>> left;  // the contents that a run's changes leave, by path
  std::set<Path> made;                         // of these, the files that the run made new
  std::set<Path> edited;                       // what somebody else changed meanwhile
};

// The file that holds the mark: its first line says what is under way, each further one is written before what it
// tells of. Every call throws a Problem where it fails, with the file as it was.
class RunJournal {
 public:
  RunJournal(Storage storage, const Path& directory) : _storage{std::move(storage)}, _mark{directory / kName} {}

  static constexpr const char* kName = "running";

  void begin(const std::string& snapshot, const std::optional<std::string>& restores) const;
  void noteChange(const Path& path, const std::string& contents, bool isMadeNew) const;
  void noteEdit(const Path& path) const;

  // The mark that is set; nothing where none is. A last line that was cut off tells of nothing that happened.
  [[nodiscard]] std::optional<RunMark> read() const;

  // Takes the mark away.
  void clear() const;

 private:
  void append(const std::string& line) const;

  Storage _storage;
  Path _mark;
};

}  // namespace host::snapshots
