#include "host/snapshots/watched_files.h"

#include <cerrno>

#include "host/snapshots/problem.h"

namespace host::snapshots {

using platform::Status;

WatchedFiles::WatchedFiles(Storage storage, const Manifest& snapshot, RunJournal journal)
    : ForwardingFiles{storage.files}, _storage{std::move(storage)}, _journal{std::move(journal)} {
  for (const KeptFile& file : snapshot.files) {
    _known[file.path].insert(file.contents);
    _parts[file.path] = file.part;
  }
}

// What the run makes beside the files of the snapshot becomes the settings.
std::string WatchedFiles::contentsAt(const Path& path) const {
  const auto found = _parts.find(path);
  return stateAt(_storage, path, found == _parts.end() ? Part::settings : found->second).contents;
}

// What cannot be looked at is not known to be as it was left.
void WatchedFiles::noteWhereEdited(const Path& path) {
  if (_edited.contains(path)) return;
  try {
    if (_known[path].contains(contentsAt(path))) return;
  } catch (const Problem&) {
  }
  _journal.noteEdit(path);
  _edited.insert(path);
}

void WatchedFiles::note(const Path& path, const std::string& contents, bool isMadeNew) {
  noteWhereEdited(path);
  if (!isMadeNew && _known[path].contains(contents)) return;
  _journal.noteChange(path, contents, isMadeNew);
  _known[path].insert(contents);
}

template <typename Contents, typename Change>
Status WatchedFiles::noted(const Path& path, const Contents& contents, const Change& change, bool isMadeNew) {
  if (_known.contains(path)) {
    try {
      note(path, contents(), isMadeNew);
    } catch (const Problem& problem) {
      return Status::failure(EIO, "note the change of " + path.string() + " (" + problem.what() + ")");
    }
  }
  return change();
}

// A file that is made at a path of which nothing is known yet stood there in no form before.
Status WatchedFiles::create(const Path& path, std::span<const std::uint8_t> bytes) {
  _known.try_emplace(path, std::set<std::string>{kAbsent});
  return noted(
      path, [&] { return checksum(bytes); }, [&] { return _storage.files->create(path, bytes); }, true);
}

Status WatchedFiles::replace(const Path& path, std::span<const std::uint8_t> bytes) {
  return noted(
      path, [&] { return checksum(bytes); }, [&] { return _storage.files->replace(path, bytes); });
}

Status WatchedFiles::copy(const Path& from, const Path& to) {
  return noted(
      to, [&] { return contentsAt(from); }, [&] { return _storage.files->copy(from, to); });
}

Status WatchedFiles::remove(const Path& path) {
  return noted(
      path, [] { return std::string{kAbsent}; }, [&] { return _storage.files->remove(path); });
}

Status WatchedFiles::rename(const Path& from, const Path& to) {
  return noted(
      to, [&] { return contentsAt(from); }, [&] { return _storage.files->rename(from, to); });
}

}  // namespace host::snapshots
