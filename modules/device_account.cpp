// The account of what is kept only on the device. Its record is its full account, and the class that makes it the
// library's own, so all that this module has to do is to be there and to bring the library with it.

#include "accountsettings/device_local_account.h"

namespace modules {
namespace {

// Keeps the library among what this module needs, however the linker is asked to drop what seems unused.
[[gnu::used]] const auto kFullAccount = &accountsettings::DeviceLocalAccount::accountWithBasicAccount<>;

}  // namespace
}  // namespace modules
