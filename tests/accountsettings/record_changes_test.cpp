#include "accountsettings/record_changes.h"

#include <map>
#include <random>

#include "tests/support/account_store.h"
#include "tests/support/fact_recorder.h"

namespace tests {
namespace {

using accountsettings::Difference;
using accountsettings::RecordState;
using accountsettings::StoreState;
using Lines = std::vector<std::string>;

class RecordChanges : public AccountStore {
 protected:
  static StoreState stateOf(const Accounts& accounts) {
    StoreState state;
    for (const Account& each : accounts) state.push_back({each, each->properties()});
    return state;
  }
  static Lines between(const StoreState& before, const StoreState& after) {
    Lines lines;
    for (const Difference& each : accountsettings::differencesBetween(before, after)) {
      lines.push_back(lineOf(each.fact));
    }
    return lines;
  }
  static Account parent(std::string_view identifier, Array children) {
    return account(identifier, {{"ChildAccounts", std::move(children)}});
  }
};

TEST_F(RecordChanges, AreNoneWhereNothingChanged) {
  const StoreState state = stateOf({account("a"), parent("p", {properties("c")})});
  EXPECT_EQ(between(state, state), Lines{});
}

TEST_F(RecordChanges, AreNoneWhereAValueWasSetToWhatItWas) {
  const Account one = account("a", {{"Port", 1}});
  const StoreState before = stateOf({one});
  one->setAccountProperty_forKey(1, "Port");
  EXPECT_EQ(between(before, stateOf({one})), Lines{});
}

TEST_F(RecordChanges, TellKeysThatCameWentAndChanged) {
  const Account one = account("a", {{"Port", 1}, {"Host", "h"}});
  const StoreState before = stateOf({one});
  one->setAccountProperty_forKey(2, "Port");
  one->setAccountProperty_forKey(true, "Secure");
  one->removeAccountPropertyForKey("Host");
  EXPECT_EQ(between(before, stateOf({one})), Lines{"changed a: Port 1 -> 2, +Secure true, -Host"});
}

TEST_F(RecordChanges, TellOfAKeyThatIsCalledOtherwiseNowInOne) {
  const Account one = account("a", {{"uniqueId", "u"}});
  const StoreState before = stateOf({one});
  one->setAccountProperty_forKey("u", "Identifier");
  one->removeAccountPropertyForKey("uniqueId");
  EXPECT_EQ(between(before, stateOf({one})), Lines{"changed u: uniqueId now Identifier \"u\""});
}

TEST_F(RecordChanges, TakeKeysOfOneTextForRenamedOnesInTheirOrder) {
  const Account one = account("a", {{"first", "t"}, {"second", "t"}, {"third", "t"}});
  const StoreState before = stateOf({one});
  for (const char* const key : {"first", "second", "third"}) one->removeAccountPropertyForKey(key);
  for (const char* const key : {"one", "two"}) one->setAccountProperty_forKey("t", key);
  EXPECT_EQ(between(before, stateOf({one})), Lines{"changed a: first now one \"t\", second now two \"t\", -third"});
}

TEST_F(RecordChanges, TakeNoTwoEqualNumbersForARenamedKey) {
  const Account one = account("a", {{"Port", 1}});
  const StoreState before = stateOf({one});
  one->removeAccountPropertyForKey("Port");
  one->setAccountProperty_forKey(1, "IsActive");
  EXPECT_EQ(between(before, stateOf({one})), Lines{"changed a: +IsActive 1, -Port"});
}

TEST_F(RecordChanges, TakeNoTwoEmptyTextsForARenamedKey) {
  const Account one = account("a", {{"Old", ""}});
  const StoreState before = stateOf({one});
  one->removeAccountPropertyForKey("Old");
  one->setAccountProperty_forKey("", "New");
  EXPECT_EQ(between(before, stateOf({one})), Lines{"changed a: +New \"\", -Old"});
}

TEST_F(RecordChanges, TellByItsKeyOfAChildListThatBecameSomethingElse) {
  const Account one = parent("p", {});
  const StoreState before = stateOf({one});
  one->setAccountProperty_forKey("text", "ChildAccounts");
  EXPECT_EQ(between(before, stateOf({one})), Lines{"changed p: ChildAccounts () -> \"text\""});
}

TEST_F(RecordChanges, TellOfAccountsThatCameAndWent) {
  const Account stays = account("s");
  EXPECT_EQ(between(stateOf({account("a"), stays}), stateOf({stays, account("b")})),
            (Lines{"added b", "lost a (removed)"}));
}

TEST_F(RecordChanges, KnowAnAccountWhoseIdentifierChanged) {
  const Account one = parent("a", {properties("c")});
  const StoreState before = stateOf({one});
  one->setAccountProperty_forKey("b", "Identifier");
  EXPECT_EQ(between(before, stateOf({one})), Lines{"changed b: Identifier \"a\" -> \"b\""});
}

TEST_F(RecordChanges, TellOfChildrenLikeOfAccounts) {
  const Account one = parent("p", {properties("c", {{"Port", 1}}), properties("d")});
  const StoreState before = stateOf({one});
  one->setAccountProperty_forKey(Array{properties("c", {{"Port", 2}}), properties("e")}, "ChildAccounts");
  EXPECT_EQ(between(before, stateOf({one})),
            (Lines{"changed c in p: Port 1 -> 2", "added e in p", "lost d in p (removed-from-parent)"}));
}

TEST_F(RecordChanges, KeepChildrenOfOneIdentifierApartByTheirParents) {
  const Account one = parent("p", {properties("c", {{"Port", 1}})});
  const Account other = parent("q", {properties("c", {{"Port", 2}})});
  EXPECT_EQ(between(stateOf({one, other}), stateOf({other, one})), Lines{});
}

TEST_F(RecordChanges, KnowAChildWithoutIdentifierByItsParent) {
  const Account first = parent("p", {Dictionary{{"Type", "CalDAV"}, {"Port", 1}}});
  const StoreState before = stateOf({first});
  first->setAccountProperty_forKey(Array{Dictionary{{"Type", "CalDAV"}, {"Port", 2}}}, "ChildAccounts");
  EXPECT_EQ(between(before, stateOf({first})), Lines{"changed in p: Port 1 -> 2"});
}

TEST_F(RecordChanges, TakeNoAccountWithoutIdentifierForTheFirstOnesChild) {
  const Account first = parent("p", {Dictionary{{"Type", "CalDAV"}}});
  const StoreState before = stateOf({first});
  first->removeAccountPropertyForKey("ChildAccounts");
  const Account nameless = account("gone");
  nameless->removeAccountPropertyForKey("Identifier");
  EXPECT_EQ(between(before, stateOf({first, nameless})), (Lines{"added", "lost in p (removed-from-parent)"}));
}

TEST_F(RecordChanges, TellOfAnObjectThatStandsForTheSameRecord) {
  const Dictionary record = properties("a");
  EXPECT_EQ(between({{account("a"), record}}, {{account("a"), record}}), Lines{"changed a"});
}

TEST_F(RecordChanges, TellOfAnAccountThatAnotherObjectStandsFor) {
  EXPECT_EQ(between(stateOf({account("a")}), stateOf({account("a")})), Lines{"changed a"});
}

TEST_F(RecordChanges, NameARecordByWhatPeopleKnowItBy) {
  const Dictionary displayed{{"Type", "Mail"}, {"DisplayName", "Home"}, {"Username", "jane"}, {"Identifier", "a"}};
  EXPECT_EQ(accountsettings::nameOf(displayed, "p"), (records::Name{"Mail", "Home", "a", "p"}));
  EXPECT_EQ(accountsettings::nameOf({{"DisplayName", ""}, {"Username", "jane"}}), (records::Name{"", "jane", "", ""}));
  EXPECT_EQ(accountsettings::nameOf({{"Username", 5}}), (records::Name{}));
}

TEST_F(RecordChanges, TellOfAnAccountThatWentUnderAnotherAndTookItsChildrenAlong) {
  const Account mail = parent("m", {properties("c")});
  const StoreState before = stateOf({mail});
  const Account umbrella = parent("p", {properties("c"), properties("m")});
  EXPECT_EQ(between(before, stateOf({umbrella})), (Lines{"added p", "moved c in p into p", "moved m in p into p"}));
}

TEST_F(RecordChanges, TellOfAChildThatBecameAnAccount) {
  EXPECT_EQ(between(stateOf({parent("p", {properties("c")})}), stateOf({account("c")})),
            (Lines{"moved c", "changed c", "lost p (removed)"}));
}

TEST_F(RecordChanges, TellOfAnAccountThatIsListedAgain) {
  const Account one = account("a");
  EXPECT_EQ(between(stateOf({one}), stateOf({one, one})), Lines{"repeated a"});
}

TEST_F(RecordChanges, KeepAccountsOfOneIdentifierApart) {
  const Account first = account("a", {{"Port", 1}});
  const Account second = account("a", {{"Port", 2}});
  const StoreState before = stateOf({first, second});
  second->setAccountProperty_forKey(3, "Port");
  EXPECT_EQ(between(before, stateOf({first, second})), Lines{"changed a: Port 2 -> 3"});
}

TEST_F(RecordChanges, TellByItsKeyOfAChildListThatHoldsSomethingElse) {
  const Account one = parent("p", {"no record"});
  const StoreState before = stateOf({one});
  one->setAccountProperty_forKey(Array{properties("c")}, "ChildAccounts");
  const Lines told = between(before, stateOf({one}));
  ASSERT_EQ(told.size(), 2U);
  EXPECT_TRUE(told[0].starts_with("changed p: ChildAccounts (\"no record\") -> ("));
  EXPECT_EQ(told[1], "added c in p");
}

// --- Whatever happens, what is told is enough to make the new accounts of the old ones ---

class RandomEdits {
 public:
  explicit RandomEdits(std::uint32_t seed) : _numbers{seed} {}

