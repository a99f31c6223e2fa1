#pragma once

#include <optional>
#include <string_view>

namespace platform {

// The user's preferences, by domain.
class PreferencesStore {
 public:
  virtual ~PreferencesStore() = default;
  // Reads the domain as it stands now; later answers about it are of this state.
  virtual void synchronize(std::string_view domain) = 0;
  // The switch under the key; nothing where it is absent, of no use as a switch, or the domain was not synchronised.
  [[nodiscard]] virtual std::optional<bool> boolean(std::string_view domain, std::string_view key) const = 0;
};

}  // namespace platform
