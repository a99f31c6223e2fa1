#include "accountsettings/basic_account.h"

#include <gtest/gtest.h>

#include "tests/support/account_configuration.h"

namespace accountsettings {
namespace {

class Record : public testing::Test {
 protected:
  Record() { tests::putAccountConfiguration(device); }

  tests::FakeDevice device;
};

TEST_F(Record, OfATypeHasTypeClassAndOneIdentifierForTheAccountAndItsSyncStore) {
  const auto account = BasicAccount::accountWithType_class("CalDAV", "DACalendarAccount");
  EXPECT_EQ(account->type(), Text{"CalDAV"});
  EXPECT_EQ(account->accountClass(), Text{"DACalendarAccount"});
  EXPECT_EQ(account->identifier(), Text{"00000000-0000-4000-8000-000000000001"});
  EXPECT_EQ(account->syncStoreIdentifier(), account->identifier());
}

}  // namespace
}  // namespace accountsettings
