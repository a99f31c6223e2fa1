#include "host/verdict.h"

#include <algorithm>
#include <map>
#include <optional>
#include <set>
#include <utility>

namespace host {
namespace {

using namespace records;  // the facts
using Losses = std::vector<Lost>;

constexpr std::string_view kIdentifierKey = "Identifier";

void append(Losses& to, Losses from) {
  for (Lost& lost : from) to.push_back(std::move(lost));
}

// Follows the facts of a run in their order.
class Judge {
 public:
  explicit Judge(std::string_view snapshot) : _snapshot{snapshot} {}

  void hear(const CopiedAside& copy) { _copy = copy.file; }
  void hear(const KeptAside& kept) { _kept[kept.file] = kept.where; }
  void hear(const Converted& converted) {
    _sources[converted.account.identifier] = converted.file;
    _unsaved[converted.file].push_back(
        {.code = LossCode::notSaved, .account = converted.account, .file = converted.file});
  }
  void hear(const Lost& lost) { lost.file.empty() ? leaveOut(lost) : _unconverted[lost.file].push_back(lost); }
  void hear(const Saved&) {
    append(_verdict.lost, std::exchange(_leftOut, {}));
    _unsaved.clear();
    _cause.reset();
  }
  void hear(const SaveFailed& failed) { _cause = failed.cause; }
  void hear(const FileRemoved& removed) {
    if (!removed.isSource) return;
    append(_verdict.lost, std::exchange(_unconverted[removed.file], {}));
    append(_verdict.lost, std::exchange(_unsaved[removed.file], {}));
  }
  template <typename Other>
  void hear(const Other&) {}

  Verdict verdict() && {
    _verdict.kind = _cause                  ? Verdict::Kind::notSaved
                    : _verdict.lost.empty() ? Verdict::Kind::kept
                                            : Verdict::Kind::lost;
    _verdict.cause = std::move(_cause).value_or("");
    for (Lost& lost : _verdict.lost) lost.where = placeOf(lost);
    return std::move(_verdict);
  }

 private:
  // An account of the settings file, or one that was converted and went before it could stand there.
  void leaveOut(Lost lost) {
    const auto source = _sources.find(lost.account.identifier);
    if (source != _sources.end() && !source->first.empty()) lost.file = source->second;
    _leftOut.push_back(std::move(lost));
  }
  [[nodiscard]] std::string placeOf(const Lost& lost) const {
    if (const auto kept = _kept.find(lost.file); kept != _kept.end()) return kept->second;
    if (!_snapshot.empty()) return _snapshot;
    return lost.file.empty() ? _copy : std::string{};
  }

  std::string _snapshot;
  std::string _copy;                            // of the settings file
  std::map<std::string, std::string> _kept;     // where files are kept that no run overwrites, by the file
  std::map<std::string, std::string> _sources;  // of the converted accounts, by identifier: the file
  std::map<std::string, Losses> _unsaved;       // what is lost if the file goes and nothing is saved before
  std::map<std::string, Losses> _unconverted;   // what is lost if the file goes
  Losses _leftOut;                              // what is lost once the settings are saved
  std::optional<std::string> _cause;
  Verdict _verdict;
};

// The top-level accounts, by the identifier that they have in the end: each stands in one set at most.
class Tally {
 public:
  void hear(const Added& it) { insert(_added, it.account); }
  void hear(const Converted& it) { insert(_converted, it.account); }
  void hear(const Changed& it) {
    followIdentifier(it);
    const std::string& identifier = it.account.identifier;
    if (!_added.contains(identifier) && !_converted.contains(identifier)) insert(_changed, it.account);
  }
  void hear(const Moved& it) {
    remove(it.account.identifier);
    it.into ? static_cast<void>(++_moved) : insert(_changed, it.account);
  }
  void hear(const Folded& it) {
    remove(it.account.identifier);
    ++_folded;
  }
  void hear(const Lost& it) {
    if (it.code != LossCode::replacedDuplicate) remove(it.account.identifier);
  }
  void hear(const Saved& it) { _accounts = it.accounts; }
  void hear(const SaveFailed& it) { _accounts = it.accounts; }
  template <typename Other>
  void hear(const Other&) {}

  [[nodiscard]] Counts counts() const {
    const std::size_t others = _changed.size() + _added.size() + _converted.size();
    return {.kept = _accounts > others ? _accounts - others : 0,
            .changed = _changed.size(),
            .added = _added.size(),
            .converted = _converted.size(),
            .moved = _moved,
            .folded = _folded};
  }

 private:
  using Identifiers = std::set<std::string>;

  static void insert(Identifiers& accounts, const Name& account) {
    if (account.parent.empty()) accounts.insert(account.identifier);
  }
  void remove(const std::string& identifier) {
    for (Identifiers* const accounts : {&_changed, &_added, &_converted}) accounts->erase(identifier);
  }
  void followIdentifier(const Changed& changed) {
    for (const Change& change : changed.changes) {
      const auto* const former = change.key == kIdentifierKey && change.from ? change.from->asText() : nullptr;
      if (former == nullptr) continue;
      for (Identifiers* const accounts : {&_changed, &_added, &_converted}) {
        if (accounts->erase(former->string()) > 0) accounts->insert(changed.account.identifier);
      }
    }
  }

  std::size_t _accounts = 0;
  std::size_t _moved = 0;
  std::size_t _folded = 0;
  Identifiers _changed;
  Identifiers _added;
  Identifiers _converted;
};

template <typename Listener>
void tell(const Explanation& explanation, Listener& listener) {
  explanation.forEachFact(
      [&listener](const Fact& fact) { std::visit([&listener](const auto& each) { listener.hear(each); }, fact); });
}

}  // namespace

std::string_view nameOf(Verdict::Kind kind) {
  switch (kind) {
    case Verdict::Kind::kept: return "kept";
    case Verdict::Kind::lost: return "lost";
    case Verdict::Kind::notSaved: return "not saved";
  }
  return {};
}

Verdict verdictOf(const Explanation& explanation, std::string_view snapshot) {
  Judge judge{snapshot};
  tell(explanation, judge);
  return std::move(judge).verdict();
}

Losses lossesFrom(const std::string& file, const Explanation& explanation, const Fact& next) {
  Judge judge{{}};
  tell(explanation, judge);
  std::visit([&judge](const auto& each) { judge.hear(each); }, next);
  Losses losses = std::move(judge).verdict().lost;
  std::erase_if(losses, [&file](const Lost& lost) { return lost.file != file; });
  return losses;
}

Counts countsOf(const Explanation& explanation, const Verdict& verdict) {
  Tally tally;
  tell(explanation, tally);
  Counts counts = tally.counts();
  for (const Lost& lost : verdict.lost) counts.dropped += meaningOf(lost.code).name.starts_with("dropped-") ? 1U : 0U;
  counts.lost = verdict.lost.size();
  return counts;
}

std::array<std::pair<std::string_view, std::size_t>, 8> Counts::named() const {
  return {{{"kept", kept},
           {"changed", changed},
           {"added", added},
           {"converted", converted},
           {"moved", moved},
           {"folded", folded},
           {"dropped", dropped},
           {"lost", lost}}};
}

}  // namespace host
