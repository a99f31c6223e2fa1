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

using accounts::Edit;
using accountsettings::Dictionary;
using accountsettings::Text;
using Json = nlohmann::ordered_json;

[[noreturn]] void refuseUse(const std::string& message) { throw Failure{ExitStatus::wrongUse, message}; }

// What a change prints: for machines the report, for people the line, or what a mere rehearsal would have done.
std::string printedChange(const Options& options, Json report, const std::string& line, const std::string& rehearsed) {
  if (options.printsJson) {
    if (options.changesNothing) report["dryRun"] = true;
    return report.dump(2) + "\n";
  }
  return options.changesNothing ? "would " + rehearsed + "\n" : line;
}

// The steps change the one account, which is answered as it is then.
template <typename Steps>
Account changed(Session& session, const Account& account, const Dataclasses& concerned, const Steps& steps) {
  const std::string identifier = account.identifier();
  if (identifier.empty())
    throw Failure{ExitStatus::failed, "the account has no identifier by which it could be changed"};
  std::optional<Account> after;
  session.change({{account, concerned}}, [&](Edit& edit) {
    steps(edit, identifier);
    after = edit.account(identifier);
  });
  return after.value_or(account);
}

// The data class of those that the name means, in short or in full, in whatever case; null where it is none of them.
const std::string* dataclassNamed(const std::string& name, const Dataclasses& dataclasses) {
  const std::string meant = platform::caseFolded(fullDataclass(name));
  const auto found = std::ranges::find_if(dataclasses, [&](const std::string& each) {
    return platform::caseFolded(each) == meant || platform::caseFolded(each) == platform::caseFolded(name);
  });
  return found == dataclasses.end() ? nullptr : &*found;
}

// The data class that the name means for the account.
std::string supportedDataclass(const Account& account, const std::string& name) {
  const Dataclasses supported = account.supportedDataclasses();
  if (const auto* const found = dataclassNamed(name, supported)) return *found;
  Dataclasses all;
  for (const Text& each : BasicAccount::allSupportedDataclasses()) all.push_back(each.string());
  const auto* const known = dataclassNamed(name, all);
  if (known != nullptr) {
    refuseUse("accounts of the type " + account.type() + " do not support " + shortDataclass(*known));
  }
  std::vector<std::string> names;
  for (const std::string& each : supported) names.push_back(shortDataclass(each));
  throw Failure{ExitStatus::wrongUse, "unknown data class: " + name, commandline::hintFor(shortDataclass(name), names)};
}

Outcome switchDataclass(Session& session, const Words& arguments, const Options& options, bool enabled) {
  session.beginChanges();
  const Account account = session.accountMeantBy(arguments[0]);
  const auto dataclass = supportedDataclass(account, arguments[1]);
  const auto after = changed(session, account, {dataclass}, [&](Edit& edit, const std::string& identifier) {
    required(edit.setEnabled(identifier, dataclass, enabled));
  });
  return printedChange(
      options, {{"account", jsonOf(after)}}, "",
      (enabled ? "enable " : "disable ") + shortDataclass(dataclass) + " of " + namesOf(account).described());
}

// Refuses a record that would not last, or only as another one.
void requireLasting(const Dictionary& record) {
  if (const auto fault = faultAtNextLoad(record); !fault.empty()) refuseUse("the next load would " + fault);
}

Dictionary newRecord(const Words& arguments) {
  if (!BasicAccount::_isValidAccountType(arguments[0])) refuseUse("unknown account type: " + arguments[0]);
  if (arguments[1].empty()) refuseUse("an account needs a class");
  Dictionary properties{{accountsettings::kAccountType, arguments[0]}, {accountsettings::kAccountClass, arguments[1]}};
  for (std::size_t index = 2; index < arguments.size(); ++index) {
    const auto [key, value] = parseKeyValue(arguments[index], index - 1);
    const auto place = "property " + std::to_string(index - 1);
    if (key == accountsettings::kAccountType || key == accountsettings::kAccountClass) {
      refuseUse(place + " sets " + key + ", which stands before the properties");
    }
    if (!value) refuseUse(place + " holds null, which is no value");
    const bool isEmpty = value->asText() == nullptr || value->asText()->empty();
    if (key == accountsettings::kAccountIdentifier && isEmpty) refuseUse(place + " is no identifier");
    properties.set(key, *value);
  }
  requireLasting(properties);
  return properties;
}

