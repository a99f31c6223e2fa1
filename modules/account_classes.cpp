#include "modules/account_classes.h"

#include <string>

#include "modules/refresh_queue.h"

namespace modules {

using accountsettings::AccountClassInfo;
using Account = std::shared_ptr<BasicAccount>;

AccountClass serviceAccountClass(std::string_view name, const ServiceKind& kind) {
  auto info = std::make_shared<AccountClassInfo>(std::string{name});
  info->initWithProperties = [&kind](const Dictionary& properties) {
    return std::make_shared<ServiceAccount>(properties, kind);
  };
  return info;
}

AccountClass fullAccountCreator(std::string_view name, const AccountClassInfo* (*classForType)(std::string_view)) {
  auto info = std::make_shared<AccountClassInfo>(std::string{name});
  info->classForAccountType = classForType;
  return info;
}

AccountClass fullAccountCreator(std::string_view name, const ServiceKind& (*kindOf)(const BasicAccount&)) {
  auto info = std::make_shared<AccountClassInfo>(std::string{name});
  info->accountWithBasicAccount = [kindOf](const Account& account) {
    return std::make_shared<ServiceAccount>(account->properties(), kindOf(*account));
  };
  return info;
}

AccountClass syncAccountCreator(std::string_view name) {
  auto info = std::make_shared<AccountClassInfo>(std::string{name});
  info->accountToRefreshForBasicAccount = [](const Account& account) {
    return std::make_shared<RefreshQueue>(account);
  };
  return info;
}

}  // namespace modules
