#include <algorithm>

#include "host/explanation_output.h"
#include "host/fact_json.h"
#include "platform/description.h"

namespace host {
namespace {

using platform::Array;
using platform::PropertyValue;
using platform::RecordChange;
using platform::RecordName;
using platform::RunFact;
using Kind = RunFact::Kind;

constexpr std::size_t kLongestValue = 80;
constexpr std::size_t kMostChangedAccounts = 40;  // of one stage

std::string quoted(const std::string& text) { return platform::description(PropertyValue{text}); }

// Cut between two characters.
std::string shortened(std::string text) {
  if (text.size() <= kLongestValue) return text;
  std::size_t end = kLongestValue;
  while (end > 0 && (static_cast<unsigned char>(text[end]) & 0xC0U) == 0x80U) --end;
  return text.substr(0, end) + "…";
}

// Mail "June" (4F1C…), in 0B6C…
std::string shown(const RecordName& name) {
  std::string text = name.type.empty() ? "account" : name.type;
  if (!name.name.empty()) text += " " + shortened(quoted(name.name));
  if (!name.identifier.empty()) text += " (" + shortened(name.identifier) + ")";
  if (!name.parent.empty()) text += ", in " + shortened(name.parent);
  return text;
}

std::string shownWithoutParent(RecordName name) {
  name.parent.clear();
  return shown(name);
}

std::string shownAll(const std::vector<RecordName>& names) {
  std::string text;
  for (const RecordName& name : names) text += (text.empty() ? "" : " and ") + shown(name);
  return text;
}

// --- Changes ---

bool contains(const Array& array, const PropertyValue& value) { return std::ranges::find(array, value) != array.end(); }

std::string membership(const Array& of, const Array& notOf, std::string_view mark) {
  std::string text;
  for (const PropertyValue& element : of) {
    if (!contains(notOf, element)) text += " " + std::string{mark} + platform::description(element);
  }
  return text;
}

// What a list gained and lost; empty where that does not tell the change.
std::string listChange(const RecordChange& change) {
  const Array* const before = change.from ? change.from->asArray() : nullptr;
  const Array* const after = change.to ? change.to->asArray() : nullptr;
  if (before == nullptr || after == nullptr || platform::namesCredential(change.key)) return {};
  const std::string members = membership(*after, *before, "+") + membership(*before, *after, "-");
  return members.empty() && before->size() == after->size() ? " in another order" : members;
}

std::string shownValue(const RecordChange& change, const std::optional<PropertyValue>& value) {
  return value ? shortened(platform::descriptionUnder(keyForShowing(change), *value)) : "nothing";
}

std::string shown(const RecordChange& change) {
  if (!change.oldKey.empty()) {
    const std::string former = change.from ? ", in place of " + shownValue(change, change.from) : "";
    return "~ " + change.oldKey + " is now " + change.key + ": " + shownValue(change, change.to) + former;
  }
  if (!change.from) return "+ " + change.key + ": " + shownValue(change, change.to);
  if (!change.to) return "- " + change.key + ": " + shownValue(change, change.from);
  if (const std::string list = listChange(change); !list.empty()) return "~ " + change.key + ":" + list;
  return "~ " + change.key + ": " + shownValue(change, change.from) + " -> " + shownValue(change, change.to);
}

bool isRenamed(const RecordChange& change) { return !change.oldKey.empty(); }
bool isAdded(const RecordChange& change) { return change.oldKey.empty() && !change.from; }
bool isRemoved(const RecordChange& change) { return change.oldKey.empty() && !change.to; }

// One line of those changes that are alike, by their keys alone.
std::string keysOf(const RunFact& fact, std::string_view title, bool (*isMeant)(const RecordChange&)) {
  std::string text;
  for (const RecordChange& change : fact.changes) {
    if (!isMeant(change)) continue;
    text += (text.empty() ? "    " + std::string{title} + ": " : ", ") +
            (change.oldKey.empty() ? change.key : change.oldKey + " to " + change.key);
  }
  return text.empty() ? text : text + "\n";
}

// How a description became a record: the values are mostly the same, so the keys tell it.
std::string conversionOf(const RunFact& fact) {
  std::string text = keysOf(fact, "renamed", &isRenamed);
  for (const RecordChange& change : fact.changes) {
    if (!isRenamed(change) && !isAdded(change) && !isRemoved(change)) text += "    " + shown(change) + "\n";
  }
  return text + keysOf(fact, "added", &isAdded) + keysOf(fact, "removed", &isRemoved);
}

std::string changesOf(const RunFact& fact) {
  std::string text;
  for (const RecordChange& change : fact.changes) text += "    " + shown(change) + "\n";
  return text;
}

// --- Facts ---

std::string because(const RunFact& fact) { return fact.reason.empty() ? "\n" : ": " + fact.reason + "\n"; }

std::string destinationOf(const RunFact& fact) {
  return fact.others.empty() ? " out of its parent" : " into " + shownAll(fact.others);
}

std::string shown(const RunFact& fact) {
  const std::string subject = shown(fact.subject);
  switch (fact.kind) {
    case Kind::loaded: return "";
    case Kind::unread: return "  NOT READ: " + fact.path + because(fact);
    case Kind::added: return "  added: " + subject + "\n";
    case Kind::converted: return "  converted: " + subject + " from " + fact.reason + "\n" + conversionOf(fact);
    case Kind::changed: return "  " + subject + "\n" + changesOf(fact);
    case Kind::moved: return "  moved: " + shownWithoutParent(fact.subject) + destinationOf(fact) + "\n";
    case Kind::folded: return "  folded: " + subject + destinationOf(fact) + because(fact);
    case Kind::dropped: return "  dropped: " + subject + because(fact);
    case Kind::repeated: return "  repeated: " + subject + " stands there once more\n";
    case Kind::unrepaired: return "  kept as it is: " + subject + because(fact);
    case Kind::failed: return "  not converted: " + fact.reason + "\n";
    case Kind::saved: return "";
    case Kind::saveFailed: return "  NOT SAVED: " + fact.reason + "\n";
    case Kind::fileRemoved:
    case Kind::sourceRemoved: return "  removed: " + fact.path + "\n";
    case Kind::fileUnremoved: return "  not removed: " + fact.path + because(fact);
  }
  return "";
}

std::string titleOf(const Explanation::Stage& stage) {
  const bool isPartOfStep = stage.name == "save" && !stage.within.empty();
  return "\n" + stage.name + (isPartOfStep ? ", within " + stage.within : "") + "\n";
}

// The stage's facts under its name; empty where none of them is worth a line.
std::string shown(const Explanation::Stage& stage) {
  std::string text;
  std::size_t changed = 0;
  for (const RunFact& fact : stage.facts) {
    if (fact.kind == Kind::changed && ++changed > kMostChangedAccounts) continue;
    text += shown(fact);
  }
  if (changed > kMostChangedAccounts) {
    text += "  and " + std::to_string(changed - kMostChangedAccounts) + " more accounts with other values\n";
  }
  return text.empty() ? text : titleOf(stage) + text;
}

// --- The whole ---

std::string heading(const Outcome& outcome) {
  return outcome.isRehearsal ? "What a run would do (this was a rehearsal: nothing on the device was changed)\n"
                             : "What the run did\n";
}

std::string tally(const Explanation& explanation) {
  std::string text;
  for (const Kind kind : {Kind::added, Kind::converted, Kind::moved, Kind::folded, Kind::dropped}) {
    const std::size_t count = explanation.count(kind);
    if (count > 0) text += ", " + std::to_string(count) + " " + std::string{actionOf(kind)};
  }
  return text;
}

std::string savedAs(const RunFact& save) {
  if (save.kind == Kind::saveFailed) return "; THE ACCOUNTS WERE NOT SAVED";
  return "; " + std::to_string(save.count) + " accounts of data version " + std::to_string(save.version);
}

std::string result(const Explanation& explanation, const Outcome& outcome) {
  const RunFact* const save = explanation.lastSave();
  return "\nresult: " + std::string{outcome.success ? "success" : "failure"} + (save == nullptr ? "" : savedAs(*save)) +
         tally(explanation) + "\n";
}

// What became of the file that stood in the place of the settings and could not be read.
std::string fateOfUnread(const RunFact& unread, const RunFact* save) {
  const std::string text = "\nWARNING: " + unread.path + " could not be read";
  if (save == nullptr || save->kind != Kind::saved) return text + "; it is still there.\n";
  return text + "; " + (save->count == 0 ? "an empty one" : "another one") + " was put in its place.\n";
}

std::string warnings(const Explanation& explanation) {
  std::string text;
  if (const RunFact* const unread = explanation.unreadFile()) text += fateOfUnread(*unread, explanation.lastSave());
  for (const std::string& file : explanation.lostFiles()) {
    text += "\nWARNING: the accounts of " + file + " are lost: the file was removed although they were not saved.\n";
  }
  if (!explanation.isComplete())
    text += "\nWARNING: memory ran out while the run was watched; something is missing here.\n";
  return text;
}

}  // namespace

std::string textOf(const Explanation& explanation, const Outcome& outcome) {
  std::string stages;
  for (const Explanation::Stage& stage : explanation.stages()) stages += shown(stage);
  if (stages.empty()) stages = "\nNo account was changed.\n";
  return heading(outcome) + stages + result(explanation, outcome) + warnings(explanation);
}

}  // namespace host
