#include "tools/creator_entries.h"

#include <algorithm>
#include <array>

#include "accountsettings/basic_account.h"
#include "accountsettings/dataclass_lists.h"

namespace tools {
namespace {

using accountsettings::BasicAccount;
using platform::Array;
using platform::Dictionary;
using platform::PropertyValue;
using platform::Text;

constexpr const char* kNeverCalled = "it is never called";
constexpr const char* kDescription = "Description";
constexpr const char* kFramework = "Framework";
constexpr const char* kClass = "Class";
const std::string kDataclasses{accountsettings::kAccountSupportedDataclasses.view()};

bool contains(const std::vector<Text>& texts, std::string_view text) {
  return std::ranges::find(texts, text, &Text::view) != texts.end();
}

// One entry under examination.
class Examination {
 public:
  Examination(CreatorEntry& entry, std::vector<ModuleFinding>& findings) : _entry{entry}, _findings{findings} {}

  void examine(const PropertyValue& value) {
    const Dictionary* const creator = value.asDictionary();
    if (creator == nullptr) return block("no-dictionary", "the entry is no dictionary", kNeverCalled);
    if (!readKind(*creator)) return;
    const Dictionary* const description = creator->dictionary(kDescription);
    const bool isNotifier = _entry.kind == kNotifierEntry;
    const std::string effect = isNotifier ? kNeverCalled : effectOfFailure(_entry.kind);
    const std::vector<std::string> keys = isNotifier ? std::vector<std::string>{kDataclasses, kFramework, kClass}
                                                     : std::vector<std::string>{kFramework, kClass};
    if (description == nullptr) {
      const auto beside = std::ranges::find_if(keys, [&](const auto& key) { return creator->find(key) != nullptr; });
      if (beside != keys.end())
        return block("misplaced-key", *beside + " stands beside Description, not in it", effect);
      return block("missing-key", "the entry has no dictionary Description", effect);
    }
    if (isNotifier) readDataclasses(*creator, *description);
    _entry.framework = textUnder(kFramework, *creator, *description);
    _entry.className = textUnder(kClass, *creator, *description);
  }

 private:
  void note(std::string_view kind, const std::string& what, const std::string& effect) {
    _findings.push_back({kind, _entry.place, what, effect});
  }
  void block(std::string_view kind, const std::string& what, const std::string& effect) {
    note(kind, what, effect);
    _entry.isCalled = false;
  }

  bool readKind(const Dictionary& creator) {
    const Text* const kind = creator.text("Type");
    if (kind != nullptr) _entry.kind = kind->string();
    if (std::ranges::count(std::array{kFullAccountEntry, kSyncAccountEntry, kNotifierEntry}, _entry.kind) != 0)
      return true;
    block("unknown-kind",
          (_entry.kind.empty() ? "the entry has no Type" : "the entry's Type is " + _entry.kind) +
              ", and not FullAccount, SyncAccount or NotifierAccount",
          kNeverCalled);
    return false;
  }

  // Says why the description has no such value of that kind.
  void blockWithout(const std::string& key, const char* kind, const Dictionary& creator, const Dictionary& description,
                    const std::string& effect) {
    if (description.find(key) != nullptr) return block("wrong-kind", key + " is no " + kind, effect);
    if (creator.find(key) != nullptr) {
      return block("misplaced-key", key + " stands beside Description, not in it", effect);
    }
    block("missing-key", "Description has no " + key, effect);
  }

  std::string textUnder(const char* key, const Dictionary& creator, const Dictionary& description) {
    const Text* const text = description.text(key);
    if (text != nullptr && !text->empty()) return text->string();
    if (_entry.isCalled == std::nullopt) {
      blockWithout(key, "text with something in it", creator, description, effectOfFailure(_entry.kind));
    }
    return {};
  }

  void readDataclasses(const Dictionary& creator, const Dictionary& description) {
    const Array* const list = description.array(kDataclasses);
    if (list == nullptr) return blockWithout(kDataclasses, "array", creator, description, kNeverCalled);
    for (const Text& each : accountsettings::textsIn(*list)) {
      _entry.dataclasses.push_back(each.string());
      if (contains(BasicAccount::allSupportedDataclasses(), each.view())) continue;
      note("unknown-dataclass", each.string() + " is no data class", "it is not called for it");
    }
    const auto* const supported = BasicAccount::supportedDataclassesForAccountType(_entry.accountType);
    if (supported == nullptr || supported->empty()) return;  // of such a type, nobody expects to hear
    const auto isSupported = [&](const std::string& each) { return contains(*supported, each); };
    if (std::ranges::any_of(_entry.dataclasses, isSupported)) return;
    block("unsupported-dataclasses",
          _entry.dataclasses.empty() ? kDataclasses + " is empty"
                                     : "no account of this type has a data class of " + kDataclasses,
          kNeverCalled);
  }

  CreatorEntry& _entry;
  std::vector<ModuleFinding>& _findings;
};

// All entries of a kind have their modules opened, and the last one's class is used.
void markShadowed(CreatorTable& table, std::size_t first) {
  for (const auto kind : {kFullAccountEntry, kSyncAccountEntry}) {
    const CreatorEntry* used = nullptr;
    for (std::size_t place = table.entries.size(); place-- > first;) {
      CreatorEntry& entry = table.entries[place];
      if (entry.kind != kind) continue;
      if (used != nullptr && entry.isCalled == std::nullopt) {
        table.findings.push_back({"shadowed", entry.place, used->place + " is of the same kind and stands later",
                                  "its module is opened, but its class is never called"});
        entry.isCalled = false;
      }
      used = used == nullptr ? &entry : used;
    }
  }
}

}  // namespace

std::string effectOfFailure(std::string_view kind) {
  if (kind == kFullAccountEntry) return "asking for the full account of such a record ends with an assertion failure";
  if (kind == kSyncAccountEntry) return "asking for the sync account of such a record ends with an assertion failure";
  return "a change of such an account ends with an assertion failure";
}

CreatorTable creatorTableIn(const Dictionary& file) {
  CreatorTable table;
  const auto types = BasicAccount::accountTypes();
  for (const auto& [key, value] : file) {
    const std::string type = key.string();
    const bool isKnown = contains(types, type);
    if (!isKnown) {
      table.findings.push_back({"unknown-type", type, "AccountTypesProperties.plist has no such account type",
                                "nothing under it is ever called"});
    }
    const Array* const list = value.asArray();
    const std::size_t first = table.entries.size();
    for (std::size_t index = 0; list != nullptr && index < list->size(); ++index) {
      CreatorEntry& entry = table.entries.emplace_back();
      entry.place = type + "[" + std::to_string(index) + "]";
      entry.accountType = type;
      Examination{entry, table.findings}.examine((*list)[index]);
      if (!isKnown) entry.isCalled = false;
    }
    markShadowed(table, first);
  }
  for (const Text& type : types) {
    if (file.array(type.view()) != nullptr) continue;
    table.findings.push_back(
        {"no-entries", type.string(), "the file has no array for this account type", effectOfFailure(kNotifierEntry)});
  }
  return table;
}

}  // namespace tools
