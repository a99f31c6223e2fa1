#include "accountsettings/record_changes.h"

#include <algorithm>
#include <deque>
#include <map>
#include <optional>
#include <unordered_set>
#include <utility>

#include "accountsettings/vocabulary.h"

namespace accountsettings {
namespace {

using records::Change;
using records::Fact;
using records::LossCode;
using records::Name;

std::string textUnder(const Dictionary& properties, std::string_view key) {
  const Text* const text = properties.text(key);
  return text == nullptr ? std::string{} : text->string();
}

// --- Keys ---

bool holdsRecordsOnly(const PropertyValue* children) {
  if (children == nullptr) return true;
  const Array* const array = children->asArray();
  return array != nullptr &&
         std::ranges::all_of(*array, [](const PropertyValue& child) { return child.asDictionary() != nullptr; });
}

bool isToldByKey(std::string_view key, const Dictionary& before, const Dictionary& after) {
  return key != kAccountChildAccounts || !holdsRecordsOnly(before.find(key)) || !holdsRecordsOnly(after.find(key));
}

// The keys of a record that went, found by the texts that stood under them.
class GoneKeys {
 public:
  void add(const Dictionary::Entry& entry) {
    const Text* const text = entry.value.asText();
    if (text != nullptr && !text->empty()) _places.emplace(text->view(), _gone.size());
    _gone.emplace_back(Change{entry.key.string(), {}, entry.value, {}});
  }
  // Takes the first key that went and under which the text stood; empty where there is none.
  std::string takeKeyOf(const PropertyValue& value) {
    const Text* const text = value.asText();
    const auto found = text == nullptr ? _places.end() : _places.lower_bound(text->view());
    if (found == _places.end() || found->first != text->view()) return {};
    std::string key = std::exchange(_gone[found->second], std::nullopt)->key;
    _places.erase(found);
    return key;
  }
  void moveRestTo(std::vector<Change>& changes) {
    for (std::optional<Change>& each : _gone) {
      if (each) changes.push_back(*std::move(each));
    }
  }

 private:
  std::vector<std::optional<Change>> _gone;
  std::multimap<std::string_view, std::size_t> _places;  // the earliest first
};

// --- Records ---

constexpr std::size_t kNone = static_cast<std::size_t>(-1);

// A record of a state, with children flattened out behind their parents.
struct Entry {
  const BasicAccount* account;  // null for a child
  const Dictionary* properties;
  std::size_t parent;
};
using Entries = std::vector<Entry>;

void addWithChildren(Entry entry, Entries& entries) {
  entries.push_back(entry);
  const std::size_t place = entries.size() - 1;
  const Array* const children = entry.properties->array(kAccountChildAccounts);
  if (children == nullptr) return;
  for (const PropertyValue& child : *children) {
    if (const Dictionary* const properties = child.asDictionary()) {
      addWithChildren({nullptr, properties, place}, entries);
    }
  }
}

Entries entriesOf(const StoreState& state) {
  Entries entries;
  for (const RecordState& record : state) addWithChildren({record.account.get(), &record.properties, kNone}, entries);
  return entries;
}

Name nameIn(const Entries& entries, std::size_t place) {
  const Entry& entry = entries[place];
  const std::string parent =
      entry.parent == kNone ? std::string{} : textUnder(*entries[entry.parent].properties, kAccountIdentifier);
  return nameOf(*entry.properties, parent);
}

std::string_view identifierOf(const Entry& entry) {
  const Text* const identifier = entry.properties->text(kAccountIdentifier);
  return identifier == nullptr ? std::string_view{} : identifier->view();
}

// Finds for each record of a state the one that it was before, each of which is found once.
class Matching {
 public:
  Matching(const Entries& before, const Entries& after)
      : _before{before}, _after{after}, _isFound(before.size()), _former(after.size(), kNone) {
    matchObjects();
    matchChildrenOfTheSame();
    matchIdentifiers();
  }
  [[nodiscard]] std::size_t formerOf(std::size_t place) const { return _former[place]; }
  [[nodiscard]] bool wentAway(std::size_t place) const { return !_isFound[place]; }

 private:
  using Places = std::deque<std::size_t>;

  void match(std::size_t place, Places& candidates) {
    while (!candidates.empty() && _isFound[candidates.front()]) candidates.pop_front();
    if (candidates.empty()) return;
    _former[place] = candidates.front();
    _isFound[candidates.front()] = true;
  }
  // Matches what the key, empty for a record that has none, says is the same.
  template <typename Key, typename MakeBeforeKey, typename MakeAfterKey>
  void matchBy(const MakeBeforeKey& beforeKey, const MakeAfterKey& afterKey) {
    std::map<Key, Places> candidates;
    for (std::size_t place = 0; place < _before.size(); ++place) {
      if (const auto key = beforeKey(place); key && !_isFound[place]) candidates[*key].push_back(place);
    }
    for (std::size_t place = 0; place < _after.size(); ++place) {
      if (_former[place] != kNone) continue;
      const auto key = afterKey(place);
      const auto found = key ? candidates.find(*key) : candidates.end();
      if (found != candidates.end()) match(place, found->second);
    }
  }
  void matchObjects() {
    const auto objectIn = [](const Entries& entries) {
      return [&entries](std::size_t place) {
        const BasicAccount* const account = entries[place].account;
        return account == nullptr ? std::nullopt : std::optional{account};
      };
    };
    matchBy<const BasicAccount*>(objectIn(_before), objectIn(_after));
  }
  // Parents stand before their children, so a child's parent is matched when the child's turn comes.
  void matchChildrenOfTheSame() {
    using Key = std::pair<std::size_t, std::string_view>;
    const auto key = [](const Entry& child, std::size_t parent) {
      return parent == kNone ? std::nullopt : std::optional{Key{parent, identifierOf(child)}};
    };
    matchBy<Key>([&](std::size_t place) { return key(_before[place], _before[place].parent); },
                 [&](std::size_t place) {
                   const std::size_t parent = _after[place].parent;
                   return key(_after[place], parent == kNone ? kNone : _former[parent]);
                 });
  }
  void matchIdentifiers() {
    const auto identifierIn = [](const Entries& entries) {
      return [&entries](std::size_t place) {
        const std::string_view identifier = identifierOf(entries[place]);
        return identifier.empty() ? std::nullopt : std::optional{identifier};
      };
    };
    matchBy<std::string_view>(identifierIn(_before), identifierIn(_after));
  }

