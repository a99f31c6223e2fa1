// Directories that contacts are looked up in. Nothing of them is kept on the device, so there is nothing to refresh.

#include "modules/account_classes.h"

namespace modules {
namespace {

constexpr ServiceKind kDirectory{.name = "LDAP", .securePort = 636, .plainPort = 389};

const platform::ClassRegistration kFullAccounts{fullAccountCreator(
    "DirectoryAccountCreator", [](const BasicAccount&) -> const ServiceKind& { return kDirectory; })};

}  // namespace
}  // namespace modules
