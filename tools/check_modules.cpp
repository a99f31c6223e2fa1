#include <algorithm>
#include <filesystem>
#include <map>
#include <nlohmann/json.hpp>

#include "commandline/program.h"
#include "commandline/table.h"
#include "commandline/text.h"
#include "platform/base_directories.h"
#include "platform/platform.h"
#include "tools/commands.h"
#include "tools/creator_entries.h"
#include "tools/module_trial.h"

namespace tools {
namespace {

using commandline::printable;
using Json = nlohmann::ordered_json;
using Ended = ModuleTrial::Ended;

constexpr int kSchema = 1;

Json orNull(const std::string& text) { return text.empty() ? Json(nullptr) : Json(printable(text)); }

Json textsOf(const std::vector<std::string>& texts) {
  Json list = Json::array();
  for (const std::string& each : texts) list.push_back(printable(each));
  return list;
}

// One file, what is found in it, and how that is told.
class ModuleCheck {
 public:
  ModuleCheck(platform::Path file, CreatorTable table) : _file{std::move(file)}, _table{std::move(table)} {}

  // Looks into the modules of the entries that the library would get to. A module that could not be opened once is not
  // opened again.
  void tryModules() {
    std::map<std::string, ModuleTrial> failures;
    for (CreatorEntry& entry : _table.entries) {
      if (entry.isCalled == false) continue;
      const auto path = pathOf(entry).string();
      const bool isFull = entry.kind == kFullAccountEntry;
      const auto failed = failures.find(path);
      const auto trial = failed == failures.end() ? tryModule(path, entry.className,
                                                              isFull ? std::optional{entry.accountType} : std::nullopt)
                                                  : failed->second;
      if (trial.ended != Ended::answered) failures.emplace(path, trial);
      entry.answers = trial.answers;
      entry.isCalled = true;
      judge(entry, trial);
    }
  }

  [[nodiscard]] ExitStatus status() const { return _table.findings.empty() ? ExitStatus::done : ExitStatus::findings; }

  [[nodiscard]] std::string text(const commandline::Page& page) const {
    std::vector<commandline::Row> rows{commandline::Row{{"ENTRY", "KIND", "CLASS", "CALLED", "DATA CLASSES", "MODULE"},
                                                        commandline::Emphasis::strong}};
    for (const CreatorEntry& each : _table.entries) {
      rows.push_back({each.place, each.kind, each.className, calledOf(each), dataclassesOf(each), each.framework});
    }
    const auto count = _table.findings.size();
    std::string report = printable(_file.string()) + ": " + (count == 0 ? "no" : std::to_string(count)) + " finding" +
                         (count == 1 ? "" : "s") + "\n" + commandline::table(rows, page);
    for (const ModuleFinding& each : _table.findings) {
      report += printable(each.place + ": " + each.what) + "\n    " + printable(each.effect) + "\n";
    }
    return report;
  }

  [[nodiscard]] std::string json() const {
    Json report{{"schema", kSchema},
                {"file", printable(_file.string())},
                {"entries", Json::array()},
                {"findings", Json::array()}};
    for (const CreatorEntry& each : _table.entries) {
      report["entries"].push_back({{"place", printable(each.place)},
                                   {"type", printable(each.accountType)},
                                   {"kind", orNull(each.kind)},
                                   {"module", orNull(each.framework.empty() ? "" : pathOf(each).string())},
                                   {"class", orNull(each.className)},
                                   {"dataclasses", each.kind == kNotifierEntry ? textsOf(each.dataclasses) : nullptr},
                                   {"answers", textsOf(each.answers)},
                                   {"called", each.isCalled ? Json(*each.isCalled) : nullptr}});
    }
    for (const ModuleFinding& each : _table.findings) {
      report["findings"].push_back({{"kind", each.kind},
                                    {"place", printable(each.place)},
                                    {"what", printable(each.what)},
                                    {"effect", each.effect}});
    }
    return report.dump(2) + "\n";
  }

