#include <algorithm>

#include "accountsettings/accounts_manager.h"
#include "accountsettings/assertion_failure.h"
#include "accountsettings/dataclass_lists.h"
#include "accountsettings/file_paths.h"
#include "accountsettings/product_values.h"
#include "platform/platform.h"

namespace accountsettings {
namespace {

using SingleChange = std::function<void(std::string_view identifier, std::string_view dataclass)>;

template <typename... Arguments>
[[noreturn]] void fail(std::string_view method, std::string_view format, const Arguments&... arguments) {
  failAssertion(method, "AccountsManager", format, {records::MessageArgument{arguments}...});
}

// --- Finding notifiers ---

constexpr std::string_view kNotifier = "NotifierAccount";
constexpr std::string_view kFind = "+[AccountsManager _notifierClassNamesForAccountType:dataclass:]";

// The description of a notifier that wants to hear of the data class; null for every other entry.
const Dictionary* notifierDescription(const PropertyValue& entry, std::string_view dataclass) {
  const Dictionary* const creator = entry.asDictionary();
  const Text* const type = creator == nullptr ? nullptr : creator->text("Type");
  if (type == nullptr || *type != kNotifier) return nullptr;
  const Dictionary* const description = creator->dictionary("Description");
  const Array* const dataclasses = description == nullptr ? nullptr : description->array(kAccountSupportedDataclasses);
  return dataclasses != nullptr && containsText(textsIn(*dataclasses), dataclass) ? description : nullptr;
}

void openNotifierModule(const Dictionary& description, std::optional<std::string_view> accountType) {
  const Text* const framework = description.text("Framework");
  if (framework == nullptr) {
    fail(kFind,
         "Malformed AccountCreators information. Could not find the path to the framework for the notifier with type "
         "%@",
         accountType);
  }
  const std::string path = modulePath(*framework);
  if (const platform::Status opened = platform::current().modules->open(path); !opened.isOk()) {
    fail(kFind, "Could not load the account creator framework %@. Error %s", path, opened.reason());
  }
}

std::string notifierClassName(const Dictionary& description, std::optional<std::string_view> accountType) {
  const Text* const name = description.text("Class");
  if (name == nullptr || name->empty()) {
    fail(kFind,
         "Malformed AccountCreators information. Could not find the name of the class for notificatinos with the type "
         "%@",
         accountType);
  }
  return name->string();
}

// Null for a class of another kind, which answers no operation of a notifier.
const AccountClassInfo* notifierClass(std::string_view method, std::string_view name) {
  const platform::ClassInfo* const found = platform::current().classes->classNamed(name);
  if (found == nullptr) fail(method, "Could not find a class for class name %@", name);
  return dynamic_cast<const AccountClassInfo*>(found);
}

// --- Single changes ---

void tellOfSingleChange(std::string_view method, const SingleChange AccountClassInfo::*operation,
                        const BasicAccount& account, std::string_view dataclass) {
  const std::optional<Text> type = account.type();
  const Text identifier = account.identifier().value_or(Text{});
  for (const std::string& name : AccountsManager::_notifierClassNamesForAccountType_dataclass(type, dataclass)) {
    const AccountClassInfo* const notifier = notifierClass(method, name);
    if (notifier != nullptr && notifier->*operation) (notifier->*operation)(identifier, dataclass);
  }
}

// --- Changes of a save ---

const Array* enabledIn(const Dictionary* properties) {
  return properties == nullptr ? nullptr : properties->array(kAccountEnabledDataclasses);
}

BasicAccount::Dataclasses enabledDataclassesIn(const Dictionary* properties) {
  const Array* const enabled = enabledIn(properties);
  return enabled == nullptr ? BasicAccount::Dataclasses{} : textsIn(*enabled);
}

void addMissing(BasicAccount::Dataclasses& list, const BasicAccount::Dataclasses& additions,
                const BasicAccount::Dataclasses& exceptions = {}) {
  for (const Text& dataclass : additions) {
    if (!containsText(exceptions, dataclass) && !containsText(list, dataclass)) list.push_back(dataclass);
  }
}

Dictionary withoutWhatConcernsNobody(const Dictionary* properties) {
  Dictionary rest = properties == nullptr ? Dictionary{} : *properties;
  rest.remove(kAccountEnabledDataclasses);
  rest.remove(kAccountChildAccounts);
  rest.remove(kMailAccountIsActiveKey);
  return rest;
}

BasicAccount::Dataclasses dataclassesConcerned(ChangeType change, const Dictionary* original,
                                               const Dictionary* current) {
  if (change == ChangeType::removed) return enabledDataclassesIn(original);
  if (change == ChangeType::added) return enabledDataclassesIn(current);
  const BasicAccount::Dataclasses before = enabledDataclassesIn(original);
  const BasicAccount::Dataclasses after = enabledDataclassesIn(current);
  BasicAccount::Dataclasses concerned;
  addMissing(concerned, before, after);
  addMissing(concerned, after, before);
  const bool isOtherwiseChanged = withoutWhatConcernsNobody(original) != withoutWhatConcernsNobody(current);
  if (isOtherwiseChanged) addMissing(concerned, after);
  return concerned;
}

// A value of another kind is no text: then the original tells it, as where there is none.
const Text* textOfEither(const Dictionary* current, const Dictionary* original, std::string_view key) {
  const Text* const text = current == nullptr ? nullptr : current->text(key);
  return text != nullptr || original == nullptr ? text : original->text(key);
}

// The entry ends at the first value that is missing: one without an identifier tells only of the kind of change.
Dictionary changeEntry(ChangeType change, const Dictionary* original, const Dictionary* current) {
  Dictionary entry{{kASChangeAccountChangeTypeKey, static_cast<std::int32_t>(change)}};
  for (const auto& [key, property] : {std::pair{kASChangeAccountIdentifierKey, kAccountIdentifier},
                                      std::pair{kASChangeAccountTypeKey, kAccountType}}) {
    const Text* const text = textOfEither(current, original, property);
    if (text == nullptr) return entry;
    entry.set(key, *text);
  }
  const Array* const enabled = enabledIn(original);
  entry.set(kASChangeAccountOriginallyEnabledDataclassesKey, enabled == nullptr ? Array{} : *enabled);
  return entry;
}

}  // namespace

std::vector<std::string> AccountsManager::_notifierClassNamesForAccountType_dataclass(
    std::optional<std::string_view> type, std::string_view dataclass) {
  const Dictionary* const table = BasicAccount::_accountCreationMap();
  const Array* const entries = table == nullptr || !type ? nullptr : table->array(*type);
  if (entries == nullptr) {
    fail(kFind, "Malformed AccountCreators information. Could not find the information for the type %@", type);
  }
  std::vector<std::string> names;
  for (const PropertyValue& entry : *entries) {
    const Dictionary* const description = notifierDescription(entry, dataclass);
    if (description == nullptr) continue;
    openNotifierModule(*description, type);
    names.push_back(notifierClassName(*description, type));
  }
  return names;
}

void AccountsManager::accountWillChange_forDataclass(const BasicAccount& account, std::string_view dataclass) {
  tellOfSingleChange("+[AccountsManager accountWillChange:forDataclass:]",
                     &AccountClassInfo::accountWillChange_forDataclass, account, dataclass);
}

void AccountsManager::accountDidChange_forDataclass(const BasicAccount& account, std::string_view dataclass) {
  tellOfSingleChange("+[AccountsManager accountDidChange:forDataclass:]",
                     &AccountClassInfo::accountDidChange_forDataclass, account, dataclass);
}

void AccountsManager::_addNotificationToDictionary_forChangeType_originalProperties_currentProperties(
    NotificationTable& table, ChangeType change, const Dictionary* original, const Dictionary* current) const {
  // Nobody listens for an account that has no type; the file is written, so that is no failure any more.
  const Text* const type = textOfEither(current, original, kAccountType);
  if (type == nullptr) return;
  std::vector<std::string> names;
  for (const Text& dataclass : dataclassesConcerned(change, original, current)) {
    for (std::string& name : _notifierClassNamesForAccountType_dataclass(*type, dataclass)) {
      if (std::ranges::find(names, name) == names.end()) names.push_back(std::move(name));
    }
  }
  for (const std::string& name : names) {
    if (!table.contains(name)) table.set(name, {});
    table.find(name)->push_back(changeEntry(change, original, current));
  }
}

void AccountsManager::_sendNotificationsForChangedAccounts() {
  static constexpr std::string_view kMethod = "-[AccountsManager _sendNotificationsForChangedAccounts]";
  for (const auto& [name, changes] : notificationTable()) {
    const AccountClassInfo* const notifier = notifierClass(kMethod, name);
    if (notifier == nullptr || !notifier->noteAccountChanges) {
      fail(kMethod, "The notifier %@ does not answer noteAccountChanges:", name);
    }
    notifier->noteAccountChanges(changes);
  }
}

AccountsManager::NotificationTable AccountsManager::notificationTable() const {
  platform::InsertionOrderedMap<Dictionary> originals;
  for (const auto& [identifier, original] : _originalAccountsByID) originals.set(identifier, original);
  NotificationTable table;
  const auto add = [&](ChangeType change, const Dictionary* original, const Dictionary* current) {
    _addNotificationToDictionary_forChangeType_originalProperties_currentProperties(table, change, original, current);
  };
  for (const auto& [identifier, original] : originals) {
    if (!_topLevelAccountsByID.contains(identifier)) add(ChangeType::removed, &original, nullptr);
  }
  for (const auto& [identifier, account] : _topLevelAccountsByID) {
    if (!originals.contains(identifier)) add(ChangeType::added, nullptr, &account->propertiesToSave());
  }
  for (const auto& [identifier, original] : originals) {
    const Account* const account = _topLevelAccountsByID.find(identifier);
    if (account != nullptr) add(ChangeType::present, &original, &(*account)->propertiesToSave());
  }
  return table;
}

}  // namespace accountsettings
