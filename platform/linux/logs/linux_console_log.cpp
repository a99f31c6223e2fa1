#include "platform/linux/logs/logs_and_notices.h"

#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <ctime>
#include <exception>

#include "platform/characters.h"
#include "platform/linux/files/file_access.h"

namespace platform {
namespace {

// Keeps a broken pipe from raising its signal in this thread.
class BrokenPipeGuard {
 public:
  BrokenPipeGuard() {
    ::sigemptyset(&_brokenPipe);
    ::sigaddset(&_brokenPipe, SIGPIPE);
    sigset_t pending{};
    ::sigpending(&pending);
    _wasPending = ::sigismember(&pending, SIGPIPE) == 1;
    ::pthread_sigmask(SIG_BLOCK, &_brokenPipe, &_before);
  }
  BrokenPipeGuard(const BrokenPipeGuard&) = delete;
  BrokenPipeGuard& operator=(const BrokenPipeGuard&) = delete;
  ~BrokenPipeGuard() {
    const timespec now{};
    while (!_wasPending && ::sigtimedwait(&_brokenPipe, nullptr, &now) < 0 && errno == EINTR) {
    }
    ::pthread_sigmask(SIG_SETMASK, &_before, nullptr);
  }

 private:
  sigset_t _brokenPipe{};
  sigset_t _before{};
  bool _wasPending = false;
};

class StandardErrorLog final : public ConsoleLog {
 public:
  void write(std::string_view message) noexcept override {
    try {
      const std::string line = singleLine(message) + "\n";
      const BrokenPipeGuard guard;
      static_cast<void>(writeAll(STDERR_FILENO, line.data(), line.size()));
    } catch (const std::exception&) {
      return;
    }
  }
};

}  // namespace

std::shared_ptr<ConsoleLog> makeConsoleLog() { return std::make_shared<StandardErrorLog>(); }

}  // namespace platform
