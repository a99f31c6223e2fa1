#include "accountsettings/runtime_fixer.h"

namespace accountsettings {

RuntimeFixer::~RuntimeFixer() = default;

}  // namespace accountsettings
