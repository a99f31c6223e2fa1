#include "host/snapshots/restoring.h"

#include "host/snapshots/problem.h"

namespace host::snapshots {

std::vector<Path> restoreFiles(const Storage& storage, const SnapshotStore& store, const Manifest& manifest,
                               const KnownContents& known) {
  std::map<Path, platform::Bytes> copies;
  for (const KeptFile& file : manifest.files) {
    if (file.hasCopy()) copies[file.path] = store.copyOf(manifest, file);
  }
  std::vector<Path> left;
  for (const KeptFile& file : manifest.files) {
    const FileState present = stateAt(storage, file.path, file.part);
    if (file.contents == kUnkept || file.isExactly(present)) continue;
    const auto found = known.find(file.path);
    if (found == known.end() || !found->second.contains(present.contents)) {
      left.push_back(file.path);
    } else {
      require(file.isPresent() ? storage.keeper->restore(file.path, copies[file.path], file.attributes)
                               : storage.keeper->removeFile(file.path));
    }
  }
  return left;
}

}  // namespace host::snapshots
