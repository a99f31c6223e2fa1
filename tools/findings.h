#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "accountsettings/accounts_manager.h"

namespace tools {

// One thing that is not as a save of this release would have left it. The texts are clauses of a sentence for people;
// they hold no credential. `kind` is for scripts, and so a contract (docs/ACCOUNTCTL.md lists the kinds).
struct Finding {
  std::string_view kind;
  std::string place;       // "Version", "Accounts[2]", "Accounts[2].ChildAccounts[0]"; empty for the file as a whole
  std::string identifier;  // the record's; empty where it has none
  std::string what;
  std::string migration;  // what a migration does about it: "a migration …"
};

using Findings = std::vector<Finding>;

// What is found in a settings file that was read, in its order. Nothing here knows by itself what can be loaded and
// what is repaired: each record is given to the library, and what it makes of it is compared with the record.
[[nodiscard]] Findings findingsOfRoot(const accountsettings::Dictionary& file);
[[nodiscard]] Findings findingsOfVersion(const accountsettings::Dictionary& file);
[[nodiscard]] Findings findingsOfRecords(const accountsettings::Array& accounts);

}  // namespace tools
