// The notices on a real bus, a private one, with a real subscriber.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sdbus-c++/sdbus-c++.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <thread>

#include "platform/linux/linux_platform.h"
#include "tests/support/fake_platform.h"
#include "tests/support/scratch_directory.h"

namespace tests {
namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;

constexpr const char* configuration = R"(<busconfig>
  <type>system</type>
  <listen>unix:path=%s</listen>
  <auth>EXTERNAL</auth>
  <policy context="default">
    <allow user="*"/>
    <allow send_destination="*"/>
    <allow receive_sender="*"/>
    <allow own="*"/>
  </policy>
</busconfig>
)";

// A bus daemon of the test's own, which is the process's system bus.
class PrivateBus {
 public:
  PrivateBus() {
    std::array<char, 1024> text{};
    std::snprintf(text.data(), text.size(), configuration, (_scratch / "bus").c_str());
    _scratch.put("bus.conf", text.data());
    start();
    ::setenv("DBUS_SYSTEM_BUS_ADDRESS", ("unix:path=" + (_scratch / "bus").string()).c_str(), 1);
  }
  PrivateBus(const PrivateBus&) = delete;
  PrivateBus& operator=(const PrivateBus&) = delete;
  ~PrivateBus() { stop(); }

  // Answers once the daemon takes connections.
  void start() {
    std::array<int, 2> ends{};
    ASSERT_EQ(::pipe(ends.data()), 0);
    _daemon = ::fork();
    if (_daemon == 0) {
      ::dup2(ends[1], STDOUT_FILENO);
      const std::string file = "--config-file=" + (_scratch / "bus.conf").string();
      ::execlp("dbus-daemon", "dbus-daemon", file.c_str(), "--nofork", "--nosyslog", "--print-address", nullptr);
      ::_exit(1);
    }
    ::close(ends[1]);
    char letter = 0;
    ASSERT_EQ(::read(ends[0], &letter, 1), 1) << "no dbus-daemon";
    ::close(ends[0]);
  }
  void stop() {
    if (_daemon <= 0) return;
    ::kill(_daemon, SIGKILL);
    ::waitpid(_daemon, nullptr, 0);
    _daemon = -1;
    std::filesystem::remove(_scratch / "bus");
  }

 private:
  ScratchDirectory _scratch;
  pid_t _daemon = -1;
};

// Hears every signal of the notices' interface.
class Subscriber {
 public:
  Subscriber() : _connection{sdbus::createSystemBusConnection()} {
    _slot = _connection->addMatch("type='signal',path='/com/vorlix/Notices',interface='com.vorlix.Notices1'",
                                  [this](sdbus::Message& message) { hear(message); });
  }

  // What was heard, once there are so many notices or the time is over.
  const std::vector<std::string>& heard(std::size_t count) {
    const auto end = std::chrono::steady_clock::now() + 5s;
    while (_heard.size() < count && std::chrono::steady_clock::now() < end) {
      if (!_connection->processPendingRequest()) std::this_thread::sleep_for(5ms);
    }
    return _heard;
  }

 private:
  void hear(sdbus::Message& message) {
    if (message.getMemberName() == "CloudTabs") {
      bool enabled = false;
      message >> enabled;
      _heard.emplace_back(enabled ? "tabs on" : "tabs off");
    } else {
      std::string domain;
      std::string key;
      message >> domain >> key;
      _heard.push_back(message.getMemberName() + " " + domain + " " + key);
    }
  }

  std::unique_ptr<sdbus::IConnection> _connection;
  sdbus::Slot _slot;
  std::vector<std::string> _heard;
};

TEST(Notices, AreSignalsOnTheSystemBus) {
  const PrivateBus bus;
  Subscriber subscriber;
  const auto device = platform::makeLinuxPlatform();
  device.preferencesChanged->post("com.vorlix.mobilemail", "MailAccounts");
  device.cloudTabs->post(true);
  device.cloudTabs->post(false);
  EXPECT_THAT(subscriber.heard(3),
              ElementsAre("PreferencesChanged com.vorlix.mobilemail MailAccounts", "tabs on", "tabs off"));
}

TEST(Notices, ArriveAlthoughTheirSenderEndsAtOnce) {
  const PrivateBus bus;
  Subscriber subscriber;
  const pid_t sender = ::fork();
  if (sender == 0) {
    platform::makeLinuxPlatform().cloudTabs->post(true);
    ::_exit(0);
  }
  ::waitpid(sender, nullptr, 0);
  EXPECT_THAT(subscriber.heard(1), ElementsAre("tabs on"));
}

TEST(Notices, ArriveOnABusThatWasStartedAgain) {
  PrivateBus bus;
  const auto device = platform::makeLinuxPlatform();
  device.cloudTabs->post(false);
  bus.stop();
  device.cloudTabs->post(false);
  bus.start();
  Subscriber subscriber;
  device.cloudTabs->post(true);
  EXPECT_THAT(subscriber.heard(1), ElementsAre("tabs on"));
}

TEST(Notices, ArriveOnABusThatWasStartedAgainSinceTheLast) {
  PrivateBus bus;
  const auto device = platform::makeLinuxPlatform();
  device.cloudTabs->post(false);
  bus.stop();
  bus.start();
  Subscriber subscriber;
  device.cloudTabs->post(true);
  EXPECT_THAT(subscriber.heard(1), ElementsAre("tabs on"));
}

TEST(Notices, AreLostWithoutABus) {
  ::setenv("DBUS_SYSTEM_BUS_ADDRESS", "unix:path=/nonexistent/bus", 1);
  const auto device = platform::makeLinuxPlatform();
  const auto start = std::chrono::steady_clock::now();
  EXPECT_NO_THROW(device.cloudTabs->post(true));
  EXPECT_NO_THROW(device.preferencesChanged->post("domain", "key"));
  EXPECT_LT(std::chrono::steady_clock::now() - start, 1s);
}

TEST(Notices, AreLostOnABusThatDoesNotAnswer) {
  const ScratchDirectory scratch;
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strncpy(static_cast<char*>(address.sun_path), (scratch / "bus").c_str(), sizeof address.sun_path - 1);
  const int silent = ::socket(AF_UNIX, SOCK_STREAM, 0);
  ASSERT_EQ(::bind(silent, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
  ASSERT_EQ(::listen(silent, 8), 0);
  ::setenv("DBUS_SYSTEM_BUS_ADDRESS", ("unix:path=" + (scratch / "bus").string()).c_str(), 1);
  const auto start = std::chrono::steady_clock::now();
  platform::makeLinuxPlatform().cloudTabs->post(true);
  EXPECT_LT(std::chrono::steady_clock::now() - start, 5s);
  ::close(silent);
}

TEST(Notices, ThatNoMessageCanCarryAreLost) {
  const PrivateBus bus;
  const auto device = platform::makeLinuxPlatform();
  EXPECT_NO_THROW(device.preferencesChanged->post("not \xff text", "key"));
  Subscriber subscriber;
  device.cloudTabs->post(true);
  EXPECT_THAT(subscriber.heard(1), ElementsAre("tabs on"));
}

TEST(Notices, OfTheTestsAreKeptInTheirOrder) {
  Outputs outputs;
  FakePreferencesChangedNotice{outputs}.post("domain", "key");
  FakeCloudTabsNotice{outputs}.post(false);
  EXPECT_THAT(outputs, ElementsAre("preferences domain key", "tabs off"));
}

}  // namespace
}  // namespace tests
