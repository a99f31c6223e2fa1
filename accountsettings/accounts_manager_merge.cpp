#include "accountsettings/accounts_manager.h"
#include "accountsettings/log_handle.h"

namespace accountsettings {
namespace {

constexpr const char* kMerge = "-[AccountsManager mergeInMemoryProperties:originalProperties:onDiskProperties:]";

bool isUnchanged(const Dictionary::Entry& entry, const Dictionary& original) {
  const PropertyValue* const before = original.find(entry.key);
  return before != nullptr && *before == entry.value;
}

Dictionary merged(const Dictionary& inMemory, const Dictionary& original, const Dictionary& onDisk) {
  Dictionary result = onDisk;
  for (const Dictionary::Entry& entry : inMemory) {
    if (!isUnchanged(entry, original)) result.set(entry.key, entry.value);
  }
  for (const Dictionary::Entry& entry : original) {
    if (!inMemory.contains(entry.key)) result.remove(entry.key);
  }
  return result;
}

}  // namespace

Dictionary AccountsManager::mergeInMemoryProperties_originalProperties_onDiskProperties(const Dictionary& inMemory,
                                                                                        const Dictionary& original,
                                                                                        const Dictionary* onDisk) {
  _ASLogSystem().log(kMerge, "Merging inmem %@ orig %@ onDisk %@", inMemory, original,
                     onDisk == nullptr ? std::nullopt : std::optional{*onDisk});
  // A new account, or one that the file does not hold, is written as it stands in memory.
  const bool hasNothingToMergeWith = original.empty() || onDisk == nullptr || onDisk->empty();
  Dictionary result = hasNothingToMergeWith ? inMemory : merged(inMemory, original, *onDisk);
  _ASLogSystem().log(kMerge, "Merged to %@", result);
  return result;
}

}  // namespace accountsettings
