#include "commandline/program.h"
#include "host/options.h"
#include "host/run.h"
#include "host/say.h"

namespace {

host::ExitStatus obey(std::span<const char* const> arguments) {
  const auto asked = host::parseArguments(arguments);
  if (const auto* const options = std::get_if<host::Options>(&asked)) return host::run(*options);
  static_cast<void>(commandline::print(std::get<host::Answer>(asked).text));
  return host::ExitStatus::migrated;
}

}  // namespace

int main(int count, char** arguments) {
  return commandline::runProgram(host::kProgram, {arguments, static_cast<std::size_t>(count)},
                                 static_cast<int>(host::ExitStatus::notMigrated),
                                 [](auto given) { return static_cast<int>(obey(given)); });
}
