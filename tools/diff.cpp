#include <algorithm>
#include <nlohmann/json.hpp>
#include <unordered_map>

#include "commandline/text.h"
#include "tools/account_source.h"

namespace tools {
namespace {

using accountsettings::Dictionary;
using accountsettings::PropertyValue;
using Json = nlohmann::ordered_json;

constexpr int kSchema = 1;

// The accounts of a source in their order.
std::vector<const FoundAccount*> accountsOf(const Source& source) {
  std::vector<const FoundAccount*> accounts;
  for (const AccountFile& file : source.files) {
    for (const FoundAccount& account : file.accounts) accounts.push_back(&account);
  }
  return accounts;
}

struct Pair {
  const FoundAccount* before = nullptr;  // null where it was added
  const FoundAccount* after = nullptr;   // null where it was removed
};

using KeyOf = std::string (*)(const Dictionary& record);

// Pairs the accounts that have one key, in their order; those without a key stay single.
void pairBy(KeyOf keyBefore, KeyOf keyAfter, std::vector<Pair>& pairs, std::vector<const FoundAccount*>& added) {
  std::unordered_map<std::string, std::vector<const FoundAccount**>> byKey;
  for (const FoundAccount*& each : added) {
    if (const std::string key = keyAfter(each->record); !key.empty()) byKey[key].push_back(&each);
  }
  for (Pair& pair : pairs) {
    if (pair.after != nullptr) continue;
    const auto found = byKey.find(keyBefore(pair.before->record));
    if (found == byKey.end() || found->second.empty()) continue;
    pair.after = std::exchange(*found->second.front(), nullptr);
    found->second.erase(found->second.begin());
  }
  std::erase(added, nullptr);
}

std::string identifierOf(const Dictionary& record) { return namesOf(record).identifier; }

// What the record is an account of, together with its value under the key.
std::string serviceWith(const Dictionary& record, std::string_view key) {
  const std::string service = serviceOf(record);
  return service.empty() ? service : service + "\n" + textUnder(record, key);
}

std::string serviceAndType(const Dictionary& record) { return serviceWith(record, accountsettings::kAccountType); }
std::string serviceAndClass(const Dictionary& record) { return serviceWith(record, accountsettings::kAccountClass); }

// A migration gives some accounts a new identifier, under which they keep the old one to sync by, and some a new type.
std::vector<Pair> paired(const Source& before, const Source& after) {
  std::vector<Pair> pairs;
  for (const FoundAccount* each : accountsOf(before)) pairs.push_back({each, nullptr});
  auto added = accountsOf(after);
  pairBy(identifierOf, identifierOf, pairs, added);
  const KeyOf syncIdentifierOf = [](const Dictionary& record) {
    return textUnder(record, accountsettings::kAccountSyncIdentifier);
  };
  pairBy(identifierOf, syncIdentifierOf, pairs, added);
  pairBy(serviceAndType, serviceAndType, pairs, added);
  pairBy(serviceAndClass, serviceAndClass, pairs, added);
  for (const FoundAccount* each : added) pairs.push_back({nullptr, each});
  return pairs;
}

struct KeyChange {
  std::string key;
  const PropertyValue* from;  // null where there was none
  const PropertyValue* to;    // null where there is none
};

bool isCompared(std::string_view key, const PropertyValue& value) {
  return key != accountsettings::kAccountChildAccounts || value.asArray() == nullptr;  // children are compared as such
}

std::vector<KeyChange> changesOf(const Pair& pair) {
  std::vector<KeyChange> changes;
  const Dictionary& before = pair.before->record;
  const Dictionary& after = pair.after->record;
  for (const auto& [key, value] : before) {
    const PropertyValue* const now = after.find(key);
    if (isCompared(key, value) && (now == nullptr || *now != value)) changes.push_back({key.string(), &value, now});
  }
  for (const auto& [key, value] : after) {
    if (isCompared(key, value) && !before.contains(key)) changes.push_back({key.string(), nullptr, &value});
  }
  return changes;
}

// What was found, with the accounts of which nothing differs left out.
struct Comparison {
  std::vector<const FoundAccount*> removed;
  std::vector<const FoundAccount*> added;
  std::vector<std::pair<Pair, std::vector<KeyChange>>> changed;
  std::size_t same = 0;

