#include "host/explanation_page.h"

#include <gmock/gmock.h>

namespace host {
namespace {

using platform::Array;
using platform::Dictionary;
using platform::PropertyValue;
using records::Name;
using testing::ElementsAre;
using testing::IsEmpty;

Dictionary settingsWith(Array accounts) {
  Dictionary settings;
  settings.set("Accounts", PropertyValue{std::move(accounts)});
  return settings;
}

Dictionary account(const char* type, const char* identifier) {
  Dictionary record;
  record.set("Type", PropertyValue{type});
  record.set("Identifier", PropertyValue{identifier});
  return record;
}

TEST(AccountsOfAPage, AreNamedAsTheirUsersNameThem) {
  Dictionary named = account("Mail", "A");
  named.set("DisplayName", PropertyValue{"June"});
  Dictionary signedIn = account("Mail", "B");
  signedIn.set("Username", PropertyValue{"june@hollis.example"});
  EXPECT_THAT(accountsIn(settingsWith({PropertyValue{named}, PropertyValue{signedIn}})),
              ElementsAre(Name{"Mail", "June", "A", ""}, Name{"Mail", "june@hollis.example", "B", ""}));
}

TEST(AccountsOfAPage, HaveTheirChildrenRightBehindThem) {
  Dictionary parent = account("VorlixAccount", "P");
  parent.set("ChildAccounts", PropertyValue{Array{PropertyValue{account("Nimbra", "C")}}});
  EXPECT_THAT(accountsIn(settingsWith({PropertyValue{parent}, PropertyValue{account("LDAP", "L")}})),
              ElementsAre(Name{"VorlixAccount", "", "P", ""}, Name{"Nimbra", "", "C", "P"}, Name{"LDAP", "", "L", ""}));
}

TEST(AccountsOfAPage, AreOnlyThoseThatAreRecords) {
  EXPECT_THAT(accountsIn({}), IsEmpty());
  EXPECT_THAT(accountsIn(settingsWith({PropertyValue{7}, PropertyValue{"text"}})), IsEmpty());
  Dictionary odd;
  odd.set("Accounts", PropertyValue{"no list"});
  EXPECT_THAT(accountsIn(odd), IsEmpty());
}

TEST(PageOfAnExplanation, HasNothingOfTheDocumentButItsPackedForm) {
  const std::string page = pageOf(R"({"stages":[],"result":{"verdict":"</script>@EXPLANATIONS@"}})", {});
  EXPECT_EQ(page.find("</script>@"), std::string::npos);
  EXPECT_EQ(page.find("@DOCUMENT@"), std::string::npos);
  EXPECT_EQ(page.find("@EXPLANATIONS@"), std::string::npos);
}

TEST(PageOfAnExplanation, IsNoneOfWhatIsNoDocument) { EXPECT_ANY_THROW(static_cast<void>(pageOf("{", {}))); }

}  // namespace
}  // namespace host
