#include "migrator/hostile_accounts.h"

#include <algorithm>
#include <map>
#include <stdexcept>
#include <string>

#include "accountsettings/vocabulary.h"
#include "migrator/account_reads.h"
#include "migrator/stored_names.h"
#include "platform/property_list_store.h"

namespace migrator {
namespace {

using accountsettings::AccountsManager;
using accountsettings::Array;
using accountsettings::BasicAccount;
using accountsettings::Dictionary;
using accountsettings::PropertyValue;
using platform::Text;

// The containers around an account in the file: the root and its list of accounts.
constexpr std::size_t kLevelsAbove = 2;
// What the steps add to an account at most: a parent around it, in two containers, and the parent's own properties.
constexpr std::size_t kLevelsAdded = 2;
constexpr std::size_t kValuesAdded = 64;

// Of accounts that the steps will know by one and the same identifier.
std::size_t maxOfOneIdentifier(const AccountsManager& store) {
  std::map<std::string, std::size_t> counts;
  std::size_t max = 0;
  for (const auto& account : store.allBasicAccounts()) {
    const Text* const uniqueId = account->properties().text(kUniqueIdKey);
    const bool isUnique = uniqueId != nullptr && !uniqueId->empty();
    const Text identifier = isUnique ? *uniqueId : account->identifier().value_or(Text{});
    if (!identifier.empty()) max = std::max(max, ++counts[identifier.string()]);
  }
  return max;
}

std::size_t sizeOf(const BasicAccount& account, std::string_view key) {
  const std::optional<Array> array = arrayForKey(account, key);
  return array ? array->size() : 0;
}

std::size_t inheritedDataclasses(const AccountsManager& store) {
  std::size_t sum = 0;
  for (const auto& account : store.allBasicAccounts()) {
    const std::size_t listed = sizeOf(*account, accountsettings::kAccountEnabledDataclasses) +
                               sizeOf(*account, accountsettings::kAccountProvisionedDataclasses);
    sum += sizeOf(*account, accountsettings::kAccountChildAccounts) * listed;
  }
  return sum;
}

struct Extent {
  std::size_t levels = 0;
  std::size_t values = 0;
};

Extent extentOf(const PropertyValue& value);

// The container around parts of these extents.
template <typename Parts, typename ExtentOfPart>
Extent around(const Parts& parts, const ExtentOfPart& extentOfPart) {
  Extent whole;
  for (const auto& part : parts) {
    const Extent extent = extentOfPart(part);
    whole.levels = std::max(whole.levels, extent.levels);
    whole.values += extent.values + 1;
  }
  ++whole.levels;
  return whole;
}

Extent extentOf(const Dictionary& dictionary) {
  Extent whole = around(dictionary, [](const Dictionary::Entry& entry) { return extentOf(entry.value); });
  whole.values += dictionary.size();  // the keys
  return whole;
}

Extent extentOf(const PropertyValue& value) {
  if (const Dictionary* const dictionary = value.asDictionary()) return extentOf(*dictionary);
  if (const Array* const array = value.asArray()) {
    return around(*array, [](const PropertyValue& element) { return extentOf(element); });
  }
  return {};
}

}  // namespace

void refuseAbove(std::size_t limit, std::size_t count, std::string_view what) {
  if (count <= limit) return;
  throw std::runtime_error{"It is refused as hostile: it has " + std::to_string(count) + " " + std::string{what} +
                           ", and no device has more than " + std::to_string(limit)};
}

void refuseHostileAccounts(const AccountsManager& store) {
  refuseAbove(kMaxOfOneIdentifier, maxOfOneIdentifier(store), "accounts of one identifier");
  refuseAbove(kMaxInherited, inheritedDataclasses(store), "data classes in lists that children inherit");
  const Extent extent = around(store.allBasicAccounts(), [](const AccountsManager::Account& account) {
    Extent own = extentOf(account->properties());
    own.values += kValuesAdded;
    return own;
  });
  refuseAbove(platform::kMaxNesting - kLevelsAbove - kLevelsAdded, extent.levels - 1, "containers in one another");
  refuseAbove(platform::kMaxValues, extent.values, "values, with those that the steps add");
}

}  // namespace migrator
