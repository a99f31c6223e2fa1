#pragma once

#include <functional>
#include <map>
#include <string>
#include <vector>

#include "platform/linux/logs/bus/system_bus.h"

namespace tests {

// Hears every signal of one interface on the system bus, from its making on.
class BusSubscriber {
 public:
  BusSubscriber(std::string path, std::string interface);
  BusSubscriber(const BusSubscriber&) = delete;
  BusSubscriber& operator=(const BusSubscriber&) = delete;
  ~BusSubscriber();

  // Everything that was sent until now, each signal as its member and its arguments: the bus keeps the order of what it
  // is sent, so a last signal of the subscriber's own comes after all of it. Arguments are divided by blanks; a
  // dictionary's entries are in the order of their keys, `key value; key value`, and a list's elements end in commas.
  const std::vector<std::string>& heard();

 private:
  static int hear(sd_bus_message* message, void* subscriber, sd_bus_error* error);

  std::string _path;
  std::string _interface;
  platform::SystemBusConnection _bus;
  sd_bus_slot* _slot = nullptr;
  std::vector<std::string> _heard;
  bool _heardLast = false;
};

}  // namespace tests
