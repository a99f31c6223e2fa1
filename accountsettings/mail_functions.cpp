#include "accountsettings/mail_functions.h"

#include <optional>

#include "platform/platform.h"

namespace accountsettings {

bool _UseGoogleMail() {
  static const bool kAnswer = [] {
    const std::optional<platform::PropertyValue> regional =
        platform::current().deviceInfo->answer("RegionalBehaviorGoogleMail");
    return regional && regional->booleanValue().value_or(false);
  }();
  return kAnswer;
}

void reportMailAccountClassFound(const platform::Dictionary& /*properties*/, std::string_view /*reason*/) {}

}  // namespace accountsettings
