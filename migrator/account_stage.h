#pragma once

#include <string_view>

#include "accountsettings/accounts_manager.h"
#include "platform/run_stage.h"

namespace migrator {

// A stage that works on a store's accounts: before it ends, the run's observer is told what became of them.
class AccountStage {
 public:
  AccountStage(std::string_view name, const accountsettings::AccountsManager& store, std::string_view words = {})
      : _stage{name, words}, _store{store} {}
  AccountStage(const AccountStage&) = delete;
  AccountStage& operator=(const AccountStage&) = delete;
  ~AccountStage() { _store._tellChanges(); }

 private:
  platform::RunStage _stage;
  const accountsettings::AccountsManager& _store;
};

}  // namespace migrator
