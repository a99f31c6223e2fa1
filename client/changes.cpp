#include "client/changes.h"

#include <algorithm>
#include <unordered_map>
#include <utility>

namespace accounts {
namespace {

using accountsettings::BasicAccount;
using platform::Dictionary;
using platform::PropertyValue;
using platform::Text;
using Record = std::shared_ptr<BasicAccount>;
using ByIdentifier = std::unordered_map<std::string_view, const Dictionary*>;

ByIdentifier byIdentifier(const Records& records) {
  ByIdentifier found;
  for (const Dictionary& record : records) {
    if (const Text* const identifier = record.text(accountsettings::kAccountIdentifier)) {
      found[identifier->view()] = &record;
    }
  }
  return found;
}

// Null for a record without an identifier, and for all but the last of one identifier.
const Dictionary* counterpart(const ByIdentifier& own, const Dictionary& record, const ByIdentifier& others,
                              bool& counts) {
  const Text* const identifier = record.text(accountsettings::kAccountIdentifier);
  counts = identifier != nullptr && own.at(identifier->view()) == &record;
  if (!counts) return nullptr;
  const auto found = others.find(identifier->view());
  return found == others.end() ? nullptr : found->second;
}

// Makes changes of pairs: whoever cannot be an account is none.
class Teller {
 public:
  explicit Teller(std::shared_ptr<const Device> device) : _device{std::move(device)} {}

  void tell(const Pair& pair, const Record& parent) {
    Record record = BasicAccount::initWithProperties(pair.after == nullptr ? *pair.before : *pair.after);
    if (record == nullptr) return;
    record->setParentAccount(parent);
    std::vector<std::string> keys;
    const bool isChanged = pair.before != nullptr && pair.after != nullptr;
    if (isChanged) keys = differingKeys(pair);
    // An account whose children alone changed is not changed itself.
    std::erase(keys, accountsettings::kAccountChildAccounts.view());
    if (!isChanged || !keys.empty()) _changes.push_back({kindOf(pair), accountOf(_device, record), std::move(keys)});
    if (parent != nullptr) return;
    const Records before = childrenOf(pair.before);
    const Records after = childrenOf(pair.after);
    for (const Pair& child : differingPairs(before, after)) tell(child, record);
  }

  [[nodiscard]] std::vector<Change> take() { return std::move(_changes); }

 private:
  static Change::Kind kindOf(const Pair& pair) {
    if (pair.before == nullptr) return Change::Kind::added;
    return pair.after == nullptr ? Change::Kind::removed : Change::Kind::changed;
  }

  std::shared_ptr<const Device> _device;
  std::vector<Change> _changes;
};

}  // namespace

Records childrenOf(const Dictionary* account) {
  Records children;
  const auto* const array = account == nullptr ? nullptr : account->array(accountsettings::kAccountChildAccounts);
  if (array == nullptr) return children;
  for (const PropertyValue& element : *array) {
    if (const Dictionary* const child = element.asDictionary()) children.push_back(*child);
  }
  return children;
}

Records identifiedRecords(const accountsettings::AccountsManager& store) {
  Records records;
  records.reserve(store.count());
  for (const Record& record : store.allBasicAccounts()) {
    if (record->originalProperties().text(accountsettings::kAccountIdentifier) != nullptr) {
      records.push_back(record->properties());
    }
  }
  return records;
}

std::vector<Pair> differingPairs(const Records& before, const Records& after) {
  const ByIdentifier earlier = byIdentifier(before);
  const ByIdentifier later = byIdentifier(after);
  std::vector<Pair> pairs;
  bool counts = false;
  for (const Dictionary& record : before) {
    const Dictionary* const now = counterpart(earlier, record, later, counts);
    if (counts && now == nullptr) pairs.push_back({&record, nullptr});
  }
  for (const Dictionary& record : after) {
    const Dictionary* const past = counterpart(later, record, earlier, counts);
    if (counts && (past == nullptr || *past != record)) pairs.push_back({past, &record});
  }
  return pairs;
}

std::vector<std::string> differingKeys(const Pair& pair) {
  static const Dictionary kNone;
  const Dictionary& before = pair.before == nullptr ? kNone : *pair.before;
  const Dictionary& after = pair.after == nullptr ? kNone : *pair.after;
  std::vector<std::string> keys;
  for (const auto& [key, value] : before) {
    if (!after.contains(key)) keys.push_back(key.string());
  }
  for (const auto& [key, value] : after) {
    const PropertyValue* const past = before.find(key);
    if (past == nullptr || *past != value) keys.push_back(key.string());
  }
  return keys;
}

std::vector<Change> changesBetween(const Records& before, const Records& after,
                                   const std::shared_ptr<const Device>& device) {
  const Within within{*device};
  Teller teller{device};
  for (const Pair& pair : differingPairs(before, after)) teller.tell(pair, nullptr);
  return teller.take();
}

}  // namespace accounts
