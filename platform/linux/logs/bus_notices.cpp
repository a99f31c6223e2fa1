#include "platform/linux/logs/logs_and_notices.h"

#include <mutex>
#include <string>

#include "platform/linux/logs/bus/system_bus.h"

namespace platform {
namespace {

constexpr const char* kNoticesPath = "/com/vorlix/Notices";
constexpr const char* kNoticesInterface = "com.vorlix.Notices1";

}  // namespace

class SystemBus {
 public:
  // `types` is the D-Bus signature of the arguments.
  template <typename... Arguments>
  void emit(const char* member, const char* types, Arguments... arguments) {
    const std::scoped_lock lock{_guard};
    const bool wasConnected = _connection != nullptr;
    if (tryToEmit(member, types, arguments...) || !wasConnected) return;
    tryToEmit(member, types, arguments...);
  }

 private:
  template <typename... Arguments>
  bool tryToEmit(const char* member, const char* types, Arguments... arguments) {
    if (_connection == nullptr) _connection = openSystemBus();
    if (_connection == nullptr) return false;
    const int sent =
        busLibrary()->emitSignal(_connection.get(), kNoticesPath, kNoticesInterface, member, types, arguments...);
    if (sent < 0) _connection.reset();
    return sent >= 0;
  }

  std::mutex _guard;
  SystemBusConnection _connection;
};

namespace {

class BusPreferencesChangedNotice final : public PreferencesChangedNotice {
 public:
  explicit BusPreferencesChangedNotice(std::shared_ptr<SystemBus> bus) : _bus{std::move(bus)} {}
  void post(std::string_view domain, std::string_view key) override {
    _bus->emit("PreferencesChanged", "ss", std::string{domain}.c_str(), std::string{key}.c_str());
  }

 private:
  std::shared_ptr<SystemBus> _bus;
};

class BusCloudTabsNotice final : public CloudTabsNotice {
 public:
  explicit BusCloudTabsNotice(std::shared_ptr<SystemBus> bus) : _bus{std::move(bus)} {}
  void post(bool enabled) override { _bus->emit("CloudTabs", "b", enabled ? 1 : 0); }

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
