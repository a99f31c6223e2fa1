#include <algorithm>

#include "commandline/text.h"
#include "host/explanation.h"
#include "host/fact_json.h"
#include "host/verdict.h"
#include "records/description.h"

namespace host {
namespace {

using namespace records;  // the facts
using platform::Array;

constexpr std::size_t kMaxValueLength = 80;
constexpr std::size_t kMaxChangedAccounts = 40;  // of one stage

// Every line of the explanation is made here.
std::string lineOf(std::size_t indentation, const std::string& text) {
  return std::string(indentation, ' ') + commandline::printable(text) + "\n";
}

// Cut between two characters.
std::string shortened(std::string text) {
  if (text.size() <= kMaxValueLength) return text;
  std::size_t end = kMaxValueLength;
  while (end > 0 && (static_cast<unsigned char>(text[end]) & 0xC0U) == 0x80U) --end;
  return text.substr(0, end) + "…";
}

// Mail "June" (4F1C…), in 0B6C…
std::string shown(const Name& name) {
  std::string text = name.type.empty() ? "account" : name.type;
  if (!name.name.empty()) text += " " + shortened(description(PropertyValue{name.name}));
  if (!name.identifier.empty()) text += " (" + shortened(name.identifier) + ")";
  if (!name.parent.empty()) text += ", in " + shortened(name.parent);
  return text;
}

// --- Changes ---

std::string membership(const Array& of, const Array& notOf, std::string_view mark) {
  std::string text;
  for (const PropertyValue& element : of) {
    if (std::ranges::find(notOf, element) == notOf.end()) text += " " + std::string{mark} + description(element);
  }
  return text;
}

// What a list gained and lost; empty where that does not tell the change.
std::string listChange(const Change& change) {
  const Array* const before = change.from ? change.from->asArray() : nullptr;
  const Array* const after = change.to ? change.to->asArray() : nullptr;
  if (before == nullptr || after == nullptr || namesCredential(change.key)) return {};
  const std::string members = membership(*after, *before, "+") + membership(*before, *after, "-");
  return members.empty() && before->size() == after->size() ? " in another order" : members;
}

// A list of names, such as data classes, is never cut: what is left out of it is what people look for.
std::string shownValue(const Change& change, const std::optional<PropertyValue>& value) {
  if (!value) return "nothing";
  std::string text = descriptionUnder(keyForShowing(change), *value);
  const Array* const array = value->asArray();
  const bool isListOfTexts = array != nullptr && std::ranges::all_of(*array, [](const PropertyValue& each) {
                               return each.asText() != nullptr;
                             });
  return isListOfTexts ? text : shortened(std::move(text));
}

std::string shown(const Change& change) {
  if (!change.oldKey.empty()) {
    const std::string former = change.from ? ", in place of " + shownValue(change, change.from) : "";
    return "~ " + change.oldKey + " is now " + change.key + ": " + shownValue(change, change.to) + former;
  }
  if (!change.from) return "+ " + change.key + ": " + shownValue(change, change.to);
  if (!change.to) return "- " + change.key + ": " + shownValue(change, change.from);
  if (const std::string list = listChange(change); !list.empty()) return "~ " + change.key + ":" + list;
  return "~ " + change.key + ": " + shownValue(change, change.from) + " -> " + shownValue(change, change.to);
}

bool isRenamed(const Change& change) { return !change.oldKey.empty(); }
bool isAdded(const Change& change) { return change.oldKey.empty() && !change.from; }
bool isRemoved(const Change& change) { return change.oldKey.empty() && !change.to; }

// One line of those changes that are alike, by their keys alone.
std::string keysOf(const std::vector<Change>& changes, std::string_view title, bool (*isMeant)(const Change&)) {
  std::string text;
  for (const Change& change : changes) {
    if (!isMeant(change)) continue;
    text += (text.empty() ? std::string{title} + ": " : ", ") +
            (change.oldKey.empty() ? change.key : change.oldKey + " to " + change.key);
  }
  return text.empty() ? text : lineOf(4, text);
}

// How a description became a record: the values are mostly the same, so the keys tell it.
std::string conversionOf(const std::vector<Change>& changes) {
  std::string text = keysOf(changes, "renamed", &isRenamed);
  for (const Change& change : changes) {
    if (!isRenamed(change) && !isAdded(change) && !isRemoved(change)) text += lineOf(4, shown(change));
  }
  return text + keysOf(changes, "added", &isAdded) + keysOf(changes, "removed", &isRemoved);
}

// --- Facts ---

std::string line(std::string_view kind, const std::string& rest) { return lineOf(2, std::string{kind} + ": " + rest); }

// What is told of by the result or by another fact has no line of its own.
std::string shown(const Loaded& /*it*/) { return {}; }
std::string shown(const CopiedAside& /*it*/) { return {}; }
std::string shown(const KeptAside& it) {
  return line("kept aside", (it.file.empty() ? "the settings file" : it.file) + ", as " + it.where);
}
std::string shown(const Swept& it) { return line("swept", it.file + ", which a program that was killed had left"); }
std::string shown(const Added& it) { return line("added", shown(it.account)); }
std::string shown(const Converted& it) {
  const std::string instead = it.isReplacement ? ", in place of the account with this identifier" : "";
  return line("converted", shown(it.account) + " from " + it.from + instead) + conversionOf(it.changes);
}
std::string shown(const Changed& it) {
  std::string text = lineOf(2, shown(it.account));
  for (const Change& change : it.changes) text += lineOf(4, shown(change));
  return text;
}
std::string shown(const Moved& it) {
  Name account = it.account;
  account.parent.clear();
  return line("moved", shown(account) + (it.into ? " into " + shown(*it.into) : " out of its parent"));
}
std::string shown(const Folded& it) {
  std::string into;
  for (const Name& name : it.into) into += (into.empty() ? "" : " and ") + shown(name);
  return line("folded", shown(it.account) + " into " + into + ": " + it.reason);
}
std::string shown(const Lost& it) { return line("lost", textOf(it)); }
std::string shown(const Repeated& it) { return line("repeated", shown(it.account) + " stands there once more"); }
std::string shown(const Unrepaired& it) { return line("kept as it is", shown(it.account) + ": " + it.reason); }
std::string shown(const Saved& /*it*/) { return {}; }
std::string shown(const SaveFailed& it) { return line("NOT SAVED", it.cause); }
std::string shown(const FileRemoved& it) { return line("removed", it.file); }
std::string shown(const FileNotRemoved& it) { return line("not removed", it.file + ": " + it.cause); }

// The stage's facts under its title, such as
//
//   version 4 to 5: Gmail and Yahoo accounts get their own type (_migrateAccountsFrom7A242:)
//
// Empty where none of them is worth a line.
std::string shown(const Explanation::Stage& stage) {
  std::string text;
  std::size_t changed = 0;
  for (const Fact& fact : stage.facts) {
    if (std::holds_alternative<Changed>(fact) && ++changed > kMaxChangedAccounts) continue;
    text += std::visit([](const auto& each) { return shown(each); }, fact);
  }
  if (changed > kMaxChangedAccounts) {
    text += lineOf(2, "and " + std::to_string(changed - kMaxChangedAccounts) + " more accounts with other values");
  }
  if (text.empty()) return text;
  const bool isPartOfStep = stage.name == "save" && !stage.within.empty();
  const std::string title = stage.words.empty() ? stage.name : stage.words + " (" + stage.name + ")";
  return "\n" + lineOf(0, title + (isPartOfStep ? ", within " + stage.within : "")) + text;
}

// --- The whole ---

// How the settings file was and is.
std::string stateOf(const Explanation& explanation) {
  std::string was;
  std::string is;
  explanation.forEachFact([&](const Fact& fact) {
    if (const auto* const loaded = std::get_if<Loaded>(&fact); loaded != nullptr && loaded->accounts > 0) {
      was = std::to_string(loaded->version);
    }
    if (const auto* const saved = std::get_if<Saved>(&fact)) {
      is = std::to_string(saved->accounts) + " accounts of data version " + std::to_string(saved->version);
    }
  });
  if (is.empty()) return is;
  return "; " + is + (was.empty() ? "" : ", stored before as version " + was);
}

std::string ending(const Verdict& verdict) {
  switch (verdict.kind) {
    case Verdict::Kind::kept: return "; everything was kept";
    case Verdict::Kind::lost: return "; ACCOUNTS WERE LOST";
    case Verdict::Kind::notSaved: return "; THE ACCOUNTS WERE NOT SAVED";
  }
  return {};
}

std::string warnings(const Explanation& explanation, const Verdict& verdict) {
  std::string text;
  for (const std::string& warning : warningsOf(verdict)) text += lineOf(0, "WARNING: " + warning);
  if (!explanation.isComplete()) {
    text += lineOf(0, "WARNING: memory ran out while the run was watched; something is missing here.");
  }
  return text.empty() ? text : "\n" + text;
}

}  // namespace

std::string textOf(const Lost& lost) {
  const LossMeaning& meaning = meaningOf(lost.code);
  const bool isSubjectSaidByCode = lost.code == LossCode::unreadableSettingsFile ||
                                   lost.code == LossCode::newerSettingsFile || lost.code == LossCode::failedStep;
  const std::string subject = lost.account == Name{} && !lost.file.empty() ? lost.file : shown(lost.account);
  return (isSubjectSaidByCode ? "" : subject + ": ") + std::string{meaning.text} +
         (lost.detail.empty() ? "" : ": " + lost.detail) + " [" + std::string{meaning.name} + "]";
}

std::vector<std::string> warningsOf(const Verdict& verdict) {
  std::vector<std::string> warnings;
  if (verdict.kind == Verdict::Kind::notSaved) warnings.push_back("the accounts were not saved: " + verdict.cause);
  for (const Lost& lost : verdict.lost) {
    warnings.push_back("lost: " + textOf(lost) + "; its data is " +
                       (lost.where.empty() ? "nowhere else on the device" : "still in " + lost.where));
  }
  return warnings;
}

std::string textOf(const Explanation& explanation, const Verdict& verdict, const ExplainedRun& run) {
  std::string stages;
  for (const Explanation::Stage& stage : explanation.stages()) stages += shown(stage);
  if (stages.empty()) stages = "\nNo account was changed.\n";
  std::string tally;
  for (const auto& [name, count] : countsOf(explanation, verdict).named()) {
    if (count > 0) tally += (tally.empty() ? "" : ", ") + std::to_string(count) + " " + std::string{name};
  }
  const std::string heading = run.isRehearsal
                                  ? "What a run would do (this was a rehearsal: nothing on the device was changed)\n"
                                  : "What the run did\n";
  return heading + stages + "\n" +
         lineOf(0, "result: " + std::string{run.success ? "success" : "failure"} + ending(verdict) +
                       stateOf(explanation)) +
         lineOf(0, "accounts: " + (tally.empty() ? "none" : tally)) +
         lineOf(0, "run: migration-host " + std::string{run.version} + " on " + run.root + " at " + run.time) +
         warnings(explanation, verdict);
}

}  // namespace host
