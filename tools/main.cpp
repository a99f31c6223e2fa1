#include "accountsettings/assertion_failure.h"
#include "commandline/program.h"
#include "tools/commands.h"
#include "tools/options.h"

namespace {

using tools::ExitStatus;
using tools::Failure;

constexpr std::string_view kProgram = "accountctl";

const tools::Command& commandOf(const tools::Options& options) {
  if (options.command.empty()) throw commandline::WrongUse{"no command is given"};
  const auto& command = tools::commandNamed(options.command);
  if (!options.columns.empty() && command.run != tools::listAccounts)
    throw commandline::WrongUse{"--columns is for list"};
  const auto count = options.arguments.size();
  if (count >= command.fewestArguments && count <= command.mostArguments) return command;
  throw Failure{ExitStatus::wrongUse, "usage: accountctl " + tools::usageOf(command)};
}

tools::Outcome perform(std::span<const char* const> arguments) {
  auto options = tools::parseArguments(arguments);
  if (options.printsHelp) return tools::help(options);
  if (options.printsVersion) return std::string{"accountctl " ACCOUNTCTL_VERSION "\n"};
  const auto& command = commandOf(options);
  options.device.locks = command.changesAccounts ? tools::kLocksOfWriters : tools::kLocksOfReaders;
  tools::Session session{options};
  try {
    return command.run(session, options.arguments, options);
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
