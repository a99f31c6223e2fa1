#include <algorithm>
#include <array>
#include <nlohmann/json.hpp>

#include "commandline/progress_line.h"
#include "commandline/text.h"
#include "tools/account_view.h"
#include "tools/recovery.h"

namespace tools {
namespace {

using Json = nlohmann::ordered_json;

constexpr int kSchema = 1;

// --- Doing it ---

void bringBack(Session& session, const RecoveryPlan& plan) {
  std::vector<accounts::NewAccount> absent;
  for (const RecoveryStep& step : plan.steps()) {
    if (step.kind != RecoveryStep::Kind::bringBack) continue;
    absent.push_back({.type = "",
                      .accountClass = "",
                      .properties = entriesOf(step.record),
                      .parentIdentifier = step.parent.value_or("")});
  }
  if (absent.empty()) return;
  Session::Concerned concerned;
  session.tryOut([&](accounts::Edit& edit) {
    for (accounts::NewAccount& each : absent) {
      const Account account = required(edit.add(each));
      each.properties = account.ownProperties();
      concerned.emplace_back(account, account.enabledDataclasses());
    }
  });
  session.change(concerned, [&absent](accounts::Edit& edit) {
    for (const accounts::NewAccount& each : absent) required(edit.add(each));
  });
}

// --- Telling it ---

std::string lineOf(const RecoveryStep& step, const AccountFile& file, bool isTried) {
  const std::string what = step.from->described();
  const std::string why = step.why.empty() ? "" : ": " + step.why;
  switch (step.kind) {
    case RecoveryStep::Kind::leavePresent: return "already there: " + what + why;
    case RecoveryStep::Kind::leaveFaulty: return "left: " + what + why;
    case RecoveryStep::Kind::bringBack: break;
  }
  const std::string version = file.isOlder() ? "; what a migration from data version " +
                                                   std::to_string(file.version().value_or(0)) +
                                                   " does to such an account was not done"
                                             : "";
  return (isTried ? "would bring back: " : "brought back: ") + what + why + version;
}

Outcome told(const RecoveryPlan& plan, const AccountFile& file, const Options& options) {
  static constexpr std::array kOutcomes{"recovered", "present", "faulty"};
  Json report{{"schema", kSchema}, {"dryRun", options.changesNothing}, {"accounts", Json::array()}};
  std::string text;
  bool isFaulty = false;
  for (const RecoveryStep& step : plan.steps()) {
    const Names names = namesOf(step.record);
    report["accounts"].push_back({{"outcome", kOutcomes.at(static_cast<std::size_t>(step.kind))},
                                  {"place", step.from->place()},
                                  {"identifier", names.identifier},
                                  {"name", names.name},
                                  {"why", step.why.empty() ? Json(nullptr) : Json(step.why)}});
    text += commandline::printable(lineOf(step, file, options.changesNothing)) + "\n";
    isFaulty |= step.kind == RecoveryStep::Kind::leaveFaulty;
  }
  if (plan.steps().empty()) text = "there are no accounts\n";
  return {options.printsJson ? report.dump(2) + "\n" : text, isFaulty ? ExitStatus::incomplete : ExitStatus::done};
}

// Of an earlier release's file, an account that is not there may have been folded into another one by the migration.
void refuseUnnamed(const RecoveryPlan& plan, const AccountFile& file) {
  std::string absent;
  for (const RecoveryStep& step : plan.steps()) {
    if (step.kind == RecoveryStep::Kind::bringBack) absent += (absent.empty() ? "" : "; ") + step.from->described();
  }
  if (absent.empty()) return;
  throw Failure{ExitStatus::wrongUse,
                file.path.string() + " is of data version " + std::to_string(file.version().value_or(0)) +
                    ", and a migration may have folded what is missing now into other accounts; name what is to come "
                    "back of: " +
                    absent};
}

// Children come back with their parents, and by themselves only where the parent is there.
bool comesWithParent(const FoundAccount& account, const RecoveryPlan& plan) {
  if (!account.child) return false;
  const auto parent = std::ranges::find_if(plan.steps().rbegin(), plan.steps().rend(),
                                           [](const RecoveryStep& step) { return !step.from->child; });
  return parent->kind != RecoveryStep::Kind::leavePresent;
}

Outcome recoverRecords(Session& session, const AccountFile& file, const std::vector<const FoundAccount*>& named,
                       const Options& options) {
  commandline::progressLine().show({"the device's accounts are read", 0.2, 0.4});
  session.beginChanges();
  RecoveryPlan plan{session.accounts()};
  commandline::progressLine().show({"what is missing is looked for", 0.4, 0.5});
  for (const FoundAccount* each : named) {
    plan.add(file, *each, withProperties(each->properties, options.settings));
    const RecoveryStep& step = plan.steps().back();
    if (step.kind != RecoveryStep::Kind::leaveFaulty) continue;
    throw Failure{ExitStatus::failed, step.from->described() + " cannot be brought back: " + step.why};
  }
  if (named.empty()) {
    for (const FoundAccount& each : file.accounts) {
      if (!comesWithParent(each, plan)) plan.add(file, each, each.properties);
    }
    if (file.isOlder()) refuseUnnamed(plan, file);
  }
  commandline::progressLine().show({"the accounts are saved", 0.5, 1});
  bringBack(session, plan);
  return told(plan, file, options);
}

}  // namespace

Outcome recoverAccounts(Session& session, const Words& arguments, const Options& options) {
  const bool isNamed = arguments.size() > 1;
  if (!options.settings.empty() && !isNamed) {
    throw Failure{ExitStatus::wrongUse, "--set is for accounts that are named"};
  }
  commandline::progressLine().show({"what is to come back is read", 0, 0.2});
  const auto source = sourceNamed(arguments[0], options);
  std::vector<Chosen> chosen;
  for (std::size_t index = 1; index < arguments.size(); ++index) {
    chosen.push_back(accountMeantBy(source, arguments[index]));
  }
  // The one file that the accounts are taken from: that of those that are named, else the only one, or the settings.
  const AccountFile& file = chosen.empty() ? source.files.front() : *chosen.front().file;
  std::vector<const FoundAccount*> named;
  for (const Chosen& each : chosen) {
    if (each.file != &file) {
      throw Failure{ExitStatus::wrongUse, "the accounts stand in several files: bring back those of one at a time"};
    }
    named.push_back(each.account);
  }
  if (file.form == FileForm::settings) return recoverRecords(session, file, named, options);
  return recoverLegacyFile(session, file, named, options);
}

}  // namespace tools
