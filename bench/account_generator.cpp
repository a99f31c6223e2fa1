#include "bench/account_generator.h"

#include <array>
#include <string>
#include <string_view>

namespace bench {
namespace {

using platform::Array;
using platform::Bytes;
using platform::Dictionary;
using platform::PropertyValue;

// SplitMix64: small, and the same everywhere, unlike the distributions of the standard library.
class Random {
 public:
  explicit Random(std::uint64_t seed) : _state{seed} {}
  std::uint64_t next() {
    _state += 0x9E3779B97F4A7C15U;
    std::uint64_t mixed = _state;
    mixed = (mixed ^ (mixed >> 30U)) * 0xBF58476D1CE4E5B9U;
    mixed = (mixed ^ (mixed >> 27U)) * 0x94D049BB133111EBU;
    return mixed ^ (mixed >> 31U);
  }
  std::uint64_t below(std::uint64_t end) { return next() % end; }
  bool oneIn(std::uint64_t count) { return below(count) == 0; }

 private:
  std::uint64_t _state;
};

struct Kind {
  std::uint64_t share;  // of a hundred accounts that are no cloud accounts
  const char* type;
  const char* className;
  const char* pathPrefix;  // of mail accounts
  std::array<const char*, 4> dataclasses;
};

constexpr std::array<Kind, 13> kKinds{{
    {24, "Mail", "IMAPAccount", "Mail/IMAP-", {"Mail", "Notes"}},
    {6, "Mail", "POPAccount", "Mail/POP-", {"Mail"}},
    {5, "Mail", "GmailAccount", "Mail/IMAP-", {"Mail", "Notes"}},
    {3, "Mail", "YahooAccount", "Mail/IMAP-", {"Mail", "Notes"}},
    {3, "Mail", "AOLAccount", "Mail/AOL-", {"Mail"}},
    {10, "SMTP", "SMTPAccount", nullptr, {}},
    {14, "Exchange", "ExchangeAccount", nullptr, {"Mail", "Contacts", "Calendars", "Reminders"}},
    {13, "CalDAV", "MobileCalDAVAccount", nullptr, {"Calendars", "Reminders"}},
    {8, "CardDAV", "CardDAVAccount", nullptr, {"Contacts"}},
    {5, "Subscribed Calendar", "SubscribedCalendarAccount", nullptr, {"Calendars"}},
    {4, "LDAP", "LDAPAccount", nullptr, {"ContactsSearch"}},
    {3, "Nimbra", "NimbraAccount", "Mail/Nimbra-", {"Mail", "Contacts", "Notes"}},
    {2, "BookmarkDAV", "BookmarkDAVAccount", nullptr, {"Bookmarks"}},
}};
constexpr const Kind& kGmail = kKinds[2];
constexpr const Kind& kCalendars = kKinds[7];
constexpr const Kind& kHosted = kKinds[11];
constexpr Kind kCloud{0, "VorlixAccount", "KQAccount", nullptr, {"Mail", "Contacts", "Calendars", "DeviceLocator"}};
constexpr Kind kCloudMail{0, "KeldorIMAP", "KeldorIMAPAccount", nullptr, {"Mail", "Notes"}};
constexpr Kind kCloudCalendars{0, "CalDAV", "MobileCalDAVAccount", nullptr, {"Calendars"}};

// Settings of the applications behind the accounts, which nothing here understands.
constexpr std::array<std::string_view, 20> kOtherKeys{
    "PortNumber",  "SSLEnabled",     "Days To Sync", "Refresh Interval", "Sort Order",
    "Color",       "Signature",      "Sent Mailbox", "Trash Folder",     "Draft Folder",
    "Auth Scheme", "Max Attachment", "Use TLS",      "Keep On Server",   "Last Refresh",
    "Sync Window", "Server Quirks",  "Capabilities", "Download Images",  "Archive Folder"};

constexpr std::size_t kFirstParent = 9;  // of ten accounts

class Generator {
 public:
  explicit Generator(const Population& population)
      : _seed{population.seed}, _identity{population.seed}, _children{population.children} {}

  Dictionary account(std::size_t number) {
    const std::size_t place = number % kPopulationPeriod;
    if (place == 0) _lastGmailUser.clear();
    _random = Random{_seed + place};
    const bool isCloud = number % 10 == kFirstParent;
    const Kind& kind = isCloud ? kCloud : anyKind();
    Dictionary account = common(kind, number);
    if (kind.pathPrefix != nullptr) addMail(account, kind);
    if (kind.className == std::string_view{"GmailAccount"}) _lastGmailUser = account.text("Username")->string();
    if (kind.type == std::string_view{"CalDAV"}) {
      addCalendarServer(account, !_lastGmailUser.empty() && _random.oneIn(4));
    }
    if (_random.oneIn(4)) account.set("Server State", blob(20 + _random.below(200)));
    fill(account, 15 + _random.below(isCloud ? 10 : 11));
    if (isCloud && _children > 0) account.set("ChildAccounts", children(number));
    return account;
  }

  // Of a mail account and its calendar account, which come in turn.
  Dictionary halfOfPair(std::size_t number) {
    _random = Random{_seed + number % kPopulationPeriod};
    const bool isMail = number % 2 == 0;
    Dictionary account = common(isMail ? kGmail : kCalendars, number);
    if (isMail) {
      addMail(account, kGmail);
      _lastGmailUser = account.text("Username")->string();
    } else {
      addCalendarServer(account, true);
    }
    return account;
  }

