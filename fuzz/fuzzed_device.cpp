#include "fuzz/fuzzed_device.h"

#include <algorithm>
#include <iterator>

#include "accountsettings/accounts_manager.h"

namespace fuzz {
namespace {

using tests::Array;
using tests::Bytes;
using tests::Dictionary;
using tests::Path;
using tests::PropertyValue;

constexpr std::string_view kKeys[] = {"Type",
                                      "Class",
                                      "Identifier",
                                      "Enabled Dataclasses",
                                      "ChildAccounts",
                                      "Username",
                                      "uniqueId",
                                      "IsActive",
                                      "DisplayName",
                                      "Provisioned Dataclasses",
                                      "AccountPath",
                                      "Sync Identifier",
                                      "primaryAccount",
                                      "CalDAVEnabled",
                                      "hostedServiceStatus",
                                      "CalDAVPrincipalConfiguration",
                                      "CalDAVAccountConfiguration",
                                      "Subscribed Calendars",
                                      "DAExoSubscribedCalendarInfos",
                                      "Type String",
                                      "Short Type String",
                                      "Password",
                                      "OAuth-Token",
                                      "someSecret",
                                      "Cookie_Jar",
                                      "Foreign"};
constexpr std::string_view kMailKeys[] = {"AccountType", "AccountName",   "uniqueId",    "Username",
                                          "IsActive",    "AccountPath",   "Password",    "Identifier",
                                          "Class",       "ChildAccounts", "DisplayName", "Foreign"};
constexpr std::string_view kExchangeKeys[] = {"DAAccountConfigurationClass",
                                              "DAAccountDescription",
                                              "DAAccountConfigurationAccountID",
                                              "DAAccountEnabledForCalendar",
                                              "DAAccountEnabledForContacts",
                                              "DAAccountEnabledForEmail",
                                              "DAAccountEnabledForContactsSearch",
                                              "Password",
                                              "Type",
                                              "ChildAccounts",
                                              "Foreign"};
constexpr std::string_view kTypes[] = {"Mail",      "Nimbra",     "VorlixAccount", "CalDAV",      "Exchange",
                                       "SMTP",      "Gmail",      "Yahoo",         "OnMyDevice",  "LDAP",
                                       "CardDAV",   "KeldorIMAP", "IMAPNotes",     "BookmarkDAV", "Subscribed Calendar",
                                       "Unheard of"};
constexpr std::string_view kClasses[] = {"IMAPAccount",       "POPAccount",          "GmailAccount",    "YahooAccount",
                                         "AOLAccount",        "WexmoAccount",        "NimbraAccount",   "KQAccount",
                                         "KeldorIMAPAccount", "DAMailAccount",       "DeliveryAccount", "SMTPAccount",
                                         "MailAccount",       "MobileCalDAVAccount", "LocalAccount",    "ASAccount"};
constexpr std::string_view kDataclasses[] = {
    "com.vorlix.Dataclass.Mail",           "com.vorlix.Dataclass.Contacts",      "com.vorlix.Dataclass.Calendars",
    "com.vorlix.Dataclass.Reminders",      "com.vorlix.Dataclass.Bookmarks",     "com.vorlix.Dataclass.Notes",
    "com.vorlix.Dataclass.ContactsSearch", "com.vorlix.Dataclass.DeviceLocator", "com.vorlix.Dataclass.MediaStream",
    "com.vorlix.Dataclass.Backup",         "com.vorlix.Dataclass.Quorvel",       "com.vorlix.Dataclass.KeyValue",
    "com.vorlix.Dataclass.Tickora",        "com.vorlix.Dataclass.SharedStreams", "Unheard of"};
constexpr std::string_view kTexts[] = {"",
                                       "jane",
                                       "jane@example",
                                       "yes",
                                       "2",
                                       "Nimbra",
                                       "Mail/IMAP-x",
                                       "Mail/Lumo-x",
                                       "Mail/Mailboxes",
                                       "1",
                                       "false",
                                       "elsewhere",
                                       "Mail/POP-gmail.com@imap.gmail.com",
                                       "x@imap.mail.yahoo.com"};
constexpr std::string_view kHosts[] = {"www.google.com", "caldav.calendar.yahoo.com"};
constexpr std::string_view kPrincipals[] = {"/calendar/dav/jane/user", "/calendar/dav/jane%40example/user",
                                            "/principals/users/jane"};
constexpr std::string_view kCredentials[] = {"Password", "OAuth-Token", "someSecret", "Cookie_Jar"};

bool isAmong(std::string_view word, Words words) { return std::ranges::find(words, word) != words.end(); }

Bytes secretBytes() { return {FuzzedDevice::kSecret.begin(), FuzzedDevice::kSecret.end()}; }

}  // namespace

FuzzedDevice::FuzzedDevice() : _store{std::make_shared<ValuesInMemory>(files)} {
  for (const char* const name : {"AccountTypesProperties", "DataclassesProperties", "AccountCreators"}) {
    const Path path = Path{"/resources"} / (std::string{name} + ".plist");
    putReal(path, dictionaryAt(path));
  }
  changePlatform([this](platform::Platform& services) { services.propertyLists = _store; });
  switchRecordsOn();
  _ownFiles = files->nodes;
}

void FuzzedDevice::fill(Input& input) {
  begin(input);
  putFiles();
}

void FuzzedDevice::fillWithCopies(Input& input) {
  begin(input);
  areIdentifiersUnique = _input->yes();
  const std::int64_t version =
      static_cast<std::int64_t>(_input->below(accountsettings::AccountsManager::currentVersion() + 1));
  const std::size_t copies = 1 + _input->below(250);
  const Input choices = *_input;
  Array all;
  for (std::size_t copy = 0; copy < copies; ++copy) {
    Input again = choices;
    _input = &again;
    std::ranges::move(accounts(1), std::back_inserter(all));
  }
  putReal(tests::kSettingsFile, {{"Version", version}, {"Accounts", all}});
}

void FuzzedDevice::begin(Input& input) {
  _input = &input;
  _identifiers = 0;
  _markers = 0;
  std::erase_if(files->nodes, [this](const auto& node) { return !_ownFiles.contains(node.first); });
  for (const auto& [path, node] : _ownFiles) files->nodes[path] = node;
  files->failing.clear();
  files->hasTemporaryNames = true;
  identifiers->made = 0;
  _store->isReal = true;
  _store->forget();
  forget();
}

void FuzzedDevice::forget() {
  outputs.clear();
  files->calls.clear();
  console->lines.clear();
  systemLog->lines.clear();
  locks->calls.clear();
  deviceInfo->asked.clear();
  restrictions->asked.clear();
  tetheredSync->asked.clear();
  modules->opened.clear();
  clock->patterns.clear();
}

std::optional<Dictionary> FuzzedDevice::settings() const {
  return _store->readDictionary(tests::kSettingsFile).optional();
}

std::optional<Bytes> FuzzedDevice::settingsBytes() const {
  const auto node = files->nodes.find(tests::kSettingsFile);
  return node == files->nodes.end() ? std::nullopt : std::optional{node->second.bytes};
}

PropertyValue FuzzedDevice::anything(int depth) {
  const std::size_t choice = _input->below(10);
  if (choice == 0 && depth > 0) return Dictionary{{_input->oneOf(kKeys), anything(depth - 1)}};
  if (choice == 1 && depth > 0) return Array{anything(depth - 1), anything(depth - 1)};
  if (choice == 2) return secretBytes();
  return scalarFrom(*_input, kTexts);
}

PropertyValue FuzzedDevice::identifier() {
  if (areIdentifiersUnique) return "Identifier " + std::to_string(++_identifiers);
  return "Identifier " + std::to_string(_input->below(4));
}

// What stands under the key on an honest device.
PropertyValue FuzzedDevice::usual(std::string_view key, int depth) {
  if (isAmong(key, kCredentials)) return kSecret;
  if (key == "Type") return _input->oneOf(kTypes);
  if (key == "Class" || key == "AccountType" || key == "DAAccountConfigurationClass") return _input->oneOf(kClasses);
  if (key == "Identifier" || key == "uniqueId" || key == "DAAccountConfigurationAccountID") return identifier();
  if (key == "ChildAccounts") return accounts(depth - 1);
  if (key == "CalDAVPrincipalConfiguration") {
    return Dictionary{{"Login_Key", _input->oneOf(kTexts)}, {"CalDAV_Server_Key", _input->oneOf(kHosts)}};
  }
  if (key == "CalDAVAccountConfiguration") return Dictionary{{"CalDAV_PrincipalPath_Key", _input->oneOf(kPrincipals)}};
  if (key.ends_with("Dataclasses")) {
    Array names;
    for (std::size_t count = _input->below(6); count > 0; --count) names.emplace_back(_input->oneOf(kDataclasses));
    return names;
  }
  if (key == "hostedServiceStatus") return static_cast<int>(_input->below(4));
  return scalarFrom(*_input, kTexts);
}

Dictionary FuzzedDevice::described(Words keys) {
  Dictionary properties;
  for (std::size_t count = _input->below(12); count > 0; --count) {
    const std::string_view key = _input->oneOf(keys);
    const bool isOdd = _input->below(8) == 7 && !isAmong(key, kCredentials);
    properties.set(key, isOdd ? anything(2) : usual(key, 1));
  }
  properties.set(kMarker, ++_markers);
  return properties;
}

Dictionary FuzzedDevice::account(int depth) {
  Dictionary properties;
  if (_input->below(16) != 15) properties.set("Type", usual("Type", 0));
  if (_input->below(16) != 15) properties.set("Class", usual("Class", 0));
  for (std::size_t count = _input->below(10); count > 0; --count) {
    const std::string_view key = _input->oneOf(kKeys);
    const bool isOdd = _input->below(8) == 7 && !isAmong(key, kCredentials);
    properties.set(key, isOdd ? anything(2) : usual(key, depth));
  }
  if (areIdentifiersUnique) properties.set("Identifier", identifier());
  properties.set(kMarker, ++_markers);
  return properties;
}

Array FuzzedDevice::accounts(int depth) {
  Array accounts;
  if (depth < 0) return accounts;
  for (std::size_t count = _input->below(6); count > 0; --count) {
    accounts.push_back(_input->below(16) == 15 ? anything(2) : PropertyValue{account(depth)});
  }
  return accounts;
}

void FuzzedDevice::putReal(const Path& path, const Dictionary& contents) const {
  files->put(path, *_store->serialize(contents).data);
}

void FuzzedDevice::putFile(const Path& path, const Dictionary& contents) {
  const std::size_t form = _input->below(16);
  if (form == 15) return files->putDirectory(path);
  if (form == 14) return files->put(path, _input->bytes(20));
  putReal(path, contents);
}

void FuzzedDevice::putFiles() {
  const std::size_t has = _input->byte();
  areIdentifiersUnique = (has & 1U) != 0;
  hasLegacyMail = (has & 2U) != 0;
  hasLegacyExchange = (has & 4U) != 0;
  hasSentinel = (has & 0x38U) == 0x38U;
  hasFaults = (has & 0xC0U) == 0xC0U;
  systemLog->readers = (has & 0x58U) == 0x58U;
  _store->isReal = (has & 0x58U) == 0x18U;
  const std::int64_t version = static_cast<std::int64_t>(_input->below(15)) - 1;
  const std::size_t isOdd = _input->below(8);
  Dictionary contents;
  if (version >= 0) contents.set("Version", isOdd == 7 ? anything(1) : PropertyValue{version});
  contents.set("Accounts", isOdd == 6 ? anything(2) : PropertyValue{accounts(1)});
  if (isOdd != 5) putFile(tests::kSettingsFile, contents);
  const auto descriptions = [this](Words keys) {
    Array array;
    for (std::size_t count = _input->below(5); count > 0; --count) array.emplace_back(described(keys));
    return _input->below(16) == 15 ? anything(2) : PropertyValue{array};
  };
  if (hasLegacyMail) {
    const PropertyValue delivery = descriptions(kMailKeys);
    putFile(tests::kLegacyMailFile, {{"DeliveryAccounts", delivery}, {"MailAccounts", descriptions(kMailKeys)}});
  }
  if (hasLegacyExchange) putFile(tests::kLegacyExchangeFile, {{"DAAccountsKey", descriptions(kExchangeKeys)}});
  if (hasSentinel) files->put(tests::kRemovalSentinel, std::string_view{});
  if (hasFaults) addFaults();
}

void FuzzedDevice::addFaults() {
  for (const char* const verb :
       {"read", "create", "replace", "copy", "remove", "createDirectories", "setOwner", "rename"}) {
    if (_input->below(4) == 3) files->failing.insert(verb);
  }
  if (_input->below(4) == 3) files->hasTemporaryNames = false;
}

}  // namespace fuzz
