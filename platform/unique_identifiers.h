#pragma once

#include <optional>
#include <string>

namespace platform {

class UniqueIdentifiers {
 public:
  virtual ~UniqueIdentifiers() = default;
  // A new random UUID (RFC 4122, version 4) in its 36-character text form, letters in upper case; nothing where none
  // can be made.
  [[nodiscard]] virtual std::optional<std::string> makeUuid() = 0;
};

}  // namespace platform