  Dictionary ofOneType(std::size_t number) { return mailOf(kKinds.front(), number); }
  Dictionary hosted(std::size_t number) { return mailOf(kHosted, number); }

  Dictionary twin(std::size_t number) {
    Dictionary account = ofOneType(number);
    if (number % 2 == 0) {
      _identifierOfTwin = *account.text("Identifier");
    } else {
      account.set("Identifier", _identifierOfTwin);
    }
    return account;
  }

 private:
  Dictionary mailOf(const Kind& kind, std::size_t number) {
    _random = Random{_seed + number % kPopulationPeriod};
    Dictionary account = common(kind, number);
    addMail(account, kind);
    return account;
  }

  const Kind& anyKind() {
    std::uint64_t ticket = _random.below(100);
    for (const Kind& kind : kKinds) {
      if (ticket < kind.share) return kind;
      ticket -= kind.share;
    }
    return kKinds.front();
  }

  Dictionary common(const Kind& kind, std::size_t number) {
    const std::string user = "person" + std::to_string(number);
    const std::string identifier = uuid();
    Dictionary account{{"Identifier", identifier},
                       {"Type", kind.type},
                       {"Class", kind.className},
                       {"DisplayName", user + "'s " + kind.type},
                       {"Sync Identifier", identifier},
                       {"Username", user + "@example" + digits(3) + ".com"},
                       {"Hostname", "mail" + digits(2) + ".example.com"}};
    if (kind.dataclasses.front() != nullptr) account.set("Enabled Dataclasses", enabled(kind));
    return account;
  }

  Array enabled(const Kind& kind) {
    Array dataclasses;
    for (const char* const name : kind.dataclasses) {
      if (name != nullptr && !_random.oneIn(4)) dataclasses.emplace_back(std::string{"com.vorlix.Dataclass."} + name);
    }
    return dataclasses;
  }

  void addMail(Dictionary& account, const Kind& kind) {
    account.set("AccountPath", std::string{kind.pathPrefix} + account.text("Username")->string());
    account.set("IsActive", !_random.oneIn(5));
  }

  void addCalendarServer(Dictionary& account, bool isPartner) {
    const std::string user = isPartner ? _lastGmailUser : account.text("Username")->string();
    const std::string local = user.substr(0, user.find('@'));
    const char* const server = isPartner ? "www.google.com" : "calendars.example.com";
    account.set("CalDAVPrincipalConfiguration", Dictionary{{"CalDAV_Server_Key", server}, {"Login_Key", local}});
    account.set("CalDAVAccountConfiguration",
                Dictionary{{"CalDAV_PrincipalPath_Key", "/calendar/dav/" + local + "/user"}});
  }

  Array children(std::size_t number) {
    Array children;
    while (children.size() < _children)
      children.emplace_back(child(children.size() % 2 == 0 ? kCloudMail : kCloudCalendars, number));
    return children;
  }

  Dictionary child(const Kind& kind, std::size_t number) {
    Dictionary child = common(kind, number);
    fill(child, 9);
    return child;
  }

  void fill(Dictionary& account, std::size_t keys) {
    for (std::size_t next = _random.below(kOtherKeys.size()); account.size() < keys; ++next) {
      account.set(kOtherKeys[next % kOtherKeys.size()], otherValue());
    }
  }

  PropertyValue otherValue() {
    switch (_random.below(6)) {
      case 0: return static_cast<std::int64_t>(_random.below(70000));
      case 1: return _random.oneIn(2);
      case 2: return platform::Date{static_cast<double>(_random.below(400'000'000))};
      case 3: return static_cast<double>(_random.below(1000)) / 8;
      case 4: return std::string{"standard"};
      default: return "value " + digits(6);
    }
  }

  Bytes blob(std::size_t size) {
    Bytes bytes(size);
    for (std::uint8_t& byte : bytes) byte = static_cast<std::uint8_t>(_identity.next());
    return bytes;
  }

  std::string digits(int count) {
    std::string text;
    while (count-- > 0) text += static_cast<char>('0' + _identity.below(10));
    return text;
  }

  std::string uuid() {
    std::string text;
    for (const char place : std::string_view{"xxxxxxxx-xxxx-4xxx-xxxx-xxxxxxxxxxxx"}) {
      text += place == 'x' ? "0123456789ABCDEF"[_identity.below(16)] : place;
    }
    return text;
  }

  std::uint64_t _seed;
  Random _random{0};  // what an account is made of
  Random _identity;   // what no two accounts share
  std::size_t _children;
  std::string _lastGmailUser;
  platform::Text _identifierOfTwin;
};

}  // namespace

Array accountsOf(const Population& population) {
  if (population.mixture == Mixture::family) {
    Population alone = population;
    alone.children = population.accounts - 1;
    return {Generator{alone}.account(kFirstParent)};
  }
  Generator generator{population};
  Array accounts;
  accounts.reserve(population.accounts);
  for (std::size_t number = 0; number < population.accounts; ++number) {
    switch (population.mixture) {
      case Mixture::pairs: accounts.emplace_back(generator.halfOfPair(number)); break;
      case Mixture::type: accounts.emplace_back(generator.ofOneType(number)); break;
      case Mixture::hosted: accounts.emplace_back(generator.hosted(number)); break;
      case Mixture::twins: accounts.emplace_back(generator.twin(number)); break;
      default: accounts.emplace_back(generator.account(number));
    }
  }
  return accounts;
}

Dictionary settingsOf(const Population& population) {
  return {{"Accounts", accountsOf(population)}, {"Version", population.version}};
}

}  // namespace bench
