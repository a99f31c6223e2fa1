#include "tests/support/child_process.h"

#include <poll.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <csignal>
#include <stdexcept>

namespace tests {

ChildProcess::ChildProcess(const Task& task) {
  std::array<int, 2> ends{};
  if (::pipe(ends.data()) != 0) throw std::runtime_error{"no pipe"};
  _process = ::fork();
  if (_process == 0) {
    const int out = ends[1];
    task([out] { static_cast<void>(::write(out, "!", 1) == 1); });
    ::_exit(0);
  }
  ::close(ends[1]);
  _words = ends[0];
}

ChildProcess::~ChildProcess() {
  kill();
  ::close(_words);
}

bool ChildProcess::says(std::chrono::milliseconds within) const {
  pollfd words{.fd = _words, .events = POLLIN, .revents = 0};
  char word = 0;
  return ::poll(&words, 1, static_cast<int>(within.count())) == 1 && ::read(_words, &word, 1) == 1;
}

void ChildProcess::kill() {
  if (_process <= 0) return;
  ::kill(_process, SIGKILL);
  ::waitpid(_process, nullptr, 0);
  _process = -1;
}

}  // namespace tests
