#pragma once

#include <memory>
#include <string_view>

#include "accountsettings/account_objects.h"
#include "modules/service_account.h"

namespace modules {

using AccountClass = std::shared_ptr<const accountsettings::AccountClassInfo>;

// A class of full accounts of one kind, made from a record's properties. The kind must live as long as the class.
[[nodiscard]] AccountClass serviceAccountClass(std::string_view name, const ServiceKind& kind);

// A creator of full accounts that answers with the class for the account's type; null for other types.
[[nodiscard]] AccountClass fullAccountCreator(
    std::string_view name, const accountsettings::AccountClassInfo* (*classForType)(std::string_view type));

// A creator of full accounts that picks the kind by the whole record.
[[nodiscard]] AccountClass fullAccountCreator(std::string_view name,
                                              const ServiceKind& (*kindOf)(const BasicAccount& account));

// A creator of sync accounts: refresh queues.
[[nodiscard]] AccountClass syncAccountCreator(std::string_view name);

}  // namespace modules
