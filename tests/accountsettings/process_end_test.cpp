#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>

#include "accountsettings/accounts_manager.h"
#include "accountsettings/log_handle.h"
#include "platform/linux/linux_platform.h"

namespace tests {
namespace {

class PrintingLog final : public platform::SystemLog {
 public:
  [[nodiscard]] bool hasReaders() const override { return true; }
  void write(const platform::LogRecord& record) override { std::fprintf(stderr, "%s\n", record.text().c_str()); }
};

// Destroyed after whatever a test makes: made before main.
class LastUser {
 public:
  bool isAwake = false;
  ~LastUser() {
    if (!isAwake) return;
    const auto store = accountsettings::AccountsManager::initWithAccounsInfoArray(
        platform::Array{platform::Dictionary{{"Type", "Mail"}}});
    const bool knowsTypes = accountsettings::BasicAccount::_isValidAccountType("Mail");
    accountsettings::_ASLogSystem().log("-[LastUser dealloc]", "%@ %d %d",
                                        platform::current().directories->systemRoot().native(), store->count(),
                                        static_cast<int>(knowsTypes));
  }
};

LastUser lastUser;

[[noreturn]] void useEverythingAndEnd() {
  platform::Platform services = platform::makeLinuxPlatform({.systemRoot = "/images/device"});
  services.systemLog = std::make_shared<PrintingLog>();
  platform::setCurrent(std::move(services));
  static_cast<void>(accountsettings::AccountsManager::initWithAccounsInfoArray({}));
  static_cast<void>(accountsettings::BasicAccount::_isValidAccountType("Mail"));
  accountsettings::_ASLogSystem().log("main", "ends");
  lastUser.isAwake = true;
  std::exit(0);
}

TEST(TheEndOfTheProcess, LeavesLogConfigurationAndPlatformToTheDestructorsOfGlobals) {
  testing::GTEST_FLAG(death_test_style) = "threadsafe";  // a process of its own, from the start
  EXPECT_EXIT(useEverythingAndEnd(), testing::ExitedWithCode(0), "\"/images/device 0 1\"");
}

}  // namespace
}  // namespace tests
