#include "tools/remedies.h"

#include <algorithm>
#include <array>
#include <stdexcept>
#include <string_view>

namespace tools {
namespace {

enum class Act : std::uint8_t {
  nothing,
  keepCopy,
  moveAway,
  replaceLink,
  look,
  verify,
  remove,
  closeToOthers,
  giveToMobile,
  makeMobile,
  list,
  save,
  rehearse
};

struct Row {
  std::string_view kind;
  std::string_view advice;
  Act act;
};

constexpr std::string_view kKeepAndRecover =
    "keep a copy of the file before one runs; accountctl recover brings the record back from it, repaired";
constexpr std::string_view kRehearse = "see what it makes of each account before it runs";
constexpr std::string_view kLeave = "nothing need be done";

constexpr auto kRows = std::to_array<Row>({
    {"unreadable", "keep a copy of the file for what can be rescued, and put a sound one in its place", Act::keepCopy},
    {"unsafe", "see whose it is; put the file itself there, with no second name", Act::look},
    {"link", "put the file itself there", Act::replaceLink},
    {"no-file", "take it away", Act::moveAway},
    {"open-to-others", "keep it from others, since passwords stand in it", Act::closeToOthers},
    {"foreign-owner", "give it to its owner", Act::giveToMobile},
    {"no-owner", "make the user, with the group of the same name", Act::makeMobile},
    {"no-accounts", "keep a copy of the file before one runs, unless the device has no accounts", Act::keepCopy},
    {"unknown-key", "keep a copy of the file before one runs, if something reads the key", Act::keepCopy},
    {"version-older", kRehearse, Act::rehearse},
    {"version-newer", "keep a copy of the file before one runs, for what only the newer release knows", Act::keepCopy},
    {"version-absent", kRehearse, Act::rehearse},
    {"version-odd", kRehearse, Act::rehearse},
    {"no-record", kKeepAndRecover, Act::keepCopy},
    {"unknown-type", kKeepAndRecover, Act::keepCopy},
    {"no-class", kKeepAndRecover, Act::keepCopy},
    {"unknown-class", kKeepAndRecover, Act::keepCopy},
    {"orphaned-children", kKeepAndRecover, Act::keepCopy},
    {"repairable-class", "nothing need be done; every load repairs it, and this for good", Act::save},
    {"no-identifier", kLeave, Act::nothing},
    {"duplicate-identifier", "keep a copy of the file before anything saves it, and rename one of them", Act::keepCopy},
    {"unreadable-children", kLeave, Act::nothing},
    {"legacy", kRehearse, Act::rehearse},
    {"refused-description", kKeepAndRecover, Act::keepCopy},
    {"interrupted-run", "compare what it makes of each account with those that are listed", Act::rehearse},
    {"replaced-with-type", kKeepAndRecover, Act::keepCopy},
    {"companion", "see whether it has accounts that are nowhere else", Act::verify},
    {"sentinel", "see whether the accounts of those files are on the device before one runs", Act::list},
    {"killed-run", "see what is still ahead; where steps are missing, put the copy from before it in place",
     Act::rehearse},
    {"kept-copy", "bring back what is missed with accountctl recover, and remove it when nothing is", Act::verify},
    {"leftover", "remove it, unless the settings file was lost", Act::remove},
});

std::string quoted(const std::string& word) {
  constexpr std::string_view kPlain = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789_-./:=@%+,";
  if (!word.empty() && word.find_first_not_of(kPlain) == std::string::npos) return word;
  std::string text = "'";
  for (const char letter : word) text += letter == '\'' ? std::string{"'\\''"} : std::string(1, letter);
  return text + "'";
}

std::string onDevice(const char* program, const Options& options) {
  std::string command = program;
  if (options.device.systemRoot) command += " --root " + quoted(options.device.systemRoot->string());
  if (options.device.home) command += " --home " + quoted(options.device.home->string());
  return command;
}

std::string commandFor(Act act, const std::string& file, const Options& options) {
  const std::string path = quoted(file);
  const std::string kept = quoted(file + ".kept");
  const auto& root = options.device.systemRoot;
  switch (act) {
    case Act::nothing: return {};
    case Act::keepCopy: return "cp -p " + path + " " + kept;
    case Act::moveAway: return "mv " + path + " " + kept;
    case Act::replaceLink: return "cp -p --remove-destination \"$(readlink -f " + path + ")\" " + path;
    case Act::look: return "ls -l " + path;
    case Act::verify: return onDevice("accountctl", options) + " verify " + path;
    case Act::remove: return "rm " + path;
    case Act::closeToOthers: return "chmod go= " + path;
    case Act::giveToMobile: return "chown mobile:mobile " + path;
    case Act::makeMobile: return "systemd-sysusers" + (root ? " --root=" + quoted(root->string()) : "");
    case Act::list: return onDevice("accountctl", options) + " list";
    case Act::save: return onDevice("accountctl", options) + " save";
    case Act::rehearse: return onDevice("migration-host", options) + " --dry-run --explain";
  }
  return {};
}

}  // namespace

Remedy remedyFor(const Finding& finding, const platform::Path& file, const Options& options) {
  const auto* const row = std::ranges::find(kRows, finding.kind, &Row::kind);
  if (row == kRows.end()) throw std::logic_error{"nothing is known to be done about " + std::string{finding.kind}};
  return {std::string{row->advice}, commandFor(row->act, file.string(), options)};
}

}  // namespace tools
