#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "tools/session.h"

namespace tools {

using Words = std::vector<std::string>;

// What a command that did what it was asked leaves: what is to be printed on standard output, whole lines or nothing,
// and how the program ends.
struct Outcome {
  Outcome(std::string printed, ExitStatus ends = ExitStatus::done) : output{std::move(printed)}, status{ends} {}
  std::string output;
  ExitStatus status;
};

// One command of the program. It ends with a Failure where it cannot do what it was asked.
struct Command {
  std::string_view name;
  std::string_view arguments;  // as the help shows them
  std::string_view summary;
  std::string_view details;  // for the help on this command alone
  std::size_t minArguments;
  std::size_t maxArguments;
  Outcome (*run)(Session& session, const Words& arguments, const Options& options);
  bool changesAccounts = false;
  // What is run in place of it where --file is given; null where that makes no sense.
  Outcome (*runOnFile)(Session& session, const Words& arguments, const Options& options) = nullptr;
};

[[nodiscard]] const std::vector<Command>& commands();

// help.cpp; of the command alone where one is given beside --help.
[[nodiscard]] std::string help(const Options& options);
// The command of that name; throws WrongUse where there is none.
[[nodiscard]] const Command& commandNamed(const std::string& name);
// How the command is written: "show ID".
[[nodiscard]] std::string usageOf(const Command& command);
Outcome helpOnCommand(Session& session, const Words& arguments, const Options& options);

// file_reports.cpp; what stands elsewhere than in the device's store, as --file says.
Outcome listFile(Session& session, const Words& arguments, const Options& options);
Outcome showInFile(Session& session, const Words& arguments, const Options& options);
Outcome verifyFiles(Session& session, const Words& arguments, const Options& options);

// recover.cpp
Outcome recoverAccounts(Session& session, const Words& arguments, const Options& options);

// diff.cpp; has exit statuses of its own.
Outcome compareAccounts(Session& session, const Words& arguments, const Options& options);

// reports.cpp
Outcome listAccounts(Session& session, const Words& arguments, const Options& options);
Outcome showAccount(Session& session, const Words& arguments, const Options& options);
Outcome listTypes(Session& session, const Words& arguments, const Options& options);

// verify.cpp; ends with ExitStatus::findings where it has something to tell of the file.
Outcome verifySettings(Session& session, const Words& arguments, const Options& options);

// check_modules.cpp; ends with ExitStatus::findings where it has something to tell.
Outcome checkModules(Session& session, const Words& arguments, const Options& options);

// new_device.cpp
Outcome makeDevice(Session& session, const Words& arguments, const Options& options);

// changes.cpp; each saves the accounts.
Outcome enableDataclass(Session& session, const Words& arguments, const Options& options);
Outcome disableDataclass(Session& session, const Words& arguments, const Options& options);
Outcome renameAccount(Session& session, const Words& arguments, const Options& options);
Outcome setProperties(Session& session, const Words& arguments, const Options& options);
Outcome addAccount(Session& session, const Words& arguments, const Options& options);
Outcome removeAccount(Session& session, const Words& arguments, const Options& options);
Outcome saveAccounts(Session& session, const Words& arguments, const Options& options);

}  // namespace tools
