#include <stdexcept>

#include "migrator/hostile_accounts.h"
#include "tests/support/step_test.h"

namespace migrator {
namespace {

using tests::account;
using tests::dataclasses;

// What a run does with accounts that its steps would multiply, or could no longer write.
class HostileAccounts : public tests::StepTest {
 protected:
  // What the steps are refused for; empty where they run.
  std::string refusalOf(const Array& accounts, const PropertyValue& version = 0) {
    load(accounts, version);
    const std::ptrdiff_t before = saves();
    try {
      EXPECT_TRUE(migrator._migrateNewAccountsInfo(*store));
    } catch (const std::runtime_error& refusal) {
      EXPECT_EQ(saves(), before);
      return refusal.what();
    }
    return {};
  }
  static Array copies(std::size_t count, const Dictionary& account) { return Array(count, PropertyValue{account}); }
  static Dictionary nested(std::size_t levels) {
    PropertyValue value{Array{}};
    for (std::size_t level = 1; level < levels; ++level) value = Array{value};
    return account("Mail", "NimbraAccount", "A", {{"Deep", value}});
  }
};

TEST_F(HostileAccounts, OfOneIdentifierAreRefusedAboveAHundred) {
  const Dictionary hosted = account("Nimbra", "NimbraAccount", "A");
  EXPECT_EQ(refusalOf(copies(101, hosted)),
            "It is refused as hostile: it has 101 accounts of one identifier, and no device has more than 100");
  EXPECT_EQ(refusalOf(copies(100, account("LDAP", "LDAPAccount", "A"))), "");
}

TEST_F(HostileAccounts, AreOfOneIdentifierAlsoByTheirUniqueId) {
  Array accounts;
  for (int number = 0; number < 101; ++number) {
    accounts.emplace_back(account("Nimbra", "NimbraAccount", std::to_string(number), {{"uniqueId", "U"}}));
  }
  EXPECT_NE(refusalOf(accounts), "");
}

TEST_F(HostileAccounts, ThatNestTooDeeplyForAParentAboveThemAreRefused) {
  EXPECT_EQ(refusalOf({nested(251)}), "");
  EXPECT_EQ(refusalOf({nested(252)}),
            "It is refused as hostile: it has 253 containers in one another, and no device has more than 252");
}

TEST_F(HostileAccounts, WhoseManyChildrenReadALongListAreRefused) {
  const PropertyValue child{account("CalDAV", "X", "C")};
  const auto parent = [&](std::size_t children) {
    return account("VorlixAccount", "KQAccount", "P",
                   {{"ChildAccounts", Array(children, child)},
                    {"Enabled Dataclasses", Array(2000, PropertyValue{"com.vorlix.Dataclass.Notes"})}});
  };
  EXPECT_EQ(refusalOf({parent(501)}),
            "It is refused as hostile: it has 1002000 data classes in lists that children inherit, and no device has "
            "more than 1000000");
  EXPECT_EQ(refusalOf({parent(100)}), "");
}

TEST_F(HostileAccounts, WhoseChildrenReadALongListOfWhatIsProvisionedAreRefused) {
  const Array children(501, PropertyValue{account("CalDAV", "X", "C")});
  const Array listed(2000, PropertyValue{"com.vorlix.Dataclass.Notes"});
  EXPECT_NE(refusalOf({account("VorlixAccount", "KQAccount", "P",
                               {{"ChildAccounts", children}, {"Provisioned Dataclasses", listed}})}),
            "");
}

// The values are those of the lists, of five keys and as many values, of the account itself, and 64 for the steps.
TEST_F(HostileAccounts, OfMoreValuesThanCanBeWrittenAreRefused) {
  const PropertyValue list{Array(1000, PropertyValue{0})};
  const auto big = accountsettings::AccountsManager::initWithAccounsInfoArray(
      {account("LDAP", "LDAPAccount", "A", {{"Many", Array(7991, list)}, {"More", Array(935, PropertyValue{0})}})});
  try {
    refuseHostileAccounts(*big);
    FAIL() << "nothing is refused";
  } catch (const std::runtime_error& refusal) {
    EXPECT_STREQ(refusal.what(),
                 "It is refused as hostile: it has 8000001 values, with those that the steps add, and no device has "
                 "more than 8000000");
  }
}

TEST_F(HostileAccounts, OfACurrentFileAreLeftAsTheyAre) {
  const Dictionary hosted = account("Nimbra", "NimbraAccount", "A");
  EXPECT_EQ(refusalOf(copies(101, hosted), accountsettings::kCurrentVersion), "");
}

}  // namespace
}  // namespace migrator
