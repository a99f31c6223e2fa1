#pragma once

#include <sys/types.h>

#include <string>

namespace tests {

// A bus daemon of a test's own, in a directory of its own, which is the process's system bus and that of the programs
// it starts.
class PrivateBus {
 public:
  // Answers once the daemon takes connections; throws where there is no dbus-daemon.
  PrivateBus();
  PrivateBus(const PrivateBus&) = delete;
  PrivateBus& operator=(const PrivateBus&) = delete;
  ~PrivateBus();

  void start();
  void stop();

 private:
  [[nodiscard]] std::string socket() const { return _directory + "/bus"; }
  [[nodiscard]] std::string configuration() const { return _directory + "/bus.conf"; }

  const std::string _directory;
  pid_t _daemon = -1;
};

}  // namespace tests
