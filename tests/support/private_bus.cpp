#include "tests/support/private_bus.h"

#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <stdexcept>

namespace tests {
namespace {

std::string newDirectory() {
  std::string name = std::filesystem::temp_directory_path() / "bus-XXXXXX";
  if (::mkdtemp(name.data()) == nullptr) throw std::runtime_error{"no directory for a bus"};
  return name;
}

std::string configurationOf(const std::string& socket) {
  return "<busconfig><type>system</type><listen>unix:path=" + socket +
         "</listen><auth>EXTERNAL</auth><policy context=\"default\"><allow user=\"*\"/>"
         "<allow send_destination=\"*\"/><allow receive_sender=\"*\"/><allow own=\"*\"/></policy></busconfig>\n";
}

}  // namespace

PrivateBus::PrivateBus() : _directory{newDirectory()} {
  std::ofstream{configuration()} << configurationOf(socket());
  ::setenv("DBUS_SYSTEM_BUS_ADDRESS", ("unix:path=" + socket()).c_str(), 1);
  start();
}

PrivateBus::~PrivateBus() {
  stop();
  std::error_code ignored;
  std::filesystem::remove(configuration(), ignored);
  std::filesystem::remove(_directory, ignored);
}

// The daemon prints its address once it listens.
void PrivateBus::start() {
  std::array<int, 2> ends{};
  if (::pipe(ends.data()) != 0) throw std::runtime_error{"no pipe"};
  const std::string option = "--config-file=" + configuration();
  _daemon = ::fork();
  if (_daemon == 0) {
    ::dup2(ends[1], STDOUT_FILENO);
    ::execlp("dbus-daemon", "dbus-daemon", option.c_str(), "--nofork", "--nosyslog", "--print-address", nullptr);
    ::_exit(1);
  }
  ::close(ends[1]);
  char letter = 0;
  const bool listens = ::read(ends[0], &letter, 1) == 1;
  ::close(ends[0]);
  if (!listens) throw std::runtime_error{"no dbus-daemon"};
}

void PrivateBus::stop() {
  if (_daemon <= 0) return;
  ::kill(_daemon, SIGKILL);
  ::waitpid(_daemon, nullptr, 0);
  _daemon = -1;
  std::error_code ignored;
  std::filesystem::remove(socket(), ignored);
}

}  // namespace tests
