#include <algorithm>
#include <csignal>
#include <cstdio>
#include <exception>
#include <iterator>
#include <span>
#include <string>
#include <string_view>

#include "accountsettings/assertion_failure.h"
#include "tools/commands.h"
#include "tools/failure.h"
#include "tools/options.h"
#include "tools/table.h"

namespace {

using tools::ExitStatus;
using tools::Failure;

constexpr std::string_view kUsageHead =
    "Usage: accountctl [OPTION]... COMMAND [ARGUMENT]...\n"
    "Reads and changes a device's accounts.\n"
    "\n";
constexpr std::string_view kUsageOptions =
    "\n"
    "  --root DIR       the root of the device's file tree (default: /)\n"
    "  --home DIR       the mobile user's home directory (default: the process's;\n"
    "                   with --root, var/mobile in it)\n"
    "  --resources DIR  the configuration, in place of the installed one\n"
    "  --modules        open the account modules under --root, too, and tell them of\n"
    "                   changes; else nobody is told of a change under another root\n"
    "  --json           print JSON\n"
    "  --help           print this text\n"
    "  --version        print the version\n"
    "\n"
    "DATACLASS is written Mail or com.vorlix.Dataclass.Mail, VALUE is a text;\n"
    "KEY:=JSON gives any other value. Credentials are never printed.\n"
    "\n"
    "Exit status: 0 done, 1 failed or findings, 2 wrong use, 3 no such account,\n"
    "4 the configuration or a module is at fault.\n";

// A reader that went away and a file that may not grow are failed writes, not the end of a half-done change.
void surviveFailedWrites() {
  std::signal(SIGPIPE, SIG_IGN);
  std::signal(SIGXFSZ, SIG_IGN);
}

void say(std::string_view message) noexcept {
  try {
    const auto line = "accountctl: " + tools::printable(message) + "\n";
    std::fwrite(line.data(), 1, line.size(), stderr);
  } catch (...) {
    std::fputs("accountctl: out of memory\n", stderr);
  }
}

std::string usage() {
  std::vector<std::vector<std::string>> rows;
  for (const auto& command : tools::commands()) {
    const auto blank = command.arguments.empty() ? "" : " ";
    rows.push_back(
        {"", std::string{command.name} + blank + std::string{command.arguments}, std::string{command.summary}});
  }
  return std::string{kUsageHead} + tools::table(rows) + std::string{kUsageOptions};
}

const tools::Command& commandOf(const tools::Options& options) {
  if (options.command.empty()) throw Failure{ExitStatus::wrongUse, "no command is given (see --help)"};
  const auto& all = tools::commands();
  const auto found = std::ranges::find(all, options.command, &tools::Command::name);
  if (found == all.end()) {
    throw Failure{ExitStatus::wrongUse, "unknown command: " + options.command + " (see --help)"};
  }
  const auto count = options.arguments.size();
  if (count < found->fewestArguments || count > found->mostArguments) {
    throw Failure{ExitStatus::wrongUse, "usage: accountctl " + options.command + (found->arguments.empty() ? "" : " ") +
                                            std::string{found->arguments}};
  }
  return *found;
}

tools::Outcome run(std::span<const char* const> arguments) {
  const auto options = tools::parseArguments(arguments);
  if (options.printsHelp) return usage();
  if (options.printsVersion) return std::string{"accountctl " ACCOUNTCTL_VERSION "\n"};
  const auto& command = commandOf(options);
  tools::Session session{options};
  return command.run(session, options.arguments, options.printsJson);
}

ExitStatus print(const tools::Outcome& outcome) {
  const auto& output = outcome.output;
  const bool isWritten = std::fwrite(output.data(), 1, output.size(), stdout) == output.size();
  if (isWritten && std::fflush(stdout) == 0) return outcome.status;
  say("the output could not be written");
  return ExitStatus::failed;
}

ExitStatus performed(std::span<const char* const> arguments) {
  try {
    return print(run(arguments));
  } catch (const Failure& failure) {
    say(failure.what());
    return failure.status();
  } catch (const accountsettings::AssertionFailure& failure) {
    say(failure.what());
    return ExitStatus::faultyInstallation;
  } catch (const std::exception& thrown) {
    say(thrown.what());
  } catch (...) {
    say("the command ended in an unknown failure");
  }
  return ExitStatus::failed;
}

}  // namespace

int main(int count, char** arguments) {
  surviveFailedWrites();
  const std::span<const char* const> all{arguments, static_cast<std::size_t>(count)};
  return static_cast<int>(performed(all.subspan(all.empty() ? 0 : 1)));
}
