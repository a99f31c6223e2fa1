#include "host/explanation.h"

#include <set>

namespace host {

using platform::RunFact;

namespace {

constexpr std::string_view kOutside = "end of the run";  // where nothing but the last word is left

}  // namespace

void Explanation::began(std::string_view stage) {
  _open.emplace_back(stage);
  _isNewStage = true;
}

void Explanation::ended() {
  if (!_open.empty()) _open.pop_back();
  _isNewStage = true;
}

void Explanation::add(const RunFact& fact) {
  if (_isNewStage) _stages.push_back({std::string{stage()}, std::string{outerStage()}, {}});
  _isNewStage = false;
  _stages.back().facts.push_back(fact);
}

std::string_view Explanation::stage() const { return _open.empty() ? kOutside : std::string_view{_open.back()}; }

std::string_view Explanation::outerStage() const {
  return _open.size() < 2 ? std::string_view{} : _open[_open.size() - 2];
}

template <typename Action>
void Explanation::forEachFact(const Action& action) const {
  for (const Stage& stage : _stages) {
    for (const RunFact& fact : stage.facts) action(fact);
  }
}

template <typename Condition>
const RunFact* Explanation::lastFact(const Condition& condition) const {
  const RunFact* last = nullptr;
  forEachFact([&](const RunFact& fact) {
    if (condition(fact.kind)) last = &fact;
  });
  return last;
}

const RunFact* Explanation::lastSave() const {
  return lastFact([](RunFact::Kind kind) { return kind == RunFact::Kind::saved || kind == RunFact::Kind::saveFailed; });
}

const RunFact* Explanation::unreadFile() const {
  return lastFact([](RunFact::Kind kind) { return kind == RunFact::Kind::unread; });
}

std::vector<std::string> Explanation::lostFiles() const {
  // One save that went through, and what was converted before it is in the settings file.
  const bool isUnsaved = count(RunFact::Kind::saved) == 0 && count(RunFact::Kind::saveFailed) > 0;
  std::set<std::string> unconverted;
  std::vector<std::string> lost;
  forEachFact([&](const RunFact& fact) {
    if (fact.kind == RunFact::Kind::failed) unconverted.insert(fact.path);
    if (fact.kind != RunFact::Kind::sourceRemoved) return;
    if (isUnsaved || unconverted.contains(fact.path)) lost.push_back(fact.path);
  });
  return lost;
}

std::size_t Explanation::count(RunFact::Kind kind) const {
  std::size_t count = 0;
  forEachFact([&](const RunFact& fact) { count += fact.kind == kind ? 1U : 0U; });
  return count;
}

}  // namespace host
