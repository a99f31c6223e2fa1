#pragma once

#include <systemd/sd-bus.h>

namespace platform {

// The functions of the bus library that the house calls. The library brings six others along, which would make the
// start of a run on a device without a bus a third longer; so nothing is linked with it.
struct BusLibrary {
  decltype(&::sd_bus_open_system) openSystem;
  decltype(&::sd_bus_close_unref) closeUnref;
  decltype(&::sd_bus_is_ready) isReady;
  decltype(&::sd_bus_process) process;
  decltype(&::sd_bus_wait) wait;
  decltype(&::sd_bus_send) send;
  decltype(&::sd_bus_call) call;
  decltype(&::sd_bus_emit_signal) emitSignal;
  decltype(&::sd_bus_message_new_signal) newSignal;
  decltype(&::sd_bus_message_new_method_call) newMethodCall;
  decltype(&::sd_bus_message_unref) unref;
  decltype(&::sd_bus_message_open_container) openContainer;
  decltype(&::sd_bus_message_close_container) closeContainer;
  decltype(&::sd_bus_message_append_basic) appendBasic;
};

// The library, opened by the first who asks and kept open. Null where the system has none, or one without one of these.
[[nodiscard]] const BusLibrary* busLibrary();

}  // namespace platform
