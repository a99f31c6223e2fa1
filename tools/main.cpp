#include "accountsettings/assertion_failure.h"
#include "commandline/program.h"
#include "tools/commands.h"
#include "tools/options.h"

namespace {

using tools::ExitStatus;
using tools::Failure;

constexpr std::string_view kProgram = "accountctl";

// An option that means nothing for the command is a misunderstanding that had better be told.
const tools::Command& commandOf(const tools::Options& options) {
  if (options.command.empty()) throw commandline::WrongUse{"no command is given"};
  const auto& command = tools::commandNamed(options.command);
  const auto require = [](bool isSound, const char* message) {
    if (!isSound) throw commandline::WrongUse{message};
  };
  const bool listsStore = command.run == tools::listAccounts && !options.file;
  require(options.columns.empty() || listsStore, "--columns is for a list of the device's accounts");
  require(!options.changesNothing || command.changesAccounts, "--dry-run is for commands that change accounts");
  require(!options.file || command.runOnFile != nullptr, "--file is for list, show and verify");
  require(options.settings.empty() || command.run == tools::recoverAccounts, "--set is for recover");
  const auto count = options.arguments.size();
  if (count >= command.minArguments && count <= command.maxArguments) return command;
  throw Failure{ExitStatus::wrongUse, "usage: accountctl " + tools::usageOf(command)};
}

tools::Outcome perform(std::span<const char* const> arguments) {
  const auto options = tools::parseArguments(arguments);
  if (options.printsHelp) return tools::help(options);
  if (options.printsVersion) return std::string{"accountctl " ACCOUNTCTL_VERSION "\n"};
  const auto& command = commandOf(options);
  tools::Session session{options};
  try {
    return (options.file ? command.runOnFile : command.run)(session, options.arguments, options);
  } catch (const accountsettings::AssertionFailure& failure) {
    throw Failure{ExitStatus::faultyInstallation, failure.what()};
  }
}

}  // namespace

int main(int count, char** arguments) {
  const auto obey = [](std::span<const char* const> words) {
    const auto outcome = perform(words);
    if (!commandline::print(outcome.output)) throw Failure{ExitStatus::failed, "the output could not be written"};
    return static_cast<int>(outcome.status);
  };
  return commandline::runProgram(kProgram, {arguments, static_cast<std::size_t>(count)},
                                 static_cast<int>(ExitStatus::failed), obey);
}
