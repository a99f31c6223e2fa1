#include <sys/prctl.h>

#include "commandline/program.h"
#include "host/options.h"
#include "host/rehearsal_server.h"
#include "host/run.h"
#include "host/say.h"

namespace {

host::ExitStatus obey(std::span<const char* const> arguments) {
  const auto asked = host::parseArguments(arguments);
  if (const auto* const options = std::get_if<host::Options>(&asked)) {
    return options->isServer ? host::serveRehearsals(*options) : host::run(*options);
  }
  static_cast<void>(commandline::print(std::get<host::Answer>(asked).text));
  return host::ExitStatus::migrated;
}

}  // namespace

int main(int count, char** arguments) {
#ifndef __SANITIZE_ADDRESS__
  // Neither a core file nor another process of the same user gets at the passwords in memory. The search for leaks of a
  // sanitizer has to.
  ::prctl(PR_SET_DUMPABLE, 0, 0, 0, 0);
#endif
  return commandline::runProgram(host::kProgram, {arguments, static_cast<std::size_t>(count)},
                                 static_cast<int>(host::ExitStatus::notMigrated),
                                 [](auto given) { return static_cast<int>(obey(given)); });
}
