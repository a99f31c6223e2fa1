#include <ranges>
#include <tuple>

#include "accountsettings/accounts_manager.h"
#include "accountsettings/as_runtime_fix_mail_account.h"
#include "accountsettings/change_tracker.h"
#include "accountsettings/log_handle.h"
#include "accountsettings/product_values.h"
#include "platform/platform.h"
#include "platform/run_observer.h"
#include "records/description.h"

namespace accountsettings {
namespace {

using platform::Cause;
using platform::FileSystem;
using platform::Path;
using platform::Result;
using platform::SerializedPropertyList;
using platform::Status;

constexpr const char* kSave = "-[AccountsManager saveAllAccounts]";

using SaveStage = SaveOutcome::Stage;

WhyLeftOut faultOf(const PropertyValue& element) {
  const Dictionary* const properties = element.asDictionary();
  if (properties == nullptr) return WhyLeftOut::noRecord;
  const PropertyValue* const type = properties->find(kAccountType);
  if (type == nullptr) return WhyLeftOut::noType;
  const Text* const name = type->asText();
  const bool isKnown = name != nullptr && BasicAccount::_isValidAccountType(*name);
  return isKnown ? WhyLeftOut::noClass : WhyLeftOut::unknownType;
}

void logCalculated(const BasicAccount& account, const Dictionary& merged) {
  if (!_ASLogSystem().hasReaders()) return;
  const std::function<std::string()> dataclasses = [&account]() -> std::string {
    const std::optional<BasicAccount::Dataclasses> enabled = account.enabledDataclasses();
    return enabled ? records::description(Array(enabled->begin(), enabled->end())) : "(null)";
  };
  _ASLogSystem().log(kSave, "Calculated Properties - Type: %@, Properties: %@, Dataclasses: %@", account.type(), merged,
                     dataclasses);
}

// An error that came with data is said, too, but does not keep the data from being written.
SerializedPropertyList serialized(const Dictionary& root) {
  SerializedPropertyList list = platform::current().propertyLists->serialize(root);
  if (list.data != nullptr && list.status.isOk()) return list;
  const auto error = list.status.isOk() ? std::nullopt : std::optional{list.status.reason()};
  _ASLogSystem().log(kSave, "Failed to serialize account settings data: %@", error);
  if (error == std::nullopt) list.status = Status::failure(Cause::other, "serialize the accounts", "No data came back");
  return list;
}

SaveOutcome moveOntoSettingsFile(FileSystem& files, const Path& temporary) {
  if (Status given = files.setOwner(temporary, kSettingsOwner, kSettingsOwner); !given.isOk()) {
    _ASLogSystem().log(kSave, "Could not set attributes on the temporary account settings plist. %@",
                       given.description());
    return {SaveStage::givingAway, std::move(given)};
  }
  Status moved = files.rename(temporary, AccountsManager::fullPathToAccountSettingsPlist());
  return {moved.isOk() ? SaveStage::saved : SaveStage::replacing, std::move(moved)};
}

// The one place where the settings file is written: whole, beside it, and then moved onto it. Whatever fails or is
// thrown, no temporary file of ours stays; one that somebody else made at the proposed name is not ours to remove.
SaveOutcome replaceSettingsFile(const SerializedPropertyList& list) {
  FileSystem& files = *platform::current().files;
  const Result<Path> name = files.temporaryName();
  if (list.data == nullptr) return {SaveStage::serializing, list.status};
  if (!name.isOk()) return {SaveStage::naming, name.status()};
  const Path& temporary = name.value();
  if (Status made = files.create(temporary, *list.data); !made.isOk()) return {SaveStage::creating, std::move(made)};
  SaveOutcome outcome;
  try {
    outcome = moveOntoSettingsFile(files, temporary);
  } catch (...) {
    std::ignore = files.remove(temporary);
    throw;
  }
  if (!outcome.isSaved()) std::ignore = files.remove(temporary);
  return outcome;
}

}  // namespace

AccountsManager::AccountsManager() : _runtimeFixers{_createRuntimeFixers()} {}

AccountsManager::~AccountsManager() {
  _topLevelAccountsByID.clear();
  _orderedTopLevelAccounts.clear();
  _childAccountIDToParentAccountID.clear();
  _childAccountsByID.clear();
  _originalAccountsByID.clear();
  _runtimeFixers.clear();
}

AccountsManager::RuntimeFixers AccountsManager::_createRuntimeFixers() const {
  return {ASRuntimeFixMailAccount::init()};
}

std::shared_ptr<AccountsManager> AccountsManager::init() { return initInsideOfMigration(); }

std::shared_ptr<AccountsManager> AccountsManager::initInsideOfMigration() {
  return loadedFromFile(ChangeTracker::ofRun());
}

std::shared_ptr<AccountsManager> AccountsManager::loadedFromFile(std::unique_ptr<ChangeTracker> tracker) {
  Result<Dictionary> read = platform::current().propertyLists->readDictionary(fullPathToAccountSettingsPlist());
  const Dictionary file = read.isOk() ? read.value() : Dictionary{};
  std::shared_ptr<AccountsManager> store = loaded(file.array(kPlistAccountsKey), std::move(tracker));
  store->_loadOutcome.isFromFile = true;
  store->_loadOutcome.reading = read.status();
  if (const PropertyValue* const version = file.find(kPlistVersionKey)) {
    store->_loadOutcome.storedVersion = version->integerValue();
  }
  store->setDataVersion(static_cast<std::uint64_t>(store->_loadOutcome.storedVersion.value_or(0)));
  if (store->_tracker) store->_tracker->loadedAll(store->_orderedTopLevelAccounts, store->_loadOutcome);
  return store;
}

std::shared_ptr<AccountsManager> AccountsManager::initWithAccounsInfoArray(const Array& accounts) {
  return _initWithAccountsInfo(&accounts);
}

std::shared_ptr<AccountsManager> AccountsManager::_initWithAccountsInfo(const Array* accounts) {
  return loaded(accounts, nullptr);
}

std::shared_ptr<AccountsManager> AccountsManager::loaded(const Array* accounts,
                                                         std::unique_ptr<ChangeTracker> tracker) {
  std::shared_ptr<AccountsManager> store{new AccountsManager};
  store->_tracker = std::move(tracker);
  if (accounts != nullptr) store->loadAccounts(*accounts);
  store->_setOriginalAccountDictionaries();
  return store;
}

void AccountsManager::loadAccounts(const Array& accounts) {
  bool isFixed = false;
  platform::RunProgress progress{accounts.size()};
  for (std::size_t position = 0; position < accounts.size(); ++position) {
    progress.next();
    const PropertyValue& properties = accounts[position];
    const Account account = accountFromElement(properties);
    if (account == nullptr) {
      _ASLogSystem().log("-[AccountsManager _initWithAccountsInfo:]", "ERROR: Failed to create a BasicAccount from %@",
                         properties);
      leaveOut(position, properties, faultOf(properties));
      continue;
    }
    isFixed |= offerLoaded(account, position, properties);
  }
  if (isFixed) tellFixers(false);
}

void AccountsManager::leaveOut(std::size_t position, const PropertyValue& element, WhyLeftOut why) {
  _loadOutcome.leftOut.push_back({position, element, why});
  if (_tracker) _tracker->leftOut(_loadOutcome.leftOut.back());
}

bool AccountsManager::offerLoaded(const Account& account, std::size_t position, const PropertyValue& element) {
  bool isFixed = false;
  for (const auto& fixer : _runtimeFixers) {
    const FixAnswer answer = fixer->fixBasicAccountIfNeeded_loggingMessage(*account, "loading accounts");
    if (answer != FixAnswer::drop) registerAccount(account);
    isFixed |= answer != FixAnswer::nothingToDo;
    if (answer == FixAnswer::drop) {
      leaveOut(position, element, WhyLeftOut::givenUp);
    } else if (_tracker) {
      _tracker->loaded(element, *account);
    }
  }
  return isFixed;
}

AccountsManager::Account AccountsManager::accountFromElement(const PropertyValue& element) {
  const Dictionary* const properties = element.asDictionary();
  return BasicAccount::initWithProperties(properties == nullptr ? Dictionary{} : *properties);
}

void AccountsManager::tellFixers(bool saved) {
  for (const auto& fixer : _runtimeFixers) fixer->accountsHaveBeenSaved(saved);
}

void AccountsManager::_setOriginalAccountDictionaries() {
  _originalAccountsByID.clear();
  _originalAccountsByID.reserve(_orderedTopLevelAccounts.size());
  for (const Account& account : _orderedTopLevelAccounts) {
    if (const std::optional<Text> identifier = account->identifier()) {
      _originalAccountsByID.emplace_back(*identifier, account->propertiesToSave());
    } else {
      _ASLogSystem().log("-[AccountsManager _setOriginalAccountDictionaries]",
                         "%@ returned a nil identifier. Account properties may not get saved", account->properties());
    }
  }
}

void AccountsManager::tellChanges() const {
  if (_tracker) _tracker->look(_orderedTopLevelAccounts);
}

void AccountsManager::saveAllAccounts() {
  tellChanges();
  const platform::RunStage stage{"save"};
  _ASLogSystem().log(kSave, "Saving all accounts");
  const bool isFixed = fixAccountsForSaving();
  writeFile();
  const bool isSaved = _lastSaveOutcome.isSaved();
  if (isSaved) {
    for (const Account& account : _orderedTopLevelAccounts) account->setOriginalProperties(account->propertiesToSave());
  } else {
    _ASLogSystem().log(kSave, "Failed to save accounts to filesystem.");
  }
  if (isFixed) tellFixers(true);  // after a failed save, too
  if (!isSaved || shouldSkipNotifications()) return;
  _sendNotificationsForChangedAccounts();
  _setOriginalAccountDictionaries();
}

void AccountsManager::writeFile() {
  tellChanges();
  _lastSaveOutcome = {SaveStage::merging};
  Array records = mergedRecords();
  if (_tracker) _tracker->written(_orderedTopLevelAccounts, records);
  const Dictionary root{{kPlistAccountsKey, std::move(records)}, {kPlistVersionKey, currentVersion()}};
  _lastSaveOutcome.stage = SaveStage::serializing;
  _lastSaveOutcome = replaceSettingsFile(serialized(root));
  if (_tracker)
    _tracker->savedAll(count(), currentVersion(), fullPathToAccountSettingsPlist(), _lastSaveOutcome.status);
}

bool AccountsManager::fixAccountsForSaving() {
  bool isFixed = false;
  for (const Account& account : std::views::reverse(_orderedTopLevelAccounts)) {
    for (const auto& fixer : _runtimeFixers) {
      const FixAnswer answer = fixer->fixBasicAccountIfNeeded_loggingMessage(*account, "saving accounts");
      // A dropped account is no longer found, but keeps its place in the order and so in the file.
      if (answer == FixAnswer::drop) {
        forgetIdentifierOfAccount(*account);
        if (_tracker) _tracker->unrepaired(*account);
      }
      isFixed |= answer != FixAnswer::nothingToDo;
    }
  }
  return isFixed;
}

Array AccountsManager::mergedRecords() const {
  const std::shared_ptr<AccountsManager> fileAsItStands = loadedFromFile(nullptr);
  Array records;
  records.reserve(_orderedTopLevelAccounts.size());
  platform::RunProgress progress{count()};
  for (const Account& account : _orderedTopLevelAccounts) {
    progress.next();
    const std::optional<Text> identifier = account->identifier();
    const Account onDisk = identifier ? fileAsItStands->accountWithIdentifier(*identifier) : nullptr;
    Dictionary merged = mergeInMemoryProperties_originalProperties_onDiskProperties(
        account->propertiesToSave(), account->originalProperties(),
        onDisk == nullptr ? nullptr : &onDisk->propertiesToSave());
    logCalculated(*account, merged);
    records.emplace_back(std::move(merged));
  }
  return records;
}

}  // namespace accountsettings
