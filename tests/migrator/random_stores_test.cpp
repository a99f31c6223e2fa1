#include <cstdlib>
#include <fstream>
#include <iterator>
#include <map>
#include <random>
#include <set>

#include "accountsettings/device_local_account.h"
#include "tests/support/property_list_files.h"
#include "tests/support/step_test.h"

namespace migrator {
namespace {

using accountsettings::kCurrentVersion;
using tests::dataclasses;

constexpr int kVersions = kCurrentVersion + 1;

constexpr std::string_view kMarker = "Marker";  // which account of the file a record was
constexpr std::string_view kForeignKey = "Foreign";

// By release, what the steps that came later name: each key with the values that it is to have.
const Dictionary& stepKeys() {
  static const Dictionary keys = [] {
    std::ifstream file{STEP_KEYS};
    const std::string bytes{std::istreambuf_iterator{file}, {}};
    return tests::PropertyListFiles{}.read(bytes).value();
  }();
  return keys;
}

// Settings files of accounts as odd as a file can hold them.
class RandomFiles {
 public:
  explicit RandomFiles(std::uint32_t seed) : _numbers{seed} {}

  // Accounts with identifiers that all differ, or accounts that share a few and partly have none.
  Array accounts(bool haveIdentifiersOfTheirOwn) {
    _areIdentifiersUnique = haveIdentifiersOfTheirOwn;
    Array accounts;
    for (int count = below(9); count > 0; --count) accounts.emplace_back(account(true));
    return accounts;
  }
  int below(int limit) { return std::uniform_int_distribution{0, limit - 1}(_numbers); }

 private:
  using Words = std::vector<std::string_view>;

  bool maybe() { return below(2) == 0; }
  std::size_t placeAmong(std::size_t count) { return static_cast<std::size_t>(below(static_cast<int>(count))); }
  std::string_view oneOf(const Words& words) { return words[placeAmong(words.size())]; }

  PropertyValue identifier() {
    const int number = _areIdentifiersUnique ? ++_identifiers : below(4);
    return "Identifier " + std::to_string(number);
  }
  PropertyValue anything() {
    switch (below(9)) {
      case 0: return below(4);
      case 1: return 0.5 * below(5);
      case 2: return maybe();
      case 3: return platform::Date{12.5};
      case 4: return platform::Bytes{1, 2, 3};
      case 5: return Array{anything(), 1};
      case 6: return Dictionary{{"Inner", anything()}};
      default: return oneOf({"", "2", "yes", "Nimbra", "jane@example", "jane"});
    }
  }
  PropertyValue sometimesOdd(PropertyValue usual) { return below(12) == 0 ? anything() : std::move(usual); }

  PropertyValue someDataclasses() {
    static const Words kNames{"Mail",          "Contacts", "Calendars", "Reminders", "Bookmarks", "Notes",
                              "DeviceLocator", "Quorvel",  "KeyValue",  "Tickora",   "Backup",    "Unheard of"};
    Array names;
    for (int count = below(8); count > 0; --count) names.push_back(sometimesOdd(dataclasses({oneOf(kNames)}).front()));
    return names;
  }
  PropertyValue children() {
    Array children;
    for (int count = below(4); count > 0; --count) children.push_back(sometimesOdd(account(false)));
    return children;
  }
  void addCalDAV(Dictionary& properties) {
    properties.set("CalDAVPrincipalConfiguration",
                   sometimesOdd(Dictionary{
                       {"Login_Key", sometimesOdd(oneOf({"jane", "jane@example"}))},
                       {"CalDAV_Server_Key", sometimesOdd(oneOf({"www.google.com", "caldav.calendar.yahoo.com"}))}}));
    properties.set(
        "CalDAVAccountConfiguration",
        sometimesOdd(Dictionary{{"CalDAV_PrincipalPath_Key", oneOf({"/calendar/dav/jane/user", "/principals/users/jane",
                                                                    "/calendar/dav/jane%40example/user"})}}));
  }
  void addSettings(Dictionary& properties) {
    if (maybe()) properties.set("Username", sometimesOdd(oneOf({"jane", "jane@example"})));
    if (maybe()) properties.set("IsActive", sometimesOdd(maybe()));
    if (maybe()) properties.set("DisplayName", sometimesOdd(oneOf({"Nimbra", "Mine"})));
    if (maybe()) properties.set("Enabled Dataclasses", sometimesOdd(someDataclasses()));
    if (below(3) == 0) properties.set("Provisioned Dataclasses", sometimesOdd(someDataclasses()));
    if (maybe()) properties.set("hostedServiceStatus", sometimesOdd(below(4)));
    if (below(4) == 0) properties.set("primaryAccount", sometimesOdd(maybe()));
    if (below(4) == 0) properties.set("Subscribed Calendars", anything());
    if (below(4) == 0) properties.set("AccountPath", sometimesOdd(oneOf({"Mail/IMAP-x", "Mail/Lumo-x", "elsewhere"})));
  }
  void addStepKeys(Dictionary& properties) {
    for (const Dictionary::Entry& step : stepKeys()) {
      for (const Dictionary::Entry& key : *step.value.asDictionary()) {
        const Array& values = *key.value.asArray();
        if (maybe()) properties.set(key.key, sometimesOdd(values.at(placeAmong(values.size()))));
      }
    }
  }
  Dictionary account(bool isTopLevel) {
    static const Words kTypes{"Mail",          "Mail",   "Nimbra",     "Nimbra",   "VorlixAccount",
                              "VorlixAccount", "CalDAV", "CalDAV",     "Exchange", "SMTP",
                              "Gmail",         "Yahoo",  "OnMyDevice", "LDAP",     "IMAPNotes"};
    static const Words kClasses{"IMAPAccount", "POPAccount",          "GmailAccount",        "YahooAccount",
                                "AOLAccount",  "WexmoAccount",        "NimbraAccount",       "KQAccount",
                                "KQAccount",   "MobileCalDAVAccount", "MobileCalDAVAccount", "MailAccount",
                                "OtherAccount"};
    Dictionary properties;
    if (below(20) != 0) properties.set("Type", sometimesOdd(oneOf(kTypes)));
    if (below(20) != 0) properties.set("Class", oneOf(kClasses));
    if (_areIdentifiersUnique || below(10) != 0) properties.set("Identifier", identifier());
    if (below(3) == 0) properties.set("uniqueId", sometimesOdd(identifier()));
    if (below(3) == 0) properties.set("Sync Identifier", sometimesOdd("sync"));
    addSettings(properties);
    if (maybe()) addCalDAV(properties);
    addStepKeys(properties);
    if (isTopLevel && below(3) == 0) properties.set("ChildAccounts", sometimesOdd(children()));
    properties.set(kMarker, ++_markers);
    properties.set(kForeignKey, anything());
    return properties;
  }

