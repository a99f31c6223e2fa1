// Accounts that hold mail, send it, or keep notes on a mail server. One account type covers several protocols, so the
// record's class decides.

#include <array>
#include <utility>

#include "modules/account_classes.h"

namespace modules {
namespace {

constexpr ServiceKind kImap{.name = "IMAP", .securePort = 993, .plainPort = 143};

constexpr std::array<std::pair<std::string_view, ServiceKind>, 8> kKindsByClass{{
    {"POPAccount", {.name = "POP", .securePort = 995, .plainPort = 110}},
    {"GmailAccount", {.name = "Gmail", .host = "imap.gmail.com", .securePort = 993, .plainPort = 143}},
    {"YahooAccount", {.name = "Yahoo!", .host = "imap.mail.yahoo.com", .securePort = 993, .plainPort = 143}},
    {"AOLAccount", {.name = "AOL", .host = "imap.aol.com", .securePort = 993, .plainPort = 143}},
    {"SMTPAccount", {.name = "SMTP", .securePort = 587, .plainPort = 587}},
    {"DeliveryAccount", {.name = "SMTP", .securePort = 587, .plainPort = 587}},
    {"LocalAccount", {.name = "Mail"}},
    {"IMAPAccount", kImap},
}};

const ServiceKind& kindOf(const BasicAccount& account) {
  const auto className = account.accountClass();
  for (const auto& [name, kind] : kKindsByClass) {
    if (className && *className == name) return kind;
  }
  return kImap;
}

const platform::ClassRegistration kFullAccounts{fullAccountCreator("MailAccountCreator", kindOf)};
const platform::ClassRegistration kSyncAccounts{syncAccountCreator("MailSyncAccountCreator")};

}  // namespace
}  // namespace modules
