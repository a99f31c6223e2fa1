// The notices on a real bus, a private one, with a real subscriber.

#include <dlfcn.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <cstring>
#include <filesystem>

#include "platform/linux/linux_platform.h"
#include "tests/support/bus_subscriber.h"
#include "tests/support/fake_platform.h"
#include "tests/support/private_bus.h"
#include "tests/support/scratch_directory.h"

namespace tests {
namespace {

bool isBusLibraryGone = false;
bool isBusLibraryAskedFor = false;

}  // namespace
}  // namespace tests

// Stands in the way of the C library's own.
extern "C" [[gnu::visibility("default")]] void* dlopen(const char* file, int flags) {
  const bool isBusLibrary = file != nullptr && std::strstr(file, "libsystemd") != nullptr;
  tests::isBusLibraryAskedFor = tests::isBusLibraryAskedFor || isBusLibrary;
  if (isBusLibrary && tests::isBusLibraryGone) return nullptr;
  static const auto kOpen = reinterpret_cast<void* (*)(const char*, int)>(::dlsym(RTLD_NEXT, "dlopen"));
  return kOpen(file, flags);
}

namespace tests {
namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;

// Hears every signal of the notices' interface.
class Subscriber : public BusSubscriber {
 public:
  Subscriber() : BusSubscriber{"/com/vorlix/Notices", "com.vorlix.Notices1"} {}
};

TEST(Notices, AreSignalsOnTheSystemBus) {
  const PrivateBus bus;
  Subscriber subscriber;
  const auto device = platform::makeLinuxPlatform();
  device.preferencesChanged->post("com.vorlix.mobilemail", "MailAccounts");
  device.cloudTabs->post(true);
  device.cloudTabs->post(false);
  EXPECT_THAT(subscriber.heard(),
              ElementsAre("PreferencesChanged com.vorlix.mobilemail MailAccounts", "CloudTabs 1", "CloudTabs 0"));
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
  EXPECT_THAT(subscriber.heard(), ElementsAre("CloudTabs 1"));
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
  EXPECT_THAT(subscriber.heard(), ElementsAre("CloudTabs 1"));
}

TEST(Notices, ArriveOnABusThatWasStartedAgainSinceTheLast) {
  PrivateBus bus;
  const auto device = platform::makeLinuxPlatform();
  device.cloudTabs->post(false);
  bus.stop();
  bus.start();
  Subscriber subscriber;
  device.cloudTabs->post(true);
  EXPECT_THAT(subscriber.heard(), ElementsAre("CloudTabs 1"));
}

TEST(Notices, AreLostWithoutABus) {
  ::setenv("DBUS_SYSTEM_BUS_ADDRESS", "unix:path=/nonexistent/bus", 1);
  const auto device = platform::makeLinuxPlatform();
  const auto start = std::chrono::steady_clock::now();
  EXPECT_NO_THROW(device.cloudTabs->post(true));
  EXPECT_NO_THROW(device.preferencesChanged->post("domain", "key"));
  EXPECT_LT(std::chrono::steady_clock::now() - start, 1s);
}

// Each test has a process of its own, so nothing has opened the library before.
TEST(Notices, AreLostWithoutTheBusLibrary) {
  const PrivateBus bus;
  isBusLibraryGone = true;
  const auto device = platform::makeLinuxPlatform();
  EXPECT_NO_THROW(device.cloudTabs->post(true));
  EXPECT_NO_THROW(device.preferencesChanged->post("domain", "key"));
  EXPECT_TRUE(isBusLibraryAskedFor);
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
  EXPECT_THAT(subscriber.heard(), ElementsAre("CloudTabs 1"));
}

TEST(Notices, OfTheTestsAreKeptInTheirOrder) {
  Outputs outputs;
  FakePreferencesChangedNotice{outputs}.post("domain", "key");
  FakeCloudTabsNotice{outputs}.post(false);
  EXPECT_THAT(outputs, ElementsAre("preferences domain key", "tabs off"));
}

}  // namespace
}  // namespace tests
