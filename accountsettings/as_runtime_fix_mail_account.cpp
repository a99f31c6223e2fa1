#include "accountsettings/as_runtime_fix_mail_account.h"

#include <array>

#include "accountsettings/log_handle.h"
#include "accountsettings/product_values.h"
#include "platform/kept_for_life.h"
#include "platform/platform.h"

namespace accountsettings {
namespace {

struct ClassByPath {
  StringConstant fragment;
  StringConstant className;
};

// The first fragment found wins, so the providers stand before the protocols that they are reached by.
constexpr std::array<ClassByPath, 8> kClassesByPath{{{"Mail/Lumo-", "WexmoAccount"},
                                                     {"Mail/Nimbra-", "NimbraAccount"},
                                                     {"Mail/AOL-", "AOLAccount"},
                                                     {"Mail/Mailboxes", "LocalAccount"},
                                                     {kGmailAccountPathFragment, "GmailAccount"},
                                                     {kYahooAccountPathFragment, "YahooAccount"},
                                                     {"Mail/POP-", "POPAccount"},
                                                     {"Mail/IMAP-", "IMAPAccount"}}};

}  // namespace

RuntimeFixer::~RuntimeFixer() = default;

std::shared_ptr<ASRuntimeFixMailAccount> ASRuntimeFixMailAccount::init() {
  return std::shared_ptr<ASRuntimeFixMailAccount>{new ASRuntimeFixMailAccount};
}

ASRuntimeFixMailAccount::ASRuntimeFixMailAccount()
    : _supportedMailClasses{"WexmoAccount", "NimbraAccount", "POPAccount",   "IMAPAccount",
                            "AOLAccount",   "LocalAccount",  "GmailAccount", "YahooAccount"} {}

ASRuntimeFixMailAccount::~ASRuntimeFixMailAccount() = default;

const std::unordered_set<std::string_view>& ASRuntimeFixMailAccount::supportedAccountTypes() const {
  using Types = const std::unordered_set<std::string_view>;
  static Types& types =
      platform::keptForLife<Types>(std::initializer_list<std::string_view>{kNimbraAccountType, kMailAccountType});
  return types;
}

FixAnswer ASRuntimeFixMailAccount::fixBasicAccountIfNeeded_loggingMessage(BasicAccount& account,
                                                                          std::string_view /*loggingMessage*/) {
  const std::optional<Text> type = account.type();
  if (!type || !supportedAccountTypes().contains(*type)) return FixAnswer::nothingToDo;
  const std::optional<Text> className = account.accountClass();
  if (className && _supportedMailClasses.contains(*className)) return FixAnswer::nothingToDo;
  _shouldNotifyMobileMail = true;
  return _cleanupAccountClass(account) ? FixAnswer::repaired : FixAnswer::drop;
}

bool ASRuntimeFixMailAccount::_cleanupAccountClass(BasicAccount& account) {
  const std::optional<PropertyValue> property = account.accountPropertyForKey(kMailAccountPathKey);
  const Text path = property && property->asText() != nullptr ? *property->asText() : Text{};
  for (const ClassByPath& entry : kClassesByPath) {
    if (path.view().find(entry.fragment.view()) == std::string_view::npos) continue;
    account.setAccountClass(entry.className);
    return true;
  }
  _ASLogSystem().log("-[ASRuntimeFixMailAccount _cleanupAccountClass:]",
                     "Could not fix the class of the mail account: %@", account.properties());
  return false;
}

void ASRuntimeFixMailAccount::accountsHaveBeenSaved(bool saved) {
  if (_shouldNotifyMobileMail && saved) {
    platform::current().preferencesChanged->post(kMailPreferencesDomain, kMailPreferencesAccountsKey);
  }
  _shouldNotifyMobileMail = false;
}

}  // namespace accountsettings
