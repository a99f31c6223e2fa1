#include <unistd.h>

#include <algorithm>
#include <iterator>
#include <nlohmann/json.hpp>
#include <optional>

#include "accountsettings/file_paths.h"
#include "commandline/program.h"
#include "commandline/table.h"
#include "platform/characters.h"
#include "platform/platform.h"
#include "tools/account_view.h"
#include "tools/commands.h"

namespace tools {
namespace {

using accountsettings::Text;
using Json = nlohmann::ordered_json;
using Rows = std::vector<commandline::Row>;

// --- The table of accounts ---

struct Column {
  std::string_view name;  // as --columns has it; in capitals the heading
  bool isUsual;
  std::string (*cell)(const Account& account);
};

std::string shownName(const Account& account) {
  const std::string name = account.displayName().value_or("");
  return name.empty() ? "(no name)" : name;
}

constexpr Column kColumns[] = {
    {"identifier", true, [](const Account& account) { return account.identifier(); }},
    {"type", true, [](const Account& account) { return account.type(); }},
    {"class", true, [](const Account& account) { return account.accountClass(); }},
    {"name", true, shownName},
    {"user", true, [](const Account& account) { return namesOf(account).user; }},
    {"host", false, [](const Account& account) { return namesOf(account).host; }},
    {"enabled", true, [](const Account& account) { return joinedDataclasses(account.enabledDataclasses()); }},
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

commandline::Row rowOf(const std::vector<Column>& columns, const Account& account, std::string_view indentation) {
  std::vector<std::string> cells;
  for (const Column& column : columns) cells.push_back(column.cell(account));
  cells.front().insert(0, indentation);
  return commandline::Row{std::move(cells)};
}

std::string counted(std::size_t count, std::string_view what) {
  return std::to_string(count) + " " + std::string{what} + (count == 1 ? "" : "s");
}

bool isThere(const platform::Path& path) { return platform::current().files->kindOf(path).isOk(); }

// What a reader of the list cannot see in it; empty where it has everything.
std::string whatIsNotListed(const accounts::Accounts& accounts) {
  const auto path = AccountsManager::fullPathToAccountSettingsPlist();
  if (const std::size_t count = accounts.unreadable(); count > 0) {
    return counted(count, "record") + " of the settings file cannot be loaded; accountctl verify tells why";
  }
  if (isThere(path)) return accounts.empty() ? "the settings file has no accounts: " + path.string() : "";
  const bool isLegacy = isThere(accountsettings::daAccountPath()) || isThere(accountsettings::mailAccountsPath());
  return isLegacy ? "the device has account files of the first releases alone; a migration converts them"
                  : "the device has no settings file: " + path.string();
}

// --- One account ---

Json treeOf(const Account& account) {
  auto tree = jsonOf(account);
  auto children = Json::array();
  for (const Account& child : account.children()) children.push_back(jsonOf(child));
  tree["children"] = std::move(children);
  return tree;
}

Json jsonOf(const std::optional<accounts::Service>& service) {
  if (!service) return nullptr;
  return {{"host", service->host}, {"port", service->port}, {"secure", service->isSecure}};
}

Rows summaryOf(const Account& account) {
  Rows rows{{"Identifier", account.identifier()},
            {"Type", account.type()},
            {"Class", account.accountClass()},
            {"Name", shownName(account)},
            {"Enabled", account.listsDataclasses() ? joinedDataclasses(account.enabledDataclasses()) : "(no list)"},
            {"Supported", joinedDataclasses(account.supportedDataclasses())}};
  if (const auto service = account.service()) {
    const std::string place = service->host + ":" + std::to_string(service->port);
    rows.push_back({"Service", place + (service->isSecure ? " (secure)" : " (not secure)")});
  }
  if (const auto parent = account.parentIdentifier(); !parent.empty()) rows.push_back({"Parent", parent});
  for (const Account& child : account.children()) rows.push_back({"Child", child.identifier()});
  return rows;
}

}  // namespace

Outcome listAccounts(Session& session, const Words&, const Options& options) {
  const accounts::Accounts& accounts = session.accounts();
  if (options.printsJson) {
    Json report{{"version", accounts.dataVersion()}, {"accounts", Json::array()}};
    for (const Account& account : accounts) report["accounts"].push_back(treeOf(account));
    return report.dump(2) + "\n";
  }
  const auto columns = columnsFor(options);
  commandline::Row heading{{}, commandline::Emphasis::strong};
  for (const Column& column : columns) heading.cells.push_back(platform::upperCased(column.name));
  Rows rows{heading};
  for (const Account& account : accounts) {
    rows.push_back(rowOf(columns, account, ""));
    for (const Account& child : account.children()) rows.push_back(rowOf(columns, child, "  "));
  }
  if (const auto told = whatIsNotListed(accounts); !told.empty()) commandline::say("accountctl", told);
  const std::string table = commandline::table(rows, options.page());
  if (::isatty(STDOUT_FILENO) == 0) return table;
  const std::size_t children = rows.size() - 1 - accounts.size();
  const std::string others = children == 0 ? "" : ", " + std::to_string(children) + " of them in others";
  return table + counted(accounts.size() + children, "account") + others + "\n";
}

Outcome showAccount(Session& session, const Words& arguments, const Options& options) {
  const Account account = session.accountMeantBy(arguments[0]);
  if (!options.printsJson) {
    const auto page = options.page();
    Rows properties;  // without the children, which are accounts of their own
    for (const auto& [key, value] : recordOf(account)) {
      if (key == accountsettings::kAccountChildAccounts) continue;
      properties.push_back({"  " + key.string(), lineOf(value, key)});
    }
    return commandline::table(summaryOf(account), page) +
           commandline::emphasised("Properties", commandline::Emphasis::strong, page) + "\n" +
           commandline::table(properties, page);
  }
  auto report = treeOf(account);
  report["service"] = jsonOf(account.service());
  report["properties"] = tools::jsonOf(recordOf(account));
  return report.dump(2) + "\n";
}

Outcome listTypes(Session&, const Words&, const Options& options) {
  Json report{{"types", Json::array()}};
  Rows rows{commandline::Row{{"TYPE", "DATA CLASSES"}, commandline::Emphasis::strong}};
  for (const Text& type : BasicAccount::accountTypes()) {
    Dataclasses supported;
    if (const auto* const listed = BasicAccount::supportedDataclassesForAccountType(type)) {
      for (const Text& each : BasicAccount::_orderedDataclasses(*listed)) supported.push_back(each.string());
    }
    rows.push_back({type.string(), joinedDataclasses(supported)});
    report["types"].push_back({{"type", type.string()}, {"supported", std::move(supported)}});
  }
  return options.printsJson ? report.dump(2) + "\n" : commandline::table(rows, options.page());
}

}  // namespace tools
