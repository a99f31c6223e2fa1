// The three-way merge of properties beside a model that decides every key by itself, and keeps keys as a list.
#include <optional>
#include <utility>
#include <vector>

#include "accountsettings/accounts_manager.h"
#include "fuzz/input.h"
#include "fuzz/require.h"
#include "tests/support/fake_platform.h"

namespace {

using accountsettings::AccountsManager;
using fuzz::Input;
using platform::Array;
using platform::Dictionary;
using platform::PropertyValue;

// Few words, as keys and as values, so that the three dictionaries meet.
constexpr std::string_view kWords[] = {"a", "b", "c", "d", "e", "f", "Identifier", "ChildAccounts", "Password"};

PropertyValue valueFrom(Input& input, int depth);

Dictionary dictionaryFrom(Input& input, int depth) {
  Dictionary dictionary;
  for (std::size_t count = input.below(9); count > 0; --count) {
    const std::string_view key = input.oneOf(kWords);
    dictionary.set(key, valueFrom(input, depth - 1));
  }
  return dictionary;
}

PropertyValue valueFrom(Input& input, int depth) {
  const std::size_t choice = input.below(8);
  if (choice == 0 && depth > 0) return dictionaryFrom(input, depth);
  if (choice == 1 && depth > 0) {
    Array array;
    for (std::size_t count = input.below(4); count > 0; --count) array.push_back(valueFrom(input, depth - 1));
    return array;
  }
  return choice < 5 ? PropertyValue{static_cast<int>(input.below(3))} : fuzz::scalarFrom(input, kWords);
}

using Keys = std::vector<std::string>;

Keys keysOf(const Dictionary& dictionary) {
  Keys keys;
  for (const auto& entry : dictionary) keys.push_back(entry.key.string());
  return keys;
}

std::optional<PropertyValue> at(const Dictionary& dictionary, const std::string& key) {
  for (const auto& entry : dictionary) {
    if (entry.key == std::string_view{key}) return entry.value;
  }
  return std::nullopt;
}

// What was changed or removed in memory wins, everything else is as the file has it. The file's order stays, new keys
// follow in memory's.
Keys expectedKeys(const Dictionary& memory, const Dictionary& original, const Dictionary& disk) {
  Keys expected;
  for (const std::string& key : keysOf(disk)) {
    const bool isRemoved = at(original, key) && !at(memory, key);
    if (!isRemoved) expected.push_back(key);
  }
  for (const std::string& key : keysOf(memory)) {
    const bool isChanged = at(memory, key) != at(original, key);
    if (isChanged && !at(disk, key)) expected.push_back(key);
  }
  return expected;
}

void compare(const Dictionary& memory, const Dictionary& original, const Dictionary* disk) {
  const Dictionary merged =
      AccountsManager::mergeInMemoryProperties_originalProperties_onDiskProperties(memory, original, disk);
  if (original.empty() || disk == nullptr || disk->empty()) {
    fuzz::require(merged == memory && keysOf(merged) == keysOf(memory), "not as it is in memory");
    return;
  }
  fuzz::require(keysOf(merged) == expectedKeys(memory, original, *disk), "other keys, or in another order");
  for (const std::string& key : keysOf(merged)) {
    const bool isUntouched = at(memory, key) == at(original, key);
    fuzz::require(at(merged, key) == at(isUntouched ? *disk : memory, key), "another value");
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static tests::FakeDevice device;
  device.systemLog->readers = false;
  Input input{data, size};
  const bool isOnDisk = input.below(16) != 15;
  const Dictionary original = dictionaryFrom(input, 3);
  // Often a copy that is edited, as in real life, and not three strangers.
  const auto edited = [&] {
    Dictionary copy = input.yes() ? original : Dictionary{};
    for (const auto& entry : dictionaryFrom(input, 3)) copy.set(entry.key, entry.value);
    for (std::size_t count = input.below(4); count > 0; --count) copy.remove(input.oneOf(kWords));
    return copy;
  };
  const Dictionary memory = edited();
  const Dictionary disk = edited();
  compare(memory, original, isOnDisk ? &disk : nullptr);
  return 0;
}
