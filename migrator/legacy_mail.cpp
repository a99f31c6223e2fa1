#include <algorithm>
#include <array>
#include <utility>

#include "accountsettings/mail_functions.h"
#include "migrator/accounts_data_migrator.h"
#include "migrator/legacy_conversion.h"
#include "migrator/stored_names.h"
#include "platform/platform.h"
#include "records/fact_observer.h"

namespace migrator {
namespace {

using namespace accountsettings;

constexpr std::string_view kMethod = "-[AccountsDataMigrator(Internal) _migrateMailAccounts:]";

constexpr std::array kRenames{Rename{"AccountType", kAccountClass}, Rename{"AccountName", kAccountDisplayName},
                              Rename{kUniqueIdKey, kAccountIdentifier}};

constexpr StringConstant kGenericTypeString{"Account"};

// What a legacy class stands for: the account's type, and what people call that type.
struct MailClass {
  std::string_view name;
  StringConstant type;
  StringConstant typeString;
};

constexpr std::array kMailClasses{
    MailClass{kGmailAccountClass, kGmailAccountType, "Gmail"},  // "Google Mail" in some regions
    MailClass{kWexmoAccountClass, kNimbraAccountType, "Nimbra"},
    MailClass{kCloudMailClass, kKeldorIMAPAccountType, "Cirrant"},
    MailClass{kYahooAccountClass, kYahooAccountType, "Yahoo!\u200E"},  // with a left-to-right mark
    MailClass{kExchangeMailClass, kExchangeAccountType, "Exchange ActiveSync"},
    MailClass{kNimbraAccountClass, kNimbraAccountType, "Nimbra"},
    MailClass{kDeliveryAccountClass, kSMTPAccountType, kGenericTypeString},
    MailClass{kSMTPAccountClass, kSMTPAccountType, kGenericTypeString},
};
constexpr MailClass kAnyOtherMailClass{{}, kMailAccountType, kGenericTypeString};

const MailClass& mailClassNamed(std::string_view name) {
  const auto* const found = std::ranges::find(kMailClasses, name, &MailClass::name);
  return found == kMailClasses.end() ? kAnyOtherMailClass : *found;
}

// The record's class; a delivery account that has none is given the generic one.
std::optional<Text> settledClass(Dictionary& record, std::string_view initialType) {
  if (const Text* const present = record.text(kAccountClass)) return *present;
  if (initialType != kSMTPAccountType.view()) return std::nullopt;
  record.set(kAccountClass, kSMTPAccountClass);
  return Text{kSMTPAccountClass};
}

// The hosted service knows its users by the part before the "@".
void cutHostedUsername(Dictionary& record) {
  const Text* const type = record.text(kAccountType);
  const Text* const username = record.text(kAccountUsername);
  if (type == nullptr || username == nullptr || *type != kNimbraAccountType.view()) return;
  const std::size_t at = username->view().find('@');
  if (at != std::string_view::npos) record.set(kAccountUsername, Text{username->view().substr(0, at)});
}

Conversion conversionOfType(std::string_view initialType) {
  return [initialType](const Dictionary& description) {
    return AccountsDataMigrator::_convertMailAccountDescription_type(description, initialType);
  };
}

}  // namespace

void tellUnsavedMail() {
  const std::string path = mailAccountsPath();
  if (records::factObserver() == nullptr || !platform::current().files->kindOf(path).isOk()) return;
  const Dictionary legacyFile = readLegacyFile(path);
  std::multiset<std::string> saved = savedSyncIdentifiers();
  tellUnsaved({path, legacyFile, "DeliveryAccounts", kRenames}, saved);
  tellUnsaved({path, legacyFile, "MailAccounts", kRenames}, saved);
}

Text AccountsDataMigrator::_accountTypeForMailAccountClass(std::string_view className) {
  return mailClassNamed(className).type;
}

Text AccountsDataMigrator::_accountTypeStringForMailAccountClass(std::string_view className) {
  return _accountShortTypeStringForMailAccountClass(className);
}

Text AccountsDataMigrator::_accountShortTypeStringForMailAccountClass(std::string_view className) {
  if (className == kGmailAccountClass.view() && _UseGoogleMail()) return "Google Mail";
  return mailClassNamed(className).typeString;
}

std::shared_ptr<BasicAccount> AccountsDataMigrator::_convertMailAccountDescription_type(const Dictionary& description,
                                                                                        std::string_view initialType) {
  Dictionary record = renamed(description, kRenames);
  record.set(kAccountType, initialType);
  if (const std::optional<Text> className = settledClass(record, initialType)) {
    record.set(kAccountTypeString, _accountTypeStringForMailAccountClass(*className));
    record.set(kAccountShortTypeString, _accountShortTypeStringForMailAccountClass(*className));
    record.set(kAccountType, _accountTypeForMailAccountClass(*className));
  }
  cutHostedUsername(record);
  std::shared_ptr<BasicAccount> account = BasicAccount::initWithProperties(record);
  if (!account) return nullptr;
  if (const Text* const identifier = record.text(kAccountIdentifier)) {
    account->setAccountProperty_forKey(*identifier, kAccountSyncIdentifier);
  } else if (const auto made = platform::current().identifiers->makeUuid(); made.isOk()) {
    account->setAccountProperty_forKey(made.value(), kAccountSyncIdentifier);
  }
  if (account->accountClass() == Text{kGenericMailClass}) {
    reportMailAccountClassFound(account->properties(), "During account migration");
  }
  return account;
}

bool AccountsDataMigrator::_migrateMailAccounts(AccountsManager& store) {
  const std::string path = mailAccountsPath();
  const Dictionary legacyFile = readLegacyFile(path);
  if (!legacyFile.empty()) _foundOldMailAccountsToMigrate = true;
  if (_saveMigrationInformation() && _collatedMigrationData) {
    _collatedMigrationData->set(kOldMailAccountsKey, legacyFile);
  }
  const LegacySource outgoingServers{path, legacyFile, "DeliveryAccounts", kRenames, "MailAccounts"};
  const LegacySource mailAccounts{path, legacyFile, "MailAccounts", kRenames, "DeliveryAccounts"};
  // All or nothing: where one description is refused, none of either kind is stored.
  const auto delivery = convertedAccounts(outgoingServers, conversionOfType(kSMTPAccountType), kMethod,
                                          "%s. Could not convert the description for the delivery account %@");
  auto incoming = std::optional<AccountsManager::Accounts>{};
  if (delivery) {
    incoming = convertedAccounts(mailAccounts, conversionOfType(kMailAccountType), kMethod,
                                 "%s. Could not convert the description for the incoming account %@");
  }
  if (incoming) {
    noteOrigins(store, outgoingServers, *delivery);
    noteOrigins(store, mailAccounts, *incoming);
    // Only "SMTP" and "Mail" accounts make room, although the class table may have given the new ones other types.
    store.replaceAccountsWithTypes_withAccounts({kSMTPAccountType}, *delivery);
    store.replaceAccountsWithTypes_withAccounts({kMailAccountType}, *incoming);
  }
  removeOriginalCompanion(path);
  return incoming.has_value();
}

}  // namespace migrator
