#include <algorithm>

#include "commandline/table.h"
#include "commandline/text.h"
#include "tools/commands.h"

namespace tools {
namespace {

constexpr std::size_t kUsualColumns = 80;

constexpr std::string_view kUsage =
    "Usage: accountctl [OPTION]... COMMAND [ARGUMENT]...\n"
    "Reads and changes a device's accounts.\n"
    "\n";
constexpr std::string_view kStatuses =
    "\n"
    "Credentials are never printed. accountctl help COMMAND tells more.\n"
    "\n"
    "Exit status: 0 done, 1 failed, 2 wrong use, 3 no such account,\n"
    "4 the configuration or a module is at fault,\n"
    "5 verify or check-modules has findings.\n";

commandline::Page pageOf(const Options& options) {
  auto page = options.page();
  page.columns = page.columns.value_or(kUsualColumns);
  return page;
}

std::string helpOf(const Command& command, const commandline::Page& page) {
  std::string text = "Usage: accountctl [OPTION]... " + usageOf(command) + "\n\n";
  for (const auto paragraph : {command.summary, command.details}) {
    for (const std::string& line : commandline::wrapped(paragraph, *page.columns)) {
      if (!line.empty()) text += line + "\n";
    }
  }
  return text;
}

}  // namespace

std::string help(const Options& options) {
  const auto page = pageOf(options);
  if (!options.command.empty() && options.printsHelp) return helpOf(commandNamed(options.command), page);
  std::vector<commandline::Meaning> list;
  for (const Command& command : commands()) list.push_back({usageOf(command), std::string{command.summary}});
  return std::string{kUsage} + commandline::meanings(list, page) + "\n" + helpOfOptions(page) + std::string{kStatuses};
}

const Command& commandNamed(const std::string& name) {
  const auto& all = commands();
  const auto found = std::ranges::find(all, name, &Command::name);
  if (found != all.end()) return *found;
  std::vector<std::string> names;
  for (const Command& each : all) names.emplace_back(each.name);
  throw commandline::WrongUse{"unknown command: " + name, commandline::hintFor(name, names)};
}

std::string usageOf(const Command& command) {
  return std::string{command.name} + (command.arguments.empty() ? "" : " ") + std::string{command.arguments};
}

Outcome helpOnCommand(Session&, const Words& arguments, const Options& options) {
  return arguments.empty() ? help(options) : helpOf(commandNamed(arguments[0]), pageOf(options));
}

}  // namespace tools
