#include <algorithm>

#include "accountsettings/vocabulary.h"
#include "migrator/account_reads.h"
#include "migrator/accounts_data_migrator.h"
#include "migrator/stored_names.h"
#include "migrator/telling.h"
#include "platform/platform.h"

namespace migrator {
namespace {

using namespace accountsettings;  // the vocabulary

using Account = AccountsManager::Account;
using Accounts = AccountsManager::Accounts;

// What an account was at the earlier hosted service. Nothing here ever sets `separate`.
constexpr std::int64_t kStandardStatus = 1;
constexpr std::int64_t kSeparateStatus = 2;

std::int64_t hostedServiceStatus(const BasicAccount& account) {
  const auto status = account.accountPropertyForKey(platform::current().systemAccount->hostedServiceStatusKey());
  return status ? status->integerValue().value_or(0) : 0;
}

void revertToStandardStatus(BasicAccount& account) {
  account.setAccountProperty_forKey(kStandardStatus, platform::current().systemAccount->hostedServiceStatusKey());
}

bool isCloudAccount(const BasicAccount& account) { return hasClassAmong(account, {kCloudAccountClass}); }

bool isPrimary(const BasicAccount& account) { return booleanForKey(account, kPrimaryAccountKey).value_or(false); }

Array childrenOf(const BasicAccount& account) { return arrayForKey(account, kAccountChildAccounts).value_or(Array{}); }

bool contains(const BasicAccount::Dataclasses& dataclasses, std::string_view dataclass) {
  return std::ranges::find(dataclasses, dataclass, &Text::view) != dataclasses.end();
}

void provision(BasicAccount& account, std::string_view dataclass) {
  Array provisioned = arrayOf(account.provisionedDataclasses());
  provisioned.emplace_back(dataclass);
  account.setAccountProperty_forKey(std::move(provisioned), kAccountProvisionedDataclasses);
}

Accounts cloudAndHostedAccountsOf(const AccountsManager& store) {
  return store.basicAccountsWithTypes({kVorlixAccountType, kNimbraAccountType});
}

// --- The primary account ---

void makePrimary(BasicAccount& account) {
  // A platform without a key of its own has that which the later steps read.
  const Text key = platform::current().systemAccount->primaryAccountKey().value_or(kPrimaryAccountKey);
  account.setAccountProperty_forKey(true, key);
  account.setEnabled_forDataclass(true, kAccountDataclassQuorvel);
  account.setEnabled_forDataclass(true, kAccountDataclassKeyValue);
}

// Answers whether the account became the primary one.
bool settleCloudAccount(BasicAccount& account) {
  if (hostedServiceStatus(account) != kSeparateStatus) {
    // Takes back what the calendars may just have switched on: such an account has no reminders of its own.
    account.setEnabled_forDataclass(false, kAccountDataclassReminders);
    return false;
  }
  writeToConsole("Found Nimbra account with status 2");
  if (!childrenOf(account).empty()) {
    revertToStandardStatus(account);
    writeToConsole("Standard Nimbra account with status 2, reverting to status 1");
    return false;
  }
  const Text typeString = platform::current().systemAccount->systemAccountTypeString();
  if (account.displayName() == Text{"Nimbra"}) account.setDisplayName(typeString);
  const bool isToBePrimary = account.isEnabledForDataclass(kAccountDataclassDeviceLocator);
  if (isToBePrimary) makePrimary(account);
  account.setAccountProperty_forKey(typeString, kAccountTypeString);
  account.setAccountProperty_forKey(typeString, kAccountShortTypeString);
  return isToBePrimary;
}

}  // namespace

bool AccountsDataMigrator::_migrateAccountsFrom9A182(AccountsManager& store) {
  bool hasPrimary = false;
  for (const Account& account : store.allBasicSyncableAccounts()) {
    if (contains(account->supportedDataclasses(), kAccountDataclassReminders) &&
        account->isEnabledForDataclass(kAccountDataclassCalendars)) {
      account->setEnabled_forDataclass(true, kAccountDataclassReminders);
    }
    if (isCloudAccount(*account) && settleCloudAccount(*account)) hasPrimary = true;
  }
  if (!hasPrimary) {
    const Accounts accounts = store.basicAccountsWithTypes({kVorlixAccountType});
    const auto first = std::ranges::find(accounts, kSeparateStatus,
                                         [](const Account& account) { return hostedServiceStatus(*account); });
    if (first != accounts.end()) makePrimary(**first);
  }
  store.setDataVersion(10);
  store.saveAllAccounts();
  return true;
}

bool AccountsDataMigrator::_migrateAccountsFrom9A334(AccountsManager& store) {
  for (const Account& account : cloudAndHostedAccountsOf(store)) {
    if (!isPrimary(*account) && (account->isEnabledForDataclass(kAccountDataclassQuorvel) ||
                                 account->isEnabledForDataclass(kAccountDataclassKeyValue))) {
      writeToConsole("AccountsDataMigrator: Fixing secondary account with quorvel and keyvalue enabled");
      account->setEnabled_forDataclass(false, kAccountDataclassQuorvel);
      account->setEnabled_forDataclass(false, kAccountDataclassKeyValue);
    }
    if (!isCloudAccount(*account)) continue;
    // Provisioning follows the children.
    if (hostedServiceStatus(*account) == kSeparateStatus &&
        _account_hasChildAccountOfType(*account, kNimbraAccountType)) {
      writeToConsole("AccountsDataMigrator: Found Nimbra mail as Cirrant child account, setting status to 1");
      revertToStandardStatus(*account);
    }
    _enableProvisioningForDataClass_toAccount_ifChildAccountExistsOfType(kAccountDataclassMail, *account,
                                                                         kNimbraAccountType);
    _enableProvisioningForDataClass_toAccount_ifChildAccountExistsOfType(kAccountDataclassCalendars, *account,
                                                                         kCalDAVAccountType);
  }
  store.setDataVersion(11);
  store.saveAllAccounts();
  return true;
}

bool AccountsDataMigrator::_account_hasChildAccountOfType(const BasicAccount& account, std::string_view type) {
  return std::ranges::any_of(childrenOf(account), [type](const PropertyValue& child) {
    const Dictionary* const properties = child.asDictionary();
    const Text* const childType = properties != nullptr ? properties->text(kAccountType) : nullptr;
    return childType != nullptr && *childType == type;
  });
}

void AccountsDataMigrator::_enableProvisioningForDataClass_toAccount_ifChildAccountExistsOfType(
    std::string_view dataclass, BasicAccount& account, std::string_view type) {
  if (!_account_hasChildAccountOfType(account, type)) return;
  if (contains(account.provisionedDataclasses(), dataclass)) return;
  writeToConsole("AccountsDataMigrator: Enabling provisioning for dataclass %@", dataclass);
  provision(account, dataclass);
}

bool AccountsDataMigrator::_migrateAccountsFrom9B176(AccountsManager& store) {
  for (const Account& account : cloudAndHostedAccountsOf(store)) {
    const BasicAccount::Dataclasses provisioned = account->provisionedDataclasses();
    if (isPrimary(*account) && contains(provisioned, kAccountDataclassQuorvel)) {
      if (!contains(provisioned, kAccountDataclassTickora)) {
        writeToConsole("AccountsDataMigrator: Provisioning Tickora data class in primary account");
        provision(*account, kAccountDataclassTickora);
      }
      if (account->isEnabledForDataclass(kAccountDataclassQuorvel)) {
        writeToConsole("AccountsDataMigrator: Enabling Tickora data class in primary account");
        account->setEnabled_forDataclass(true, kAccountDataclassTickora);
      }
    }
    if (account->isEnabledForDataclass(kAccountDataclassBookmarks)) platform::current().cloudTabs->post(true);
  }
  store.setDataVersion(12);
  store.saveAllAccounts();
  return true;
}

}  // namespace migrator
