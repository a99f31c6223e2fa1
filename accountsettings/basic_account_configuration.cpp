#include <algorithm>
#include <atomic>
#include <mutex>

#include "accountsettings/assertion_failure.h"
#include "accountsettings/basic_account.h"
#include "accountsettings/dataclass_lists.h"
#include "platform/insertion_ordered_map.h"
#include "platform/kept_for_life.h"
#include "platform/platform.h"

// The tables live as long as the process and are never destroyed, so that modules may ask until the very end.
namespace accountsettings {
namespace {

using Actions = BasicAccount::Actions;
using Dataclasses = BasicAccount::Dataclasses;

struct AccountType {
  std::optional<Dataclasses> supportedDataclasses;
  Dataclasses orderedSupportedDataclasses;
  std::optional<Actions> enableActions;
  std::optional<Actions> disableActions;
  std::optional<Actions> deleteAccountActions;
  bool showsRemindersSeparately = false;
};
using AccountTypes = platform::InsertionOrderedMap<AccountType>;

std::mutex classLock;
// Both are kept for the life of the process: what they answer is handed out by pointer.
std::atomic<const AccountTypes*> typeTable = nullptr;
std::atomic<const Dictionary*> creatorTable = nullptr;

platform::Path configurationFile(std::string_view name) {
  return platform::current().directories->resources() / (std::string{name} + ".plist");
}

platform::Result<Dictionary> readConfiguration(std::string_view name) {
  return platform::current().propertyLists->readDictionary(configurationFile(name));
}

std::optional<std::vector<Text>> textsUnder(std::string_view key, const Dictionary& properties) {
  const Array* const array = properties.array(key);
  return array == nullptr ? std::nullopt : std::optional{textsIn(*array)};
}

bool booleanUnder(std::string_view key, const Dictionary& properties) {
  const PropertyValue* const value = properties.find(key);
  return value != nullptr && value->booleanValue().value_or(false);
}

// The known data classes of a list, in its order, each the library's own constant.
Dataclasses knownDataclasses(const Dataclasses& listed, bool keepsNotes) {
  const Dataclasses& known = BasicAccount::allSupportedDataclasses();
  Dataclasses kept;
  kept.reserve(listed.size());
  for (const Text& dataclass : listed) {
    if (dataclass == kAccountDataclassNotes && !keepsNotes) continue;
    const auto match = std::find(known.begin(), known.end(), dataclass);
    if (match != known.end()) kept.push_back(*match);
  }
  return kept;
}

AccountType accountType(const Dictionary& properties, bool keepsNotes) {
  AccountType type{.supportedDataclasses = textsUnder(kPropertiesSupportedDataclasses, properties),
                   .orderedSupportedDataclasses = {},
                   .enableActions = textsUnder(kPropertiesEnableDataclassActions, properties),
                   .disableActions = textsUnder(kPropertiesDisableDataclassActions, properties),
                   .deleteAccountActions = textsUnder(kPropertiesDeleteAccountActions, properties),
                   .showsRemindersSeparately = booleanUnder(kPropertiesShowRemindersSeparately, properties)};
  if (!type.supportedDataclasses) return type;
  // A type of which no data class would be left keeps its list as the file has it.
  Dataclasses known = knownDataclasses(*type.supportedDataclasses, keepsNotes);
  if (!known.empty()) type.supportedDataclasses = std::move(known);
  type.orderedSupportedDataclasses = BasicAccount::_orderedDataclasses(*type.supportedDataclasses);
  return type;
}

const AccountTypes& loadedAccountTypes() {
  BasicAccount::initialize();
  return *typeTable.load(std::memory_order_acquire);
}

const AccountType* accountTypeNamed(std::string_view type) { return loadedAccountTypes().find(type); }

bool answerForDataclass(std::string_view dataclass, std::string_view question) {
  static const Dictionary& table =
      platform::keptForLife<Dictionary>(BasicAccount::_dataclassesProperties().value_or(Dictionary{}));
  const Dictionary* const properties = table.dictionary(dataclass);
  return properties != nullptr && booleanUnder(question, *properties);
}

std::optional<Actions> actionsForDataclass(const std::optional<Actions>& actions, std::string_view dataclass) {
  if (!actions || BasicAccount::multipleStoresSupportedByDataclass(dataclass)) return actions;
  return BasicAccount::removeActionsIncompatibleWithSingleStoreDataclass(*actions);
}

}  // namespace

void BasicAccount::initialize() {
  static constexpr std::string_view kMethod = "+[BasicAccount initialize]";
  if (typeTable.load(std::memory_order_acquire) != nullptr) return;
  const std::scoped_lock lock{classLock};
  if (typeTable.load(std::memory_order_relaxed) != nullptr) return;
  if (!platform::current().files->kindOf(configurationFile("AccountTypesProperties")).isOk()) {
    failAssertion(kMethod, "BasicAccount", "Could not find AccountTypesProperties.plist");
  }
  const platform::Result<Dictionary> file = readConfiguration("AccountTypesProperties");
  if (!file.isOk()) failAssertion(kMethod, "BasicAccount", "Could not load the dataclasses configuration file");
  const bool keepsNotes = BasicAccount::isMultitaskingEnabled();
  auto types = std::make_unique<AccountTypes>();
  for (const auto& [type, properties] : file.value()) {
    const Dictionary* const section = properties.asDictionary();
    types->set(type, accountType(section == nullptr ? Dictionary{} : *section, keepsNotes));
  }
  typeTable.store(types.release(), std::memory_order_release);
}

const Dataclasses& BasicAccount::allSupportedDataclasses() {
  static const Dataclasses& canonicalOrder = platform::keptForLife<Dataclasses>(std::initializer_list<Text>{
      kAccountDataclassMail, kAccountDataclassContacts, kAccountDataclassCalendars, kAccountDataclassReminders,
      kAccountDataclassBookmarks, kAccountDataclassNotes, kAccountDataclassMediaStream, kAccountDataclassDeviceLocator,
      kAccountDataclassContactsSearch, kAccountDataclassBackup, kAccountDataclassQuorvel, kAccountDataclassKeyValue,
      kAccountDataclassTickora, kAccountDataclassSharedStreams});
  return canonicalOrder;
}

const Dataclasses* BasicAccount::supportedDataclassesForAccountType(std::string_view type) {
  const AccountType* const found = accountTypeNamed(type);
  return found == nullptr || !found->supportedDataclasses ? nullptr : &*found->supportedDataclasses;
}

const Dataclasses& BasicAccount::orderedSupportedDataclassesForAccountType(std::string_view type) {
  static const Dataclasses& none = platform::keptForLife<Dataclasses>();
  const AccountType* const found = accountTypeNamed(type);
  return found == nullptr ? none : found->orderedSupportedDataclasses;
}

std::optional<Actions> BasicAccount::userActionsToEnableDataclass_forAccountType(std::string_view dataclass,
                                                                                 std::string_view type) {
  const AccountType* const found = accountTypeNamed(type);
  return found == nullptr ? std::nullopt : actionsForDataclass(found->enableActions, dataclass);
}

std::optional<Actions> BasicAccount::userActionsToDisableDataclass_forAccountType(std::string_view dataclass,
                                                                                  std::string_view type) {
  const AccountType* const found = accountTypeNamed(type);
  return found == nullptr ? std::nullopt : actionsForDataclass(found->disableActions, dataclass);
}

Actions BasicAccount::removeActionsIncompatibleWithSingleStoreDataclass(const Actions& actions) {
  Actions remaining = actions;
  const auto last = std::find(remaining.rbegin(), remaining.rend(), kDataclassToggleActionKeepLocalData.view());
  if (last != remaining.rend()) remaining.erase(std::next(last).base());
  return remaining;
}

std::optional<Actions> BasicAccount::deleteAccountActionsForAccountType(std::string_view type) {
  const AccountType* const found = accountTypeNamed(type);
  return found == nullptr ? std::nullopt : found->deleteAccountActions;
}

bool BasicAccount::showRemindersSeparatelyForAccountType(std::string_view type) {
  const AccountType* const found = accountTypeNamed(type);
  return found != nullptr && found->showsRemindersSeparately;
}

bool BasicAccount::multipleStoresSupportedByDataclass(std::string_view dataclass) {
  return answerForDataclass(dataclass, kDataclassSupportsMultipleStores);
}

bool BasicAccount::displayToggleForDataclass(std::string_view dataclass) {
  return answerForDataclass(dataclass, kDataclassDisplaySwitch);
}

bool BasicAccount::userConfirmationIsRequiredByDataclass(std::string_view dataclass) {
  return answerForDataclass(dataclass, kDataclassRequiresUserConfirmation);
}

bool BasicAccount::isMultitaskingEnabled() {
  const std::optional<PropertyValue> architecture = platform::current().deviceInfo->answer("CPUArchitecture");
  return !architecture || *architecture != PropertyValue{"armv6"};
}

std::vector<Text> BasicAccount::accountTypes() {
  std::vector<Text> types;
  for (const auto& [type, section] : loadedAccountTypes()) types.emplace_back(type);
  return types;
}

bool BasicAccount::_isValidAccountType(std::string_view type) {
  const AccountTypes& types = loadedAccountTypes();
  return !type.empty() && types.contains(type);
}

std::optional<Dictionary> BasicAccount::_dataclassesProperties() {
  return readConfiguration("DataclassesProperties").optional();
}

std::optional<Dictionary> BasicAccount::_creatorsInfo() { return readConfiguration("AccountCreators").optional(); }

const Dictionary* BasicAccount::_accountCreationMap() {
  if (const Dictionary* const kept = creatorTable.load(std::memory_order_acquire)) return kept;
  std::optional<Dictionary> file = _creatorsInfo();
  if (!file) return nullptr;
  auto table = std::make_unique<const Dictionary>(*std::move(file));
  const Dictionary* kept = nullptr;
  return creatorTable.compare_exchange_strong(kept, table.get()) ? table.release() : kept;
}

}  // namespace accountsettings
