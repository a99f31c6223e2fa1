#include "tests/support/step_test.h"

namespace migrator {
namespace {

using tests::account;

class CalDAVMatching : public tests::StepTest {
 protected:
  using Record = std::shared_ptr<BasicAccount>;

  static Record umbrella(std::string_view className, std::string_view username) {
    return BasicAccount::accountWithProperties(account("Mail", className, "U", {{"Username", username}}));
  }
  static Dictionary partnerProperties(std::string_view host, std::string_view login, std::string_view path) {
    return account("CalDAV", "MobileCalDAVAccount", "C",
                   {{"CalDAVPrincipalConfiguration", Dictionary{{"Login_Key", login}, {"CalDAV_Server_Key", host}}},
                    {"CalDAVAccountConfiguration", Dictionary{{"CalDAV_PrincipalPath_Key", path}}}});
  }
  static bool matches(const Dictionary& partner, const Record& umbrella) {
    return AccountsDataMigrator::_calDAVAccount_matchesUmbrellaAccount(*BasicAccount::accountWithProperties(partner),
                                                                       *umbrella);
  }
};

constexpr std::string_view kGoogle = "www.google.com";
constexpr std::string_view kYahoo = "caldav.calendar.yahoo.com";

TEST_F(CalDAVMatching, EscapesWhatIsNotLegalInAUrlAndTheThreeCharactersThatSplitOne) {
  const std::vector<std::pair<std::string, std::string>> cases{
      {"jane.doe@example", "jane.doe%40example"},
      {"", ""},
      {"abcxyzABCXYZ0189", "abcxyzABCXYZ0189"},
      {"-_.!~*'()", "-_.!~*'()"},
      {";:&=+$,", ";:&=+$,"},
      {"@?/", "%40%3F%2F"},
      {"%#[]", "%25%23%5B%5D"},
      {"%40", "%2540"},
      {" \"<>\\^`{|}", "%20%22%3C%3E%5C%5E%60%7B%7C%7D"},
      {"\t\x7f", "%09%7F"},
      {"j\u00f6\u20ac\U0001F600", "j%C3%B6%E2%82%AC%F0%9F%98%80"},
  };
  for (const auto& [plain, escaped] : cases) EXPECT_EQ(AccountsDataMigrator::_urlSafeUsername(plain), escaped) << plain;
}

TEST_F(CalDAVMatching, ExpectsTheWholeUsernameAndThePartBeforeTheFirstAt) {
  using Usernames = std::vector<std::string>;
  const auto usernames = [](std::string_view username) {
    return AccountsDataMigrator::_expectedCalDAVUsernamesForAccount(*umbrella("GmailAccount", username));
  };
  EXPECT_EQ(usernames("jane@example"), (Usernames{"jane@example", "jane"}));
  EXPECT_EQ(usernames("joe"), Usernames{"joe"});
  EXPECT_EQ(usernames("@example"), (Usernames{"@example", ""}));
  EXPECT_EQ(usernames("a@b@c"), (Usernames{"a@b@c", "a"}));
}

TEST_F(CalDAVMatching, ExpectsTheHostOfTheUmbrellasService) {
  const auto host = [](std::string_view className) {
    return AccountsDataMigrator::_expectedCalDAVHostnameForAccount(*umbrella(className, "joe"));
  };
  EXPECT_EQ(host("GmailAccount"), std::string{kGoogle});
  EXPECT_EQ(host("YahooAccount"), std::string{kYahoo});
  for (const std::string_view other : {"AOLAccount", "IMAPAccount", "gmailaccount", "GmailAccount "}) {
    EXPECT_EQ(host(other), std::nullopt) << other;
  }
}

TEST_F(CalDAVMatching, ExpectsOnePrincipalPathForEachUsername) {
  using Paths = std::vector<std::string>;
  const auto paths = [](std::string_view className, std::string_view username) {
    return AccountsDataMigrator::_expectedCalDAVPrincipalURLsForAccount(*umbrella(className, username));
  };
  EXPECT_EQ(paths("GmailAccount", "jane@example"),
            (Paths{"/calendar/dav/jane%40example/user", "/calendar/dav/jane/user"}));
  EXPECT_EQ(paths("GmailAccount", "@example"), (Paths{"/calendar/dav/%40example/user", "/calendar/dav//user"}));
  EXPECT_EQ(paths("YahooAccount", "joe"), Paths{"/principals/users/joe"});
  EXPECT_EQ(paths("AOLAccount", "joe"), Paths{});
}

TEST_F(CalDAVMatching, MatchesEveryPairOfExpectedLoginAndExpectedPath) {
  const Record jane = umbrella("GmailAccount", "jane@example");
  for (const std::string_view login : {"jane", "jane@example"}) {
    for (const std::string_view path : {"/calendar/dav/jane%40example/user", "/calendar/dav/jane/user"}) {
      EXPECT_TRUE(matches(partnerProperties(kGoogle, login, path), jane)) << login << path;
    }
  }
  EXPECT_TRUE(matches(partnerProperties(kYahoo, "joe", "/principals/users/joe"), umbrella("YahooAccount", "joe")));
  EXPECT_TRUE(matches(partnerProperties(kGoogle, "", "/calendar/dav//user"), umbrella("GmailAccount", "@example")));
}

struct Miss {
  std::string_view umbrellaClass, username, host, login, path;
};

TEST_F(CalDAVMatching, MissesByOneDetail) {
  constexpr std::string_view kPath = "/calendar/dav/jane/user";
  const std::vector<Miss> misses{
      {"GmailAccount", "jane@example", kGoogle, "Jane", kPath},
      {"GmailAccount", "jane@example", "WWW.GOOGLE.COM", "jane", kPath},
      {"GmailAccount", "jane@example", kYahoo, "jane", kPath},
      {"GmailAccount", "jane@example", kGoogle, "jane ", kPath},
      {"GmailAccount", "jane@example", kGoogle, "joe", kPath},
      {"GmailAccount", "jane@example", kGoogle, "jane", "/calendar/dav/jane@example/user"},
      {"GmailAccount", "jane\u00f6", kGoogle, "jane\u00f6", "/calendar/dav/jane%c3%b6/user"},
      {"GmailAccount", "jane@example", kGoogle, "jane", "/calendar/dav/jane/user/"},
      {"GmailAccount", "jane@example", kGoogle, "jane", "/principals/users/jane"},
      {"YahooAccount", "joe", kYahoo, "joe", "/principals/users/Joe"},
      {"YahooAccount", "joe", kYahoo, "joe@yahoo.com", "/principals/users/joe"},
      {"YahooAccount", "joe", kGoogle, "joe", "/principals/users/joe"},
      {"AOLAccount", "joe", kGoogle, "joe", "/calendar/dav/joe/user"},
      {"IMAPAccount", "joe", kYahoo, "joe", "/principals/users/joe"},
  };
  for (const Miss& miss : misses) {
    EXPECT_FALSE(
        matches(partnerProperties(miss.host, miss.login, miss.path), umbrella(miss.umbrellaClass, miss.username)))
        << miss.umbrellaClass << ' ' << miss.username << ' ' << miss.host << ' ' << miss.login << ' ' << miss.path;
  }
}

TEST_F(CalDAVMatching, MissesWhereACalDAVAccountLacksAnEntryOrHoldsAnotherKind) {
  const Record joe = umbrella("YahooAccount", "joe");
  const Dictionary whole = partnerProperties(kYahoo, "joe", "/principals/users/joe");
  ASSERT_TRUE(matches(whole, joe));
  for (const std::string_view key : {"CalDAVPrincipalConfiguration", "CalDAVAccountConfiguration"}) {
    Dictionary part = whole;
    part.remove(key);
    EXPECT_FALSE(matches(part, joe)) << key;
    part.set(key, Array{*whole.find(key)});
    EXPECT_FALSE(matches(part, joe)) << key;
    for (const Dictionary::Entry& entry : *whole.dictionary(key)) {
      Dictionary inner = *whole.dictionary(key);
      inner.set(entry.key, 1);
      part.set(key, inner);
      EXPECT_FALSE(matches(part, joe)) << entry.key;
      inner.remove(entry.key);
      part.set(key, inner);
      EXPECT_FALSE(matches(part, joe)) << entry.key;
    }
  }
}

TEST_F(CalDAVMatching, MissesAnUmbrellaWithoutAUsername) {
  for (const std::string_view className : {"GmailAccount", "YahooAccount"}) {
    const Record nameless = BasicAccount::accountWithProperties(account("Mail", className, "U"));
    const Record numbered = BasicAccount::accountWithProperties(account("Mail", className, "U", {{"Username", 1}}));
    for (const Record& umbrella : {nameless, numbered}) {
      EXPECT_FALSE(matches(partnerProperties(kGoogle, "", "/calendar/dav//user"), umbrella));
      EXPECT_FALSE(matches(partnerProperties(kYahoo, "", "/principals/users/"), umbrella));
    }
  }
}

}  // namespace
}  // namespace migrator
