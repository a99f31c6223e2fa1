#include "host/snapshots/snapshot_directory.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <set>

#include "host/snapshots/problem.h"
#include "host/snapshots/release_stamp.h"
#include "host/snapshots/run_journal.h"

namespace host::snapshots {
namespace {

using platform::FileAttributes;
using platform::FileKind;

constexpr unsigned kOwnerAlone = 0700;
constexpr unsigned kWritableByOthers = 0022;
constexpr unsigned kSticky = 01000;

constexpr const char* kOwnMark = "format";
constexpr std::string_view kOwnMarkText = "migration-host snapshots 1\n";
constexpr const char* kLock = "lock";
constexpr const char* kFormerJournal = "last";  // which earlier releases left
constexpr std::string_view kBeingReplaced = ".new-";
constexpr std::size_t kNoiseDigits = 16;
constexpr std::size_t kNumberDigits = 6;
constexpr std::string_view kTime = "ddddddddTddddddZ";

[[noreturn]] void cannotHold(const Path& directory, const std::string& reason) {
  failWrongUse(directory.string() + " cannot hold snapshots: " + reason);
}

bool isWritableByOthers(const FileAttributes& attributes) { return (attributes.permissions & kWritableByOthers) != 0; }

// What is not a directory on the way is a link; following it is as safe as its owner and what it leads to.
void requireSafeWay(const Storage& storage, const Path& directory) {
  Path above;
  for (const Path& part : directory.parent_path()) {
    above /= part;
    const FileAttributes attributes = required(storage.keeper->attributesOf(above));
    const bool isDirectory = attributes.kind == FileKind::directory;
    const bool isSticky = (attributes.permissions & kSticky) != 0;
    const bool isOurs = attributes.owner == 0 || attributes.owner == ::geteuid();
    if (!isOurs || (isDirectory && isWritableByOthers(attributes) && !isSticky)) {
      cannotHold(directory, "others could exchange it, by way of " + above.string());
    }
  }
}

bool isDigit(char character) { return character >= '0' && character <= '9'; }

// Nothing where no such file can be read; a part of it where its maker died.
std::optional<std::string> ownMarkIn(const Storage& storage, const Path& directory) {
  const platform::Result<platform::Bytes> read = storage.files->read(directory / kOwnMark, kOwnMarkText.size());
  if (!read.isOk()) return std::nullopt;
  return textIn(read.value());
}

bool isBeingReplaced(const std::string& name) {
  return name.starts_with(kBeingReplaced) && name.size() == kBeingReplaced.size() + kNoiseDigits &&
         name.find_first_not_of("0123456789abcdef", kBeingReplaced.size()) == std::string::npos;
}

bool isOwnName(const std::string& name) {
  static const std::set<std::string> kNames{kOwnMark, kLock, RunJournal::kName, kFormerJournal, kStampName};
  return kNames.contains(name) || isIdentifier(name) || isPassing(name);
}

// What who died while it marked the directory left: the mark, or what was to become it, or a part of either.
bool isOfADeadMaker(const Storage& storage, const Path& directory, const std::string& name) {
  if (name != kOwnMark && !isBeingReplaced(name)) return false;
  const platform::Result<platform::Bytes> read = storage.files->read(directory / name, kOwnMarkText.size());
  return read.isOk() && kOwnMarkText.starts_with(textIn(read.value()));
}

void requireSnapshotsOrNothing(const Storage& storage, const Path& directory) {
  const std::optional<std::string> mark = ownMarkIn(storage, directory);
  if (mark == kOwnMarkText) return;
  const std::vector<std::string> names = required(storage.keeper->entriesOf(directory));
  const auto foreign = std::ranges::find_if_not(names, &isOwnName);
  if (foreign != names.end()) cannotHold(directory, "it holds something else: " + *foreign);
  if (mark ? !kOwnMarkText.starts_with(*mark) : std::ranges::find(names, kOwnMark) != names.end()) {
    cannotHold(directory, std::string{"it holds something else: "} + kOwnMark);
  }
  const bool areAllOfADeadMaker =
      std::ranges::all_of(names, [&](const std::string& name) { return isOfADeadMaker(storage, directory, name); });
  if (areAllOfADeadMaker) return;
  // A name alone is no proof of an earlier host: every host made the lock first, and it is empty.
  const platform::Result<FileAttributes> lock = storage.keeper->attributesOf(directory / kLock);
  if (!lock.isOk() || lock.value().kind != FileKind::file || lock.value().size != 0) {
    cannotHold(directory, "it holds something else: " + names.front());
  }
}

}  // namespace

bool isIdentifier(const std::string& name) {
  const auto dash = static_cast<std::size_t>(std::ranges::find_if_not(name, &isDigit) - name.begin());
  return dash >= kNumberDigits && dash < name.size() && name[dash] == '-' &&
         std::ranges::equal(std::string_view{name}.substr(dash + 1), kTime, [](char character, char meant) {
           return meant == 'd' ? isDigit(character) : character == meant;
         });
}

bool isPassing(const std::string& name) { return name == kBeingMade || name == kBeingRemoved || isBeingReplaced(name); }

void markAsOwn(const Storage& storage, const Path& directory) {
  if (ownMarkIn(storage, directory) == kOwnMarkText) return;
  require(storage.files->replace(directory / kOwnMark, bytesOf(kOwnMarkText)));
}

bool requireOwnDirectory(const Storage& storage, const Path& directory, Missing missing) {
  platform::Result<FileAttributes> attributes = storage.keeper->attributesOf(directory);
  if (attributes.status().errorNumber() == ELOOP) requireSafeWay(storage, directory);  // says which link it was
  if (attributes.status().errorNumber() == ENOENT) {
    if (missing == Missing::isRefused) cannotHold(directory, "it does not exist");
    if (missing == Missing::isAccepted) return false;
    require(storage.files->createDirectories(directory, kOwnerAlone));
    attributes = storage.keeper->attributesOf(directory);
  }
  const FileAttributes own = required(std::move(attributes));
  if (own.kind != FileKind::directory) cannotHold(directory, "it is no directory");
  if (own.owner != ::geteuid()) cannotHold(directory, "it belongs to somebody else");
  if (isWritableByOthers(own)) cannotHold(directory, "others may write it");
  requireSafeWay(storage, directory);
  std::error_code failed;
  const Path resolved = std::filesystem::canonical(directory, failed);
  if (failed) cannotHold(directory, failed.message());
  requireSafeWay(storage, resolved);
  requireSnapshotsOrNothing(storage, directory);
  return true;
}

}  // namespace host::snapshots
