#include "platform/linux/logs/bus/system_bus.h"

#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <string_view>

namespace platform {
namespace {

using Clock = std::chrono::steady_clock;
using std::chrono::microseconds;

constexpr microseconds kPatience = std::chrono::seconds{1};
constexpr const char* kSocket = "/run/dbus/system_bus_socket";

// Whether the bus has taken or sent something, or may still do so before the end.
bool makesProgress(const BusLibrary& library, sd_bus& bus, Clock::time_point end) {
  const int progress = library.process(&bus, nullptr);
  if (progress != 0) return progress > 0;
  const auto left = std::chrono::duration_cast<microseconds>(end - Clock::now());
  return left.count() > 0 && library.wait(&bus, static_cast<std::uint64_t>(left.count())) >= 0;
}

// An address of the environment may name a program to start in place of a socket, with this process's rights.
bool mayBeThere() {
  const char* const address = ::secure_getenv("DBUS_SYSTEM_BUS_ADDRESS");
  if (address == nullptr) return ::access(kSocket, F_OK) == 0;
  return std::string_view{address}.find("exec:") == std::string_view::npos;
}

}  // namespace

void SystemBusCloser::operator()(sd_bus* bus) const { busLibrary()->closeUnref(bus); }

SystemBusConnection openSystemBus() {
  const BusLibrary* const library = mayBeThere() ? busLibrary() : nullptr;
  sd_bus* opened = nullptr;
  if (library == nullptr || library->openSystem(&opened) < 0) return nullptr;
  SystemBusConnection bus{opened};
  const Clock::time_point end = Clock::now() + kPatience;
  int isReady = 0;
  while ((isReady = library->isReady(bus.get())) == 0) {
    if (!makesProgress(*library, *bus, end)) return nullptr;
  }
  return isReady > 0 ? std::move(bus) : nullptr;
}

}  // namespace platform
