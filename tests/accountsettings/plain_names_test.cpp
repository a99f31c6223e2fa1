// What programs find in the library by its plain name is what it publishes in C++.

#include <dlfcn.h>
#include <gtest/gtest.h>

#include "accountsettings/accounts_manager.h"
#include "accountsettings/log_handle.h"
#include "accountsettings/mail_functions.h"
#include "tests/support/fake_platform.h"

namespace tests {
namespace {

template <typename Published>
Published* named(const char* name) {
  void* const found = ::dlsym(RTLD_DEFAULT, name);
  EXPECT_NE(found, nullptr) << name;
  return reinterpret_cast<Published*>(found);
}

TEST(PlainNames, OfPathsAnswerTheSamePaths) {
  const FakeDevice device;
  EXPECT_EQ(named<std::string()>("daAccountPath")(), accountsettings::daAccountPath());
  EXPECT_EQ(named<std::string()>("mailAccountsPath")(), accountsettings::mailAccountsPath());
  EXPECT_EQ(named<std::string()>("accountSettingsAccountsPath")(), accountsettings::accountSettingsAccountsPath());
  EXPECT_STREQ(*named<const char* const>("kAccountMigrationLockFilename"),
               accountsettings::kAccountMigrationLockFilename);
}

TEST(PlainNames, AnswerTheSameLogAndTheSameRegion) {
  FakeDevice device;
  device.deviceInfo->answers.emplace("RegionalBehaviorGoogleMail", true);
  EXPECT_EQ(&named<const accountsettings::LogHandle&()>("_ASLogSystem")(), &accountsettings::_ASLogSystem());
  EXPECT_TRUE(named<bool()>("_UseGoogleMail")());
}

TEST(PlainNames, TakeAReportThatNobodyHears) {
  const FakeDevice device;
  named<void(const Dictionary&, std::string_view)>("reportMailAccountClassFound")({}, "for a test");
  EXPECT_TRUE(device.outputs.empty());
}

}  // namespace
}  // namespace tests
