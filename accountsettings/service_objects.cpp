#include "accountsettings/service_objects.h"

namespace accountsettings {

ServiceAccountObject::~ServiceAccountObject() = default;
RefreshQueueObject::~RefreshQueueObject() = default;

}  // namespace accountsettings
