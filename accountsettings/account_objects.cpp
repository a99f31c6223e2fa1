#include "accountsettings/account_objects.h"

#include "accountsettings/service_objects.h"

namespace accountsettings {

// Defined here, so that the types have one home and are the same in the library and in every module.
FullAccountObject::~FullAccountObject() = default;
SyncAccountObject::~SyncAccountObject() = default;
AccountClassInfo::~AccountClassInfo() = default;
ServiceAccountObject::~ServiceAccountObject() = default;
RefreshQueueObject::~RefreshQueueObject() = default;

}  // namespace accountsettings
