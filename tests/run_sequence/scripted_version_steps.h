#pragma once

#include <functional>

#include "migrator/accounts_data_migrator.h"

namespace tests {

// What the version steps of this test program do and answer, in place of the real ones.
struct ScriptedVersionSteps {
  bool answer = true;
  int runs = 0;
  std::function<void(accountsettings::AccountsManager&)> work;
};

ScriptedVersionSteps& versionSteps();

}  // namespace tests
