// The published functions and the published path under their plain names, as programs find them by dlsym. A function
// under its plain name takes and answers what it does in C++; the path is a `const char*`.

#include "accountsettings/accounts_manager.h"
#include "accountsettings/log_handle.h"
#include "accountsettings/mail_functions.h"

namespace accountsettings {

ACCOUNT_EXPORT const LogHandle& logSystemByName() asm("_ASLogSystem");
const LogHandle& logSystemByName() { return _ASLogSystem(); }

ACCOUNT_EXPORT std::string exchangePathByName() asm("daAccountPath");
std::string exchangePathByName() { return daAccountPath(); }

ACCOUNT_EXPORT std::string mailPathByName() asm("mailAccountsPath");
std::string mailPathByName() { return mailAccountsPath(); }

ACCOUNT_EXPORT std::string settingsPathByName() asm("accountSettingsAccountsPath");
std::string settingsPathByName() { return accountSettingsAccountsPath(); }

ACCOUNT_EXPORT bool useGoogleMailByName() asm("_UseGoogleMail");
bool useGoogleMailByName() { return _UseGoogleMail(); }

ACCOUNT_EXPORT void mailClassFoundByName(const Dictionary& properties,
                                         std::string_view reason) asm("reportMailAccountClassFound");
void mailClassFoundByName(const Dictionary& properties, std::string_view reason) {
  reportMailAccountClassFound(properties, reason);
}

ACCOUNT_EXPORT extern const char* const kLockFilenameByName asm("kAccountMigrationLockFilename");
const char* const kLockFilenameByName = kAccountMigrationLockFilename;

}  // namespace accountsettings
