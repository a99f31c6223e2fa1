#include "accountsettings/log_handle.h"

#include <gtest/gtest.h>

#include <array>
#include <thread>

#include "tests/support/fake_platform.h"

namespace tests {
namespace {

using accountsettings::_ASLogSystem;
using accountsettings::LogHandle;

TEST(LogHandle, WritesMethodLineAndQuotedMessageForItsOwnSubsystemAndCategory) {
  const FakeDevice device;
  const std::uint32_t line = std::source_location::current().line() + 1;
  _ASLogSystem().log("-[Some method:]", "%@ and %s, %d of %ld", "one", "two", 3, std::int64_t{4});
  ASSERT_EQ(device.systemLog->lines.size(), 1U);
  const FakeSystemLog::Line& written = device.systemLog->lines[0];
  EXPECT_EQ(written.subsystem, "com.vorlix.accountsettings");
  EXPECT_EQ(written.category, "log");
  EXPECT_EQ(written.method, "-[Some method:]");
  EXPECT_EQ(written.line, line);
  EXPECT_EQ(written.text, "-[Some method:] (" + std::to_string(line) + ") \"one and two, 3 of 4\"");
}

TEST(LogHandle, ComputesNothingWhileNobodyReads) {
  const FakeDevice device;
  device.systemLog->readers = false;
  bool isComputed = false;
  const std::function<std::string()> costly = [&isComputed] {
    isComputed = true;
    return std::string{};
  };
  _ASLogSystem().log("-[Some method]", "%@", costly);
  EXPECT_TRUE(device.systemLog->lines.empty());
  EXPECT_FALSE(isComputed);
}

TEST(LogHandle, IsOneHandleForAllThreadsThatAskForItFirst) {
  const FakeDevice device;
  std::array<const LogHandle*, 8> handles{};
  {
    std::array<std::jthread, 8> threads;
    for (std::size_t each = 0; each < threads.size(); ++each) {
      threads[each] = std::jthread{[&handles, each] { handles[each] = &_ASLogSystem(); }};
    }
  }
  for (const LogHandle* const handle : handles) EXPECT_EQ(handle, &_ASLogSystem());
}

TEST(LogHandle, IsKeptForTheLifeOfTheProcess) {
  const FakeDevice first;
  const LogHandle* const handle = &_ASLogSystem();
  const FakeDevice second;
  EXPECT_EQ(&_ASLogSystem(), handle);
  _ASLogSystem().log("-[Some method]", "said");
  EXPECT_EQ(first.systemLog->lines.size(), 1U);
  EXPECT_TRUE(second.systemLog->lines.empty());
}

}  // namespace
}  // namespace tests
