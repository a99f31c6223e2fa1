#include "host/snapshots/snapshot_directory.h"

#include <unistd.h>

#include <cerrno>

#include "host/snapshots/problem.h"

namespace host::snapshots {
namespace {

using platform::FileAttributes;
using platform::FileKind;

constexpr unsigned kOwnerAlone = 0700;
constexpr unsigned kWritableByOthers = 0022;
constexpr unsigned kSticky = 01000;

[[noreturn]] void refuse(const Path& directory, const std::string& reason) {
  throw Problem{Problem::Kind::wrongUse, directory.string() + " cannot hold snapshots: " + reason};
}

bool isOurs(const FileAttributes& attributes) { return attributes.owner == 0 || attributes.owner == ::geteuid(); }

bool isWritableByOthers(const FileAttributes& attributes) { return (attributes.permissions & kWritableByOthers) != 0; }

// What is not a directory on the way is a link; following it is as safe as its owner and what it leads to.
void requireSafeWay(const Storage& storage, const Path& directory) {
  Path above;
  for (const Path& part : directory.parent_path()) {
    above /= part;
    const FileAttributes attributes = required(storage.keeper->attributesOf(above));
    const bool isDirectory = attributes.kind == FileKind::directory;
    const bool isSticky = (attributes.permissions & kSticky) != 0;
    if (!isOurs(attributes) || (isDirectory && isWritableByOthers(attributes) && !isSticky)) {
      refuse(directory, "others could exchange it, by way of " + above.string());
    }
  }
}

void requireSafe(const Storage& storage, const Path& directory) {
  requireSafeWay(storage, directory);
  std::error_code failed;
  const Path resolved = std::filesystem::canonical(directory, failed);
  if (failed) refuse(directory, failed.message());
  requireSafeWay(storage, resolved);
}

void requireOwn(const Path& directory, const FileAttributes& attributes) {
  if (attributes.kind != FileKind::directory) refuse(directory, "it is no directory");
  if (attributes.owner != ::geteuid()) refuse(directory, "it belongs to somebody else");
  if (isWritableByOthers(attributes)) refuse(directory, "others may write it");
}

}  // namespace

void requireOwnDirectory(const Storage& storage, const Path& directory, Missing missing) {
  platform::Result<FileAttributes> attributes = storage.keeper->attributesOf(directory);
  if (attributes.status().errorNumber() == ELOOP) requireSafeWay(storage, directory);  // says which link it was
  if (attributes.status().errorNumber() == ENOENT) {
    if (missing == Missing::isRefused) refuse(directory, "it does not exist");
    require(storage.files->createDirectories(directory, kOwnerAlone));
    attributes = storage.keeper->attributesOf(directory);
  }
  requireOwn(directory, required(std::move(attributes)));
  requireSafe(storage, directory);
}

}  // namespace host::snapshots
