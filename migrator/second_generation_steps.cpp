#include <array>
#include <map>
#include <string>

#include "accountsettings/equality_key.h"
#include "accountsettings/product_values.h"
#include "accountsettings/vocabulary.h"
#include "migrator/account_reads.h"
#include "migrator/accounts_data_migrator.h"
#include "migrator/stored_names.h"
#include "platform/platform.h"
#include "records/message.h"

namespace migrator {
namespace {

using namespace accountsettings;  // the vocabulary

using Account = AccountsManager::Account;

// --- Parents for hosted mail ---

bool isHostedMail(const BasicAccount& account) {
  return hasClassAmong(account, {kNimbraAccountClass, kWexmoAccountClass});
}

// What a parent takes away from its mail account; everything else that it takes over, the mail account keeps.
constexpr std::array kMovedKeys{kAccountEnabledDataclasses, kAccountChildAccounts, kCalendarsAccountSubscribedCalendars,
                                kSubscribedCalendarInfosKey};

std::optional<PropertyValue> usernameWithDomain(const BasicAccount& mail) {
  const std::optional<Text> username = textForKey(mail, kAccountUsername);
  if (!username) return std::nullopt;
  if (username->view().find('@') != std::string_view::npos) return *username;
  const StringConstant domain = hasClassAmong(mail, {kWexmoAccountClass}) ? kWexmoMailDomain : kNimbraMailDomain;
  return records::message("%@@%@", {*username, domain});
}

Dictionary parentPropertiesFor(const BasicAccount& mail) {
  const std::string className = mail.accountClass().value_or(Text{}).string();
  Dictionary parent;
  const auto write = [&parent](StringConstant key, std::optional<PropertyValue> value) {
    if (value) parent.set(key, *std::move(value));
  };
  const auto takeOver = [&](StringConstant key) { write(key, mail.accountPropertyForKey(key)); };
  write(kAccountUsername, usernameWithDomain(mail));
  takeOver(kAccountDisplayName);
  takeOver(kAccountEnabledDataclasses);
  write(kAccountProvisionedDataclasses, arrayOf(mail.supportedDataclasses()));
  takeOver(kAccountChildAccounts);
  takeOver(kCalDAVEnabledKey);
  takeOver(kCalendarsAccountSubscribedCalendars);
  takeOver(kSubscribedCalendarInfosKey);
  write(kAccountTypeString, AccountsDataMigrator::_accountTypeStringForMailAccountClass(className));
  write(kAccountShortTypeString, AccountsDataMigrator::_accountShortTypeStringForMailAccountClass(className));
  write(kAccountType, kVorlixAccountType);
  // The parent is of another type but keeps the class name by which older software knows the account.
  write(kAccountClass, className);
  return parent;
}

// --- Children of cloud accounts, and mail ---

// Takes the display name of a child that is hosted mail away: it is its parent's to say.
void cleanChildrenOf(BasicAccount& cloudAccount) {
  const std::optional<Array> children = arrayForKey(cloudAccount, kAccountChildAccounts);
  if (!children) return;
  Array cleaned = *children;
  std::map<std::string, std::size_t> firstPlaces;  // of equal children
  for (std::size_t place = 0; place < children->size(); ++place) {
    const PropertyValue& child = (*children)[place];
    const Dictionary* const properties = child.asDictionary();
    const Account record = BasicAccount::accountWithProperties(properties != nullptr ? *properties : Dictionary{});
    if (record == nullptr || !isHostedMail(*record) || !record->displayName()) continue;
    record->removeAccountPropertyForKey(kAccountDisplayName);
    // The place is that of the first equal child, so of two equal ones only the first is ever cleaned.
    cleaned[firstPlaces.try_emplace(equalityKey(child), place).first->second] = record->properties();
  }
  cloudAccount.setAccountProperty_forKey(std::move(cleaned), kAccountChildAccounts);
}

}  // namespace

bool AccountsDataMigrator::_migrateAccountsFrom8A293(AccountsManager& store) {
  if (platform::current().deviceInfo->answer("CPUArchitecture") == PropertyValue{"armv6"}) {
    // Forced both ways: on such a device notes are no supported data class of any account.
    for (const Account& account : store.allBasicAccounts()) {
      if (account->type() == kOnMyDeviceAccountType) {
        account->_forcedSetEnabled_forDataclass(true, kAccountDataclassNotes);
      } else if (account->isEnabledForDataclass(kAccountDataclassNotes)) {
        account->_forcedSetEnabled_forDataclass(false, kAccountDataclassNotes);
      }
    }
  }
  store.setDataVersion(6);
  return true;
}

// No release ever stamped 7 or 8: this step and the next leave the version at 6.
bool AccountsDataMigrator::_migrateAccountsFrom8B117(AccountsManager& store) {
  // A parent stands where its mail account stood, so the places stay what they are.
  for (std::size_t place = 0; place < store.count(); ++place) {
    const Account mail = store.allBasicAccounts()[place];
    if (!isHostedMail(*mail)) continue;
    const Account parent = BasicAccount::initWithProperties(parentPropertiesFor(*mail));
    if (parent == nullptr) continue;  // the device knows no cloud accounts, so there is nothing to move to
    for (const StringConstant key : kMovedKeys) mail->removeAccountPropertyForKey(key);
    // Here, unlike in the other steps, an account must say that it is active: a new parent offers mail only if told to.
    const bool isActive = booleanForKey(*mail, kIsActiveKey).value_or(false);
    if (isActive) parent->setEnabled_forDataclass(true, kAccountDataclassMail);
    store.replaceAccountAt(place, parent);
    mail->setParentAccount(parent);
    store.addChild_toAccount(mail, parent);
  }
  store.saveAllAccounts();
  return true;
}

bool AccountsDataMigrator::_migrateAccountsFrom8C136(AccountsManager& store) {
  for (const Account& account : store.allBasicAccounts()) {
    if (hasClassAmong(*account, {kCloudAccountClass})) cleanChildrenOf(*account);
    // Hosted mail is not among these, POP is: the hosted accounts' mail is by now their parents' to switch.
    const bool isMailOfOthers = hasClassAmong(
        *account, {kIMAPAccountClass, kGmailAccountClass, kYahooAccountClass, kAOLAccountClass, kPOPAccountClass});
    if (isMailOfOthers && isActiveUnlessSaidOtherwise(*account)) {
      account->setEnabled_forDataclass(true, kAccountDataclassMail);
    }
  }
  store.saveAllAccounts();
  return true;
}

bool AccountsDataMigrator::_migrateAccountsFrom8F191(AccountsManager& store) {
  store.setDataVersion(9);
  store.saveAllAccounts();
  return true;
}

}  // namespace migrator
