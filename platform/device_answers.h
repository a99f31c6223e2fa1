#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "platform/property_value.h"
#include "platform/status.h"
#include "platform/text.h"

namespace platform {

// What the device says of itself.
class DeviceInfoQuery {
 public:
  virtual ~DeviceInfoQuery() = default;
  // The answer to "CPUArchitecture" (text), "DeviceClass" (text) or "RegionalBehaviorGoogleMail" (boolean); nothing
  // where the device has no answer.
  [[nodiscard]] virtual std::optional<PropertyValue> answer(std::string_view key) const = 0;
};

enum class ManagedFeature : std::uint8_t {
  cloudDocumentSync,
  mediaStream,
  sharedStreams,
  cloudBackup,
  cardsWhileLocked
};

enum class Restriction : std::uint8_t { notSet = 0, allowed = 1, notAllowed = 2 };

// What the device's management profiles say at this moment.
class ProfileRestrictions {
 public:
  virtual ~ProfileRestrictions() = default;
  // Of each of the features, in their order. One question for them all: to ask costs a device a look at its files.
  [[nodiscard]] virtual std::vector<Restriction> restrictions(std::span<const ManagedFeature> features) const = 0;
};

// A connection to the service that syncs with a desktop computer over a cable; letting it go disconnects.
class TetheredSyncConnection {
 public:
  virtual ~TetheredSyncConnection() = default;
  // What the domain holds under the key; without a key, the whole domain. Nothing where there is no value.
  [[nodiscard]] virtual std::optional<PropertyValue> value(std::string_view domain,
                                                           std::optional<std::string_view> key) = 0;
};

class TetheredSyncQuery {
 public:
  virtual ~TetheredSyncQuery() = default;
  // A failure where the service cannot be reached; never null.
  virtual Result<std::unique_ptr<TetheredSyncConnection>> connect() = 0;
};

// The kinds of data for which external sync sources are configured.
enum class SyncDataType : std::uint8_t { bookmarks, calendars, contacts, notes };

struct ExternalSources {
  std::optional<Array> sources;      // texts as a rule; absent where nothing is configured
  std::optional<std::string> error;  // what went wrong, where something did
};

// Which external sources (a desktop computer, say) are enabled per sync data type.
class ExternalSourcesQuery {
 public:
  virtual ~ExternalSourcesQuery() = default;
  [[nodiscard]] virtual ExternalSources enabledSources(SyncDataType type) const = 0;
};

// The platform's record of the cloud account: under which keys an account keeps it, and what the account's type is
// called.
class SystemAccountQuery {
 public:
  virtual ~SystemAccountQuery() = default;
  [[nodiscard]] virtual Text hostedServiceStatusKey() const = 0;
  // Nothing where the platform has no such key of its own.
  [[nodiscard]] virtual std::optional<Text> primaryAccountKey() const = 0;
  [[nodiscard]] virtual Text systemAccountTypeString() const = 0;
};

// The user's preferences, by domain.
class PreferencesStore {
 public:
  virtual ~PreferencesStore() = default;
  // Reads the domain as it stands now; later answers about it are of this state.
  virtual void synchronize(std::string_view domain) = 0;
  // The switch under the key; nothing where it is absent, of no use as a switch, or the domain was not synchronised.
  [[nodiscard]] virtual std::optional<bool> boolean(std::string_view domain, std::string_view key) const = 0;
};

class UniqueIdentifiers {
 public:
  virtual ~UniqueIdentifiers() = default;
  // A new random UUID (RFC 4122, version 4) in its 36-character text form, letters in upper case.
  virtual Result<std::string> makeUuid() = 0;
};

}  // namespace platform
