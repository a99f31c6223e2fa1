#include "tests/support/fact_recorder.h"

#include <array>

#include "platform/description.h"

namespace tests {
namespace {

using platform::RecordChange;
using platform::RunFact;

constexpr std::array kNames{"loaded",     "unread",  "added",    "converted", "changed", "moved",
                            "folded",     "dropped", "repeated", "kept",      "failed",  "saved",
                            "saveFailed", "removed", "removed",  "unremoved"};

std::string shown(const RecordChange& change) {
  const std::string to = change.to ? platform::description(*change.to) : "";
  if (!change.oldKey.empty()) return change.oldKey + " now " + change.key + " " + to;
  if (!change.from) return "+" + change.key + " " + to;
  if (!change.to) return "-" + change.key;
  return change.key + " " + platform::description(*change.from) + " -> " + to;
}

}  // namespace

std::string lineOf(const RunFact& fact) {
  std::string line = kNames.at(static_cast<std::size_t>(fact.kind));
  if (!fact.subject.identifier.empty()) line += " " + fact.subject.identifier;
  if (!fact.subject.parent.empty()) line += " in " + fact.subject.parent;
  for (const platform::RecordName& other : fact.others) line += " into " + other.identifier;
  std::string_view separator = ": ";
  for (const RecordChange& change : fact.changes) {
    line += separator;
    line += shown(change);
    separator = ", ";
  }
  if (!fact.reason.empty()) line += " (" + fact.reason + ")";
  return line;
}

void FactRecorder::told(const RunFact& fact) {
  facts.push_back(fact);
  stages.push_back(_open.empty() ? std::string{} : _open.back());
}

std::vector<std::string> FactRecorder::lines() const {
  std::vector<std::string> lines;
  for (const RunFact& fact : facts) {
    if (fact.kind != RunFact::Kind::loaded && fact.kind != RunFact::Kind::saved) lines.push_back(lineOf(fact));
  }
  return lines;
}

}  // namespace tests
