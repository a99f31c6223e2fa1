#pragma once

#include <optional>

#include "platform/text.h"

namespace platform {

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

}  // namespace platform
