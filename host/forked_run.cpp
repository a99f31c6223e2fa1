#include "host/forked_run.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <climits>
#include <cmath>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <iostream>

#include "platform/linux/files/descriptor.h"

namespace host {
namespace {

using Clock = std::chrono::steady_clock;
using platform::Descriptor;
using platform::Status;
using Stopped = ForkedRun::Stopped;

constexpr std::size_t kMaxErrors = std::size_t{1} << 20;
constexpr double kSecondsToEnd = 1;  // after its last word
constexpr int kMillisecondsToGather = 10;

struct Pipe {
  Descriptor reader;
  Descriptor writer;

  [[nodiscard]] bool open() {
    std::array<int, 2> ends{};
    if (::pipe2(ends.data(), O_CLOEXEC) != 0 || ::fcntl(ends[0], F_SETFL, O_NONBLOCK) != 0) return false;
    reader = Descriptor{ends[0]};
    writer = Descriptor{ends[1]};
    return true;
  }
};

void limit(__rlimit_resource resource, rlim_t most) {
  const rlimit both{.rlim_cur = most, .rlim_max = most};
  static_cast<void>(::setrlimit(resource, &both));
}

[[noreturn]] void workAsChild(pid_t parent, const std::function<int()>& work, const RunLimits& limits, int output,
                              int errors) {
  ::prctl(PR_SET_PDEATHSIG, SIGKILL, 0, 0, 0);
  if (::getppid() != parent) std::_Exit(EXIT_FAILURE);
  ::setsid();
  const int nothing = ::open("/dev/null", O_RDONLY | O_CLOEXEC);
  if (nothing < 0 || ::dup2(nothing, STDIN_FILENO) < 0 || ::dup2(output, STDOUT_FILENO) < 0 ||
      ::dup2(errors, STDERR_FILENO) < 0 || ::close_range(STDERR_FILENO + 1, UINT_MAX, 0) != 0) {
    std::_Exit(EXIT_FAILURE);
  }
  limit(RLIMIT_CORE, 0);
  if (limits.seconds) limit(RLIMIT_CPU, static_cast<rlim_t>(*limits.seconds) + 1);
  if (limits.memory) limit(RLIMIT_AS, *limits.memory);
  const int status = work();
  std::cout.flush();
  std::fflush(nullptr);
  std::_Exit(status);  // nothing is given back that ends with the process anyway, and would be copied for that
}

// One child from its beginning to its end.
class Child {
 public:
  Child(pid_t number, Pipe output, Pipe errors, const RunLimits& limits, std::optional<int> listener)
      : _number{number},
        _end{static_cast<int>(::syscall(SYS_pidfd_open, number, 0))},
        _output{std::move(output.reader)},
        _errors{std::move(errors.reader)},
        _limits{limits},
        _listener{listener.value_or(-1)} {}

  // Answers whether there is still somebody to tell. This process is not woken by each line, but takes what has
  // gathered now and then: first when the child ends, as most soon do, and then while there is output to come.
  [[nodiscard]] bool hearOut() {
    const Descriptor* heard = &_end;
    while (_run.stopped == Stopped::no && (_output.isOpen() || _errors.isOpen())) {
      std::array<pollfd, 2> ready{{{heard->number(), POLLIN, 0}, {_listener, 0, 0}}};
      const int left = millisecondsLeft();
      const int count = ::poll(ready.data(), ready.size(), std::min(left, kMillisecondsToGather));
      if (count < 0 && errno == EINTR) continue;
      if (count < 0 || left == 0) _run.stopped = Stopped::timeout;
      if (ready[1].revents != 0) return false;
      take(_output, _run.output, SIZE_MAX);
      take(_errors, _run.errors, kMaxErrors);
      if (_limits.output && _run.output.size() > *_limits.output) _run.stopped = Stopped::tooMuchOutput;
      heard = _output.isOpen() ? &_output : &_errors;
    }
    return true;
  }

  [[nodiscard]] ForkedRun end(double secondsToEnd) {
    if (pollfd ended{_end.number(), POLLIN, 0}; secondsToEnd > 0 && ended.fd >= 0) {
      ::poll(&ended, 1, static_cast<int>(secondsToEnd * 1000));
    }
    if (::kill(-_number, SIGKILL) != 0) ::kill(_number, SIGKILL);  // it may have no session yet
    int status = 0;
    rusage usage{};
    while (::wait4(_number, &status, 0, &usage) < 0 && errno == EINTR) continue;
    _run.status = WIFSIGNALED(status) ? -WTERMSIG(status) : WEXITSTATUS(status);
    _run.seconds = seconds();
    _run.processorSeconds = secondsIn(usage.ru_utime) + secondsIn(usage.ru_stime);
    _run.peakMemory = static_cast<std::uint64_t>(usage.ru_maxrss) * 1024;
    return std::move(_run);
  }

  [[nodiscard]] bool wasStopped() const { return _run.stopped != Stopped::no; }

 private:
  [[nodiscard]] double seconds() const { return std::chrono::duration<double>{Clock::now() - _begun}.count(); }
  [[nodiscard]] static double secondsIn(const timeval& time) {
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) / 1e6;
  }

  [[nodiscard]] int millisecondsLeft() const {
    if (!_limits.seconds) return INT_MAX;
    return static_cast<int>(std::clamp(std::ceil((*_limits.seconds - seconds()) * 1000), 0.0, double{INT_MAX}));
  }

  // What is there.
  static void take(Descriptor& from, std::string& text, std::size_t most) {
    if (!from.isOpen()) return;
    std::array<char, std::size_t{1} << 16> block;  // NOLINT(cppcoreguidelines-pro-type-member-init): read fills it
    const ssize_t count = ::read(from.number(), block.data(), block.size());
    if (count > 0) {
      text.append(block.data(), std::min(static_cast<std::size_t>(count), most - text.size()));
    } else if (count == 0 || (errno != EINTR && errno != EAGAIN)) {
      from = Descriptor{};
    }
  }

  pid_t _number;
  Clock::time_point _begun = Clock::now();
  Descriptor _end;
  Descriptor _output;
  Descriptor _errors;
  RunLimits _limits;
  int _listener;  // -1 is nobody, which poll passes over
  ForkedRun _run;
};

}  // namespace

platform::Result<ForkedRun> runForked(const std::function<int()>& work, const RunLimits& limits,
                                      std::optional<int> listener) {
  Pipe output;
  Pipe errors;
  if (!output.open() || !errors.open()) return Status::failure(errno, "make a pipe");
  std::fflush(nullptr);  // what is buffered here is not the child's to say
  const pid_t parent = ::getpid();
  const pid_t number = ::fork();
  if (number < 0) return Status::failure(errno, "make a process");
  if (number == 0) workAsChild(parent, work, limits, output.writer.number(), errors.writer.number());
  output.writer = Descriptor{};
  errors.writer = Descriptor{};
  Child child{number, std::move(output), std::move(errors), limits, listener};
  const bool isHeard = child.hearOut();
  ForkedRun run = child.end(child.wasStopped() || !isHeard ? 0 : kSecondsToEnd);
  if (!isHeard) return Status::failure(EPIPE, "tell how the run ended");
  return run;
}

}  // namespace host