  Accounts accounts() {
    Accounts made;
    for (int count = below(5); count > 0; --count) made.push_back(account(name(), {{"Port", below(3)}}));
    return made;
  }
  void edit(Accounts& accounts) {
    for (int count = below(6); count > 0; --count) editOnce(accounts);
  }

 private:
  int below(int limit) { return std::uniform_int_distribution{0, limit - 1}(_numbers); }
  std::string name() { return "n" + std::to_string(++_names); }
  void editOnce(Accounts& accounts) {
    if (accounts.empty() || below(4) == 0) return accounts.push_back(account(name(), {{"Port", below(3)}}));
    const auto place = accounts.begin() + below(static_cast<int>(accounts.size()));
    switch (below(4)) {
      case 0: accounts.erase(place); return;
      case 1: (*place)->setAccountProperty_forKey(below(3), "Port"); return;
      case 2: (*place)->removeAccountPropertyForKey("Port"); return;
      default: (*place)->setAccountProperty_forKey(name(), "Host"); return;
    }
  }

  std::mt19937 _numbers;
  int _names = 0;
};

void apply(const records::Fact& fact, const StoreState& after, std::map<std::string, Dictionary>& records) {
  if (const auto* const lost = std::get_if<records::Lost>(&fact)) records.erase(lost->account.identifier);
  if (const auto* const added = std::get_if<records::Added>(&fact)) {
    for (const RecordState& each : after) {
      const std::string identifier = each.properties.text("Identifier")->string();
      if (identifier == added->account.identifier) records[identifier] = each.properties;
    }
  }
  const auto* const changed = std::get_if<records::Changed>(&fact);
  if (changed == nullptr) return;
  for (const records::Change& change : changed->changes) {
    Dictionary& record = records[changed->account.identifier];
    record.remove(change.oldKey);
    change.to ? record.set(change.key, *change.to) : static_cast<void>(record.remove(change.key));
  }
}

std::map<std::string, Dictionary> byIdentifier(const StoreState& state) {
  std::map<std::string, Dictionary> records;
  for (const RecordState& each : state) records[each.properties.text("Identifier")->string()] = each.properties;
  return records;
}

TEST_F(RecordChanges, AreAllThatHappened) {
  for (std::uint32_t seed = 0; seed < 500; ++seed) {
    RandomEdits random{seed};
    Accounts accounts = random.accounts();
    const StoreState before = stateOf(accounts);
    random.edit(accounts);
    const StoreState after = stateOf(accounts);
    auto records = byIdentifier(before);
    for (const Difference& each : accountsettings::differencesBetween(before, after)) apply(each.fact, after, records);
    EXPECT_EQ(records, byIdentifier(after)) << "seed " << seed;
  }
}

}  // namespace
}  // namespace tests
