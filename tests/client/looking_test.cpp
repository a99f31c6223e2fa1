#include "tests/support/device_with_accounts.h"

namespace tests {
namespace {

using accounts::Account;
using accounts::Value;
using testing::ElementsAre;
using testing::Optional;

template <typename Result>
concept HasArrow = requires(Result&& result) { std::forward<Result>(result).operator->(); };
template <typename List>
concept HasIterators = requires(List&& list) { std::forward<List>(list).begin(); };

class LookingAtAccounts : public DeviceWithAccounts {
 protected:
  static std::vector<std::string> identifiersOf(const std::vector<Account>& accounts) {
    std::vector<std::string> identifiers;
    for (const Account& account : accounts) identifiers.push_back(account.identifier());
    return identifiers;
  }
};

TEST_F(LookingAtAccounts, ListsThemInTheFilesOrder) {
  EXPECT_THAT(identifiersOf(looked().all()), ElementsAre("M1", "V1"));
}

TEST_F(LookingAtAccounts, ReadsWhatIsWellKnown) {
  const Account account = *looked().withIdentifier("M1");
  EXPECT_EQ(account.type(), "Mail");
  EXPECT_EQ(account.accountClass(), "IMAPAccount");
  EXPECT_THAT(account.displayName(), Optional(std::string{"Home"}));
  EXPECT_THAT(account.username(), Optional(std::string{"ines"}));
  EXPECT_THAT(account.enabledDataclasses(), ElementsAre(kMail));
  EXPECT_THAT(account.supportedDataclasses(), ElementsAre(kMail, kNotes));
}

TEST_F(LookingAtAccounts, ReadsPropertiesByKind) {
  const Account account = *looked().withIdentifier("M1");
  EXPECT_THAT(account.integer("Port"), Optional(993));
  EXPECT_THAT(account.boolean("Secure"), Optional(true));
  EXPECT_EQ(account.text("Port"), std::nullopt);
  EXPECT_EQ(account.property("Nothing"), std::nullopt);
}

TEST_F(LookingAtAccounts, FindsChildrenWithWhatTheyHaveOfTheirParent) {
  const Account child = *looked().withIdentifier("C1");
  EXPECT_TRUE(child.isChild());
  EXPECT_EQ(child.parentIdentifier(), "V1");
  EXPECT_THAT(child.displayName(), Optional(std::string{"Cirrant"}));
  EXPECT_THAT(child.keys(), ElementsAre("Type", "Class", "Identifier"));
  EXPECT_TRUE(child.isEnabled(kContacts));
}

TEST_F(LookingAtAccounts, FindsThemBySyncIdentifierTypeAndDataclass) {
  const auto accounts = looked();
  EXPECT_EQ(accounts.withSyncIdentifier("S1")->identifier(), "M1");
  EXPECT_THAT(identifiersOf(accounts.ofType("CalDAV")), ElementsAre("C1"));
  EXPECT_THAT(identifiersOf(accounts.withDataclass(kContacts)), ElementsAre("V1", "C1"));
  EXPECT_EQ(accounts.withIdentifier("unknown"), std::nullopt);
}

TEST_F(LookingAtAccounts, TellsWhatAChildHasItself) {
  const Account child = *looked().withIdentifier("C1");
  EXPECT_EQ(child.ownText("DisplayName"), std::nullopt);
  EXPECT_THAT(child.ownText("Class"), Optional(std::string{"CalDAVAccount"}));
}

TEST_F(LookingAtAccounts, TellsAnEmptyListOfDataclassesFromNone) {
  putAccounts(account("L1") + account("L2", "LDAP", "<key>Enabled Dataclasses</key><array/>"));
  EXPECT_FALSE(looked().withIdentifier("L1")->listsDataclasses());
  EXPECT_TRUE(looked().withIdentifier("L2")->listsDataclasses());
}

TEST_F(LookingAtAccounts, CallsTheDevicesOwnAccountAsTheDeviceDoes) {
  putAccounts(account("O", "OnMyDevice", "<key>DisplayName</key><string>Mine</string>"));
  EXPECT_THAT(looked().withIdentifier("O")->displayName(), Optional(testing::StartsWith("On My ")));
}

TEST_F(LookingAtAccounts, CountsTheRecordsThatItCannotLoad) {
  putAccounts(kAccounts + account("later", "A type to come"));
  EXPECT_EQ(looked().unreadable(), 1U);
  EXPECT_EQ(looked().dataVersion(), accountsettings::kCurrentVersion);
}

TEST_F(LookingAtAccounts, AsksNoModuleOfAnotherDeviceForAService) {
  EXPECT_FALSE(looked().withIdentifier("M1")->service().has_value());
}

TEST_F(LookingAtAccounts, OutlivesTheUnnamedResultThatItCameIn) {
  const auto settings = opened();
  std::vector<std::string> seen;
  for (const Account& each : *settings.accounts()) seen.push_back(each.identifier());
  for (const Account& each : settings.accounts().value().all()) seen.push_back(each.identifier());
  for (const Account& each : looked().all()) seen.push_back(each.identifier());
  EXPECT_THAT(seen, ElementsAre("M1", "V1", "M1", "V1", "M1", "V1"));
  using Looked = accounts::Result<accounts::Accounts>;
  static_assert(std::is_same_v<decltype(*std::declval<Looked>()), accounts::Accounts>);
  static_assert(std::is_same_v<decltype(std::declval<Looked>().error()), accounts::Error>);
  static_assert(HasArrow<Looked&> && !HasArrow<Looked>);
  static_assert(HasIterators<accounts::Accounts&> && !HasIterators<accounts::Accounts>);
}

TEST_F(LookingAtAccounts, KeepsWhatWasSeenWhateverBecomesOfTheFile) {
  std::optional<Account> child;
  {
    const auto accounts = looked();
    child = accounts.withIdentifier("V1")->children().front();
  }
  std::filesystem::remove(device.root / kSettings);
  EXPECT_EQ(child->identifier(), "C1");
  EXPECT_EQ(child->parentIdentifier(), "V1");
}

TEST_F(LookingAtAccounts, ShowsNoIdentifierThatTheFileDoesNotHave) {
  putAccounts("<dict><key>Type</key><string>LDAP</string><key>Class</key><string>A</string></dict>");
  EXPECT_EQ(looked().all().front().identifier(), "");
}

TEST_F(LookingAtAccounts, CarriesEveryKindOfValue) {
  const Value::Dictionary entries{{"text", "a"},
                                  {"integer", -1},
                                  {"large", UINT64_MAX},
                                  {"real", 0.5},
                                  {"boolean", true},
                                  {"date", accounts::Date{0.25}},
                                  {"data", Value::Data{0, 1}},
                                  {"reference", accounts::Reference{7}},
                                  {"list", Value::List{1, "b"}}};
  const auto read = *Value{entries}.dictionary();
  ASSERT_EQ(read.size(), entries.size());
  for (std::size_t place = 0; place < entries.size(); ++place) EXPECT_EQ(read[place].second, entries[place].second);
  EXPECT_EQ(read[2].second.integer(), std::nullopt);
  EXPECT_THAT(read[2].second.unsignedInteger(), Optional(UINT64_MAX));
  EXPECT_EQ(read[1].second.unsignedInteger(), std::nullopt);
  EXPECT_EQ(read[5].second.date()->secondsSince2001, 0.25);
  EXPECT_EQ(read[7].second.kind(), Value::Kind::other);
  EXPECT_EQ(read[7].second.reference()->number, 7U);
  EXPECT_NE(Value{1}, Value{1.0});
  for (const Value& one : {Value{1U}, Value{1L}, Value{1UL}, Value{1LL}, Value{1ULL}}) EXPECT_EQ(one, Value{1});
}

}  // namespace
}  // namespace tests