 private:
  [[nodiscard]] static platform::Path pathOf(const CreatorEntry& entry) {
    return platform::current().directories->systemRoot() / platform::Path{entry.framework}.relative_path();
  }

  void judge(CreatorEntry& entry, const ModuleTrial& trial) {
    const auto find = [&](std::string_view kind, const std::string& what, const std::string& effect) {
      _table.findings.push_back({kind, entry.place, what, effect});
      entry.isCalled = false;
    };
    const bool isSync = entry.kind == kSyncAccountEntry;
    const std::string failure =
        isSync ? "such an account has none, and its refreshes answer false" : effectOfFailure(entry.kind);
    if (trial.ended == Ended::notOpened) {
      find("not-opened", trial.why, effectOfFailure(entry.kind));
    } else if (trial.ended == Ended::died) {
      find("died", "when the module was tried, " + trial.why, "whoever opens the module ends so");
    } else if (trial.found == ModuleTrial::Found::none) {
      find("no-such-class", "opening the module registers no class " + entry.className, failure);
    } else if (const auto missing = missingOperation(entry, trial); !missing.empty()) {
      find("answers-nothing", entry.className + " does not answer " + missing, failure);
    }
  }

  // What the class does not answer and is asked for; empty where there is nothing.
  [[nodiscard]] static std::string missingOperation(const CreatorEntry& entry, const ModuleTrial& trial) {
    const auto unlessAnswered = [&](const char* operation) {
      return trial.answersTo(operation) ? std::string{} : std::string{operation};
    };
    if (entry.kind == kSyncAccountEntry) return unlessAnswered("accountToRefreshForBasicAccount");
    if (entry.kind == kNotifierEntry) return unlessAnswered("noteAccountChanges");
    if (trial.answersTo("classForAccountType")) {
      return trial.answersTo("initWithProperties")
                 ? ""
                 : "classForAccountType with a class that has initWithProperties, for the type " + entry.accountType;
    }
    return trial.answersTo("accountWithBasicAccount") ? "" : "classForAccountType or accountWithBasicAccount";
  }

  [[nodiscard]] static std::string calledOf(const CreatorEntry& entry) {
    if (!entry.isCalled) return "not tried";
    if (!*entry.isCalled) return "never";
    if (entry.kind == kFullAccountEntry) return "for the full account";
    if (entry.kind == kSyncAccountEntry) return "for the sync account";
    const auto whenAnswered = [&](std::string_view operation, const char* when) {
      return std::ranges::count(entry.answers, operation) == 0 ? "" : when;
    };
    return std::string{whenAnswered("accountWillChange_forDataclass", "before a switch, ")} +
           whenAnswered("accountDidChange_forDataclass", "after a switch, ") + "after a save";
  }

  [[nodiscard]] static std::string dataclassesOf(const CreatorEntry& entry) {
    static constexpr std::string_view kPrefix = "com.vorlix.Dataclass.";
    std::string list;
    for (const std::string& each : entry.dataclasses) {
      list += (list.empty() ? "" : " ") + each.substr(each.starts_with(kPrefix) ? kPrefix.size() : 0);
    }
    return list;
  }

  platform::Path _file;
  CreatorTable _table;
};

}  // namespace

Outcome checkModules(Session& session, const Words& arguments, const Options& options) {
  session.beginLooking();
  const auto& services = platform::current();
  const auto file = arguments.empty() ? services.directories->resources() / "AccountCreators.plist"
                                      : std::filesystem::absolute(arguments[0]);
  const auto read = services.propertyLists->readDictionary(file);
  if (!read.isOk()) {
    throw Failure{ExitStatus::failed, "the file cannot be read: " + file.string() + ": " + read.status().reason()};
  }
  ModuleCheck check{file, creatorTableIn(read.value())};
  if (options.opensModules()) {
    check.tryModules();
  } else {
    commandline::say("accountctl", "no module is opened; modules under another root are opened only with --modules");
  }
  return {options.printsJson ? check.json() : check.text(options.page()), check.status()};
}

}  // namespace tools
