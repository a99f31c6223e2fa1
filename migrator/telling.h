#pragma once

#include <string>
#include <string_view>

#include "accountsettings/accounts_manager.h"
#include "platform/file_system.h"
#include "platform/platform.h"
#include "platform/run_observer.h"
#include "records/message.h"

// How the plug-in tells what it does: people by the console, the run's observer by stages and facts.
namespace migrator {

// Writes one message to the console: `format` with %@, %s, %d and %ld replaced by the arguments.
template <typename... Arguments>
void writeToConsole(std::string_view format, const Arguments&... arguments) {
  platform::current().console->write(records::message(format, {records::MessageArgument{arguments}...}));
}

// A stage that works on a store's accounts: before it ends, the run's observer is told what became of them.
class AccountStage {
 public:
  AccountStage(std::string_view name, const accountsettings::AccountsManager& store, std::string_view words = {})
      : _stage{name, words}, _store{store} {}
  AccountStage(const AccountStage&) = delete;
  AccountStage& operator=(const AccountStage&) = delete;
  ~AccountStage() { _store.tellChanges(); }

 private:
  platform::RunStage _stage;
  const accountsettings::AccountsManager& _store;
};

// Whether accounts were converted out of a file that goes.
enum class Removal { ofSource, ofOther };

// Removes what stands at the path and tells the run's observer that it is gone. That it is still there is for the
// caller to tell, who knows whether it matters.
platform::Status removeAndTell(const platform::Path& path, Removal removal = Removal::ofOther);

// Tells the run's observer that what was to go is still there.
void tellNotRemoved(const platform::Path& path, const platform::Status& status);

// Tells the run's observer that a version step answered false; `words` say which.
void tellFailedStep(std::string_view name, const std::string& words);

}  // namespace migrator
