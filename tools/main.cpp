#include <unistd.h>

#include <algorithm>

#include "accountsettings/assertion_failure.h"
#include "commandline/program.h"
#include "commandline/table.h"
#include "tools/commands.h"
#include "tools/options.h"

namespace {

using tools::ExitStatus;
using tools::Failure;

constexpr std::string_view kProgram = "accountctl";
constexpr std::size_t kUsualColumns = 80;

constexpr std::string_view kUsageHead =
    "Usage: accountctl [OPTION]... COMMAND [ARGUMENT]...\n"
    "Reads and changes a device's accounts.\n"
    "\n";
constexpr std::string_view kUsageTail =
    "\n"
    "DATACLASS is written Mail or com.vorlix.Dataclass.Mail, VALUE is a text;\n"
    "KEY:=JSON gives any other value. Credentials are never printed.\n"
    "\n"
    "Exit status: 0 done, 1 failed or findings, 2 wrong use, 3 no such account,\n"
    "4 the configuration or a module is at fault.\n";

std::string usageOf(const tools::Command& command) {
  return std::string{command.name} + (command.arguments.empty() ? "" : " ") + std::string{command.arguments};
}

std::string help() {
  auto page = commandline::pageOn(STDOUT_FILENO);
  page.columns = page.columns.value_or(kUsualColumns);
  std::vector<commandline::Meaning> list;
  for (const auto& command : tools::commands()) list.push_back({usageOf(command), std::string{command.summary}});
  return std::string{kUsageHead} + commandline::meanings(list, page) + "\n" + tools::helpOfOptions(page) +
         std::string{kUsageTail};
}

const tools::Command& commandNamed(const std::string& name) {
  const auto& all = tools::commands();
  const auto found = std::ranges::find(all, name, &tools::Command::name);
  if (found != all.end()) return *found;
  std::vector<std::string> names;
  for (const auto& each : all) names.emplace_back(each.name);
  throw commandline::WrongUse{"unknown command: " + name, commandline::hintFor(name, names)};
}

const tools::Command& commandOf(const tools::Options& options) {
  if (options.command.empty()) throw commandline::WrongUse{"no command is given"};
  const auto& command = commandNamed(options.command);
  const auto count = options.arguments.size();
  if (count >= command.fewestArguments && count <= command.mostArguments) return command;
  throw Failure{ExitStatus::wrongUse, "usage: accountctl " + usageOf(command)};
}

tools::Outcome perform(std::span<const char* const> arguments) {
  auto options = tools::parseArguments(arguments);
  if (options.printsHelp) return help();
  if (options.printsVersion) return std::string{"accountctl " ACCOUNTCTL_VERSION "\n"};
  const auto& command = commandOf(options);
  options.device.locks = command.changesAccounts ? tools::kLocksOfWriters : tools::kLocksOfReaders;
  tools::Session session{options};
  try {
    return command.run(session, options.arguments, options.printsJson);
  } catch (const accountsettings::AssertionFailure& failure) {
    throw Failure{ExitStatus::faultyInstallation, failure.what()};
  }
}

int obey(std::span<const char* const> arguments) {
  const auto outcome = perform(arguments);
  if (!commandline::print(outcome.output)) throw Failure{ExitStatus::failed, "the output could not be written"};
  return static_cast<int>(outcome.status);
}

}  // namespace

int main(int count, char** arguments) {
  return commandline::runProgram(kProgram, {arguments, static_cast<std::size_t>(count)},
                                 static_cast<int>(ExitStatus::failed), obey);
}
