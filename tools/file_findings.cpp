// What stands where a file of the device should be, and beside it.

#include <algorithm>
#include <array>
#include <cstdio>
#include <filesystem>
#include <functional>
#include <system_error>

#include "accountsettings/file_paths.h"
#include "accountsettings/product_values.h"
#include "platform/device_places.h"
#include "platform/linux/files/account_names.h"
#include "platform/linux/files/file_services.h"
#include "platform/platform.h"
#include "tools/findings.h"

namespace tools {
namespace {

using accountsettings::AccountsManager;
using platform::FileAttributes;
using platform::FileKind;
using platform::Path;

constexpr std::uint32_t kOthersBits = 077;

// What a migration does where something else than a regular file stands.
struct Fates {
  const char* link;
  const char* deadLink;
  const char* directory;
  const char* otherKind;
  const char* openToOthers;
};

constexpr Fates kFatesOfSettings{
    "a migration reads what it leads to, and puts a new file in the place of the link",
    "a migration reads no account, and puts a new file in the place of the link",
    "a migration reads no account and cannot save",
    "a migration reads no account, and puts a file without accounts in its place",
    "a migration leaves a file that only its owner reads",
};
constexpr Fates kFatesOfLegacyFiles{
    "a migration converts what it leads to, and deletes the link alone",
    "a migration does not see it",
    "a migration converts nothing, and deletes it with everything in it",
    "a migration converts nothing, and deletes it",
    "a migration deletes it",
};

platform::Result<FileAttributes> attributesOf(const Path& path) {
  return platform::makeFileKeeper(*platform::current().directories)->attributesOf(path);
}

// What is followed is told of; what is not, the reading of the file tells.
Findings findingsOfLink(const Path& path, const Path& target, const Fates& fates) {
  const auto kind = platform::current().files->kindOf(path);
  const std::string what = "it is a link to " + target.string();
  if (kind.isOk() && kind.value() == FileKind::file) return {{"link", "", "", what, fates.link}};
  if (kind.cause() == platform::Cause::missing) {
    return {{"link", "", "", what + ", where nothing stands", fates.deadLink}};
  }
  return {};
}

Findings findingsOfOwner(const FileAttributes& attributes) {
  const std::string owner{accountsettings::kSettingsOwner.view()};
  const auto user = platform::numberOfUser(platform::current().directories->systemRoot(), owner);
  if (!user.isOk()) {
    return {{"no-owner", "", "", "the device has no user " + owner + ", to whom it should belong",
             "a migration cannot save"}};
  }
  if (user.value() == attributes.owner) return {};
  return {{"foreign-owner", "", "", "it belongs to the user " + std::to_string(attributes.owner) + ", not to " + owner,
           "a migration leaves a file that belongs to " + owner}};
}

std::vector<Path> filesIn(const Path& directory, const std::function<bool(const std::string&)>& isMeant) {
  const auto keeper = platform::makeFileKeeper(*platform::current().directories);
  std::vector<Path> files;
  for (const std::string& name : keeper->entriesOf(directory).valueOr({})) {
    if (isMeant(name)) files.push_back(directory / name);
  }
  return files;
}

bool isNumber(std::string_view text) {
  return !text.empty() && text.find_first_not_of("0123456789") == std::string_view::npos;
}

// What runs keep beside a file is named for why, and numbered: as in `.unreadable-1`.
std::vector<Path> keptBeside(const Path& path) {
  constexpr std::array<std::string_view, 5> kReasons{"unreadable", "newer", "interrupted", "unconverted", "unsaved"};
  std::vector<Path> kept;
  for (const std::string_view reason : kReasons) {
    const std::string beginning = path.filename().string() + "." + std::string{reason} + "-";
    std::ranges::move(filesIn(path.parent_path(),
                              [&beginning](const std::string& name) {
                                return name.starts_with(beginning) && isNumber(name.substr(beginning.size()));
                              }),
                      std::back_inserter(kept));
  }
  return kept;
}

Path besideIt(const Path& path, std::string_view before, std::string_view behind) {
  return path.parent_path() / (std::string{before} + path.filename().string() + std::string{behind});
}

void addIfThere(const Path& path, const Finding& finding, std::vector<Leftover>& found) {
  if (attributesOf(path).isOk()) found.push_back({path, finding});
}

// Copies that earlier releases made and runs kept, and what stands in the marker's place.
void lookBesideTheFiles(std::vector<Leftover>& found) {
  const Path exchange = pathOf(LegacyForm::exchange);
  const Path mail = pathOf(LegacyForm::mail);
  for (const Path& legacy : {exchange, mail}) {
    const bool isConverted = platform::current().files->kindOf(legacy).isOk() && !isDeletionUnderWay();
    addIfThere(besideIt(legacy, "", ".original"),
               {"companion", "", "", "an earlier release left this copy of " + legacy.filename().string(),
                isConverted ? "a migration deletes it with the file itself" : "a migration leaves it"},
               found);
  }
  const Path copyAside = platform::current().directories->sharedResources() / accountsettings::kCrashReporterDirectory /
                         AccountsManager::fullPathToAccountSettingsPlist().filename();
  const Finding kept{"kept-copy", "", "", "a run kept it: what stands in it may stand nowhere else",
                     "a migration leaves it"};
  for (const Path& path : {copyAside, AccountsManager::fullPathToAccountSettingsPlist(), exchange, mail}) {
    for (const Path& each : keptBeside(path)) addIfThere(each, kept, found);
  }
  const Path marker = accountsettings::mailAutoFetchMarkerPath();
  if (const auto attributes = attributesOf(marker); attributes.isOk() && attributes.value().kind != FileKind::file) {
    found.push_back({marker,
                     {"no-file", "", "", "the mail application's mark is no file",
                      "a migration deletes it with everything in it"}});
  }
}

// What runs, restores and saves leave that are killed.
void lookForDeaths(std::vector<Leftover>& found) {
  const Path root = platform::current().directories->systemRoot();
  addIfThere(accountsettings::removalSentinelPath(),
             {"sentinel", "", "", "a run died while it deleted the files of the first releases",
              "a migration finishes the deletion, converting nothing, and leaves the rest to the next one"},
             found);
  addIfThere(platform::runMarkOf(root),
             {"killed-run", "", "", "a run was killed while it worked: version steps of it may be missing",
              "a migration takes up none that the settings file's version says are done, and keeps the copy from "
              "before it"},
             found);
  for (const Path& path : {Path{AccountsManager::fullPathToAccountSettingsPlist()}, pathOf(LegacyForm::exchange),
                           pathOf(LegacyForm::mail)}) {
    addIfThere(besideIt(path, ".restoring-", ""),
               {"leftover", "", "", "a restore that died left this copy", "a migration leaves it"}, found);
  }
  for (const Path& path : filesIn(platform::temporaryDirectoryOf(root), &platform::isNameOfSave)) {
    addIfThere(path,
               {"leftover", "", "", "a program that died while it saved left it, with the accounts and their passwords",
                "a migration removes it where a save left it"},
               found);
  }
}

}  // namespace

Findings findingsOfStanding(const Path& path, Part part) {
  const Fates& fates = part == Part::settings ? kFatesOfSettings : kFatesOfLegacyFiles;
  const auto attributes = attributesOf(path);
  if (!attributes.isOk()) return {};
  std::error_code isNoLink;
  const Path target = std::filesystem::read_symlink(path, isNoLink);
  if (!isNoLink) return findingsOfLink(path, target, fates);
  if (attributes.value().kind == FileKind::directory) {
    return {{"no-file", "", "", "it is a directory", fates.directory}};
  }
  if (attributes.value().kind != FileKind::file) {
    return {{"no-file", "", "", "it is a pipe, a socket or a device, and no file", fates.otherKind}};
  }
  Findings findings;
  if (const auto permissions = attributes.value().permissions; (permissions & kOthersBits) != 0) {
    std::array<char, 12> mode{};
    std::snprintf(mode.data(), mode.size(), "%03o", permissions);
    findings.push_back({"open-to-others", "", "",
                        "others may read or change it: its mode is " + std::string{mode.data()}, fates.openToOthers});
  }
  if (part == Part::settings) std::ranges::move(findingsOfOwner(attributes.value()), std::back_inserter(findings));
  return findings;
}

Finding unreadable(const platform::Status& reading, Part part) {
  if (reading.cause() == platform::Cause::unsafe) {
    return {"unsafe", "", "", "somebody else may have put it there: " + reading.reason(),
            "a migration is refused, and nothing is changed"};
  }
  return {"unreadable", "", "", reading.reason(),
          part == Part::settings
              ? "a migration takes it for an empty one and saves a file without accounts in its place"
              : "a migration converts nothing from it, and deletes it"};
}

std::vector<Leftover> leftoversOnDevice() {
  std::vector<Leftover> found;
  lookBesideTheFiles(found);
  lookForDeaths(found);
  return found;
}

}  // namespace tools
