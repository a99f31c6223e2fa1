// The accounts in one file, each with its fault. What is an account and what none, the library says.

#include <algorithm>
#include <array>
#include <span>

#include "tools/account_source.h"
#include "tools/next_load.h"

namespace tools {
namespace {

using accountsettings::Array;
using accountsettings::Dictionary;
using accountsettings::PropertyValue;
using platform::StringConstant;

constexpr std::array<std::string_view, 3> kFormNames{"settings file", "mail file of the first releases",
                                                     "Exchange file of the first releases"};
constexpr std::array<std::string_view, 3> kFormCodes{"settings", "legacy-mail", "legacy-exchange"};
constexpr std::string_view kMeansNoChild = "it is no account that could be found in its parent: ";

FoundAccount accountAt(std::string_view list, std::size_t index, const PropertyValue& element) {
  FoundAccount account;
  account.list = list;
  account.index = index;
  if (const auto* const properties = element.asDictionary()) account.properties = *properties;
  account.record = account.properties;
  return account;
}

// --- The descriptions of the first releases ---

struct Rename {
  StringConstant legacyKey;
  StringConstant key;
};
constexpr Rename kMailRenames[] = {{"AccountType", accountsettings::kAccountClass},
                                   {"AccountName", accountsettings::kAccountDisplayName},
                                   {"uniqueId", accountsettings::kAccountIdentifier}};
constexpr Rename kExchangeRenames[] = {{"DAAccountConfigurationClass", accountsettings::kAccountClass},
                                       {"DAAccountDescription", accountsettings::kAccountDisplayName},
                                       {"DAAccountConfigurationAccountID", accountsettings::kAccountIdentifier}};

// A list of descriptions: a class that is missing is assumed where there is one to be assumed.
struct LegacyList {
  FileForm form;
  StringConstant key;
  StringConstant type;
  std::span<const Rename> renames;
  std::string_view assumedClass;
};
constexpr LegacyList kLegacyLists[] = {
    {FileForm::legacyMail, "DeliveryAccounts", accountsettings::kSMTPAccountType, kMailRenames, "SMTPAccount"},
    {FileForm::legacyMail, "MailAccounts", accountsettings::kMailAccountType, kMailRenames, {}},
    {FileForm::legacyExchange, "DAAccountsKey", accountsettings::kExchangeAccountType, kExchangeRenames, {}}};

void addLegacyAccounts(const LegacyList& list, const AccountFile& file, std::vector<FoundAccount>& accounts) {
  const Array* const descriptions = file.root.array(list.key);
  for (std::size_t index = 0; descriptions != nullptr && index < descriptions->size(); ++index) {
    FoundAccount account = accountAt(list.key, index, (*descriptions)[index]);
    Dictionary& record = account.record;
    for (const Rename& rename : list.renames) {
      if (auto value = record.remove(rename.legacyKey)) record.set(rename.key, *std::move(value));
    }
    record.set(accountsettings::kAccountType, list.type);
    const bool lacksClass = record.text(accountsettings::kAccountClass) == nullptr;
    if (lacksClass && !list.assumedClass.empty()) record.set(accountsettings::kAccountClass, list.assumedClass);
    if (BasicAccount::initWithProperties(account.record) == nullptr) {
      account.fault = "its description has no class, so a migration converts none of the file";
    }
    accounts.push_back(std::move(account));
  }
}

// --- The records of a settings file ---

void addRecords(const Array& records, std::vector<FoundAccount>& accounts) {
  const auto store = AccountsManager::initWithAccounsInfoArray(records);
  const auto& leftOut = store->loadOutcome().leftOut;
  auto next = leftOut.begin();
  for (std::size_t index = 0; index < records.size(); ++index) {
    FoundAccount account = accountAt(accountsettings::kPlistAccountsKey, index, records[index]);
    if (next != leftOut.end() && next->position == index) account.fault = reasonFor((next++)->why);
    accounts.push_back(account);
    const Array* const children = account.properties.array(accountsettings::kAccountChildAccounts);
    for (std::size_t place = 0; children != nullptr && place < children->size(); ++place) {
      const PropertyValue& element = (*children)[place];
      FoundAccount child = accountAt(account.list, index, element);
      child.child = place;
      if (const auto fault = faultOfChild(element); !fault.empty()) child.fault = std::string{kMeansNoChild} + fault;
      accounts.push_back(std::move(child));
    }
  }
}

}  // namespace

Dictionary inLegacyWords(const FoundAccount& account, const Dictionary& record) {
  const auto* const list = std::ranges::find(kLegacyLists, std::string_view{account.list}, &LegacyList::key);
  Dictionary description = record;
  for (const Rename& rename : list->renames) {
    if (auto value = description.remove(rename.key)) description.set(rename.legacyKey, *std::move(value));
  }
  return description;
}

std::string_view nameOf(FileForm form) { return kFormNames.at(static_cast<std::size_t>(form)); }
std::string_view codeOf(FileForm form) { return kFormCodes.at(static_cast<std::size_t>(form)); }

std::string FoundAccount::place() const {
  const auto indexed = [](const std::string& key, std::size_t at) { return key + "[" + std::to_string(at) + "]"; };
  const std::string top = indexed(list, index);
  if (!child) return top;
  return top + "." + indexed(std::string{accountsettings::kAccountChildAccounts.view()}, *child);
}

std::string FoundAccount::described() const { return place() + ", " + namesOf(record).described(); }

std::optional<std::int64_t> AccountFile::version() const {
  const PropertyValue* const version = root.find(accountsettings::kPlistVersionKey);
  return form != FileForm::settings || version == nullptr ? std::nullopt : version->integerValue();
}

bool AccountFile::isOlder() const {
  const auto told = version();  // one without a version counts as current, and a negative one as newer
  return told && static_cast<std::uint64_t>(*told) < AccountsManager::currentVersion();
}

std::vector<FoundAccount> accountsIn(const AccountFile& file) {
  std::vector<FoundAccount> accounts;
  for (const LegacyList& list : kLegacyLists) {
    if (list.form == file.form) addLegacyAccounts(list, file, accounts);
  }
  const Array* const records = file.root.array(accountsettings::kPlistAccountsKey);
  if (file.form == FileForm::settings && records != nullptr) addRecords(*records, accounts);
  // Of several with one identifier no more than one is found.
  platform::InsertionOrderedMap<const FoundAccount*> known;
  for (FoundAccount& account : accounts) {
    const auto* const identifier = account.record.text(accountsettings::kAccountIdentifier);
    if (identifier == nullptr || !account.fault.empty()) continue;
    if (const auto* const earlier = known.find(*identifier)) {
      account.fault = "it shares its identifier with " + (*earlier)->place();
    } else {
      known.set(*identifier, &account);
    }
  }
  return accounts;
}

}  // namespace tools
