#include "platform/linux/bus_notices.h"

#include <sdbus-c++/sdbus-c++.h>
#include <systemd/sd-bus.h>

#include <chrono>
#include <exception>
#include <string>

namespace platform {
namespace {

constexpr const char* noticesPath = "/com/vorlix/Notices";
constexpr const char* noticesInterface = "com.vorlix.Notices1";
constexpr std::chrono::microseconds patience = std::chrono::seconds{1};

// Whether the bus takes connections now. A socket may well be there before its daemon is (early in the start of a
// device); a connection that simply waits for the answer would then wait for minutes.
bool busAnswers() {
  sd_bus* opened = nullptr;
  if (::sd_bus_open_system(&opened) < 0) return false;
  const std::unique_ptr<sd_bus, decltype(&::sd_bus_close_unref)> bus{opened, &::sd_bus_close_unref};
  const auto end = std::chrono::steady_clock::now() + patience;
  while (::sd_bus_is_ready(bus.get()) == 0) {
    const int progress = ::sd_bus_process(bus.get(), nullptr);
    if (progress < 0) return false;
    if (progress > 0) continue;
    const auto left = std::chrono::duration_cast<std::chrono::microseconds>(end - std::chrono::steady_clock::now());
    if (left.count() <= 0 || ::sd_bus_wait(bus.get(), static_cast<std::uint64_t>(left.count())) < 0) return false;
  }
  return ::sd_bus_is_ready(bus.get()) > 0;
}

}  // namespace

class SystemBus {
 public:
  template <typename... Arguments>
  void emit(const char* member, const Arguments&... arguments) noexcept {
    const bool wasConnected = _notices != nullptr;
    if (tryToEmit(member, arguments...) || !wasConnected) return;
    tryToEmit(member, arguments...);
  }

 private:
  template <typename... Arguments>
  bool tryToEmit(const char* member, const Arguments&... arguments) noexcept {
    try {
      if (!connect()) return false;
      _notices->emitSignal(member).onInterface(noticesInterface).withArguments(arguments...);
      return true;
    } catch (const std::exception&) {
      _notices = nullptr;
      _connection = nullptr;
      return false;
    }
  }

  bool connect() {
    if (_notices) return true;
    if (!busAnswers()) return false;
    _connection = sdbus::createSystemBusConnection();
    _notices = sdbus::createObject(*_connection, noticesPath);
    return true;
  }

  std::unique_ptr<sdbus::IConnection> _connection;
  std::unique_ptr<sdbus::IObject> _notices;
};

namespace {

class BusPreferencesChangedNotice final : public PreferencesChangedNotice {
 public:
  explicit BusPreferencesChangedNotice(std::shared_ptr<SystemBus> bus) : _bus{std::move(bus)} {}
  void post(std::string_view domain, std::string_view key) override {
    _bus->emit("PreferencesChanged", std::string{domain}, std::string{key});
  }

 private:
  std::shared_ptr<SystemBus> _bus;
};

class BusCloudTabsNotice final : public CloudTabsNotice {
 public:
  explicit BusCloudTabsNotice(std::shared_ptr<SystemBus> bus) : _bus{std::move(bus)} {}
  void post(bool enabled) override { _bus->emit("CloudTabs", enabled); }

 private:
  std::shared_ptr<SystemBus> _bus;
};

}  // namespace

std::shared_ptr<SystemBus> makeSystemBus() { return std::make_shared<SystemBus>(); }

std::shared_ptr<PreferencesChangedNotice> makePreferencesChangedNotice(std::shared_ptr<SystemBus> bus) {
  return std::make_shared<BusPreferencesChangedNotice>(std::move(bus));
}

std::shared_ptr<CloudTabsNotice> makeCloudTabsNotice(std::shared_ptr<SystemBus> bus) {
  return std::make_shared<BusCloudTabsNotice>(std::move(bus));
}

}  // namespace platform
