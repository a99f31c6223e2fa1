#include <csignal>
#include <cstdio>
#include <exception>
#include <span>

#include "host/options.h"
#include "host/run.h"
#include "host/say.h"

namespace {

// A reader that went away and a file that may not grow are failed writes, not the end of a half-done migration.
void surviveFailedWrites() {
  std::signal(SIGPIPE, SIG_IGN);
  std::signal(SIGXFSZ, SIG_IGN);
}

host::ExitStatus print(const host::Answer& answer) {
  if (answer.isWrongUse) {
    host::say(answer.text);
    return host::ExitStatus::wrongUse;
  }
  std::fputs(answer.text.c_str(), stdout);
  return host::ExitStatus::migrated;
}

host::ExitStatus obey(std::span<const char* const> arguments) {
  const auto asked = host::parseArguments(arguments);
  if (const auto* const answer = std::get_if<host::Answer>(&asked)) return print(*answer);
  return host::run(std::get<host::Options>(asked));
}

host::ExitStatus obeyOrSayWhy(std::span<const char* const> arguments) {
  try {
    return obey(arguments);
  } catch (const std::exception& thrown) {
    host::say(thrown.what());
  } catch (...) {
    host::say("the run ended in an unknown failure");
  }
  return host::ExitStatus::notMigrated;
}

}  // namespace

int main(int count, char** arguments) {
  surviveFailedWrites();
  const std::span<const char* const> all{arguments, static_cast<std::size_t>(count)};
  return static_cast<int>(obeyOrSayWhy(all.subspan(all.empty() ? 0 : 1)));
}
