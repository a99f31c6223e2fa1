#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "platform/property_value.h"

namespace platform {

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

}  // namespace platform
