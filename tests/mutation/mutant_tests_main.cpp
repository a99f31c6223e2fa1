// The program of unit tests that are run with a mutant: `PROGRAM SECONDS TEST...` runs each of the tests, in this
// order, in a child of its own that may compute for so long, and ends with the first that fails: it writes its name and
// answers 1. A child is a copy of this process before any test, so that none sees what another one left, and none has
// to start anew.
#include <gmock/gmock.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <span>
#include <string>

namespace {

constexpr unsigned kPatience = 300;  // seconds, for a test that sleeps

[[noreturn]] void runAlone(const char* test, rlim_t seconds) {
  const rlimit limit{seconds, seconds};
  ::setrlimit(RLIMIT_CPU, &limit);
  ::alarm(kPatience);
  GTEST_FLAG_SET(filter, test);
  std::exit(RUN_ALL_TESTS());
}

bool succeeds(const char* test, rlim_t seconds) {
  const pid_t child = ::fork();
  if (child == 0) runAlone(test, seconds);
  int status = 0;
  return child > 0 && ::waitpid(child, &status, 0) == child && WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

}  // namespace

int main(int count, char** arguments) {
  testing::InitGoogleMock(&count, arguments);
  const bool isDyingForATest = !GTEST_FLAG_GET(internal_run_death_test).empty();
  if (count < 3 || isDyingForATest) return RUN_ALL_TESTS();
  const rlim_t seconds = std::strtoul(arguments[1], nullptr, 10);
  for (const char* const test : std::span{arguments, static_cast<std::size_t>(count)}.subspan(2)) {
    if (succeeds(test, seconds)) continue;
    std::fprintf(stderr, "%s\n", test);
    return 1;
  }
  return 0;
}
