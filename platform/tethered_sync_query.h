#pragma once

#include <memory>
#include <optional>
#include <string_view>

#include "platform/property_value.h"
#include "platform/status.h"

namespace platform {

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

}  // namespace platform