  [[nodiscard]] bool isSame() const { return removed.empty() && added.empty() && changed.empty(); }
};

Comparison compared(const Source& before, const Source& after) {
  Comparison comparison;
  for (const Pair& pair : paired(before, after)) {
    if (pair.after == nullptr) {
      comparison.removed.push_back(pair.before);
    } else if (pair.before == nullptr) {
      comparison.added.push_back(pair.after);
    } else if (auto changes = changesOf(pair); !changes.empty()) {
      comparison.changed.emplace_back(pair, std::move(changes));
    } else {
      ++comparison.same;
    }
  }
  return comparison;
}

std::string lineOf(const PropertyValue* value, const std::string& key) {
  return value == nullptr ? "(none)" : tools::lineOf(*value, key);
}

std::string textOf(const Comparison& comparison) {
  std::string text;
  const auto add = [&](const std::string& line) { text += commandline::printable(line) + "\n"; };
  for (const auto* each : comparison.removed) add("removed: " + each->described());
  for (const auto* each : comparison.added) add("added: " + each->described());
  for (const auto& [pair, changes] : comparison.changed) {
    add("changed: " + pair.after->described());
    for (const KeyChange& each : changes) {
      add("    " + each.key + ": " + lineOf(each.from, each.key) + " -> " + lineOf(each.to, each.key));
    }
  }
  add(std::to_string(comparison.removed.size()) + " removed, " + std::to_string(comparison.added.size()) + " added, " +
      std::to_string(comparison.changed.size()) + " changed, " + std::to_string(comparison.same) + " the same");
  return text;
}

Json jsonOf(const FoundAccount& account) {
  const auto names = namesOf(account.record);
  return {{"place", account.place()},
          {"identifier", names.identifier},
          {"type", textUnder(account.record, accountsettings::kAccountType)},
          {"name", names.name}};
}

Json jsonOf(const PropertyValue* value, const std::string& key) {
  if (value == nullptr) return nullptr;
  return tools::jsonOf(Dictionary{{key, *value}})[key];
}

Json jsonOf(const Comparison& comparison) {
  Json report{{"schema", kSchema},
              {"removed", Json::array()},
              {"added", Json::array()},
              {"changed", Json::array()},
              {"same", comparison.same}};
  for (const auto* each : comparison.removed) report["removed"].push_back(jsonOf(*each));
  for (const auto* each : comparison.added) report["added"].push_back(jsonOf(*each));
  for (const auto& [pair, changes] : comparison.changed) {
    Json account = jsonOf(*pair.after);
    account["changes"] = Json::array();
    for (const auto& [key, from, to] : changes) {
      account["changes"].push_back({{"key", key}, {"from", jsonOf(from, key)}, {"to", jsonOf(to, key)}});
    }
    report["changed"].push_back(std::move(account));
  }
  return report;
}

}  // namespace

Outcome compareAccounts(Session& session, const Words& arguments, const Options& options) {
  session.beginLooking();
  try {
    const auto before = sourceNamed(arguments[0], options);
    const auto after = arguments.size() > 1 ? sourceNamed(arguments[1], options) : deviceSource();
    const auto comparison = compared(before, after);
    return {options.printsJson ? jsonOf(comparison).dump(2) + "\n" : textOf(comparison),
            comparison.isSame() ? ExitStatus::done : ExitStatus::different};
  } catch (const Failure& failure) {
    throw Failure{ExitStatus::wrongUse, failure.what(), failure.hint()};  // 1 means that they differ
  }
}

}  // namespace tools