  std::mt19937 _numbers;
  bool _areIdentifiersUnique = true;
  int _identifiers = 0;
  int _markers = 0;
};

// How many files are tried: a few thousand, or as many as the environment asks for.
int rounds() {
  const char* const asked = std::getenv("RANDOM_STORES");
  return asked != nullptr ? std::atoi(asked) : 2000;
}

class RandomStores : public tests::StepTest {
 protected:
  RandomStores() {
    device.systemLog->readers = false;
    device.files->putDirectory("/var/mobile/Library/Logs/CrashReporter");
  }

  void start(const Array& accounts, int version) {
    AccountsManager::_setShouldSkipNotifications(true);
    load(accounts, version);
  }
  Array migrated(const Array& accounts, int version) {
    start(accounts, version);
    store.reset();
    EXPECT_TRUE(AccountsDataMigrator{}.performMigration());
    EXPECT_EQ(*device.dictionaryAt(AccountsManager::fullPathToAccountSettingsPlist()).find("Version"),
              PropertyValue{kCurrentVersion});
    return savedAccounts();
  }
};

// Every record of a file by its marker, children included.
void collect(const Array& accounts, std::map<std::int64_t, Dictionary>& found) {
  for (const PropertyValue& element : accounts) {
    const Dictionary* const record = element.asDictionary();
    if (record == nullptr) continue;
    if (const PropertyValue* const marker = record->find(kMarker)) found[marker->integerValue().value_or(0)] = *record;
    if (const Array* const children = record->array("ChildAccounts")) collect(*children, found);
  }
}

// What a run may take out of a file, by the rule that takes it.
class Losses {
 public:
  Losses(const AccountsManager& loaded, int version) : _version{version} {
    for (const auto& account : loaded.allBasicAccounts()) _loaded.insert(markerOf(account->properties()));
    for (const auto& umbrella : loaded.allBasicAccounts()) {
      for (const auto& account : loaded.allBasicAccounts()) {
        if (AccountsDataMigrator::_calDAVAccount_matchesUmbrellaAccount(*account, *umbrella)) {
          _partners.insert(markerOf(account->properties()));
        }
      }
    }
  }
  [[nodiscard]] bool explain(const Dictionary& account) const {
    if (!_loaded.contains(markerOf(account))) return true;  // refused, or dropped by the fixer, while loading
    if (_version <= 2 && *account.text("Type") == accountsettings::kOnMyDeviceAccountType) return true;
    return _version <= 4 && _partners.contains(markerOf(account)) &&
           *account.text("Class") == std::string_view{"MobileCalDAVAccount"};
  }

 private:
  static std::int64_t markerOf(const Dictionary& account) { return account.find(kMarker)->integerValue().value_or(0); }

