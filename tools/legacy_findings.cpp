#include <algorithm>
#include <array>
#include <set>
#include <span>

#include "accountsettings/file_paths.h"
#include "platform/platform.h"
#include "tools/account_view.h"
#include "tools/findings.h"

namespace tools {
namespace {

using accountsettings::AccountsManager;
using accountsettings::Array;
using accountsettings::BasicAccount;
using accountsettings::Dictionary;
using accountsettings::PropertyValue;
using accountsettings::Text;

// A list of account descriptions in a legacy file.
struct List {
  std::string_view key;
  std::string_view type;  // of the accounts in the settings that make room for those of the list
  std::string_view classKey;
  std::string_view identifierKey;
  std::string_view usualClass;  // of a description that has none; empty where it needs one
};

constexpr std::array kExchangeLists{List{"DAAccountsKey", accountsettings::kExchangeAccountType,
                                         "DAAccountConfigurationClass", "DAAccountConfigurationAccountID", ""}};
constexpr std::array kMailLists{
    List{"DeliveryAccounts", accountsettings::kSMTPAccountType, "AccountType", "uniqueId", "SMTPAccount"},
    List{"MailAccounts", accountsettings::kMailAccountType, "AccountType", "uniqueId", ""}};

std::span<const List> listsOf(LegacyForm form) {
  return form == LegacyForm::mail ? std::span<const List>{kMailLists} : std::span<const List>{kExchangeLists};
}

const Array& descriptionsIn(const Dictionary& file, const List& list) {
  static const Array kNone;
  const Array* const descriptions = file.array(list.key);
  return descriptions == nullptr ? kNone : *descriptions;
}

const Dictionary& dictionaryIn(const PropertyValue& element) {
  static const Dictionary kNone;
  const Dictionary* const dictionary = element.asDictionary();
  return dictionary == nullptr ? kNone : *dictionary;
}

// The value of the legacy key takes the place of one that stands under the later name.
const PropertyValue* valueUnder(const Dictionary& description, std::string_view legacyKey, std::string_view key) {
  const PropertyValue* const value = description.find(legacyKey);
  return value == nullptr ? description.find(key) : value;
}

std::string identifierOf(const Dictionary& description, const List& list) {
  const auto* const value = valueUnder(description, list.identifierKey, accountsettings::kAccountIdentifier);
  const Text* const text = value == nullptr ? nullptr : value->asText();
  return text == nullptr ? std::string{} : text->string();
}

// The library says whether a record of that class can be an account.
bool isRefused(const Dictionary& description, const List& list) {
  const auto* const value = valueUnder(description, list.classKey, accountsettings::kAccountClass);
  Dictionary record{{accountsettings::kAccountType, list.type}};
  if (value != nullptr) record.set(accountsettings::kAccountClass, *value);
  const bool lacksClass = record.text(accountsettings::kAccountClass) == nullptr;
  if (lacksClass && !list.usualClass.empty()) record.set(accountsettings::kAccountClass, list.usualClass);
  return BasicAccount::initWithProperties(record) == nullptr;
}

std::string placeIn(std::string_view array, std::size_t index) {
  return std::string{array} + "[" + std::to_string(index) + "]";
}

std::vector<std::string> identifiersIn(const Dictionary& file, const List& list) {
  std::vector<std::string> identifiers;
  for (const PropertyValue& element : descriptionsIn(file, list)) {
    identifiers.push_back(identifierOf(dictionaryIn(element), list));
  }
  return identifiers;
}

// How many of the file's accounts the settings have already, under their identifier or to sync by.
std::ptrdiff_t countOfConverted(LegacyForm form, const Dictionary& file, const Dictionary& settings) {
  std::set<std::string> known;
  const Array* const accounts = settings.array(accountsettings::kPlistAccountsKey);
  for (std::size_t index = 0; accounts != nullptr && index < accounts->size(); ++index) {
    const Dictionary& record = dictionaryIn((*accounts)[index]);
    known.insert(textUnder(record, accountsettings::kAccountIdentifier));
    known.insert(textUnder(record, accountsettings::kAccountSyncIdentifier));
  }
  known.erase("");
  std::ptrdiff_t count = 0;
  for (const List& list : listsOf(form)) {
    count += std::ranges::count_if(identifiersIn(file, list), [&](const auto& each) { return known.contains(each); });
  }
  return count;
}

}  // namespace

std::optional<LegacyForm> legacyFormOf(const Dictionary& file) {
  if (file.contains(accountsettings::kPlistAccountsKey)) return std::nullopt;
  for (const LegacyForm form : {LegacyForm::exchange, LegacyForm::mail}) {
    if (std::ranges::any_of(listsOf(form), [&](const List& list) { return file.contains(list.key); })) return form;
  }
  return std::nullopt;
}

platform::Path pathOf(LegacyForm form) {
  return form == LegacyForm::mail ? accountsettings::mailAccountsPath() : accountsettings::daAccountPath();
}

std::size_t countOfDescriptions(LegacyForm form, const Dictionary& file) {
  std::size_t count = 0;
  for (const List& list : listsOf(form)) count += descriptionsIn(file, list).size();
  return count;
}

Findings findingsOfDescriptions(LegacyForm form, const Dictionary& file) {
  Findings findings;
  for (const List& list : listsOf(form)) {
    const Array& descriptions = descriptionsIn(file, list);
    for (std::size_t index = 0; index < descriptions.size(); ++index) {
      const Dictionary& description = dictionaryIn(descriptions[index]);
      if (!isRefused(description, list)) continue;
      const auto* const value = valueUnder(description, list.classKey, accountsettings::kAccountClass);
      const std::string key{list.classKey};
      findings.push_back({"refused-description", placeIn(list.key, index), identifierOf(description, list),
                          value == nullptr ? "there is no " + key : key + " is no class: " + lineOf(*value, key),
                          "a migration refuses it, and with it every account of the file, which it deletes"});
    }
  }
  return findings;
}

Findings findingsOfConversion(LegacyForm form, const Dictionary& file) {
  const auto settings =
      platform::current().propertyLists->readDictionary(AccountsManager::fullPathToAccountSettingsPlist()).valueOr({});
  std::string fate = "a migration converts them and deletes the file";
  if (isDeletionUnderWay()) {
    fate = "a migration deletes it without converting it, since it only finishes the deletion";
  } else if (!findingsOfDescriptions(form, file).empty()) {
    fate = "a migration converts none of them, since one is refused, and deletes the file";
  }
  const std::string count = std::to_string(countOfDescriptions(form, file));
  Findings findings{{"legacy", "", "", "accounts of the first releases stand in it: " + count, fate}};
  const auto converted = countOfConverted(form, file, settings);
  if (converted > 0 && !isDeletionUnderWay()) {
    findings.push_back(
        {"interrupted-run", "", "",
         "accounts of it that the settings file has already: " + std::to_string(converted) +
             "; a run died after it had saved them",
         "a migration converts them once more, and upgrades them from the version of the settings file"});
  }
  return findings;
}

Findings findingsOfReplacement(LegacyForm form, const Dictionary& file, const Dictionary& settings) {
  Findings findings;
  const Array* const accounts = settings.array(accountsettings::kPlistAccountsKey);
  const bool isReplaced = accounts != nullptr && !isDeletionUnderWay() && findingsOfDescriptions(form, file).empty();
  for (std::size_t index = 0; isReplaced && index < accounts->size(); ++index) {
    const Dictionary& record = dictionaryIn((*accounts)[index]);
    const std::string type = textUnder(record, accountsettings::kAccountType);
    const std::string identifier = textUnder(record, accountsettings::kAccountIdentifier);
    for (const List& list : listsOf(form)) {
      const auto given = identifiersIn(file, list);
      if (type != list.type || std::ranges::find(given, identifier) != given.end()) continue;
      findings.push_back({"replaced-with-type", placeIn(accountsettings::kPlistAccountsKey.view(), index), identifier,
                          "its type is " + type + ", and it is none of the accounts in " + pathOf(form).string(),
                          "a migration puts those in its place, and it is lost"});
    }
  }
  return findings;
}

bool isDeletionUnderWay() { return platform::current().files->kindOf(accountsettings::removalSentinelPath()).isOk(); }

}  // namespace tools
