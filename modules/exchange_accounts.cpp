// Exchange ActiveSync accounts.

#include "modules/account_classes.h"

namespace modules {
namespace {

constexpr ServiceKind kExchange{.name = "Exchange", .securePort = 443, .plainPort = 80};

const platform::ClassRegistration kFullAccounts{
    fullAccountCreator("ExchangeAccountCreator", [](const BasicAccount&) -> const ServiceKind& { return kExchange; })};
const platform::ClassRegistration kSyncAccounts{syncAccountCreator("ExchangeSyncAccountCreator")};

}  // namespace
}  // namespace modules
