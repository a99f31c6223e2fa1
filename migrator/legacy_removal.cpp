#include <span>
#include <tuple>

#include "accountsettings/file_paths.h"
#include "migrator/accounts_data_migrator.h"
#include "migrator/telling.h"
#include "platform/platform.h"

namespace migrator {
namespace {

using platform::Path;
using platform::Status;

constexpr std::string_view kSentinelContents = "Old Account Information Removal Sentinel";

// A legacy file that cannot be deleted is worth a message only when accounts were found in it.
enum class Report { failures, nothing };

void reportIfUndeleted(const Path& path, const Status& status, Report report) {
  if (status.isOk() || report == Report::nothing) return;
  tellNotRemoved(path, status);
  writeToConsole("%s. Could not delete %@. Error = %@", "-[AccountsDataMigrator(Internal) _removeOldAccountsInfo]",
                 path.native(), status.description());
}

Status deleteLegacyFile(const Path& path, Report report) {
  Status status = removeAndTell(path, Removal::ofSource);
  reportIfUndeleted(path, status, report);
  return status;
}

Report failuresIf(bool found) { return found ? Report::failures : Report::nothing; }

}  // namespace

std::string AccountsDataMigrator::_absolutePathToOldAccountsInfoRemovalSentinel() {
  return accountsettings::removalSentinelPath();
}

bool AccountsDataMigrator::_failedToRemoveOldAccountsInfo() {
  return platform::current().files->kindOf(_absolutePathToOldAccountsInfoRemovalSentinel()).isOk();
}

bool AccountsDataMigrator::_removeOldAccountsInfo() {
  const Path sentinel = _absolutePathToOldAccountsInfoRemovalSentinel();
  const platform::Bytes contents{kSentinelContents.begin(), kSentinelContents.end()};
  if (!_failedToRemoveOldAccountsInfo()) std::ignore = platform::current().files->create(sentinel, contents);

  const Status exchange = deleteLegacyFile(accountsettings::daAccountPath(), failuresIf(_foundOldDAAccountsToMigrate));
  const bool isMailFileKept = !exchange.isOk() && _foundOldDAAccountsToMigrate;
  if (!isMailFileKept) {
    std::ignore = deleteLegacyFile(accountsettings::mailAccountsPath(), failuresIf(_foundOldMailAccountsToMigrate));
  }
  reportIfUndeleted(sentinel, platform::current().files->remove(sentinel), Report::failures);
  return exchange.isOk();  // false also where there was no Exchange file to delete
}

}  // namespace migrator
