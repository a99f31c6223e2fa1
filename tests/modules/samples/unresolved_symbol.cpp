// Calls what nobody defines.

#include "accountsettings/account_objects.h"

extern "C" void sample_symbol_that_nobody_defines();

namespace {

auto creator() {
  auto info = std::make_shared<accountsettings::AccountClassInfo>("UnresolvedCreator");
  info->accountWithBasicAccount = [](const auto&) {
    sample_symbol_that_nobody_defines();
    return nullptr;
  };
  return info;
}

const platform::ClassRegistration registration{creator()};

}  // namespace
