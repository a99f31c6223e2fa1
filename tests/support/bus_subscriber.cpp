#include "tests/support/bus_subscriber.h"

#include <chrono>
#include <cstdint>
#include <stdexcept>

namespace tests {
namespace {

using Clock = std::chrono::steady_clock;

constexpr const char* kLast = "Last";
constexpr std::uint64_t kWaitInMicroseconds = 100'000;

std::string readNext(sd_bus_message& message);

// Goes through the elements of the container at which the message stands.
template <typename Each>
void readContainer(sd_bus_message& message, char kind, const char* contents, const Each& each) {
  ::sd_bus_message_enter_container(&message, kind, contents);
  while (::sd_bus_message_at_end(&message, 0) == 0) each();
  ::sd_bus_message_exit_container(&message);
}

std::string readDictionary(sd_bus_message& message) {
  std::map<std::string, std::string> entries;
  readContainer(message, SD_BUS_TYPE_ARRAY, "{sv}", [&] {
    readContainer(message, SD_BUS_TYPE_DICT_ENTRY, "sv", [&] {
      const std::string key = readNext(message);
      entries[key] = readNext(message);
    });
  });
  std::string text;
  for (const auto& [key, value] : entries) text += (text.empty() ? "" : "; ") + key + " " + value;
  return text;
}

std::string readArray(sd_bus_message& message, const char* contents) {
  if (std::string_view{contents} == "{sv}") return readDictionary(message);
  const std::string divider = std::string_view{contents} == "s" ? "," : "";
  std::string text;
  readContainer(message, SD_BUS_TYPE_ARRAY, contents, [&] { text += readNext(message) + divider; });
  return text;
}

std::string readBasic(sd_bus_message& message, char kind) {
  if (kind == SD_BUS_TYPE_STRING) {
    const char* text = nullptr;
    ::sd_bus_message_read_basic(&message, kind, &text);
    return text == nullptr ? "?" : text;
  }
  std::int32_t number = 0;  // a boolean has the same size
  ::sd_bus_message_read_basic(&message, kind, &number);
  return std::to_string(number);
}

std::string readNext(sd_bus_message& message) {
  char kind = 0;
  const char* contents = nullptr;
  if (::sd_bus_message_peek_type(&message, &kind, &contents) <= 0) throw std::runtime_error{"a signal ends too early"};
  if (kind == SD_BUS_TYPE_ARRAY) return readArray(message, contents);
  if (kind != SD_BUS_TYPE_VARIANT) return readBasic(message, kind);
  std::string text;
  readContainer(message, kind, contents, [&] { text = readNext(message); });
  return text;
}

}  // namespace

BusSubscriber::BusSubscriber(std::string path, std::string interface)
    : _path{std::move(path)}, _interface{std::move(interface)}, _bus{platform::openSystemBus()} {
  if (_bus == nullptr) throw std::runtime_error{"no bus"};
  const int added =
      ::sd_bus_match_signal(_bus.get(), &_slot, nullptr, _path.c_str(), _interface.c_str(), nullptr, &hear, this);
  if (added < 0) throw std::runtime_error{"no match on the bus"};
}

BusSubscriber::~BusSubscriber() { ::sd_bus_slot_unref(_slot); }

const std::vector<std::string>& BusSubscriber::heard() {
  _heardLast = false;
  ::sd_bus_emit_signal(_bus.get(), _path.c_str(), _interface.c_str(), kLast, "");
  const auto end = Clock::now() + std::chrono::seconds{30};
  while (!_heardLast && Clock::now() < end) {
    if (::sd_bus_process(_bus.get(), nullptr) == 0) ::sd_bus_wait(_bus.get(), kWaitInMicroseconds);
  }
  if (!_heardLast) throw std::runtime_error{"the bus lost a signal"};
  return _heard;
}

int BusSubscriber::hear(sd_bus_message* message, void* subscriber, sd_bus_error*) {
  auto& self = *static_cast<BusSubscriber*>(subscriber);
  const std::string member = ::sd_bus_message_get_member(message);
  if (member == kLast) {
    self._heardLast = true;
    return 0;
  }
  std::string text = member;
  while (::sd_bus_message_at_end(message, 1) == 0) text += " " + readNext(*message);
  self._heard.push_back(text);
  return 0;
}

}  // namespace tests
