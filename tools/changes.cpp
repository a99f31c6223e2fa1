#include <algorithm>
#include <nlohmann/json.hpp>
#include <utility>

#include "platform/characters.h"
#include "tools/account_view.h"
#include "tools/commands.h"
#include "tools/key_value.h"
#include "tools/next_load.h"

namespace tools {
namespace {

using accountsettings::Dictionary;
using accountsettings::Text;
using Json = nlohmann::ordered_json;
using Dataclasses = BasicAccount::Dataclasses;

[[noreturn]] void refuseUse(const std::string& message) { throw Failure{ExitStatus::wrongUse, message}; }

// What a change prints: for machines the report, for people the line, or what a mere rehearsal would have done.
std::string printedChange(const Options& options, Json report, const std::string& line, const std::string& rehearsed) {
  if (options.printsJson) {
    if (options.changesNothing) report["dryRun"] = true;
    return report.dump(2) + "\n";
  }
  return options.changesNothing ? "would " + rehearsed + "\n" : line;
}

std::string printedChange(const Options& options, const BasicAccount& account, const std::string& rehearsed) {
  return printedChange(options, {{"account", jsonOf(account)}}, "", rehearsed);
}

// The data class of those that the name means, in short or in full, in whatever case; null where it is none of them.
const Text* dataclassNamed(const std::string& name, const Dataclasses& dataclasses) {
  const std::string meant = platform::caseFolded(fullDataclass(name));
  const auto found = std::ranges::find_if(dataclasses, [&](const Text& each) {
    return platform::caseFolded(each) == meant || platform::caseFolded(each) == platform::caseFolded(name);
  });
  return found == dataclasses.end() ? nullptr : &*found;
}

std::string hintForDataclass(const std::string& name, const Dataclasses& dataclasses) {
  std::vector<std::string> names;
  for (const Text& each : dataclasses) names.push_back(shortDataclass(each));
  return commandline::hintFor(shortDataclass(name), names);
}

// The data class that the name means for the account.
Text supportedDataclass(const BasicAccount& account, const std::string& name) {
  const auto& supported = account.supportedDataclasses();
  if (const Text* const found = dataclassNamed(name, supported)) return *found;
  const Text* const known = dataclassNamed(name, BasicAccount::allSupportedDataclasses());
  if (known == nullptr) {
    throw Failure{ExitStatus::wrongUse, "unknown data class: " + name, hintForDataclass(name, supported)};
  }
  refuseUse("accounts of the type " + account.type().value_or(Text{}).string() + " do not support " +
            shortDataclass(*known));
}

std::string switchDataclass(Session& session, const Words& arguments, const Options& options, bool enabled) {
  session.beginChanges();
  const auto account = session.accountMeantBy(arguments[0]);
  const auto dataclass = supportedDataclass(*account, arguments[1]);
  session.changeAndSave({{account, {dataclass}}}, [&] {
    account->setEnabled_forDataclass(enabled, dataclass);
    Session::keepChanges(account);
  });
  return printedChange(
      options, *account,
      (enabled ? "enable " : "disable ") + shortDataclass(dataclass) + " of " + namesOf(*account).described());
}

// Refuses a record that would not last, or only as another one.
void requireLasting(const Dictionary& record) {
  if (const auto fault = faultAtNextLoad(record); !fault.empty()) refuseUse("the next load would " + fault);
}

Dictionary typeAndClass(const std::string& type, const std::string& className) {
  if (!BasicAccount::_isValidAccountType(type)) refuseUse("unknown account type: " + type);
  if (className.empty()) refuseUse("an account needs a class");
  return {{accountsettings::kAccountType, type}, {accountsettings::kAccountClass, className}};
}

void setProperty(Dictionary& properties, const KeyValue& property, std::size_t position) {
  const auto place = "property " + std::to_string(position);
  if (property.key == accountsettings::kAccountType || property.key == accountsettings::kAccountClass) {
    refuseUse(place + " sets " + property.key + ", which stands before the properties");
  }
  if (!property.value) refuseUse(place + " holds null, which is no value");
  const auto* const text = property.value->asText();
  const bool hasText = text != nullptr && !text->empty();
  if (property.key == accountsettings::kAccountIdentifier && !hasText) refuseUse(place + " is no identifier");
  properties.set(property.key, *property.value);
}

Account newAccount(const Words& arguments) {
  auto properties = typeAndClass(arguments[0], arguments[1]);
  for (std::size_t index = 2; index < arguments.size(); ++index) {
    setProperty(properties, parseKeyValue(arguments[index], index - 1), index - 1);
  }
  requireLasting(properties);
  return BasicAccount::initWithProperties(properties);
}

// The properties that an account may be given afterwards are all but those that say which account it is.
void change(BasicAccount& account, const KeyValue& property, std::size_t position) {
  if (property.key == accountsettings::kAccountIdentifier || property.key == accountsettings::kAccountChildAccounts) {
    refuseUse("property " + std::to_string(position) + " sets " + property.key + ", which stays as it is");
  }
  account._forcedSetAccountProperty_forKey(property.value, property.key);
}

// A child's record lasts as a part of its parent's.
Dictionary recordOf(const BasicAccount& account) {
  const auto& parent = account.parentAccount();
  if (parent == nullptr) return account.properties();
  Dictionary record = parent->properties();
  record.set(accountsettings::kAccountChildAccounts, accountsettings::Array{account.properties()});
  return record;
}

bool isDevicesOwn(const BasicAccount& account) {
  const auto type = account.type();
  return type && *type == accountsettings::kOnMyDeviceAccountType;
}

bool isRegistered(Session& session, const BasicAccount& account) {
  const auto identifier = account.identifier();
  return std::ranges::any_of(session.accounts().allBasicSyncableAccounts(),
                             [&](const Account& each) { return each->identifier() == identifier; });
}

void removeEveryRecord(AccountsManager& accounts, const Account& account) {
  if (const auto parent = account->parentAccount()) {
    accounts.removeChildWithIdentifier_fromAccount(account->identifier().value_or(Text{}), parent);
    return;
  }
  // The store takes out one record at a time, and several may have the identifier.
  for (auto before = accounts.count() + 1; accounts.count() < before;) {
    before = accounts.count();
    accounts.deleteAccount(account);
  }
}

}  // namespace

Outcome enableDataclass(Session& session, const Words& arguments, const Options& options) {
  return switchDataclass(session, arguments, options, true);
}

Outcome disableDataclass(Session& session, const Words& arguments, const Options& options) {
  return switchDataclass(session, arguments, options, false);
}

Outcome renameAccount(Session& session, const Words& arguments, const Options& options) {
  if (arguments[1].empty()) refuseUse("an account's name cannot be empty");
  session.beginChanges();
  const auto account = session.accountMeantBy(arguments[0]);
  if (isDevicesOwn(*account)) refuseUse("the device's own account has a fixed name");
  const auto before = namesOf(*account).described();
  session.changeAndSave({{account, enabledOf(*account)}}, [&] {
    account->setDisplayName(arguments[1]);
    Session::keepChanges(account);
  });
  return printedChange(options, *account, "rename " + before + " to " + arguments[1]);
}

Outcome setProperties(Session& session, const Words& arguments, const Options& options) {
  session.beginChanges();
  const auto account = session.accountMeantBy(arguments[0]);
  const auto dataclasses = enabledOf(*account);
  const Dictionary before = account->properties();
  for (std::size_t index = 1; index < arguments.size(); ++index) {
    change(*account, parseKeyValue(arguments[index], index), index);
  }
  requireLasting(recordOf(*account));
  const Dictionary after = std::exchange(account->properties(), before);
  session.changeAndSave({{account, dataclasses}}, [&] {
    account->properties() = after;
    Session::keepChanges(account);
  });
  return printedChange(options, *account, "change " + namesOf(*account).described());
}

Outcome addAccount(Session& session, const Words& arguments, const Options& options) {
  session.beginChanges();
  const auto account = newAccount(arguments);
  const auto identifier = account->identifier().value_or(Text{}).string();
  if (isRegistered(session, *account)) refuseUse("there is an account with the identifier " + identifier);
  session.changeAndSave({{account, enabledOf(*account)}}, [&] { session.accounts().insertAccount(account); });
  return printedChange(options, {{"account", jsonOf(*account)}}, identifier + "\n",
                       "add " + namesOf(*account).described());
}

Outcome removeAccount(Session& session, const Words& arguments, const Options& options) {
  session.beginChanges();
  const auto account = session.accountMeantBy(arguments[0]);
  if (isDevicesOwn(*account)) refuseUse("the device's own account cannot be removed");
  session.changeAndSave({{account, enabledOf(*account)}}, [&] { removeEveryRecord(session.accounts(), account); });
  return printedChange(options, {{"removed", jsonOf(*account)["identifier"]}}, "",
                       "remove " + namesOf(*account).described());
}

Outcome saveAccounts(Session& session, const Words&, const Options& options) {
  session.beginChanges();
  session.save();
  const auto count = session.accounts().count();
  return printedChange(options, {{"saved", count}}, "", "save " + std::to_string(count) + " accounts");
}

}  // namespace tools
