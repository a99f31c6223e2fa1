#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace platform {

// The product's texts in the user's language. A table is named by its file; a language that lacks a key falls back to
// English.
class LocalizedStrings {
 public:
  virtual ~LocalizedStrings() = default;
  // Nothing where neither the user's language nor English has the key, or where there is no such table.
  [[nodiscard]] virtual std::optional<std::string> text(std::string_view table, std::string_view key) const = 0;
};

}  // namespace platform
