#include "accountsettings/accounts_manager.h"
#include "accountsettings/log_handle.h"

namespace accountsettings {
namespace {

constexpr const char* kMerge = "-[AccountsManager mergeInMemoryProperties:originalProperties:onDiskProperties:]";

// Looks keys up in the order of another dictionary. Mostly both have one order, so the next key is the next entry.
class LikelyInOrder {
 public:
  explicit LikelyInOrder(const Dictionary& dictionary) : _dictionary{dictionary}, _next{dictionary.begin()} {}
  const PropertyValue* find(const Text& key) {
    if (_next == _dictionary.end() || _next->key != key) return _dictionary.find(key);
    return &(_next++)->value;
  }

 private:
  const Dictionary& _dictionary;
  Dictionary::const_iterator _next;
};

bool holds(const PropertyValue* present, const PropertyValue& value) { return present != nullptr && *present == value; }

Dictionary merged(const Dictionary& inMemory, const Dictionary& original, const Dictionary& onDisk) {
  if (inMemory.isIdenticalTo(original)) return onDisk;
  Dictionary result = onDisk;
  LikelyInOrder before{original};
  for (const Dictionary::Entry& entry : inMemory) {
    if (holds(before.find(entry.key), entry.value)) continue;
    // What the file holds already is not set again: an account that does not change stays the file's own.
    if (!holds(result.find(entry.key), entry.value)) result.set(entry.key, entry.value);
  }
  LikelyInOrder after{inMemory};
  for (const Dictionary::Entry& entry : original) {
    if (after.find(entry.key) == nullptr) result.remove(entry.key);
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
