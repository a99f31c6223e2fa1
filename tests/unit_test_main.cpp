// The program of a folder's unit tests. Where more than one is to run, each runs in a process of its own, as under
// CTest: a process has one log handle and one set of configuration tables, which its first test leaves to all others.
#include <gmock/gmock.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <iostream>
#include <string>
#include <vector>

namespace {

using Arguments = std::vector<std::string>;

bool succeeds(Arguments arguments) {
  std::vector<char*> words;
  for (std::string& argument : arguments) words.push_back(argument.data());
  words.push_back(nullptr);
  pid_t process = 0;
  if (::posix_spawn(&process, "/proc/self/exe", nullptr, nullptr, words.data(), environ) != 0) return false;
  int status = 0;
  return ::waitpid(process, &status, 0) == process && WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

class ProcessForEachTest final : public testing::EmptyTestEventListener {
 public:
  explicit ProcessForEachTest(Arguments arguments) : _arguments{std::move(arguments)} {}

  void OnTestProgramStart(const testing::UnitTest& program) override {
    if (program.test_to_run_count() <= 1) return;
    ::unsetenv("GTEST_TOTAL_SHARDS");  // of which this process took its share
    for (int suite = 0; suite < program.total_test_suite_count(); ++suite) runEachOf(*program.GetTestSuite(suite));
    for (const std::string& name : _failed) std::cout << "[  FAILED  ] " << name << "\n";
    std::cout << _failed.size() << " of " << program.test_to_run_count() << " tests failed." << std::endl;
    std::_Exit(_failed.empty() ? 0 : 1);
  }

 private:
  void runEachOf(const testing::TestSuite& suite) {
    for (int number = 0; number < suite.total_test_count(); ++number) {
      const testing::TestInfo& test = *suite.GetTestInfo(number);
      if (test.should_run()) run(std::string{suite.name()} + "." + test.name());
    }
  }
  void run(const std::string& name) {
    Arguments arguments = _arguments;
    arguments.push_back("--gtest_filter=" + name);
    if (!succeeds(std::move(arguments))) _failed.push_back(name);
  }

  Arguments _arguments;
  Arguments _failed;
};

}  // namespace

int main(int count, char** words) {
  const Arguments arguments{words, words + count};
  testing::InitGoogleMock(&count, words);
  testing::UnitTest::GetInstance()->listeners().Append(new ProcessForEachTest{arguments});
  return RUN_ALL_TESTS();
}
