#include <unistd.h>

#include <algorithm>
#include <exception>
#include <iterator>
#include <nlohmann/json.hpp>
#include <optional>

#include "accountsettings/service_objects.h"
#include "commandline/program.h"
#include "commandline/table.h"
#include "platform/characters.h"
#include "platform/platform.h"
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

// --- The table of accounts ---

struct Column {
  std::string_view name;  // as --columns has it; in capitals the heading
  bool isUsual;
  std::string (*cell)(const BasicAccount& account);
};

std::string shownName(const BasicAccount& account) {
  const std::string name = nameOf(account);
  return name.empty() ? "(no name)" : name;
}

constexpr Column kColumns[] = {
    {"identifier", true, [](const BasicAccount& account) { return textOf(account.identifier()); }},
    {"type", true, [](const BasicAccount& account) { return textOf(account.type()); }},
    {"class", true, [](const BasicAccount& account) { return textOf(account.accountClass()); }},
    {"name", true, shownName},
    {"user", true, [](const BasicAccount& account) { return ownText(account, accountsettings::kAccountUsername); }},
    {"host", false, [](const BasicAccount& account) { return ownText(account, kAccountHost); }},
    {"enabled", true,
     [](const BasicAccount& account) {
       return joinedDataclasses(account.enabledDataclasses().value_or(BasicAccount::Dataclasses{}));
     }},
};

std::vector<Column> columnsFor(const Options& options) {
  std::vector<Column> columns;
  std::vector<std::string> names;
  for (const Column& each : kColumns) names.emplace_back(each.name);
  for (const std::string& name : options.columns) {
    const auto* const found = std::ranges::find(kColumns, platform::caseFolded(name), &Column::name);
    if (found == std::end(kColumns)) {
      throw commandline::WrongUse{"unknown column: " + name, commandline::hintFor(name, names)};
    }
    columns.push_back(*found);
  }
  if (columns.empty()) {
    std::ranges::copy_if(kColumns, std::back_inserter(columns), [](const Column& each) { return each.isUsual; });
  }
  return columns;
}

commandline::Row rowOf(const std::vector<Column>& columns, const BasicAccount& account, std::string_view indentation) {
  std::vector<std::string> cells;
  for (const Column& column : columns) cells.push_back(column.cell(account));
  cells.front().insert(0, indentation);
  return commandline::Row{std::move(cells)};
}

std::string counted(std::size_t count, std::string_view what) {
  return std::to_string(count) + " " + std::string{what} + (count == 1 ? "" : "s");
}

// "12 accounts, 2 of them in others"
std::string tally(std::size_t accounts, std::size_t children) {
  const std::string all = counted(accounts + children, "account");
  return children == 0 ? all : all + ", " + std::to_string(children) + " of them in others";
}

bool isThere(const platform::Path& path) { return platform::current().files->kindOf(path).isOk(); }

// What a reader of the list cannot see in it; empty where it has everything.
std::string whatIsNotListed(const AccountsManager& accounts) {
  const auto path = AccountsManager::fullPathToAccountSettingsPlist();
  if (const std::size_t count = accounts.loadOutcome().leftOut.size(); count > 0) {
    return counted(count, "record") + " of the settings file cannot be loaded; accountctl verify tells why";
  }
  if (isThere(path)) return accounts.count() == 0 ? "the settings file has no accounts: " + path.string() : "";
  const bool isLegacy = isThere(accountsettings::daAccountPath()) || isThere(accountsettings::mailAccountsPath());
  return isLegacy ? "the device has account files of the first releases alone; a migration converts them"
                  : "the device has no settings file: " + path.string();
}

// --- One account ---

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
            {"Name", shownName(*account)},
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

Outcome listAccounts(Session& session, const Words&, const Options& options) {
  const auto& accounts = session.accounts();
  auto byParent = childrenByParent(accounts);
  if (options.printsJson) {
    Json report{{"version", accounts.dataVersion()}, {"accounts", Json::array()}};
    for (const auto& account : accounts.allBasicAccounts()) report["accounts"].push_back(treeOf(byParent, *account));
    return report.dump(2) + "\n";
  }
  const auto columns = columnsFor(options);
  commandline::Row heading{{}, commandline::Emphasis::strong};
  for (const Column& column : columns) heading.cells.push_back(platform::upperCased(column.name));
  Rows rows{heading};
  for (const auto& account : accounts.allBasicAccounts()) {
    rows.push_back(rowOf(columns, *account, ""));
    for (const auto& child : byParent[account.get()]) rows.push_back(rowOf(columns, *child, "  "));
  }
  if (const auto told = whatIsNotListed(accounts); !told.empty()) commandline::say("accountctl", told);
  const auto page = options.page();
  const std::size_t top = accounts.allBasicAccounts().size();
  const bool isForPeople = ::isatty(STDOUT_FILENO) == 1;
  return commandline::table(rows, page) + (isForPeople ? tally(top, rows.size() - 1 - top) + "\n" : "");
}

Outcome showAccount(Session& session, const Words& arguments, const Options& options) {
  const auto account = session.accountMeantBy(arguments[0]);
  const auto service = serviceOf(session, *account);
  auto byParent = childrenByParent(session.accounts());
  if (!options.printsJson) {
    const auto page = options.page();
    return commandline::table(summaryOf(byParent, account, service), page) +
           commandline::emphasised("Properties", commandline::Emphasis::strong, page) + "\n" +
           commandline::table(propertiesOf(*account), page);
  }
  auto report = treeOf(byParent, *account);
  report["service"] = jsonOf(service);
  report["properties"] = tools::jsonOf(account->properties());
  return report.dump(2) + "\n";
}

Outcome listTypes(Session&, const Words&, const Options& options) {
  Json report{{"types", Json::array()}};
  Rows rows{commandline::Row{{"TYPE", "DATA CLASSES"}, commandline::Emphasis::strong}};
  for (const Text& type : BasicAccount::accountTypes()) {
    const auto* const listed = BasicAccount::supportedDataclassesForAccountType(type);
    const auto dataclasses =
        BasicAccount::_orderedDataclasses(listed == nullptr ? BasicAccount::Dataclasses{} : *listed);
    report["types"].push_back({{"type", type.string()}, {"supported", tools::jsonOf(dataclasses)}});
    rows.push_back({type.string(), joinedDataclasses(dataclasses)});
  }
  return options.printsJson ? report.dump(2) + "\n" : commandline::table(rows, options.page());
}

}  // namespace tools
