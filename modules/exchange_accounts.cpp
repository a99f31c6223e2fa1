// Exchange ActiveSync accounts.

#include "modules/account_classes.h"

namespace modules {
namespace {

constexpr ServiceKind kExchange{.name = "Exchange", .securePort = 443, .plainPort = 80};

const ServiceKind& kindOf(const BasicAccount&) { return kExchange; }

const platform::ClassRegistration fullAccounts{fullAccountCreator("ExchangeAccountCreator", kindOf)};
const platform::ClassRegistration syncAccounts{syncAccountCreator("ExchangeSyncAccountCreator")};

}  // namespace
}  // namespace modules
