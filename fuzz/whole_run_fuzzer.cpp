// A whole run over whatever a device may hold. It ends with its lock given back, no temporary file, no credential in
// any output, and a settings file that is of the current version or as it was; no account is gone but by a rule, and a
// further run changes nothing.
#include <algorithm>
#include <map>
#include <set>

#include "fuzz/fuzzed_device.h"
#include "fuzz/require.h"
#include "migrator/accounts_data_migrator.h"

namespace {

using accountsettings::AccountsManager;
using fuzz::FuzzedDevice;
using fuzz::require;
using migrator::AccountsDataMigrator;
using tests::Array;
using tests::Bytes;
using tests::Dictionary;
using tests::PropertyValue;

using Accounts = std::map<std::int64_t, Dictionary>;  // by marker

void collect(const Array& records, bool withChildren, Accounts& found) {
  for (const PropertyValue& element : records) {
    const Dictionary* const record = element.asDictionary();
    if (record == nullptr) continue;
    if (const PropertyValue* const marker = record->find(FuzzedDevice::kMarker)) {
      found[marker->integerValue().value_or(0)] = *record;
    }
    const Array* const children = record->array("ChildAccounts");
    if (withChildren && children != nullptr) collect(*children, true, found);
  }
}

Accounts accountsOf(const std::optional<Dictionary>& settings, bool withChildren) {
  Accounts found;
  const Array* const records = settings ? settings->array("Accounts") : nullptr;
  if (records != nullptr) collect(*records, withChildren, found);
  return found;
}

bool hasText(const Dictionary& account, std::string_view key, std::initializer_list<std::string_view> values) {
  const tests::Text* const text = account.text(key);
  return text != nullptr && std::ranges::find(values, text->view()) != values.end();
}

// What a run may take out of a settings file whose identifiers all differ, by the rule that takes it.
class Losses {
 public:
  explicit Losses(const FuzzedDevice& device) : _hasMail{device.hasLegacyMail}, _hasExchange{device.hasLegacyExchange} {
    AccountsManager::_setShouldSkipNotifications(true);
    const auto store = AccountsManager::initInsideOfMigration();
    _version = store->dataVersion();
    for (const auto& account : store->allBasicAccounts()) loadUp(*account, *store);
  }

  [[nodiscard]] bool explain(const Dictionary& account) const {
    const std::int64_t marker = markerOf(account);
    if (!_loaded.contains(marker)) return true;  // no account, or dropped by the fixer
    if (_version <= 2 && hasText(account, "Type", {"OnMyDevice"})) return true;
    if (_version <= 4 && _partners.contains(marker)) return true;  // folded into the mail account of the same service
    if (_hasExchange && hasText(account, "Type", {"Exchange"})) return true;
    return _hasMail && hasText(account, "Type", {"Mail", "SMTP"});
  }

 private:
  static std::int64_t markerOf(const Dictionary& account) {
    const PropertyValue* const marker = account.find(FuzzedDevice::kMarker);
    return marker == nullptr ? 0 : marker->integerValue().value_or(0);
  }
  void loadUp(const accountsettings::BasicAccount& account, const AccountsManager& store) {
    const std::int64_t marker = markerOf(account.properties());
    _loaded.insert(marker);
    const auto isUmbrella = [&account](const auto& umbrella) {
      return AccountsDataMigrator::_calDAVAccount_matchesUmbrellaAccount(account, *umbrella);
    };
    if (std::ranges::any_of(store.allBasicAccounts(), isUmbrella)) _partners.insert(marker);
  }

  std::uint64_t _version = 0;
  bool _hasMail;
  bool _hasExchange;
  std::set<std::int64_t> _loaded;
  std::set<std::int64_t> _partners;
};

bool migrate() { return AccountsDataMigrator{}.performMigration(); }

void checkWhatIsLeft(const FuzzedDevice& device) {
  require(device.locks->held.empty(), "the lock is held");
  for (const std::string& output : device.outputs) {
    require(output.find(FuzzedDevice::kSecret) == std::string::npos, "a credential in " + output);
  }
  if (device.files->failing.contains("remove")) return;
  for (const auto& [path, node] : device.files->nodes) {
    require(node.isDirectory || !path.native().starts_with("/var/mobile/tmp/"), "a temporary file stays");
  }
}

bool isCurrent(const std::optional<Dictionary>& settings) {
  const PropertyValue* const version = settings ? settings->find("Version") : nullptr;
  return version != nullptr && *version == PropertyValue{accountsettings::kCurrentVersion} &&
         settings->array("Accounts") != nullptr;
}

void checkAgain(FuzzedDevice& device) {
  const auto once = device.settings();
  require(migrate(), "the second run failed");
  const auto twice = device.settings();
  // A converted account that the fixer refuses is written once and dropped when the file is next loaded.
  const bool mayLose = device.hasLegacyMail || device.hasLegacyExchange;
  if (!mayLose) return require(once == twice, "the second run changed the settings");
  require(migrate(), "the third run failed");
  require(device.settings() == twice, "the third run changed the settings");
}

// Each account of the settings file as it was is still there, or gone by a rule.
void checkLosses(const FuzzedDevice& device, const Accounts& before, const Accounts& kept, const Bytes& bytesBefore) {
  Accounts gone = before;
  std::erase_if(gone, [&kept](const auto& account) { return kept.contains(account.first); });
  if (gone.empty()) return;
  device.files->put(tests::kSettingsFile, bytesBefore);
  const Losses losses{device};
  for (const auto& [marker, account] : gone) {
    require(losses.explain(account), "account " + std::to_string(marker) + " is gone");
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  fuzz::Input input{data, size};
  static FuzzedDevice device;
  device.fill(input);
  const auto bytesBefore = device.settingsBytes();
  const auto before = accountsOf(device.settings(), false);
  const bool succeeded = migrate();
  checkWhatIsLeft(device);
  const auto after = device.settings();
  const bool isUntouched = device.settingsBytes() == bytesBefore;
  require(succeeded, "the run failed");
  if (device.hasFaults) {
    require(isUntouched || device.files->failing.contains("read") || isCurrent(after), "neither old nor new settings");
    return 0;
  }
  if (device.hasSentinel) {
    require(isUntouched, "the end of an interrupted removal touched the settings");
    return 0;
  }
  const bool isBlocked = bytesBefore && device.files->nodes.at(tests::kSettingsFile).isDirectory;
  if (isBlocked) return 0;
  require(isCurrent(after), "no current settings");
  if (!device.areIdentifiersUnique) return 0;
  checkAgain(device);
  if (bytesBefore) checkLosses(device, before, accountsOf(after, true), *bytesBefore);
  return 0;
}
