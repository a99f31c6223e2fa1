#pragma once

#include <string_view>

namespace platform {

// Tells running applications that a key of a preferences domain changed. Nobody may be listening; nothing comes back.
class PreferencesChangedNotice {
 public:
  virtual ~PreferencesChangedNotice() = default;
  virtual void post(std::string_view domain, std::string_view key) = 0;
};

}  // namespace platform
