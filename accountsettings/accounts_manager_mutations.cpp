#include <algorithm>
#include <map>
#include <ranges>
#include <string>
#include <unordered_set>
#include <utility>

#include "accountsettings/accounts_manager.h"
#include "accountsettings/assertion_failure.h"
#include "accountsettings/change_tracker.h"
#include "accountsettings/dataclass_lists.h"
#include "accountsettings/log_handle.h"

namespace accountsettings {
namespace {

using Account = AccountsManager::Account;
using Accounts = AccountsManager::Accounts;
using AccountsByID = AccountsManager::AccountsByID;

// Accounts without an identifier are like none, each other included.
bool hasIdentifier(const BasicAccount& account, const std::optional<Text>& identifier) {
  return identifier && account.identifier() == identifier;
}

std::optional<Text> identifierProperty(const BasicAccount& account) {
  const std::optional<PropertyValue> value = account.accountPropertyForKey(kAccountIdentifier);
  const Text* const text = value ? value->asText() : nullptr;
  return text == nullptr ? std::nullopt : std::optional{*text};
}

void enter(AccountsByID& accounts, const std::optional<Text>& identifier, const Account& account) {
  if (identifier) accounts.set(*identifier, account);
}

// Deletes the last of the accounts that is not deleted already; it may stand there more than once.
void deleteLast(Accounts& accounts, std::unordered_set<Account>& deleted) {
  while (!accounts.empty() && deleted.contains(accounts.back())) accounts.pop_back();
  if (!accounts.empty()) deleted.insert(accounts.back());
}

Account foundIn(const AccountsByID& accounts, const std::optional<Text>& identifier) {
  const Account* const account = identifier ? accounts.find(*identifier) : nullptr;
  return account == nullptr ? nullptr : *account;
}

}  // namespace

void AccountsManager::registerAccount(const Account& account) {
  enter(_topLevelAccountsByID, account->identifier(), account);
  _orderedTopLevelAccounts.push_back(account);
  _loadChildrenFromAccount(_orderedTopLevelAccounts.back());
}

void AccountsManager::forgetIdentifierOfAccount(const BasicAccount& account) {
  const std::optional<Text> identifier = account.identifier();
  if (!identifier) return;
  _removeChildrenForAccountWithIdentifier(*identifier);
  _topLevelAccountsByID.remove(*identifier);
}

void AccountsManager::insertAccount(const Account& account) {
  _ASLogSystem().log("-[AccountsManager insertAccount:]", "Inserting account: %@", account->properties());
  if (foundIn(_topLevelAccountsByID, account->identifier()) == nullptr) registerAccount(account);
}

void AccountsManager::updateAccount(const Account& account) {
  _ASLogSystem().log("-[AccountsManager updateAccount:]", "Updating account: %@", account->properties());
  const std::optional<Text> identifier = account->identifier();
  for (Account& present : std::views::reverse(_orderedTopLevelAccounts)) {
    if (!hasIdentifier(*present, identifier)) continue;
    present = account;
    enter(_topLevelAccountsByID, identifier, account);
    _loadChildrenFromAccount(account);
  }
}

void AccountsManager::deleteAccount(const Account& account) { deleteAccounts({account}); }

void AccountsManager::deleteAccounts(const Accounts& accounts) {
  std::map<std::string, Accounts, std::less<>> present;  // of each identifier, in the order of the store
  for (const Account& account : accounts) {
    if (const std::optional<Text> identifier = account->identifier()) present[identifier->string()];
  }
  for (const Account& account : _orderedTopLevelAccounts) {
    const std::optional<Text> identifier = account->identifier();
    const auto same = identifier ? present.find(identifier->view()) : present.end();
    if (same != present.end()) same->second.push_back(account);
  }
  std::unordered_set<Account> deleted;
  for (const Account& account : accounts) {
    _ASLogSystem().log("-[AccountsManager deleteAccount:]", "Deleting account: %@", account->properties());
    forgetIdentifierOfAccount(*account);
    if (_tracker) _tracker->willGo(*account, records::LossCode::deleted);
    if (const std::optional<Text> identifier = account->identifier())
      deleteLast(present[identifier->string()], deleted);
  }
  std::erase_if(_orderedTopLevelAccounts, [&deleted](const Account& account) { return deleted.contains(account); });
}

void AccountsManager::deleteAccountWithIdentifier(std::string_view identifier) {
  const Account* const account = _topLevelAccountsByID.find(identifier);
  if (account == nullptr) {
    failAssertion("-[AccountsManager deleteAccountWithIdentifier:]", "AccountsManager",
                  "There is no top-level account with identifier %@", {identifier});
  }
  deleteAccount(Account{*account});
}

void AccountsManager::replaceAccount_withAccount(const Account& oldAccount, const Account& newAccount) {
  const auto position = std::ranges::find(_orderedTopLevelAccounts, oldAccount);
  if (position == _orderedTopLevelAccounts.end()) {
    failAssertion("-[AccountsManager replaceAccount:withAccount:]", "AccountsManager",
                  "The account with identifier %@ is not in the store", {oldAccount->identifier()});
  }
  replaceAccountAt(static_cast<std::size_t>(position - _orderedTopLevelAccounts.begin()), newAccount);
}

void AccountsManager::replaceAccountAt(std::size_t place, const Account& newAccount) {
  const Account oldAccount = std::exchange(_orderedTopLevelAccounts[place], newAccount);
  forgetIdentifierOfAccount(*oldAccount);
  if (_tracker) _tracker->willGo(*oldAccount, records::LossCode::replaced);
  _loadChildrenFromAccount(newAccount);
}

void AccountsManager::replaceAccountsWithTypes_withAccounts(const Types& types, const Accounts& accounts) {
  _ASLogSystem().log("-[AccountsManager replaceAccountsWithTypes:withAccounts:]", "Replacing accounts");
  Replacement replacement{_orderedTopLevelAccounts, {}, accounts};
  replaceInPlace(types, replacement);
  for (const Account& account : replacement.toPlace) {
    account->parentAccountIdentifier() ? moveChild(account, replacement) : appendAccount(account, replacement);
  }
  _orderedTopLevelAccounts = std::move(replacement.order);
  _topLevelAccountsByID = std::move(replacement.byID);
}

void AccountsManager::replaceInPlace(const Types& types, Replacement& replacement) {
  AccountsByID given;
  for (const Account& account : replacement.toPlace) enter(given, identifierProperty(*account), account);
  std::unordered_set<Account> placed;
  for (Account& present : std::views::reverse(replacement.order)) {
    const std::optional<Text> identifier = present->identifier();
    const std::optional<Text> type = present->type();
    if (const Account replacing = foundIn(given, identifier)) {
      present = replacing;
      enter(replacement.byID, identifier, replacing);
      placed.insert(replacing);
      _loadChildrenFromAccount(replacing);
    } else if (!type || !containsText(types, *type)) {
      enter(replacement.byID, identifier, present);
    } else {
      if (identifier) _removeChildrenForAccountWithIdentifier(*identifier);
      if (_tracker) _tracker->willGo(*present, records::LossCode::replacedWithType);
      present = nullptr;
    }
  }
  std::erase(replacement.order, nullptr);
  std::erase_if(replacement.toPlace, [&placed](const Account& account) { return placed.contains(account); });
}

void AccountsManager::appendAccount(const Account& account, Replacement& replacement) {
  replacement.order.push_back(account);
  enter(replacement.byID, identifierProperty(*account), account);
  _loadChildrenFromAccount(account);
}

void AccountsManager::moveChild(const Account& child, const Replacement& replacement) {
  const Account newParent = foundIn(replacement.byID, child->parentAccountIdentifier());
  if (const std::optional<Text> identifier = child->identifier()) takeFromRecordedParent(*identifier, newParent);
  if (newParent != nullptr) addChild_toAccount(child, newParent);
}

void AccountsManager::takeFromRecordedParent(const Text& child, const Account& newParent) {
  const Text* const recorded = _childAccountIDToParentAccountID.find(child);
  if (recorded == nullptr) return;
  const bool isAlreadyThere = newParent != nullptr && newParent->identifier() == *recorded;
  const Account parent = isAlreadyThere ? newParent : accountWithIdentifier(*recorded);
  if (parent != nullptr) removeChildWithIdentifier_fromAccount(child, parent);
}

void AccountsManager::addChild_toAccount(const Account& child, const Account& parent) {
  const std::optional<PropertyValue> property = parent->accountPropertyForKey(kAccountChildAccounts);
  const Array* const present = property ? property->asArray() : nullptr;
  Array children = present == nullptr ? Array{} : *present;
  children.emplace_back(child->properties());
  parent->setAccountProperty_forKey(std::move(children), kAccountChildAccounts);
  _loadChildrenFromAccount(parent);
}

void AccountsManager::removeChildWithIdentifier_fromAccount(std::string_view identifier, const Account& parent) {
  const std::optional<PropertyValue> property = parent->accountPropertyForKey(kAccountChildAccounts);
  if (const Array* const present = property ? property->asArray() : nullptr) {
    Array children = *present;
    std::erase_if(children, [removed = Text{identifier}](const PropertyValue& properties) {
      const Account child = accountFromElement(properties);
      return child != nullptr && child->identifier() == removed;
    });
    parent->setAccountProperty_forKey(std::move(children), kAccountChildAccounts);
  }
  _loadChildrenFromAccount(parent);
}

}  // namespace accountsettings
