#include <nlohmann/json.hpp>

#include "accountsettings/file_paths.h"
#include "accountsettings/product_values.h"
#include "commandline/text.h"
#include "platform/platform.h"
#include "tools/findings.h"
#include "tools/recovery.h"

namespace tools {
namespace {

using accountsettings::Array;
using platform::Path;
using Json = nlohmann::ordered_json;

constexpr int kSchema = 1;

[[noreturn]] void fail(const std::string& message) { throw Failure{ExitStatus::failed, message}; }

// The file with the named descriptions repaired.
AccountFile repaired(const AccountFile& file, const std::vector<const FoundAccount*>& named,
                     const std::vector<std::string>& settings) {
  AccountFile result = file;
  for (const FoundAccount* each : named) {
    Array list = *result.root.array(each->list);
    list[each->index] = inLegacyWords(*each, withProperties(each->properties, settings));
    result.root.set(each->list, std::move(list));
  }
  result.accounts = accountsIn(result);
  return result;
}

bool stands(const Path& path) { return platform::current().files->kindOf(path).isOk(); }

void requireFreePlace(const Path& place, const AccountFile& original) {
  if (stands(accountsettings::removalSentinelPath())) {
    fail("a migration was deleting such files when it died, and the next one goes on with that: run it first");
  }
  if (!stands(place)) return;
  const auto present = platform::current().propertyLists->readDictionary(place);
  if (!present.isOk() || present.value() != original.root) fail("another file stands there: " + place.string());
}

void write(const AccountFile& file, const Path& place) {
  const auto& services = platform::current();
  const auto list = services.propertyLists->serialize(file.root);
  if (list.data == nullptr || !list.status.isOk()) fail(list.status.description());
  if (const auto written = services.files->replace(place, *list.data); !written.isOk()) fail(written.description());
  const auto owner = accountsettings::kSettingsOwner.view();
  if (const auto given = services.files->setOwner(place, owner, owner); !given.isOk()) fail(given.description());
}

Outcome told(const AccountFile& file, const Path& place, const Options& options) {
  const std::string count = std::to_string(file.accounts.size());
  if (options.printsJson) {
    const Json report{{"schema", kSchema},
                      {"dryRun", options.changesNothing},
                      {"file", commandline::printable(place.string())},
                      {"accounts", file.accounts.size()}};
    return report.dump(2) + "\n";
  }
  return commandline::printable((options.changesNothing ? "would bring back: " : "brought back: ") + place.string() +
                                ", with " + count + " accounts; the next migration converts them") +
         "\n";
}

}  // namespace

Outcome recoverLegacyFile(Session& session, const AccountFile& file, const std::vector<const FoundAccount*>& named,
                          const Options& options) {
  const Path place = pathOf(file.form == FileForm::legacyMail ? LegacyForm::mail : LegacyForm::exchange);
  const AccountFile whole = repaired(file, named, options.settings);
  for (const FoundAccount& each : whole.accounts) {
    if (each.fault.empty()) continue;
    fail(each.described() + ": " + each.fault + "; name it, and repair it with --set Class=CLASS");
  }
  const accounts::Accounts& accounts = session.accounts();
  const bool isMigrated =
      stands(AccountsManager::fullPathToAccountSettingsPlist()) && !AccountsManager::accountSettingsNeedsToBeMigrated();
  requireFreePlace(place, file);
  if (isMigrated && (!accounts.empty() || accounts.unreadable() > 0)) {
    fail(
        "the device has migrated accounts, beside which a migration converts such a file without its version steps; go "
        "back first (migration-host --undo), or migrate the file on an empty device and recover from that");
  }
  if (options.changesNothing) return told(whole, place, options);
  platform::keepTemporaryDirectoryOnDeviceVolume(platform::current());
  // An empty settings file would pass for migrated accounts; one that is older is migrated together with the file.
  if (isMigrated) AccountsManager::removeNewAccountSettingsToMigrateOldAccountInformation();
  write(whole, place);
  return told(whole, place, options);
}

}  // namespace tools
