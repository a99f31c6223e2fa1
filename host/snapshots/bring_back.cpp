#include "host/snapshots/bring_back.h"

#include "host/snapshots/problem.h"

namespace host::snapshots {
namespace {

using Copies = std::map<Path, platform::Bytes>;

Copies verifiedCopies(const SnapshotStore& store, const Manifest& manifest) {
  Copies copies;
  for (const KeptFile& file : manifest.files) {
    if (file.isPresent()) copies[file.path] = store.copyOf(manifest, file);
  }
  return copies;
}

bool isKnown(const KnownContents& known, const Path& path, const std::string& contents) {
  const auto found = known.find(path);
  return found != known.end() && found->second.contains(contents);
}

void putBack(const Storage& storage, const KeptFile& file, const Copies& copies) {
  require(file.isPresent() ? storage.keeper->restore(file.path, copies.at(file.path), file.attributes)
                           : storage.keeper->removeFile(file.path));
}

}  // namespace

std::vector<Path> bringBack(const Storage& storage, const SnapshotStore& store, const Manifest& manifest,
                            const KnownContents& known) {
  const Copies copies = verifiedCopies(store, manifest);
  std::vector<Path> left;
  for (const KeptFile& file : manifest.files) {
    const Look present = lookAt(storage, file.path);
    if (file.isExactly(present)) continue;
    if (isKnown(known, file.path, present.contents)) {
      putBack(storage, file, copies);
    } else {
      left.push_back(file.path);
    }
  }
  return left;
}

}  // namespace host::snapshots
