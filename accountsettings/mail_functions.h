#pragma once

#include <string_view>

#include "platform/export.h"
#include "platform/property_value.h"

// What the conversion of mail accounts shares with other programs.
namespace accountsettings {

// Whether the device's region calls Gmail "Google Mail". Asked of the device once per process, also under concurrent
// callers; no answer counts as no.
[[nodiscard]] ACCOUNT_EXPORT bool _UseGoogleMail();

// Called for a converted account that still has the generic class "MailAccount": a place to observe such accounts from
// outside. Does nothing.
ACCOUNT_EXPORT void reportMailAccountClassFound(const platform::Dictionary& properties, std::string_view reason);

}  // namespace accountsettings
