#include "commandline/program.h"

#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <exception>
#include <string>

#include "commandline/ending.h"
#include "commandline/progress_line.h"
#include "commandline/text.h"

namespace commandline {
void say(std::string_view program, std::string_view line) noexcept {
  try {
    const std::string text = std::string{program} + ": " + printable(line) + "\n";
    const auto hidden = progressLine().hide();
    std::fwrite(text.data(), 1, text.size(), stderr);
  } catch (...) {
    std::fwrite(program.data(), 1, program.size(), stderr);
    std::fputs(": out of memory\n", stderr);
  }
}

bool print(std::string_view text) {
  progressLine().end();
  const bool isWritten = std::fwrite(text.data(), 1, text.size(), stdout) == text.size();
  return std::fflush(stdout) == 0 && isWritten;
}

int runProgram(std::string_view program, std::span<char* const> arguments, int failed,
               const std::function<int(std::span<const char* const>)>& work) {
  std::signal(SIGPIPE, SIG_IGN);  // a reader that went away
  std::signal(SIGXFSZ, SIG_IGN);  // a file that may not grow
  try {
    const std::span<const char* const> all{arguments.data(), arguments.size()};
    return work(all.subspan(all.empty() ? 0 : 1));
  } catch (const Ending& ending) {
    say(program, ending.what());
    if (!ending.hint().empty() && ::isatty(STDERR_FILENO) == 1) say(program, ending.hint());
    return ending.status();
  } catch (const std::exception& thrown) {
    say(program, thrown.what());
  } catch (...) {
    say(program, "ended in an unknown failure");
  }
  return failed;
}

}  // namespace commandline
