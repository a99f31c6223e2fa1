#include <exception>
#include <nlohmann/json.hpp>
#include <optional>

#include "accountsettings/service_objects.h"
#include "commandline/table.h"
#include "tools/account_view.h"
#include "tools/commands.h"

namespace tools {
namespace {

using accountsettings::ServiceAccountObject;
using accountsettings::ServiceAddress;
using accountsettings::Text;
using Json = nlohmann::ordered_json;
using Rows = std::vector<commandline::Row>;

std::string textOf(const std::optional<Text>& text) { return text ? text->string() : std::string{}; }

commandline::Row rowOf(const BasicAccount& account, std::string_view indentation) {
  return commandline::Row{std::string{indentation} + textOf(account.identifier()), textOf(account.type()),
                          textOf(account.accountClass()), nameOf(account),
                          joinedDataclasses(account.enabledDataclasses().value_or(BasicAccount::Dataclasses{}))};
}

Json treeOf(ChildrenByParent& byParent, const BasicAccount& account) {
  auto tree = jsonOf(account);
  auto children = Json::array();
  for (const auto& child : byParent[&account]) children.push_back(jsonOf(*child));
  tree["children"] = std::move(children);
  return tree;
}

// What the account's module knows of its service; nothing where no module may be asked or none can tell. An account
// whose module is at fault can be shown all the same.
std::optional<ServiceAddress> serviceOf(const Session& session, BasicAccount& account) {
  if (!session.opensModules()) return std::nullopt;
  try {
    const auto full = account.fullAccountUsingLoader(nullptr);
    const auto* const service = dynamic_cast<const ServiceAccountObject*>(full.get());
    return service == nullptr ? std::nullopt : service->service();
  } catch (const std::exception&) {
    return std::nullopt;
  }
}

Json jsonOf(const std::optional<ServiceAddress>& service) {
  if (!service) return nullptr;
  return {{"host", service->host}, {"port", service->port}, {"secure", service->isSecure}};
}

std::string textOf(const ServiceAddress& service) {
  return service.host + ":" + std::to_string(service.port) + (service.isSecure ? " (secure)" : " (not secure)");
}

Rows summaryOf(ChildrenByParent& byParent, const Account& account, const std::optional<ServiceAddress>& service) {
  const auto enabled = account->enabledDataclasses();
  Rows rows{{"Identifier", textOf(account->identifier())},
            {"Type", textOf(account->type())},
            {"Class", textOf(account->accountClass())},
            {"Name", nameOf(*account)},
            {"Enabled", enabled ? joinedDataclasses(*enabled) : "(no list)"},
            {"Supported", joinedDataclasses(account->supportedDataclasses())}};
  if (service) rows.push_back({"Service", textOf(*service)});
  if (const auto parent = account->parentAccountIdentifier()) rows.push_back({"Parent", parent->string()});
  for (const auto& child : byParent[account.get()]) rows.push_back({"Child", textOf(child->identifier())});
  return rows;
}

// Children are accounts of their own and not shown twice.
Rows propertiesOf(const BasicAccount& account) {
  Rows rows;
  for (const auto& [key, value] : account.properties()) {
    if (key != accountsettings::kAccountChildAccounts) rows.push_back({"  " + key.string(), lineOf(value, key)});
  }
  return rows;
}

}  // namespace

Outcome listAccounts(Session& session, const Words&, bool asJson) {
  const auto& accounts = session.accounts();
  auto byParent = childrenByParent(accounts);
  if (asJson) {
    Json report{{"version", accounts.dataVersion()}, {"accounts", Json::array()}};
    for (const auto& account : accounts.allBasicAccounts()) report["accounts"].push_back(treeOf(byParent, *account));
    return report.dump(2) + "\n";
  }
  Rows rows{{"IDENTIFIER", "TYPE", "CLASS", "NAME", "ENABLED"}};
  for (const auto& account : accounts.allBasicAccounts()) {
    rows.push_back(rowOf(*account, ""));
    for (const auto& child : byParent[account.get()]) rows.push_back(rowOf(*child, "  "));
  }
  return commandline::table(rows);
}

Outcome showAccount(Session& session, const Words& arguments, bool asJson) {
  const auto account = session.accountWithIdentifier(arguments[0]);
  const auto service = serviceOf(session, *account);
  auto byParent = childrenByParent(session.accounts());
  if (!asJson) {
    return commandline::table(summaryOf(byParent, account, service)) + "Properties\n" +
           commandline::table(propertiesOf(*account));
  }
  auto report = treeOf(byParent, *account);
  report["service"] = jsonOf(service);
  report["properties"] = tools::jsonOf(account->properties());
  return report.dump(2) + "\n";
}

Outcome listTypes(Session&, const Words&, bool asJson) {
  Json report{{"types", Json::array()}};
  Rows rows{{"TYPE", "DATA CLASSES"}};
  for (const Text& type : BasicAccount::accountTypes()) {
    const auto* const listed = BasicAccount::supportedDataclassesForAccountType(type);
    const auto dataclasses =
        BasicAccount::_orderedDataclasses(listed == nullptr ? BasicAccount::Dataclasses{} : *listed);
    report["types"].push_back({{"type", type.string()}, {"supported", tools::jsonOf(dataclasses)}});
    rows.push_back({type.string(), joinedDataclasses(dataclasses)});
  }
  return asJson ? report.dump(2) + "\n" : commandline::table(rows);
}

}  // namespace tools
