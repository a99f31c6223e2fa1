#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "tools/account_source.h"

namespace tools {

// What becomes of one account that is to come back.
struct RecoveryStep {
  enum class Kind : std::uint8_t { bringBack, leavePresent, leaveFaulty };

  Kind kind = Kind::bringBack;
  const FoundAccount* from = nullptr;
  accountsettings::Dictionary record;  // as it is to be, without those children that are there already
  std::string why;                     // it is left, or what of it is, as a clause; empty where it comes back whole
  std::optional<std::string> parent;   // of a child: the identifier of the account that it comes back into
};

// The accounts that are there, top-level ones and children.
class PresentAccounts {
 public:
  explicit PresentAccounts(const accounts::Accounts& accounts);
  void add(const accountsettings::Dictionary& record);

  // The one of that identifier, and the one that syncs by it; null where there is none.
  [[nodiscard]] const accountsettings::Dictionary* withIdentifier(std::string_view identifier) const {
    return _byIdentifier.find(identifier);
  }
  [[nodiscard]] const accountsettings::Dictionary* withSyncIdentifier(std::string_view identifier) const {
    return _bySyncIdentifier.find(identifier);
  }
  // The one that is of the same user at the same server, and of the same type or class; null where there is none.
  [[nodiscard]] const accountsettings::Dictionary* sameAccount(const accountsettings::Dictionary& record) const;

 private:
  platform::InsertionOrderedMap<accountsettings::Dictionary> _byIdentifier;
  platform::InsertionOrderedMap<accountsettings::Dictionary> _bySyncIdentifier;
  platform::InsertionOrderedMap<std::vector<accountsettings::Dictionary>> _byService;
};

// What becomes of the accounts that are added to it, one after the other: each is looked at as if those before it were
// back already. None comes back that is there, and none that the next load would drop or repair.
class RecoveryPlan {
 public:
  explicit RecoveryPlan(const accounts::Accounts& accounts) : _present{accounts} {}

  // An account of the file, with the record that it is to come back as.
  void add(const AccountFile& file, const FoundAccount& account, accountsettings::Dictionary record);
  [[nodiscard]] const std::vector<RecoveryStep>& steps() const { return _steps; }

 private:
  void settle(RecoveryStep& step) const;
  [[nodiscard]] bool settleByIdentifiers(RecoveryStep& step) const;
  void leaveOutPresentChildren(RecoveryStep& step);

  PresentAccounts _present;
  std::vector<RecoveryStep> _steps;
};

// The record with properties set or taken away as the command line has them (key_value.h).
[[nodiscard]] accountsettings::Dictionary withProperties(accountsettings::Dictionary record,
                                                         const std::vector<std::string>& settings);

// A file of the first releases comes back as a file, with the named descriptions repaired, to be converted by the next
// migration. Throws Failure where that would convert nothing, or not as a migration of the first releases' accounts
// does it.
Outcome recoverLegacyFile(Session& session, const AccountFile& file, const std::vector<const FoundAccount*>& named,
                          const Options& options);

}  // namespace tools