// The properties that an account may be given afterwards are all but those that say which account it is.
std::vector<KeyValue> givenProperties(const Words& arguments) {
  std::vector<KeyValue> given;
  for (std::size_t index = 1; index < arguments.size(); ++index) {
    const KeyValue& property = given.emplace_back(parseKeyValue(arguments[index], index));
    if (property.key == accountsettings::kAccountIdentifier || property.key == accountsettings::kAccountChildAccounts) {
      refuseUse("property " + std::to_string(index) + " sets " + property.key + ", which stays as it is");
    }
  }
  return given;
}

bool isDevicesOwn(const Account& account) { return account.type() == accountsettings::kOnMyDeviceAccountType; }

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
  const Account account = session.accountMeantBy(arguments[0]);
  if (isDevicesOwn(account)) refuseUse("the device's own account has a fixed name");
  const auto enabled = account.enabledDataclasses();
  const auto after = changed(session, account, enabled, [&](Edit& edit, const std::string& identifier) {
    required(edit.set(identifier, accountsettings::kAccountDisplayName, arguments[1]));
  });
  return printedChange(options, {{"account", jsonOf(after)}}, "",
                       "rename " + namesOf(account).described() + " to " + arguments[1]);
}

Outcome setProperties(Session& session, const Words& arguments, const Options& options) {
  session.beginChanges();
  const Account account = session.accountMeantBy(arguments[0]);
  const auto given = givenProperties(arguments);
  Dictionary record = recordOf(account);
  for (const auto& [key, value] : given) value ? record.set(key, *value) : static_cast<void>(record.remove(key));
  if (account.isChild()) {  // whose record lasts as a part of its parent's
    Dictionary parent = recordOf(session.accounts().withIdentifier(account.parentIdentifier()).value_or(account));
    parent.set(accountsettings::kAccountChildAccounts, accountsettings::Array{std::move(record)});
    record = std::move(parent);
  }
  requireLasting(record);
  const auto enabled = account.enabledDataclasses();
  const auto after = changed(session, account, enabled, [&](Edit& edit, const std::string& identifier) {
    for (const auto& [key, value] : given) {
      required(value ? edit.set(identifier, key, valueOf(*value)) : edit.erase(identifier, key));
    }
  });
  return printedChange(options, {{"account", jsonOf(after)}}, "", "change " + namesOf(account).described());
}

Outcome addAccount(Session& session, const Words& arguments, const Options& options) {
  session.beginChanges();
  static_cast<void>(session.accounts());  // which may be none that this release may change
  std::optional<Account> account;
  session.tryOut([&](Edit& edit) { account = required(edit.add({"", "", entriesOf(newRecord(arguments)), ""})); });
  session.change({{*account, account->enabledDataclasses()}}, [&](Edit& edit) {
    account = required(edit.add({"", "", account->ownProperties(), ""}));
  });
  return printedChange(options, {{"account", jsonOf(*account)}}, account->identifier() + "\n",
                       "add " + namesOf(*account).described());
}

Outcome removeAccount(Session& session, const Words& arguments, const Options& options) {
  session.beginChanges();
  const Account account = session.accountMeantBy(arguments[0]);
  if (isDevicesOwn(account)) refuseUse("the device's own account cannot be removed");
  changed(session, account, account.enabledDataclasses(),
          [](Edit& edit, const std::string& identifier) { required(edit.remove(identifier)); });
  return printedChange(options, {{"removed", account.identifier()}}, "", "remove " + namesOf(account).described());
}

Outcome saveAccounts(Session& session, const Words&, const Options& options) {
  session.beginChanges();
  std::size_t count = 0;
  session.change({}, [&count](Edit& edit) {
    edit.rewrite();
    count = edit.accounts().size();
  });
  return printedChange(options, {{"saved", count}}, "", "save " + std::to_string(count) + " accounts");
}

}  // namespace tools
