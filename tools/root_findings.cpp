#include <cstdint>
#include <optional>

#include "records/description.h"
#include "tools/findings.h"

namespace tools {
namespace {

using accountsettings::AccountsManager;
using accountsettings::Dictionary;
using accountsettings::PropertyValue;

constexpr std::string_view kAccountsPlace = "Accounts";
constexpr std::string_view kVersionPlace = "Version";
constexpr const char* kTakesForCurrent =
    "upgrades nothing, since it takes the file for current, unless there are legacy files to convert: then it runs "
    "every step";

std::string currentVersion() { return std::to_string(AccountsManager::currentVersion()); }

std::string versionText(std::int64_t version) { return "the data version is " + std::to_string(version); }

Finding finding(std::string_view kind, std::string_view place, std::string what, const std::string& migration) {
  return {kind, std::string{place}, "", std::move(what), "a migration " + migration};
}

}  // namespace

Findings findingsOfVersion(const Dictionary& file) {
  const PropertyValue* const version = file.find(accountsettings::kPlistVersionKey);
  if (version == nullptr) {
    return {finding("version-absent", kVersionPlace, "there is no data version", kTakesForCurrent)};
  }
  const auto number = version->integerValue();
  const auto shown = records::description(*version);
  if (!number) {
    return {finding("version-odd", kVersionPlace, "the data version is no number: " + shown, kTakesForCurrent)};
  }
  Findings findings;
  if (!version->asInteger()) {
    findings.push_back(finding("version-odd", kVersionPlace, "the data version is no integer: " + shown,
                               "reads it as " + std::to_string(*number)));
  }
  const bool isCurrent = static_cast<std::uint64_t>(*number) == AccountsManager::currentVersion();
  // The library, which answers for the file that is examined, says whether it would upgrade it.
  if (AccountsManager::accountSettingsNeedsToBeMigrated()) {
    findings.push_back(finding("version-older", kVersionPlace, versionText(*number),
                               "upgrades the accounts from there to " + currentVersion()));
  } else if (!isCurrent) {
    findings.push_back(finding("version-newer", kVersionPlace,
                               versionText(*number) + (*number < 0 ? ", which counts as newer than every other" : ""),
                               "upgrades nothing and saves the file as version " + currentVersion()));
  }
  return findings;
}

Findings findingsOfRoot(const Dictionary& file) {
  Findings findings;
  const PropertyValue* const accounts = file.find(accountsettings::kPlistAccountsKey);
  if (accounts == nullptr) {
    findings.push_back(finding("no-accounts", kAccountsPlace, "there is no list of accounts", "saves an empty one"));
  } else if (accounts->asArray() == nullptr) {
    findings.push_back(finding("no-accounts", kAccountsPlace, "what should be the list of accounts is no array",
                               "reads no account from it and loses what it holds"));
  }
  for (const auto& [key, value] : file) {
    if (key == accountsettings::kPlistAccountsKey || key == accountsettings::kPlistVersionKey) continue;
    findings.push_back(
        {"unknown-key", key.string(), "", "the file has a key of no meaning", "a migration does not keep it"});
  }
  return findings;
}

}  // namespace tools
