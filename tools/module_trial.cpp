#include "tools/module_trial.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <functional>
#include <sstream>
#include <system_error>

#include "accountsettings/account_objects.h"
#include "platform/linux/files/descriptor.h"
#include "platform/platform.h"

namespace tools {
namespace {

using accountsettings::AccountClassInfo;
using platform::Descriptor;
using Clock = std::chrono::steady_clock;

constexpr std::chrono::seconds kTimeLimit{10};
constexpr rlim_t kMoreMemory = rlim_t{1} << 30;
constexpr std::size_t kMaxReportSize = std::size_t{1} << 16;

// The lines of a report: how it ended, what was found, the operations, and the last one, without which it is none.
constexpr std::string_view kAnswered = "answered";
constexpr std::string_view kAccountClass = "account class";
constexpr std::string_view kOtherClass = "other class";
constexpr std::string_view kEnd = "end";

std::string operationsOf(const AccountClassInfo& info, const std::optional<std::string>& accountType) {
  const AccountClassInfo* made = &info;
  if (accountType && info.classForAccountType) made = info.classForAccountType(*accountType);
  const std::pair<const char*, bool> all[] = {
      {"classForAccountType", info.classForAccountType != nullptr},
      {"initWithProperties", made != nullptr && made->initWithProperties != nullptr},
      {"accountWithBasicAccount", info.accountWithBasicAccount != nullptr},
      {"accountToRefreshForBasicAccount", info.accountToRefreshForBasicAccount != nullptr},
      {"loadBundleForAccountWithProperties", info.loadBundleForAccountWithProperties != nullptr},
      {"accountWillChange_forDataclass", info.accountWillChange_forDataclass != nullptr},
      {"accountDidChange_forDataclass", info.accountDidChange_forDataclass != nullptr},
      {"noteAccountChanges", info.noteAccountChanges != nullptr},
  };
  std::string lines;
  for (const auto& [name, isSet] : all) {
    if (isSet) lines += std::string{name} + "\n";
  }
  return lines;
}

// Runs the module's code. Whatever it throws ends the process, as it would end a program.
std::string reportOn(const std::string& path, const std::string& className,
                     const std::optional<std::string>& accountType) noexcept {
  const auto opened = platform::current().modules->open(path);
  if (!opened.isOk()) return opened.reason();
  const auto* const found = platform::current().classes->classNamed(className);
  const auto* const info = dynamic_cast<const AccountClassInfo*>(found);
  std::string report = std::string{kAnswered} + "\n";
  if (found != nullptr) report += std::string{info == nullptr ? kOtherClass : kAccountClass} + "\n";
  if (info != nullptr) report += operationsOf(*info, accountType);
  return report + std::string{kEnd} + "\n";
}

void limit(__rlimit_resource resource, rlim_t most) {
  const rlimit both{.rlim_cur = most, .rlim_max = most};
  static_cast<void>(::setrlimit(resource, &both));
}

// The process in which a module is tried, from its beginning to its end.
class TrialProcess {
 public:
  explicit TrialProcess(const std::function<std::string()>& work) {
    std::array<int, 2> ends{};
    if (::pipe2(ends.data(), O_CLOEXEC) != 0) throw std::system_error{errno, std::generic_category(), "make a pipe"};
    _reader = Descriptor{ends[0]};
    Descriptor writer{ends[1]};
    std::fflush(nullptr);  // what is buffered here is not the other process's to say
    const pid_t parent = ::getpid();
    _number = ::fork();
    if (_number < 0) throw std::system_error{errno, std::generic_category(), "make a process"};
    if (_number == 0) workInChild(parent, work, writer.number());
    _end = Descriptor{static_cast<int>(::syscall(SYS_pidfd_open, _number, 0))};
  }

