#include "accountsettings/mail_functions.h"

#include <mutex>
#include <optional>

#include "platform/platform.h"

namespace accountsettings {

bool _UseGoogleMail() {
  static std::once_flag asked;
  static bool answer = false;
  std::call_once(asked, [] {
    const std::optional<platform::PropertyValue> regional =
        platform::current().deviceInfo->answer("RegionalBehaviorGoogleMail");
    answer = regional && regional->booleanValue().value_or(false);
  });
  return answer;
}

void reportMailAccountClassFound(const platform::Dictionary& /*properties*/, std::string_view /*reason*/) {}

}  // namespace accountsettings