  const Entries& _before;
  const Entries& _after;
  std::vector<bool> _isFound;
  std::vector<std::size_t> _former;
};

class Comparison {
 public:
  Comparison(const StoreState& before, const StoreState& after)
      : _before{entriesOf(before)}, _after{entriesOf(after)}, _matching{_before, _after} {
    for (const RecordState& record : before) _known.insert(record.account.get());
  }

  std::vector<Difference> differences() {
    for (std::size_t place = 0; place < _after.size(); ++place) {
      const std::size_t former = _matching.formerOf(place);
      former == kNone ? tellNew(place) : tellKept(former, place);
    }
    for (std::size_t place = 0; place < _before.size(); ++place) {
      if (_matching.wentAway(place)) tellGone(place);
    }
    return std::move(_differences);
  }

 private:
  Difference& tell(Fact fact, const Entry& entry) {
    return _differences.emplace_back(Difference{.fact = std::move(fact), .account = entry.account});
  }
  void tellNew(std::size_t place) {
    const Entry& entry = _after[place];
    const bool isSecond = entry.account != nullptr && !_known.insert(entry.account).second;
    Name name = nameIn(_after, place);
    isSecond ? tell(records::Repeated{std::move(name)}, entry) : tell(records::Added{std::move(name)}, entry);
  }
  void tellGone(std::size_t place) {
    const bool isChild = _before[place].account == nullptr;
    tell(records::Lost{.code = isChild ? LossCode::removedFromParent : LossCode::removed,
                       .account = nameIn(_before, place)},
         _before[place]);
  }
  void tellKept(std::size_t former, std::size_t place) {
    if (isMoved(former, place)) tellMoved(place);
    auto changes = changesOf(*_before[former].properties, *_after[place].properties);
    const bool isReplacement = _after[place].account != nullptr && _after[place].account != _before[former].account;
    if (changes.empty() && !isReplacement) return;
    Difference& told = tell(records::Changed{nameIn(_after, place), std::move(changes)}, _after[place]);
    told.isReplacement = isReplacement;
  }
  [[nodiscard]] bool isMoved(std::size_t former, std::size_t place) const {
    const std::size_t before = _before[former].parent;
    const std::size_t after = _after[place].parent;
    if (before == kNone || after == kNone) return before != after;
    return _matching.formerOf(after) != before;
  }
  void tellMoved(std::size_t place) {
    const std::size_t parent = _after[place].parent;
    const auto into = parent == kNone ? std::nullopt : std::optional{nameIn(_after, parent)};
    tell(records::Moved{nameIn(_after, place), into}, _after[place]);
  }

  Entries _before;
  Entries _after;
  Matching _matching;
  std::unordered_set<const BasicAccount*> _known;
  std::vector<Difference> _differences;
};

}  // namespace

Name nameOf(const Dictionary& properties, std::string_view parent) {
  std::string name = textUnder(properties, kAccountDisplayName);
  if (name.empty()) name = textUnder(properties, kAccountUsername);
  return {textUnder(properties, kAccountType), std::move(name), textUnder(properties, kAccountIdentifier),
          std::string{parent}};
}

std::vector<Change> changesOf(const Dictionary& before, const Dictionary& after) {
  if (before.isIdenticalTo(after)) return {};
  std::vector<Change> changes;
  GoneKeys gone;
  for (const Dictionary::Entry& entry : before) {
    if (!after.contains(entry.key) && isToldByKey(entry.key, before, after)) gone.add(entry);
  }
  for (const auto& [key, value] : after) {
    const PropertyValue* const former = before.find(key);
    if ((former != nullptr && *former == value) || !isToldByKey(key, before, after)) continue;
    changes.push_back({key.string(), gone.takeKeyOf(value), former ? std::optional{*former} : std::nullopt, value});
  }
  gone.moveRestTo(changes);
  return changes;
}

std::vector<Difference> differencesBetween(const StoreState& before, const StoreState& after) {
  const auto isUnchanged = [](const RecordState& one, const RecordState& other) {
    return one.account == other.account && one.properties.isIdenticalTo(other.properties);
  };
  if (std::ranges::equal(before, after, isUnchanged)) return {};
  return Comparison{before, after}.differences();
}

}  // namespace accountsettings
