// Tells every program on the device of account changes, by signals on the system bus. com.vorlix.Accounts1.xml
// describes them.

#include <sdbus-c++/sdbus-c++.h>

#include <chrono>
#include <map>
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
using platform::Dictionary;
using platform::PropertyValue;
using Entry = std::map<std::string, sdbus::Variant>;

constexpr const char* kPath = "/com/vorlix/Accounts";
constexpr const char* kInterface = "com.vorlix.Accounts1";
constexpr std::chrono::seconds kPatience{1};

// Returns once the bus has taken everything that was sent before, so that signals keep their order whoever sends the
// next one, and none is lost when the process ends.
void waitForBus(sdbus::IConnection& connection) {
  std::string identifier;
  sdbus::createProxy(connection, "org.freedesktop.DBus", "/org/freedesktop/DBus")
      ->callMethod("GetId")
      .onInterface("org.freedesktop.DBus")
      .withTimeout(kPatience)
      .storeResultsTo(identifier);
}

// Without a bus nothing happens. A connection of its own for each signal asks nothing of the process: no event loop, no
// thread, nothing to carry over a fork or a restart of the bus.
template <typename... Arguments>
void announce(const char* signalName, const Arguments&... arguments) noexcept {
  try {
    if (platform::openSystemBus() == nullptr) return;  // sdbus would wait for one that does not answer
    const auto connection = sdbus::createSystemBusConnection();
    const auto object = sdbus::createObject(*connection, kPath);
    auto signal = object->createSignal(kInterface, signalName);
    static_cast<void>((signal << ... << arguments));
    object->emitSignal(signal);
    waitForBus(*connection);
  } catch (...) {  // NOLINT(bugprone-empty-catch): an account change never fails for want of listeners
  }
}

std::vector<std::string> textsOf(const platform::Array& array) {
  std::vector<std::string> texts;
  for (const PropertyValue& element : array) {
    if (const auto* const text = element.asText()) texts.push_back(text->string());
  }
  return texts;
}

// A change entry as a D-Bus dictionary. Only what has the type that the interface promises is passed on.
Entry entryOf(const Dictionary& change) {
  Entry entry;
  for (const auto& [key, value] : change) {
    if (const auto* const text = value.asText()) {
      entry.emplace(key.string(), sdbus::Variant{text->string()});
    } else if (const auto* const array = value.asArray()) {
      entry.emplace(key.string(), sdbus::Variant{textsOf(*array)});
    } else if (value.asInteger()) {
      entry.emplace(key.string(), sdbus::Variant{static_cast<std::int32_t>(value.integerValue().value_or(0))});
    }
  }
  return entry;
}

void noteAccountChanges(const std::vector<Dictionary>& changes) {
  std::vector<Entry> entries;
  entries.reserve(changes.size());
  for (const Dictionary& change : changes) entries.push_back(entryOf(change));
  announce("AccountsChanged", entries);
}

std::shared_ptr<const AccountClassInfo> announcer() {
  auto info = std::make_shared<AccountClassInfo>("AccountAnnouncer");
  info->accountWillChange_forDataclass = [](std::string_view identifier, std::string_view dataclass) {
    announce("AccountWillChange", std::string{identifier}, std::string{dataclass});
  };
  info->accountDidChange_forDataclass = [](std::string_view identifier, std::string_view dataclass) {
    announce("AccountDidChange", std::string{identifier}, std::string{dataclass});
  };
  info->noteAccountChanges = noteAccountChanges;
  return info;
}

const platform::ClassRegistration notifier{announcer()};

}  // namespace
}  // namespace modules
