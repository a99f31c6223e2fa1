#include "platform/linux/logs/bus/system_bus.h"

#include <chrono>
#include <cstdlib>
#include <string_view>

namespace platform {
namespace {

using Clock = std::chrono::steady_clock;
using std::chrono::microseconds;

constexpr microseconds kPatience = std::chrono::seconds{1};

// Whether the bus has taken or sent something, or may still do so before the end.
bool makesProgress(sd_bus& bus, Clock::time_point end) {
  const int progress = ::sd_bus_process(&bus, nullptr);
  if (progress != 0) return progress > 0;
  const auto left = std::chrono::duration_cast<microseconds>(end - Clock::now());
  return left.count() > 0 && ::sd_bus_wait(&bus, static_cast<std::uint64_t>(left.count())) >= 0;
}

// An address of the environment may name a program to start in place of a socket, with this process's rights.
bool isProgramToBeStarted() {
  const char* const address = ::secure_getenv("DBUS_SYSTEM_BUS_ADDRESS");
  return address != nullptr && std::string_view{address}.find("exec:") != std::string_view::npos;
}

}  // namespace

void SystemBusCloser::operator()(sd_bus* bus) const { ::sd_bus_close_unref(bus); }

SystemBusConnection openSystemBus() {
  if (isProgramToBeStarted()) return nullptr;
  sd_bus* opened = nullptr;
  if (::sd_bus_open_system(&opened) < 0) return nullptr;
  SystemBusConnection bus{opened};
  const Clock::time_point end = Clock::now() + kPatience;
  int isReady = 0;
  while ((isReady = ::sd_bus_is_ready(bus.get())) == 0) {
    if (!makesProgress(*bus, end)) return nullptr;
  }
  return isReady > 0 ? std::move(bus) : nullptr;
}

}  // namespace platform
