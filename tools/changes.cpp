#include <algorithm>
#include <exception>
#include <functional>
#include <nlohmann/json.hpp>

#include "platform/characters.h"
#include "tools/account_view.h"
#include "tools/commands.h"
#include "tools/key_value.h"

namespace tools {
namespace {

using accountsettings::Dictionary;
using accountsettings::Text;
using Json = nlohmann::ordered_json;
using Dataclasses = BasicAccount::Dataclasses;

[[noreturn]] void refuseUse(const std::string& message) { throw Failure{ExitStatus::wrongUse, message}; }

std::string printedChange(const BasicAccount& account, bool asJson) {
  return asJson ? Json{{"account", jsonOf(account)}}.dump(2) + "\n" : std::string{};
}

// A module may fail in its own way, too; whatever it throws, the message says what became of the change.
void announceBefore(const Session& session, const BasicAccount& account, const Dataclasses& dataclasses) {
  if (!session.opensModules()) return;
  try {
    for (const Text& each : dataclasses) AccountsManager::accountWillChange_forDataclass(account, each);
  } catch (const std::exception& failure) {
    throw Failure{ExitStatus::faultyInstallation, "nothing was changed: " + std::string{failure.what()}};
  }
}

void announceAfter(const Session& session, const BasicAccount& account, const Dataclasses& dataclasses) {
  if (!session.opensModules()) return;
  try {
    for (const Text& each : dataclasses) AccountsManager::accountDidChange_forDataclass(account, each);
  } catch (const std::exception& failure) {
    throw Failure{ExitStatus::faultyInstallation,
                  "the accounts were saved, but not announced: " + std::string{failure.what()}};
  }
}

// Changes an account in memory and saves it, telling those who follow its data classes before and after.
void changeAndSave(Session& session, const Account& account, const Dataclasses& dataclasses,
                   const std::function<void()>& change) {
  announceBefore(session, *account, dataclasses);
  change();
  session.save();
  announceAfter(session, *account, dataclasses);
}

Dataclasses enabledOf(const BasicAccount& account) { return account.enabledDataclasses().value_or(Dataclasses{}); }

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

std::string switchDataclass(Session& session, const Words& arguments, bool asJson, bool enabled) {
  session.beginChanges();
  const auto account = session.accountMeantBy(arguments[0]);
  const auto dataclass = supportedDataclass(*account, arguments[1]);
  changeAndSave(session, account, {dataclass}, [&] {
    account->setEnabled_forDataclass(enabled, dataclass);
    Session::keepChanges(account);
  });
  return printedChange(*account, asJson);
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
  const auto* const text = property.value.asText();
  const bool hasText = text != nullptr && !text->empty();
  if (property.key == accountsettings::kAccountIdentifier && !hasText) refuseUse(place + " is no identifier");
  properties.set(property.key, property.value);
}

Account newAccount(const Words& arguments) {
  auto properties = typeAndClass(arguments[0], arguments[1]);
  for (std::size_t index = 2; index < arguments.size(); ++index) {
    setProperty(properties, parseKeyValue(arguments[index], index - 1), index - 1);
  }
  return BasicAccount::initWithProperties(properties);
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
  return switchDataclass(session, arguments, options.printsJson, true);
}

Outcome disableDataclass(Session& session, const Words& arguments, const Options& options) {
  return switchDataclass(session, arguments, options.printsJson, false);
}

Outcome renameAccount(Session& session, const Words& arguments, const Options& options) {
  if (arguments[1].empty()) refuseUse("an account's name cannot be empty");
  session.beginChanges();
  const auto account = session.accountMeantBy(arguments[0]);
  const auto type = account->type();
  if (type && *type == accountsettings::kOnMyDeviceAccountType) refuseUse("the device's own account has a fixed name");
  changeAndSave(session, account, enabledOf(*account), [&] {
    account->setDisplayName(arguments[1]);
    Session::keepChanges(account);
  });
  return printedChange(*account, options.printsJson);
}

Outcome addAccount(Session& session, const Words& arguments, const Options& options) {
  session.beginChanges();
  const auto account = newAccount(arguments);
  const auto identifier = account->identifier().value_or(Text{}).string();
  if (isRegistered(session, *account)) refuseUse("there is an account with the identifier " + identifier);
  changeAndSave(session, account, enabledOf(*account), [&] { session.accounts().insertAccount(account); });
  return options.printsJson ? printedChange(*account, true) : identifier + "\n";
}

Outcome removeAccount(Session& session, const Words& arguments, const Options& options) {
  session.beginChanges();
  const auto account = session.accountMeantBy(arguments[0]);
  changeAndSave(session, account, enabledOf(*account), [&] { removeEveryRecord(session.accounts(), account); });
  return options.printsJson ? Json{{"removed", jsonOf(*account)["identifier"]}}.dump(2) + "\n" : std::string{};
}

Outcome saveAccounts(Session& session, const Words&, const Options& options) {
  session.beginChanges();
  session.save();
  return options.printsJson ? Json{{"saved", session.accounts().count()}}.dump(2) + "\n" : std::string{};
}

}  // namespace tools
