#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "platform/run_observer.h"
#include "tests/support/fake_platform.h"

namespace tests {

inline const Path kLegacyExchangeFile = "/var/mobile/Library/Preferences/com.vorlix.DataAccess.plist";
inline const Path kLegacyMailFile = "/var/mobile/Library/Mail/Accounts.plist";
inline const Path kRemovalSentinel = "/var/mobile/Library/Preferences/.removingOldAccounts";
inline const Path kSettingsCopy = "/var/mobile/Library/Logs/CrashReporter/com.vorlix.accountsettings.plist";
inline const Path kReportDirectory = "/var/mobile/Library/Logs/CrashReporter/AccountMigration";
inline const Path kReportFile = kReportDirectory / "AccountMigrationInformation-2011-10-12-9-10-5.txt";
inline const Path kAutoFetchMarker = "/var/mobile/Library/Mail/AutoFetchEnabled";

// What a watched run told its observer, among everything else that left the process: "began NAME", "ended NAME".
class RecordingObserver final : public platform::RunObserver {
 public:
  explicit RecordingObserver(Outputs& outputs) : _outputs{outputs} {}
  void stageBegan(std::string_view stage, std::string_view) override {
    _outputs.push_back("began " + std::string{stage});
  }
  void stageEnded(std::string_view stage) override { _outputs.push_back("ended " + std::string{stage}); }

 private:
  Outputs& _outputs;
};

// A device with the shipped account configuration and a directory for the logs, on which migrations are run.
class MigrationDevice : public FakeDevice {
 public:
  MigrationDevice();

  void observe();  // records the stages in `outputs`
  void switchRecordsOn();
  void putSettings(std::int64_t version, Array accounts);
  // The elements of "Accounts" in the settings file.
  [[nodiscard]] Array savedAccounts();
  [[nodiscard]] std::vector<std::string> savedIdentifiers();
  [[nodiscard]] std::vector<std::string> namesOfStages() const;  // of those that began, in order
};

// The text under a key; "(none)" where there is none.
[[nodiscard]] std::string textIn(const Dictionary& dictionary, std::string_view key);

}  // namespace tests
