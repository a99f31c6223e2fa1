// The notices on a real bus, a private one, with a real subscriber.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sdbus-c++/sdbus-c++.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <array>
#include <chrono>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <thread>

#include "platform/linux/linux_platform.h"
#include "tests/support/fake_platform.h"
#include "tests/support/private_bus.h"
#include "tests/support/scratch_directory.h"

namespace tests {
namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;

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

TEST(Notices, StartNoProgramInPlaceOfABus) {
  const ScratchDirectory scratch;
  const std::string started = (scratch / "started").string();
  for (const char* const before : {"", "unix:path=/nonexistent/bus;"}) {
    const std::string address = std::string{before} + "unixexec:path=/usr/bin/touch,argv1=" + started;
    ::setenv("DBUS_SYSTEM_BUS_ADDRESS", address.c_str(), 1);
    platform::makeLinuxPlatform().cloudTabs->post(true);
    EXPECT_FALSE(std::filesystem::exists(started)) << address;
  }
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