  int _version;
  std::set<std::int64_t> _loaded;
  std::set<std::int64_t> _partners;
};

TEST_F(RandomStores, LoseNoAccountButByARuleAndNoKeyThatNoStepNames) {
  for (int round = 0; round < rounds(); ++round) {
    RandomFiles random{static_cast<std::uint32_t>(round)};
    const int version = random.below(kVersions);
    const Array before = random.accounts(true);
    start(before, version);
    const Losses losses{*store, version};
    std::map<std::int64_t, Dictionary> found;
    collect(migrated(before, version), found);
    for (const PropertyValue& element : before) {
      const Dictionary& account = *element.asDictionary();
      const auto place = found.find(*account.find(kMarker)->integerValue());
      ASSERT_TRUE(place != found.end() || losses.explain(account)) << "round " << round << ", " << version;
      if (place == found.end()) continue;
      EXPECT_EQ(*place->second.find(kForeignKey), *account.find(kForeignKey)) << "round " << round;
    }
  }
}

TEST_F(RandomStores, StayAsTheyAreWhenMigratedAgain) {
  for (int round = 0; round < rounds() / 4; ++round) {
    RandomFiles random{static_cast<std::uint32_t>(round)};
    const Array once = migrated(random.accounts(true), random.below(kVersions));
    store = AccountsManager::initInsideOfMigration();
    EXPECT_EQ(store->count(), once.size()) << "round " << round;
    EXPECT_EQ(migrated(once, kCurrentVersion), once) << "round " << round;
    EXPECT_TRUE(device.console->lines.empty());
  }
}

TEST_F(RandomStores, AreMigratedAlsoWhereAccountsShareIdentifiers) {
  for (int round = 0; round < rounds(); ++round) {
    RandomFiles random{static_cast<std::uint32_t>(round)};
    const int version = random.below(kVersions);
    const Array before = random.accounts(false);
    start(before, version);
    const bool isAnythingLoaded = store->count() > 0;
    EXPECT_EQ(migrated(before, version).empty(), !isAnythingLoaded && version > 2) << "round " << round;
  }
}

class RandomStoresOneStepEarlier : public RandomStores, public testing::WithParamInterface<int> {
 protected:
  // With the account that makes the step of the on-device account do nothing.
  static Array withCurrentOnDeviceAccount(Array accounts) {
    std::erase_if(accounts, [](const PropertyValue& element) {
      const PropertyValue* const type = element.asDictionary()->find("Type");
      return type != nullptr && *type == PropertyValue{accountsettings::kOnMyDeviceAccountType};
    });
    Dictionary onDevice = accountsettings::DeviceLocalAccount::basicAccountProperties();
    onDevice.set("Enabled Dataclasses", dataclasses({"Bookmarks", "Calendars", "Contacts", "Notes"}));
    accounts.emplace_back(onDevice);
    return accounts;
  }
  [[nodiscard]] Array properties() const {
    Array properties;
    for (const auto& account : store->allBasicAccounts()) properties.emplace_back(account->properties());
    return properties;
  }
  bool hasNothingToDo(const Array& accounts) {
    start(accounts, GetParam());
    const Array before = properties();
    const auto& step = AccountsDataMigrator::versionSteps()[static_cast<std::size_t>(GetParam())];
    std::ignore = (migrator.*step.run)(*store);
    return properties() == before;
  }
};

constexpr int kStepOfTheOnDeviceAccount = 2;

TEST_P(RandomStoresOneStepEarlier, BecomeTheSameWhereThatStepHasNothingToDo) {
  int compared = 0;
  for (int round = 0; round < rounds() / 10; ++round) {
    RandomFiles random{static_cast<std::uint32_t>(round)};
    Array accounts = random.accounts(true);
    if (GetParam() == kStepOfTheOnDeviceAccount) accounts = withCurrentOnDeviceAccount(accounts);
    if (!hasNothingToDo(accounts)) continue;
    device.identifiers->made = 0;
    const Array entered = migrated(accounts, GetParam() + 1);
    device.identifiers->made = 0;
    EXPECT_EQ(migrated(accounts, GetParam()), entered) << "round " << round;
    ++compared;
  }
  EXPECT_GT(compared, 0);
}

INSTANTIATE_TEST_SUITE_P(EveryStep, RandomStoresOneStepEarlier, testing::Range<int>(0, kCurrentVersion));

class RandomStoresOfAStep : public RandomStoresOneStepEarlier {
 protected:
  RandomStoresOfAStep() { device.deviceInfo->answers["CPUArchitecture"] = "armv6"; }
};

TEST_P(RandomStoresOfAStep, GiveItSomethingToDo) {
  for (int round = 0; round < rounds(); ++round) {
    if (!hasNothingToDo(RandomFiles{static_cast<std::uint32_t>(round)}.accounts(true))) return;
  }
  FAIL() << "no account has what this step changes; name the keys in " << STEP_KEYS;
}

// Two steps change nothing but the version.
std::vector<int> stepsThatChangeAccounts() {
  std::vector<int> steps;
  for (int version = 0; version < static_cast<int>(kCurrentVersion); ++version) {
    if (version != 0 && version != 8) steps.push_back(version);
  }
  return steps;
}

INSTANTIATE_TEST_SUITE_P(ThatChangesAccounts, RandomStoresOfAStep, testing::ValuesIn(stepsThatChangeAccounts()));

}  // namespace
}  // namespace migrator
