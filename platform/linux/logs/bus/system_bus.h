#pragma once

#include <memory>

#include "platform/linux/logs/bus/bus_library.h"

namespace platform {

struct SystemBusCloser {
  void operator()(sd_bus* bus) const;
};

// A connection to the system bus, closed with its owner; what the kernel has taken of it by then still arrives.
using SystemBusConnection = std::unique_ptr<sd_bus, SystemBusCloser>;

// A connection over which messages go at once. Null where there is no bus or no library to speak to it, where
// DBUS_SYSTEM_BUS_ADDRESS names a transport that starts a program, or where the bus does not answer within a second:
// its socket may well be there before its daemon is (early in the start of a device), and a connection that simply
// waited for the answer would then wait for minutes.
[[nodiscard]] SystemBusConnection openSystemBus();

}  // namespace platform
