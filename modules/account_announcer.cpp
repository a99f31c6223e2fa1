// Tells every program on the device of account changes, by signals on the system bus. com.vorlix.Accounts1.xml
// describes them.

#include <chrono>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "accountsettings/account_objects.h"
#include "accountsettings/vocabulary.h"
#include "platform/linux/logs/bus/system_bus.h"

namespace modules {
namespace {

using accountsettings::AccountClassInfo;
using platform::busLibrary;
using platform::Dictionary;
using platform::PropertyValue;
using std::chrono::microseconds;

constexpr const char* kPath = "/com/vorlix/Accounts";
constexpr const char* kInterface = "com.vorlix.Accounts1";
constexpr microseconds kPatience = std::chrono::seconds{1};

struct MessageReleaser {
  void operator()(sd_bus_message* message) const { busLibrary()->unref(message); }
};
using Message = std::unique_ptr<sd_bus_message, MessageReleaser>;

// Returns once the bus has taken everything that was sent before, so that signals keep their order whoever sends the
// next one, and none is lost when the process ends.
void waitForBus(sd_bus& bus) {
  sd_bus_message* made = nullptr;
  busLibrary()->newMethodCall(&bus, &made, "org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus",
                              "GetId");
  const Message question{made};
  if (question == nullptr) return;
  sd_bus_message* reply = nullptr;
  busLibrary()->call(&bus, question.get(), static_cast<std::uint64_t>(kPatience.count()), nullptr, &reply);
  const Message released{reply};
}

// Adds a signal's arguments. After the first that cannot be added, such as a text that no message can carry, nothing
// more is.
class Arguments {
 public:
  explicit Arguments(sd_bus_message& signal) : _signal{signal} {}

  void open(char kind, const char* contents) { attempt(busLibrary()->openContainer, kind, contents); }
  void close() { attempt(busLibrary()->closeContainer); }
  void add(const std::string& text) { attempt(busLibrary()->appendBasic, SD_BUS_TYPE_STRING, text.c_str()); }
  void add(std::int32_t number) { attempt(busLibrary()->appendBasic, SD_BUS_TYPE_INT32, &number); }
  [[nodiscard]] bool areComplete() const { return _areComplete; }

 private:
  template <typename Call, typename... Given>
  void attempt(Call call, Given... given) {
    _areComplete = _areComplete && call(&_signal, given...) >= 0;
  }

  sd_bus_message& _signal;
  bool _areComplete = true;
};

// Without a bus nothing happens. A connection of its own for each signal asks nothing of the process: no event loop, no
// thread, nothing to carry over a fork or a restart of the bus.
template <typename Fill>
void announce(const char* name, const Fill& fill) try {
  const auto bus = platform::openSystemBus();
  if (bus == nullptr) return;
  sd_bus_message* made = nullptr;  // and stays so where none can be made
  busLibrary()->newSignal(bus.get(), &made, kPath, kInterface, name);
  const Message signal{made};
  if (signal == nullptr) return;
  Arguments arguments{*signal};
  fill(arguments);
  if (arguments.areComplete() && busLibrary()->send(bus.get(), signal.get(), nullptr) >= 0) waitForBus(*bus);
} catch (...) {  // NOLINT(bugprone-empty-catch): an account change never fails for want of listeners, or of memory
}

void announceDataclass(const char* name, std::string_view identifier, std::string_view dataclass) {
  const std::string texts[] = {std::string{identifier}, std::string{dataclass}};
  announce(name, [&](Arguments& arguments) {
    for (const std::string& text : texts) arguments.add(text);
  });
}

// --- Change entries ---

void addTexts(Arguments& arguments, const platform::Array& array) {
  arguments.open(SD_BUS_TYPE_VARIANT, "as");
  arguments.open(SD_BUS_TYPE_ARRAY, "s");
  for (const PropertyValue& element : array) {
    if (const auto* const text = element.asText()) arguments.add(text->string());
  }
  arguments.close();
  arguments.close();
}

template <typename Value>
void addVariant(Arguments& arguments, const char* kind, const Value& value) {
  arguments.open(SD_BUS_TYPE_VARIANT, kind);
  arguments.add(value);
  arguments.close();
}

// Values of other types than the interface promises are not passed on.
void addEntry(Arguments& arguments, const Dictionary& change) {
  arguments.open(SD_BUS_TYPE_ARRAY, "{sv}");
  for (const auto& [key, value] : change) {
    const auto* const text = value.asText();
    const auto* const array = value.asArray();
    if (text == nullptr && array == nullptr && !value.asInteger()) continue;
    arguments.open(SD_BUS_TYPE_DICT_ENTRY, "sv");
    arguments.add(key.string());
    if (text != nullptr) addVariant(arguments, "s", text->string());
    if (array != nullptr) addTexts(arguments, *array);
    if (const auto integer = value.asInteger()) addVariant(arguments, "i", static_cast<std::int32_t>(integer->bits));
    arguments.close();
  }
  arguments.close();
}

void noteAccountChanges(const std::vector<Dictionary>& changes) {
  announce("AccountsChanged", [&](Arguments& arguments) {
    arguments.open(SD_BUS_TYPE_ARRAY, "a{sv}");
    for (const Dictionary& change : changes) addEntry(arguments, change);
    arguments.close();
  });
}

std::shared_ptr<const AccountClassInfo> announcer() {
  auto info = std::make_shared<AccountClassInfo>("AccountAnnouncer");
  info->accountWillChange_forDataclass = [](std::string_view identifier, std::string_view dataclass) {
    announceDataclass("AccountWillChange", identifier, dataclass);
  };
  info->accountDidChange_forDataclass = [](std::string_view identifier, std::string_view dataclass) {
    announceDataclass("AccountDidChange", identifier, dataclass);
  };
  info->noteAccountChanges = noteAccountChanges;
  return info;
}

const platform::ClassRegistration kNotifier{announcer()};

}  // namespace
}  // namespace modules
