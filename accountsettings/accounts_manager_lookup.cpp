#include <algorithm>

#include "accountsettings/accounts_manager.h"
#include "accountsettings/assertion_failure.h"
#include "accountsettings/dataclass_lists.h"
#include "accountsettings/device_local_account.h"
#include "accountsettings/log_handle.h"
#include "platform/platform.h"

namespace accountsettings {
namespace {

using Account = AccountsManager::Account;
using Types = AccountsManager::Types;

bool isOfTypes(const BasicAccount& account, const Types& types) {
  const std::optional<Text> type = account.type();
  return type && containsText(types, *type);
}

Account withSyncIdentifier(const AccountsManager::AccountsByID& accounts, std::string_view identifier) {
  const auto found = std::ranges::find_if(accounts, [identifier](const auto& entry) {
    const std::optional<Text> syncIdentifier = entry.second->syncStoreIdentifier();
    return syncIdentifier && *syncIdentifier == identifier;
  });
  return found == accounts.end() ? nullptr : found->second;
}

Account foundIn(const AccountsManager::AccountsByID& accounts, std::string_view identifier) {
  const Account* const account = accounts.find(identifier);
  return account == nullptr ? nullptr : *account;
}

}  // namespace

Account AccountsManager::accountWithIdentifier(std::string_view identifier) const {
  if (const Account* const account = _topLevelAccountsByID.find(identifier)) return *account;
  const Account* const child = _childAccountsByID.find(identifier);
  const std::optional<Text> childIdentifier = child == nullptr ? std::nullopt : (*child)->identifier();
  const Text* const parentIdentifier =
      childIdentifier ? _childAccountIDToParentAccountID.find(*childIdentifier) : nullptr;
  return parentIdentifier == nullptr ? nullptr : foundIn(_topLevelAccountsByID, *parentIdentifier);
}

Account AccountsManager::syncableAccountWithSyncIdentifier(std::string_view identifier) const {
  const Account account = withSyncIdentifier(_topLevelAccountsByID, identifier);
  return account != nullptr ? account : withSyncIdentifier(_childAccountsByID, identifier);
}

Account AccountsManager::displayAccountWithSyncIdentifier(std::string_view identifier) const {
  const Account account = syncableAccountWithSyncIdentifier(identifier);
  const std::optional<Text> found = account == nullptr ? std::nullopt : account->identifier();
  return found ? accountWithIdentifier(*found) : nullptr;
}

AccountsManager::Accounts AccountsManager::allBasicSyncableAccounts() const {
  Accounts accounts = _orderedTopLevelAccounts;
  for (const auto& [identifier, child] : _childAccountsByID) accounts.push_back(child);
  return accounts;
}

AccountsManager::Accounts AccountsManager::basicAccountsWithTypes(const Types& types) const {
  Accounts accounts;
  std::ranges::copy_if(_orderedTopLevelAccounts, std::back_inserter(accounts),
                       [&types](const Account& account) { return isOfTypes(*account, types); });
  return accounts;
}

std::size_t AccountsManager::countOfBasicAccountsWithTypes(const Types& types) const {
  return static_cast<std::size_t>(std::ranges::count_if(
      _orderedTopLevelAccounts, [&types](const Account& account) { return isOfTypes(*account, types); }));
}

AccountsManager::FullAccount AccountsManager::fullAccountWithIdentifier_loader(std::string_view identifier,
                                                                               const AccountClassInfo* loader) const {
  if (identifier.empty()) return nullptr;
  const Account topLevel = foundIn(_topLevelAccountsByID, identifier);
  const Account account = topLevel != nullptr ? topLevel : foundIn(_childAccountsByID, identifier);
  return account == nullptr ? nullptr : account->fullAccountUsingLoader(loader);
}

std::vector<AccountsManager::FullAccount> AccountsManager::accountsWithTypes_withLoader(
    const Types& types, const AccountClassInfo* loader) const {
  std::unordered_map<const BasicAccount*, Accounts> childrenByParent;
  for (const auto& [identifier, child] : _childAccountsByID) {
    if (isOfTypes(*child, types)) childrenByParent[child->parentAccount().get()].push_back(child);
  }
  const auto fullAccount = [&](const Account& account) {
    return fullAccountWithIdentifier_loader(account->identifier().value_or(Text{}), loader);
  };
  std::vector<FullAccount> accounts;
  for (const Account& account : _orderedTopLevelAccounts) {
    if (isOfTypes(*account, types)) {
      accounts.push_back(fullAccount(account));
      if (accounts.back() == nullptr) {
        failAssertion("-[AccountsManager accountsWithTypes:withLoader:]", "AccountsManager",
                      "There is no full account for the account with identifier %@", {account->identifier()});
      }
    }
    for (const Account& child : childrenByParent[account.get()]) {
      if (FullAccount made = fullAccount(child)) accounts.push_back(std::move(made));
    }
  }
  return accounts;
}

std::vector<AccountsManager::FullAccount> AccountsManager::accountsWithTypes(const Types& types) const {
  return accountsWithTypes_withLoader(types, nullptr);
}

std::vector<AccountsManager::FullAccount> AccountsManager::allMailAccounts() const {
  return accountsWithTypes({kMailAccountType, kNimbraAccountType, kGmailAccountType, kYahooAccountType});
}

AccountsManager::FullAccount AccountsManager::fullDeviceLocalAccount() {
  const Types deviceLocal{kOnMyDeviceAccountType};
  const auto present = std::ranges::find_if(
      _orderedTopLevelAccounts, [&deviceLocal](const Account& account) { return isOfTypes(*account, deviceLocal); });
  if (present != _orderedTopLevelAccounts.end()) return (*present)->fullAccountUsingLoader(nullptr);
  _ASLogSystem().log("-[AccountsManager fullDeviceLocalAccount]", "DeviceLocalAccount missing. Creating...");
  const Account account = BasicAccount::initWithProperties(DeviceLocalAccount::basicAccountProperties());
  if (account == nullptr) return nullptr;
  replaceAccountsWithTypes_withAccounts(deviceLocal, {account});
  return account->fullAccountUsingLoader(nullptr);
}

std::optional<std::string> AccountsManager::displayNameForGroupOfAccountType_forBeginningOfSentence(
    std::string_view type, bool beginningOfSentence) {
  if (type != kSubscribedCalendarAccountType) return std::nullopt;
  const std::string_view key =
      beginningOfSentence ? "SUBSCRIBED_CALENDAR_GROUP_TITLE" : "SUBSCRIBED_CALENDAR_GROUP_MID_SENTENCE_TITLE";
  return platform::current().strings->text("AccountsManager", key).value_or("");
}

void AccountsManager::_loadChildrenFromAccount(const Account& account) {
  const std::optional<Text> identifier = account->identifier();
  if (identifier) _removeChildrenForAccountWithIdentifier(*identifier);
  const std::optional<PropertyValue> property = account->accountPropertyForKey(kAccountChildAccounts);
  const Array* const children = property ? property->asArray() : nullptr;
  if (children == nullptr) return;
  for (const PropertyValue& properties : *children) loadChild(properties, account, identifier);
}

void AccountsManager::loadChild(const PropertyValue& properties, const Account& parent,
                                const std::optional<Text>& parentIdentifier) {
  const Account child = accountFromElement(properties);
  if (child != nullptr) child->setParentAccount(parent);
  const std::optional<Text> identifier = child == nullptr ? std::nullopt : child->identifier();
  if (!identifier) {
    _ASLogSystem().log("-[AccountsManager _loadChildrenFromAccount:]",
                       "Ignoring unknown child account with properties %@", properties);
    return;
  }
  _childAccountsByID.set(*identifier, child);
  // The child of a parent that has lost its identifier is indexed like any other, but leads to no account.
  if (!parentIdentifier) {
    _childAccountIDToParentAccountID.remove(*identifier);
    return;
  }
  _childAccountIDToParentAccountID.set(*identifier, *parentIdentifier);
  if (std::vector<Text>* const indexed = _childIdentifiersByParentID.find(*parentIdentifier)) {
    indexed->push_back(*identifier);
  } else {
    _childIdentifiersByParentID.set(*parentIdentifier, {*identifier});
  }
}

void AccountsManager::_removeChildrenForAccountWithIdentifier(const Text& identifier) {
  const std::vector<Text>* const indexed = _childIdentifiersByParentID.find(identifier);
  if (indexed == nullptr) return;
  const std::vector<Text> children = *indexed;
  _childIdentifiersByParentID.remove(identifier);
  for (const Text& child : children) {
    const Text* const recorded = _childAccountIDToParentAccountID.find(child);
    const bool isTakenOverByAnotherParent = recorded == nullptr || *recorded != identifier;
    if (isTakenOverByAnotherParent) continue;
    _childAccountIDToParentAccountID.remove(child);
    _childAccountsByID.remove(child);
  }
}

}  // namespace accountsettings
