#include "host/sweeping.h"

#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <string>

#include "host/say.h"
#include "platform/device_places.h"
#include "platform/platform.h"
#include "platform/run_observer.h"
#include "records/fact_observer.h"

namespace host {
namespace {

using platform::FileAttributes;
using platform::FileCopy;
using platform::FileKind;
using platform::Path;
using platform::Result;

constexpr std::size_t kLargest = std::size_t{256} << 20U;  // no larger property list is saved
constexpr std::uint32_t kOwnerOnly = 0600;
constexpr std::string_view kContentsBegin = "bplist00";

// Where the process died early, there is a part of it, or nothing yet.
bool beginsAsSave(const platform::Bytes& bytes) {
  const std::size_t size = std::min(bytes.size(), kContentsBegin.size());
  return std::equal(bytes.begin(), bytes.begin() + static_cast<std::ptrdiff_t>(size), kContentsBegin.begin());
}

bool isBefore(const FileAttributes& file, std::chrono::system_clock::time_point start) {
  const auto modified = std::chrono::seconds{file.modifiedSeconds} + std::chrono::nanoseconds{file.modifiedNanoseconds};
  return modified < start.time_since_epoch();
}

bool isLeftBySave(const FileCopy& file, std::uint32_t directoryOwner, std::chrono::system_clock::time_point start) {
  const FileAttributes& is = file.attributes;
  return is.kind == FileKind::file && is.permissions == kOwnerOnly &&
         (is.owner == ::geteuid() || is.owner == directoryOwner) && isBefore(is, start) && beginsAsSave(file.bytes);
}

void sweep(platform::FileKeeper& keeper, const Path& path) {
  const platform::Status removed = keeper.removeFile(path);
  if (!removed.isOk()) return say("what a program that was killed left stays: " + removed.description());
  say("a program was killed while it saved accounts; what it left was removed: " + path.string());
  records::tellFact([&] { return records::Swept{path.string()}; });
}

}  // namespace

void sweepTemporaryFiles(const snapshots::Storage& storage, std::chrono::system_clock::time_point start) {
  const Path directory = platform::temporaryDirectoryOf(platform::current().directories->systemRoot());
  const char* const used = std::getenv("TMPDIR");
  if (used == nullptr || directory != used) return;
  const Result<FileAttributes> attributes = storage.keeper->attributesOf(directory);
  const Result<std::vector<std::string>> entries = storage.keeper->entriesOf(directory);
  if (!attributes.isOk() || !entries.isOk()) return;
  const platform::RunStage stage{"before the run"};
  for (const std::string& name : entries.value()) {
    if (!platform::isNameOfSave(name)) continue;
    const Result<FileCopy> file = storage.keeper->read(directory / name, kLargest);
    if (file.isOk() && isLeftBySave(file.value(), attributes.value().owner, start)) {
      sweep(*storage.keeper, directory / name);
    }
  }
}

}  // namespace host
