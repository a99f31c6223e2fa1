#include "tests/support/fact_recorder.h"

#include "records/description.h"

namespace tests {
namespace {

using namespace records;  // the facts

std::string shown(const Name& name) {
  return (name.identifier.empty() ? "" : " " + name.identifier) + (name.parent.empty() ? "" : " in " + name.parent);
}

std::string shown(const Change& change) {
  const std::string to = change.to ? description(*change.to) : "";
  if (!change.oldKey.empty()) return change.oldKey + " now " + change.key + " " + to;
  if (!change.from) return "+" + change.key + " " + to;
  if (!change.to) return "-" + change.key;
  return change.key + " " + description(*change.from) + " -> " + to;
}

std::string shown(const std::vector<Change>& changes) {
  std::string line;
  for (const Change& change : changes) line += (line.empty() ? ": " : ", ") + shown(change);
  return line;
}

std::string into(const std::vector<Name>& names) {
  std::string line;
  for (const Name& name : names) line += " into " + name.identifier;
  return line;
}

std::string rest(const Lost& lost) {
  return shown(lost.account) + " (" + std::string{meaningOf(lost.code).name} +
         (lost.detail.empty() ? "" : ": " + lost.detail) + ")";
}

std::string rest(const Fact& fact) {
  return std::visit(
      Visitor{[](const Loaded&) { return std::string{}; }, [](const CopiedAside&) { return std::string{}; },
              [](const KeptAside&) { return std::string{}; }, [](const Swept&) { return std::string{}; },
              [](const Added& it) { return shown(it.account); },
              [](const Converted& it) {
                return shown(it.account) + shown(it.changes) + " (" + it.from +
                       (it.isReplacement ? ", replacing)" : ")");
              },
              [](const Changed& it) { return shown(it.account) + shown(it.changes); },
              [](const Moved& it) { return shown(it.account) + (it.into ? " into " + it.into->identifier : ""); },
              [](const Folded& it) { return shown(it.account) + into(it.into) + " (" + it.reason + ")"; },
              [](const Lost& it) { return rest(it); }, [](const Repeated& it) { return shown(it.account); },
              [](const Unrepaired& it) { return shown(it.account) + " (" + it.reason + ")"; },
              [](const Saved&) { return std::string{}; }, [](const SaveFailed& it) { return " (" + it.cause + ")"; },
              [](const FileRemoved&) { return std::string{}; },
              [](const FileNotRemoved& it) { return " (" + it.cause + ")"; }},
      fact);
}

bool isOfEveryRun(const Fact& fact) {
  return std::holds_alternative<Loaded>(fact) || std::holds_alternative<Saved>(fact) ||
         std::holds_alternative<CopiedAside>(fact);
}

}  // namespace

std::string lineOf(const Fact& fact) { return std::string{nameOf(fact)} + rest(fact); }

void FactRecorder::told(const Fact& fact) {
  facts.push_back(fact);
  stages.push_back(_open.empty() ? std::string{} : _open.back());
}

std::vector<std::string> FactRecorder::lines() const {
  std::vector<std::string> lines;
  for (const Fact& fact : facts) {
    if (!isOfEveryRun(fact)) lines.push_back(lineOf(fact));
  }
  return lines;
}

}  // namespace tests
