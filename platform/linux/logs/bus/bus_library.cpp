#include "platform/linux/logs/bus/bus_library.h"

#include <dlfcn.h>

#include <optional>

namespace platform {
namespace {

constexpr const char* kFile = "libsystemd.so.0";

// Finds functions by their names; one that is not there is remembered.
class Finder {
 public:
  explicit Finder(void* library) : _library{library} {}

  template <typename Function>
  void find(const char* name, Function& function) {
    function = reinterpret_cast<Function>(::dlsym(_library, name));
    _hasAll = _hasAll && function != nullptr;
  }
  [[nodiscard]] bool hasAll() const { return _hasAll; }

 private:
  void* _library;
  bool _hasAll = true;
};

std::optional<BusLibrary> openLibrary() {
  void* const library = ::dlopen(kFile, RTLD_NOW | RTLD_LOCAL | RTLD_NODELETE);
  if (library == nullptr) return std::nullopt;
  Finder finder{library};
  BusLibrary functions{};
  finder.find("sd_bus_open_system", functions.openSystem);
  finder.find("sd_bus_close_unref", functions.closeUnref);
  finder.find("sd_bus_is_ready", functions.isReady);
  finder.find("sd_bus_process", functions.process);
  finder.find("sd_bus_wait", functions.wait);
  finder.find("sd_bus_send", functions.send);
  finder.find("sd_bus_call", functions.call);
  finder.find("sd_bus_emit_signal", functions.emitSignal);
  finder.find("sd_bus_message_new_signal", functions.newSignal);
  finder.find("sd_bus_message_new_method_call", functions.newMethodCall);
  finder.find("sd_bus_message_unref", functions.unref);
  finder.find("sd_bus_message_open_container", functions.openContainer);
  finder.find("sd_bus_message_close_container", functions.closeContainer);
  finder.find("sd_bus_message_append_basic", functions.appendBasic);
  return finder.hasAll() ? std::optional{functions} : std::nullopt;
}

}  // namespace

const BusLibrary* busLibrary() {
  static const std::optional<BusLibrary> kLibrary = openLibrary();
  return kLibrary ? &*kLibrary : nullptr;
}

}  // namespace platform
