// A run in which a file operation fails, once or from then on. Nothing crosses the plug-in's boundary, the settings
// file is a whole one, no temporary file stays, and no account is gone unless its save failed before its legacy file
// went.
#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>
#include <iostream>
#include <iterator>

#include "tests/reliability/device_forms.h"

using tests::DeviceForm;
using tests::Mishap;
using tests::RunOutcome;
using tests::ScratchDevice;

namespace {

class FailingRuns : public testing::TestWithParam<std::tuple<int, bool>> {};

struct Message {
  const char* operation;  // how it begins
  const char* path;       // how it ends
  const char* message;    // what the run says then; nothing where nobody hears of it
};

constexpr const char* kNotSaved = "\"Failed to save accounts to filesystem.\"";
constexpr const char* kNotDeleted = "-[AccountsDataMigrator(Internal) _removeOldAccountsInfo]. Could not delete ";

constexpr Message kMessages[] = {
    {"temporaryName", "", kNotSaved},
    {"create ", ".removingOldAccounts", nullptr},
    {"create ", "", kNotSaved},
    {"setOwner ", "", "\"Could not set attributes on the temporary account settings plist. Could not work on "},
    {"setOwner ", "", kNotSaved},
    {"rename ", "", kNotSaved},
    {"copy ", "", "Error trying to save an accountsettings plist copy: Could not work on "},
    {"remove ", "CrashReporter/com.vorlix.accountsettings.plist", "Couldn't remove existing accountsettings copy at "},
    {"remove ", "DataAccess.plist", kNotDeleted},
    {"remove ", "Mail/Accounts.plist", kNotDeleted},
    {"remove ", ".removingOldAccounts", kNotDeleted},
    {"remove ", ".original", nullptr},
    {"remove ", "AutoFetchEnabled", nullptr},
};

bool isOf(const Message& message, const std::string& operation) {
  return operation.starts_with(message.operation) && operation.ends_with(message.path);
}

bool isSaid(const std::string& message, const RunOutcome& outcome) {
  return std::ranges::any_of(outcome.outputs,
                             [&](const std::string& line) { return line.find(message) != std::string::npos; });
}

// What is looked up or read and cannot be counts as missing, without a word.
void expectMessageOf(const RunOutcome& outcome) {
  const std::string& operation = outcome.failedOperation;
  ASSERT_NE(operation, "");
  if (operation.starts_with("kindOf ") || operation.starts_with("read ")) return;
  const auto* const silent =
      std::ranges::find_if(kMessages, [&](const Message& message) { return isOf(message, operation); });
  ASSERT_NE(silent, std::end(kMessages)) << operation;
  if (silent->message == nullptr) return;
  for (const Message& message : kMessages) {
    if (isOf(message, operation) && message.message != nullptr) {
      EXPECT_TRUE(isSaid(message.message, outcome)) << operation << " failed without \"" << message.message << "\"";
    }
  }
}

TEST_P(FailingRuns, LeaveAWholeSettingsFileAndNoTemporaryOne) {
  const auto [version, withLegacy] = GetParam();
  const DeviceForm form{version, withLegacy ? tests::kBothLegacyFiles : tests::kNoLegacyFiles};
  ScratchDevice counted;
  prepare(counted, form);
  const int operations = counted.run().operations;
  int runs = 0;
  for (const Mishap::Kind kind : {Mishap::Kind::failsOnce, Mishap::Kind::failsFromThenOn}) {
    for (const int error : {ENOSPC, EIO, EACCES, EROFS, EINTR}) {
      for (int operation = 1; operation <= operations; ++operation) {
        ScratchDevice device;
        prepare(device, form);
        const RunOutcome outcome = device.run({kind, operation, error});
        EXPECT_FALSE(outcome.crashed) << "operation " << operation << " error " << error;
        EXPECT_FALSE(outcome.heldLock) << "operation " << operation << " error " << error;
        expectMessageOf(outcome);
        EXPECT_TRUE(device.comparableSettings()) << "operation " << operation << " error " << error;
        if (kind == Mishap::Kind::failsOnce) {
          EXPECT_EQ(device.temporaryFiles(), std::vector<std::string>{});
        }
        EXPECT_TRUE(device.run().succeeded) << "operation " << operation << " error " << error;
        ++runs;
      }
    }
  }
  std::cout << tests::described(form) << ": " << operations << " operations, " << runs << " faults\n";
}

INSTANTIATE_TEST_SUITE_P(OfSomeVersions, FailingRuns,
                         testing::Combine(testing::Values(0, 6, tests::kCurrentVersion - 1, tests::kCurrentVersion),
                                          testing::Bool()));

}  // namespace
