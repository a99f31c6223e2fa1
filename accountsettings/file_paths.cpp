#include "accountsettings/file_paths.h"

#include "accountsettings/accounts_manager.h"
#include "platform/platform.h"

namespace accountsettings {
namespace {

using platform::Path;

constexpr const char* kPreferences = "Library/Preferences";

Path home() { return platform::current().directories->home(); }

}  // namespace

Path AccountsManager::fullPathToAccountSettingsPlist() {
  return platform::current().directories->systemRoot() / "var/mobile" / kPreferences / kAccountsFilename.view();
}

std::string accountSettingsAccountsPath() { return AccountsManager::fullPathToAccountSettingsPlist(); }

std::string daAccountPath() { return home() / kPreferences / "com.vorlix.DataAccess.plist"; }

std::string mailAccountsPath() { return home() / "Library/Mail/Accounts.plist"; }

Path removalSentinelPath() { return home() / kPreferences / ".removingOldAccounts"; }

Path mailAutoFetchMarkerPath() { return platform::current().directories->mailData() / "AutoFetchEnabled"; }

std::string modulePath(const platform::Text& framework) {
  return platform::current().directories->systemRoot() / Path{framework.view()}.relative_path();
}

}  // namespace accountsettings
