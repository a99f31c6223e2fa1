#include "host/snapshots/kept_file.h"

#include <cerrno>

#include "host/snapshots/checksum.h"
#include "host/snapshots/problem.h"

namespace host::snapshots {
namespace {

// No file that a run works on is larger.
constexpr std::size_t kLargest = std::size_t{1} << 30U;

bool isNothingThere(const platform::Status& status) {
  return status.errorNumber() == ENOENT || status.errorNumber() == ENOTDIR;
}

}  // namespace

Look lookAt(const Storage& storage, const Path& path) {
  platform::Result<platform::FileAttributes> attributes = storage.keeper->attributesOf(path);
  if (isNothingThere(attributes.status())) return {.contents = kAbsent, .attributes = {}, .bytes = {}};
  Look look{.contents = kNoFile, .attributes = required(std::move(attributes)), .bytes = {}};
  if (look.attributes.kind != platform::FileKind::file) return look;
  look.bytes = required(storage.files->read(path, kLargest));
  look.contents = checksum(look.bytes);
  return look;
}

bool KeptFile::isExactly(const Look& present) const {
  return contents == present.contents && (!isPresent() || attributes == present.attributes);
}

}  // namespace host::snapshots
