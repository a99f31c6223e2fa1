#include "tools/commands.h"

#include <limits>

namespace tools {
namespace {

constexpr std::size_t kAnyNumber = std::numeric_limits<std::size_t>::max();

}  // namespace

const std::vector<Command>& commands() {
  static const std::vector<Command> all{
      {"list", "", "all accounts, children below their parents", 0, 0, listAccounts},
      {"show", "ID", "one account with its properties", 1, 1, showAccount},
      {"verify", "[FILE]", "what a migration would do about each fault", 0, 1, verifySettings},
      {"types", "", "the account types, with their data classes", 0, 0, listTypes},
      {"enable", "ID DATACLASS", "switch a data class on", 2, 2, enableDataclass, true},
      {"disable", "ID DATACLASS", "switch a data class off", 2, 2, disableDataclass, true},
      {"rename", "ID NAME", "change what the account is called", 2, 2, renameAccount, true},
      {"add", "TYPE CLASS [KEY=VALUE]...", "add an account and print its identifier", 2, kAnyNumber, addAccount, true},
      {"remove", "ID", "remove an account, with its children", 1, 1, removeAccount, true},
      {"save", "", "repair what needs it and save the accounts", 0, 0, saveAccounts, true},
  };
  return all;
}

}  // namespace tools
