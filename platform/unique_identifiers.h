#pragma once

#include <string>

#include "platform/status.h"

namespace platform {

class UniqueIdentifiers {
 public:
  virtual ~UniqueIdentifiers() = default;
  // A new random UUID (RFC 4122, version 4) in its 36-character text form, letters in upper case.
  virtual Result<std::string> makeUuid() = 0;
};

}  // namespace platform
