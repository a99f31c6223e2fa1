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

constexpr std::uint32_t kOwnerOnly = 0600;
constexpr std::string_view kContentsBegin = "bplist00";
constexpr std::size_t kMaxRead = std::size_t{64} << 20U;  // of all together: sparse files cost who makes them nothing

// Where the process died early, there is a part of it, or nothing yet.
bool isLeftBySave(const FileCopy& file, std::uint32_t directoryOwner, std::chrono::system_clock::time_point start) {
  const FileAttributes& is = file.attributes;
  const auto modified = std::chrono::seconds{is.modifiedSeconds} + std::chrono::nanoseconds{is.modifiedNanoseconds};
  const auto there = std::min(file.bytes.size(), kContentsBegin.size());
  return is.kind == FileKind::file && is.permissions == kOwnerOnly &&
         (is.owner == ::geteuid() || is.owner == directoryOwner) && modified < start.time_since_epoch() &&
         std::equal(kContentsBegin.begin(), kContentsBegin.begin() + there, file.bytes.begin());
}

}  // namespace

void sweepTemporaryFiles(const snapshots::Storage& storage, std::chrono::system_clock::time_point start) {
  const Path directory = platform::temporaryDirectoryOf(platform::current().directories->systemRoot());
  const char* const used = std::getenv("TMPDIR");
  if (used == nullptr || directory != used) return;
  const Result<std::vector<std::string>> entries = storage.keeper->entriesOf(directory);
  if (!entries.isOk()) return;
  const platform::RunStage stage{"before the run"};
  std::size_t left = kMaxRead;
  for (const std::string& name : entries.value()) {
    if (!platform::isNameOfSave(name)) continue;
    const Path path = directory / name;
    const Result<FileCopy> file = storage.keeper->read(path, left);
    if (file.isOk()) left -= file.value().bytes.size();
    const Result<FileAttributes> holder = storage.keeper->attributesOf(directory);
    if (!file.isOk() || !holder.isOk() || !isLeftBySave(file.value(), holder.value().owner, start)) continue;
    const platform::Status removed = storage.keeper->removeFile(path);
    if (removed.isOk()) {
      say("a program was killed while it saved accounts; what it left was removed: " + path.string());
      records::tellFact([&] { return records::Swept{path.string()}; });
    } else {
      say("what a program that was killed left stays: " + removed.description());
    }
  }
}

}  // namespace host
