#include <algorithm>

#include "accountsettings/product_values.h"
#include "migrator/account_reads.h"
#include "migrator/accounts_data_migrator.h"
#include "migrator/stored_names.h"
#include "records/message.h"

// Nothing is folded, trimmed or normalised anywhere here: an account that differs in the case of one letter belongs to
// somebody else.
namespace migrator {
namespace {

using accountsettings::kAccountUsername;

constexpr StringConstant kGooglePrincipalPath{"/calendar/dav/%@/user"};
constexpr StringConstant kYahooPrincipalPath{"/principals/users/%@"};

// Reserved and unreserved characters of RFC 2396, without "@", "?" and "/", which a path's segment must not hold.
constexpr std::string_view kLegalInSegment =
    "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789-_.!~*'();:&=+$,";

bool contains(const std::vector<std::string>& texts, const Text* text) {
  return text != nullptr && std::ranges::find(texts, text->view()) != texts.end();
}

}  // namespace

std::string AccountsDataMigrator::_urlSafeUsername(std::string_view username) {
  constexpr std::string_view kDigits = "0123456789ABCDEF";  // upper case, as in the paths that are compared
  std::string escaped;
  for (const char character : username) {
    const auto byte = static_cast<unsigned char>(character);
    if (kLegalInSegment.find(character) != std::string_view::npos) {
      escaped += character;
    } else {
      escaped.append({'%', kDigits[byte >> 4U], kDigits[byte & 0xFU]});
    }
  }
  return escaped;
}

std::vector<std::string> AccountsDataMigrator::_expectedCalDAVUsernamesForAccount(const BasicAccount& umbrella) {
  const std::optional<Text> username = textForKey(umbrella, kAccountUsername);
  if (!username) return {};  // so nothing can match
  const std::string_view whole = *username;
  const std::size_t at = whole.find('@');
  if (at == std::string_view::npos) return {std::string{whole}};
  return {std::string{whole}, std::string{whole.substr(0, at)}};
}

std::optional<std::string> AccountsDataMigrator::_expectedCalDAVHostnameForAccount(const BasicAccount& umbrella) {
  if (hasClassAmong(umbrella, {kGmailAccountClass})) return std::string{accountsettings::kGoogleCalDAVHost.view()};
  if (hasClassAmong(umbrella, {kYahooAccountClass})) return std::string{accountsettings::kYahooCalDAVHost.view()};
  return std::nullopt;
}

std::vector<std::string> AccountsDataMigrator::_expectedCalDAVPrincipalURLsForAccount(const BasicAccount& umbrella) {
  std::vector<std::string> paths;
  const auto appendPaths = [&](StringConstant pathTemplate) {
    for (const std::string& username : _expectedCalDAVUsernamesForAccount(umbrella)) {
      paths.push_back(records::message(pathTemplate, {_urlSafeUsername(username)}));
    }
  };
  if (hasClassAmong(umbrella, {kGmailAccountClass})) appendPaths(kGooglePrincipalPath);
  if (hasClassAmong(umbrella, {kYahooAccountClass})) appendPaths(kYahooPrincipalPath);
  return paths;
}

bool AccountsDataMigrator::_calDAVAccount_matchesUmbrellaAccount(const BasicAccount& calDAVAccount,
                                                                 const BasicAccount& umbrella) {
  const Dictionary principal = dictionaryForKey(calDAVAccount, kCalDAVPrincipalKey).value_or(Dictionary{});
  const Text* const server = principal.text(kCalDAVServerKey);
  if (server == nullptr || server->view() != _expectedCalDAVHostnameForAccount(umbrella)) return false;
  if (!contains(_expectedCalDAVUsernamesForAccount(umbrella), principal.text(kCalDAVLoginKey))) return false;
  const Dictionary configuration = dictionaryForKey(calDAVAccount, kCalDAVConfigurationKey).value_or(Dictionary{});
  return contains(_expectedCalDAVPrincipalURLsForAccount(umbrella), configuration.text(kCalDAVPrincipalPathKey));
}

}  // namespace migrator