  // What it wrote before it ended, or before its time was over.
  [[nodiscard]] std::string report() {
    std::string text;
    std::array<char, 4096> block{};
    while (isReady(_reader) && text.size() < kMaxReportSize) {
      const ssize_t count = ::read(_reader.number(), block.data(), block.size());
      if (count == 0 || (count < 0 && errno != EINTR)) break;
      if (count > 0) text.append(block.data(), static_cast<std::size_t>(count));
    }
    return text;
  }

  // Ends it, and says how it ended by itself.
  [[nodiscard]] std::string end() {
    const bool isOver = isReady(_end);
    ::kill(-_number, SIGKILL);
    ::kill(_number, SIGKILL);  // it may have no session yet
    int status = 0;
    while (::waitpid(_number, &status, 0) < 0 && errno == EINTR) continue;
    if (!isOver) return "it was not done after " + std::to_string(kTimeLimit.count()) + " seconds";
    if (WIFSIGNALED(status)) return std::string{"it ended the process by SIG"} + ::sigabbrev_np(WTERMSIG(status));
    return "it ended the process with status " + std::to_string(WEXITSTATUS(status));
  }

 private:
  [[nodiscard]] bool isReady(const Descriptor& descriptor) const {
    while (true) {
      const auto left = std::chrono::ceil<std::chrono::milliseconds>(_begun + kTimeLimit - Clock::now()).count();
      pollfd ready{descriptor.number(), POLLIN, 0};
      const int count = ::poll(&ready, 1, static_cast<int>(std::max<decltype(left)>(left, 0)));
      if (count >= 0 || errno != EINTR) return count > 0;
    }
  }

  [[noreturn]] static void workInChild(pid_t parent, const std::function<std::string()>& work, int report) {
    ::prctl(PR_SET_PDEATHSIG, SIGKILL, 0, 0, 0);
    if (::getppid() != parent) std::_Exit(EXIT_FAILURE);
    ::setsid();
    const int nothing = ::open("/dev/null", O_RDONLY | O_CLOEXEC);
    if (nothing < 0 || ::dup2(nothing, STDIN_FILENO) < 0 || ::dup2(STDERR_FILENO, STDOUT_FILENO) < 0) {
      std::_Exit(EXIT_FAILURE);
    }
    keepLimits();
    const std::string text = work();
    std::_Exit(::write(report, text.data(), text.size()) == static_cast<ssize_t>(text.size()) ? EXIT_SUCCESS
                                                                                              : EXIT_FAILURE);
  }

  static void keepLimits() {
    limit(RLIMIT_CORE, 0);
    limit(RLIMIT_CPU, static_cast<rlim_t>(kTimeLimit.count()));
    rlim_t pages = 0;
    if (std::ifstream{"/proc/self/statm"} >> pages) {
      limit(RLIMIT_AS, pages * static_cast<rlim_t>(::sysconf(_SC_PAGESIZE)) + kMoreMemory);
    }
  }

  Clock::time_point _begun = Clock::now();
  Descriptor _reader;
  pid_t _number = -1;
  Descriptor _end;
};

}  // namespace

ModuleTrial tryModule(const std::string& path, const std::string& className,
                      const std::optional<std::string>& accountType) {
  TrialProcess process{[&] { return reportOn(path, className, accountType); }};
  std::istringstream report{process.report()};
  ModuleTrial trial;
  trial.why = process.end();
  std::string line;
  if (!std::getline(report, line)) return trial;
  if (line != kAnswered) {
    trial.ended = ModuleTrial::Ended::notOpened;
    trial.why = report.str();
    return trial;
  }
  while (std::getline(report, line) && line != kEnd) {
    if (line == kAccountClass) {
      trial.found = ModuleTrial::Found::accountClass;
    } else if (line == kOtherClass) {
      trial.found = ModuleTrial::Found::otherClass;
    } else {
      trial.answers.push_back(line);
    }
  }
  if (line == kEnd) trial.ended = ModuleTrial::Ended::answered;
  return trial;
}

}  // namespace tools
