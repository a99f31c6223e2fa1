// Accounts of the vendor's hosted services: the current cloud account with its children's mail, and the earlier ones.

#include <array>
#include <utility>

#include "modules/account_classes.h"

namespace modules {
namespace {

constexpr ServiceKind kCloud{.name = "Cirrant", .securePort = 443, .plainPort = 80};
constexpr ServiceKind kCloudMail{.name = "Cirrant", .securePort = 993, .plainPort = 143};
constexpr ServiceKind kEarlierService{.name = "Nimbra", .securePort = 993, .plainPort = 143};

const ServiceKind& kindOf(const BasicAccount& account) {
  const auto type = account.type();
  if (type && *type == accountsettings::kNimbraAccountType) return kEarlierService;
  if (type && *type == accountsettings::kKeldorIMAPAccountType) return kCloudMail;
  return kCloud;
}

const platform::ClassRegistration kFullAccounts{fullAccountCreator("HostedAccountCreator", kindOf)};
const platform::ClassRegistration kSyncAccounts{syncAccountCreator("HostedSyncAccountCreator")};

}  // namespace
}  // namespace modules
