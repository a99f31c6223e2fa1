#include "host/keeping_files.h"

#include <algorithm>
#include <cerrno>
#include <random>
#include <utility>

#include "host/say.h"
#include "host/verdict.h"
#include "platform/linux/property_lists/libplist_conversion.h"
#include "platform/platform.h"
#include "platform/run_observer.h"
#include "records/fact_observer.h"

namespace host {
namespace {

using platform::FileAttributes;
using platform::FileCopy;
using platform::FileKind;
using platform::MigrationFile;
using platform::Path;
using platform::Result;
using platform::Status;
using records::LossCode;

constexpr std::string_view kUnreadable = "unreadable";
constexpr std::string_view kNewer = "newer";
constexpr std::string_view kInterrupted = "interrupted";
constexpr unsigned kDirectoryPermissions = 0755;

std::string_view whyGone(LossCode code) {
  switch (code) {
    case LossCode::unreadableLegacyFile: return kUnreadable;
    case LossCode::refusedDescription:
    case LossCode::refusedFile: return "unconverted";
    default: return "unsaved";
  }
}

Path numbered(const Path& place, std::string_view why, int number) {
  return place.string() + "." + std::string{why} + "-" + std::to_string(number);
}

// Of the numbers from the first to the last one.
Result<Path> freeName(platform::FileKeeper& keeper, const Path& place, std::string_view why, int first, int last) {
  for (int number = first; number <= last; ++number) {
    Path name = numbered(place, why, number);
    const Status there = keeper.attributesOf(name).status();
    if (there.cause() == platform::Cause::missing) return name;
    if (!there.isOk()) return there;
  }
  return Status::failure(EEXIST, "keep another file beside " + place.string());
}

void tellKept(const std::string& file, const Path& where) {
  records::tellFact([&] { return records::KeptAside{file, where.string()}; });
}

void tellPutAside(const MigrationFile& file, const std::string& why, const Path& where) {
  const bool isSettings = file.part == MigrationFile::Part::settings;
  const std::string from = isSettings ? std::string{} : file.path.string();
  const LossCode code = isSettings ? LossCode::unreadableSettingsFile : LossCode::unreadableLegacyFile;
  records::tellFact(
      [&] { return records::Lost{.code = code, .account = {}, .detail = why, .file = from, .where = {}}; });
  tellKept(from, where);
  if (!isSettings) records::tellFact([&] { return records::FileRemoved{from, true}; });
}

void sayNoRoom(const Path& place, std::string_view why) {
  say(numbered(place, why, 1).string() + " to " + std::to_string(KeepingFiles::kMaxKept) +
      " are kept already; a further one is not, and goes as the rules require");
}

}  // namespace

Path settingsIn(const platform::MigrationFootprint& footprint) {
  const auto found = std::ranges::find(footprint.files, MigrationFile::Part::settings, &MigrationFile::part);
  return found == footprint.files.end() ? Path{} : found->path;
}

// Another name costs no room; and whoever has taken the first ones does not know which one comes then.
Status putAside(const snapshots::Storage& storage, const MigrationFile& file, const std::string& why,
                bool isRehearsal) {
  constexpr int kTooMany = 1'000'000'000;
  const platform::RunStage stage{"before the run"};
  Result<Path> name = freeName(*storage.keeper, file.path, kUnreadable, 1, KeepingFiles::kMaxKept);
  if (name.status().errorNumber() == EEXIST) {
    const auto random = static_cast<int>(std::random_device{}() % kTooMany);
    name = freeName(*storage.keeper, file.path, kUnreadable, random + KeepingFiles::kMaxKept, kTooMany * 2);
  }
  if (!name.isOk()) return name.status();
  // A rehearsal moves no directories; that nothing stands there any more is all that the run sees.
  const Status moved =
      isRehearsal ? storage.keeper->removeFile(file.path) : storage.files->rename(file.path, name.value());
  if (!moved.isOk()) return moved;
  say(file.path.string() + " is nothing that a run can read; it is kept as " + name.value().string());
  tellPutAside(file, why, name.value());
  return {};
}

KeepingFiles::KeepingFiles(std::shared_ptr<platform::FileSystem> files, std::shared_ptr<platform::FileKeeper> keeper,
                           platform::MigrationFootprint footprint, const Explanation& explanation)
    : ForwardingFiles{std::move(files)},
      _keeper{std::move(keeper)},
      _footprint{std::move(footprint)},
      _settings{settingsIn(_footprint)},
      _explanation{explanation} {}

std::string_view KeepingFiles::whyUnusable() {
  const auto read = platform::current().propertyLists->readDictionary(_settings);
  if (!read.isOk()) return kUnreadable;
  const auto* const version = read.value().find(_footprint.versionKey);
  const bool isNewer = version != nullptr && version->integerValue().value_or(0) > _footprint.currentVersion;
  return isNewer ? kNewer : std::string_view{};
}

std::string_view KeepingFiles::whyToldUnusable() const {
  std::string_view why;
  _explanation.forEachFact([&why](const records::Fact& fact) {
    const auto* const lost = std::get_if<records::Lost>(&fact);
    if (lost == nullptr) return;
    if (lost->code == LossCode::unreadableSettingsFile) why = kUnreadable;
    if (lost->code == LossCode::newerSettingsFile) why = kNewer;
  });
  return why;
}

// A run that could not save finds the same file again: that is kept once.
Result<Path> KeepingFiles::keptAs(std::string_view why, const FileCopy& settings) {
  for (int number = 1; number <= kMaxKept; ++number) {
    Path name = numbered(_footprint.copyAside, why, number);
    const Result<FileCopy> kept = _keeper->read(name, settings.bytes.size());
    if (kept.isOk() && kept.value().attributes.kind == FileKind::file && kept.value().bytes == settings.bytes)
      return name;
  }
  const Path directory = _footprint.copyAside.parent_path();
  if (kindOf(directory).cause() == platform::Cause::missing &&
      createDirectories(directory, kDirectoryPermissions).isOk()) {
    static_cast<void>(setOwner(directory, "mobile", "mobile"));
  }
  Result<Path> name = freeName(*_keeper, _footprint.copyAside, why, 1, kMaxKept);
  if (!name.isOk()) return name;
  const Status copied = _keeper->restore(name.value(), settings.bytes, settings.attributes);
  return copied.isOk() ? std::move(name) : copied;
}

Status KeepingFiles::keepSettings(std::string_view why) {
  if (_areSettingsKept || why.empty() || kindOf(_settings) != FileKind::file) return {};
  const Result<FileCopy> contents = _keeper->readTarget(_settings, platform::kMaxPropertyListSize);
  if (!contents.isOk()) return contents.status();
  const Result<Path> kept = keptAs(why, contents.value());
  if (!kept.isOk() && kept.status().errorNumber() != EEXIST) return kept.status();
  _areSettingsKept = true;
  if (kept.isOk()) {
    say("the settings file " + std::string{why == kNewer ? "is of a newer version" : "cannot be read"} +
        "; it is kept as " + kept.value().string());
    tellKept({}, kept.value());
  } else {
    sayNoRoom(_footprint.copyAside, why);
  }
  return {};
}

Status KeepingFiles::keepUnusableSettings() {
  if (_settings.empty() || _footprint.copyAside.empty()) return {};
  const platform::RunStage stage{"before the run"};
  return keepSettings(whyUnusable());
}

Status KeepingFiles::keepCopyOfKilledRun() {
  constexpr std::string_view kMissing =
      "the run before this one was killed while it saved: steps of it may be missing, and are not taken up again";
  const platform::RunStage stage{"before the run"};
  const Result<FileCopy> copy = _keeper->read(_footprint.copyAside, platform::kMaxPropertyListSize);
  if (!copy.isOk()) {
    say(std::string{kMissing});
    return copy.cause() == platform::Cause::missing ? Status{} : copy.status();
  }
  const Result<Path> kept = keptAs(kInterrupted, copy.value());
  if (!kept.isOk() && kept.status().errorNumber() != EEXIST) return kept.status();
  if (!kept.isOk()) {
    sayNoRoom(_footprint.copyAside, kInterrupted);
    return {};
  }
  say(std::string{kMissing} + "; the settings from before it are kept as " + kept.value().string());
  tellKept(_footprint.copyAside.string(), kept.value());
  return {};
}

Status KeepingFiles::remove(const Path& path) {
  const auto losses = lossesFrom(path.string(), _explanation, records::FileRemoved{path.string(), true});
  const Result<FileAttributes> there = _keeper->attributesOf(path);
  if (losses.empty() || !there.isOk() || there.value().kind == FileKind::directory)
    return ForwardingFiles::remove(path);
  const std::string_view why = whyGone(losses.front().code);
  const Result<Path> name = freeName(*_keeper, path, why, 1, kMaxKept);
  if (!name.isOk() && name.status().errorNumber() != EEXIST) return name.status();
  if (!name.isOk()) {
    sayNoRoom(path, why);
    return ForwardingFiles::remove(path);
  }
  Status moved = ForwardingFiles::rename(path, name.value());
  if (!moved.isOk()) return moved;
  say(path.string() + " holds accounts that stand nowhere else; it is kept as " + name.value().string());
  tellKept(path.string(), name.value());
  return {};
}

Status KeepingFiles::rename(const Path& from, const Path& to) {
  if (to == _settings) {
    if (Status kept = keepSettings(whyToldUnusable()); !kept.isOk()) return kept;
  }
  return ForwardingFiles::rename(from, to);
}

}  // namespace host
