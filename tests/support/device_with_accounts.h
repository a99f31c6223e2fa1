#pragma once

#include <gmock/gmock.h>
#include <unistd.h>

#include <filesystem>
#include <string>
#include <utility>

#include "accounts/account_settings.h"
#include "accountsettings/accounts_manager.h"
#include "tests/support/real_device.h"

namespace tests {

using namespace std::chrono_literals;

// A device of a few accounts, whose mobile user is whoever runs the test.
class DeviceWithAccounts : public ::testing::Test {
 protected:
  static constexpr const char* kSettings = "var/mobile/Library/Preferences/com.vorlix.accountsettings.plist";
  static constexpr const char* kLock = "tmp/AccountMigrationInProgress";
  static constexpr const char* kMail = "com.vorlix.Dataclass.Mail";
  static constexpr const char* kNotes = "com.vorlix.Dataclass.Notes";
  static constexpr const char* kContacts = "com.vorlix.Dataclass.Contacts";
  static constexpr const char* kAccounts =
      "<dict><key>Type</key><string>Mail</string><key>Class</key><string>IMAPAccount</string>"
      "<key>Identifier</key><string>M1</string><key>Sync Identifier</key><string>S1</string>"
      "<key>DisplayName</key><string>Home</string><key>Username</key><string>ines</string>"
      "<key>Port</key><integer>993</integer><key>Secure</key><string>YES</string>"
      "<key>Enabled Dataclasses</key><array><string>com.vorlix.Dataclass.Mail</string></array></dict>"
      "<dict><key>Type</key><string>VorlixAccount</string><key>Class</key><string>KQAccount</string>"
      "<key>Identifier</key><string>V1</string><key>DisplayName</key><string>Cirrant</string>"
      "<key>Enabled Dataclasses</key><array><string>com.vorlix.Dataclass.Contacts</string></array>"
      "<key>ChildAccounts</key><array><dict><key>Type</key><string>CalDAV</string>"
      "<key>Class</key><string>CalDAVAccount</string><key>Identifier</key><string>C1</string></dict></array></dict>";

  DeviceWithAccounts() {
    const std::string ids = std::to_string(::getuid()) + ":" + std::to_string(::getgid());
    device.root.put("etc/passwd", "mobile:*:" + ids + "::/var/mobile:/bin/sh\n");
    device.root.put("etc/group", "mobile:*:" + std::to_string(::getgid()) + ":\n");
    putAccounts(kAccounts);
  }

  void putAccounts(const std::string& accounts, int version = accountsettings::kCurrentVersion) const {
    device.put(kSettings, "<key>Accounts</key><array>" + accounts + "</array><key>Version</key><integer>" +
                              std::to_string(version) + "</integer>");
  }

  // An account that comes behind the others, or stands alone.
  static std::string account(const std::string& identifier, const std::string& type = "LDAP",
                             const std::string& more = "") {
    return "<dict><key>Type</key><string>" + type + "</string><key>Class</key><string>SomeAccount</string>" +
           "<key>Identifier</key><string>" + identifier + "</string>" + more + "</dict>";
  }

  // As an editor does that knows nothing of us: another file is moved onto the settings.
  void replaceAccounts(const std::string& accounts, int version = accountsettings::kCurrentVersion) const {
    const std::string kept = device.root.contents(kSettings);
    putAccounts(accounts, version);
    const std::string written = device.root.contents(kSettings);
    device.root.put(kSettings, kept);
    std::filesystem::rename(device.root.put("replacement", written), device.root / kSettings);
  }

  [[nodiscard]] accounts::OpenOptions options() const {
    accounts::OpenOptions options;
    options.root = device.root.path();
    options.timeLimit = 200ms;
    return options;
  }

  [[nodiscard]] accounts::AccountSettings opened(const accounts::OpenOptions& options) const {
    auto settings = accounts::AccountSettings::open(options);
    EXPECT_TRUE(settings.isOk()) << (settings.isOk() ? "" : settings.error().sentence);
    return std::move(settings).value();
  }
  [[nodiscard]] accounts::AccountSettings opened() const { return opened(options()); }

  [[nodiscard]] accounts::Accounts looked() const { return opened().accounts().value(); }

  RealDevice device;
};

template <typename Value>
accounts::Code codeOf(const accounts::Result<Value>& result) {
  return result.isOk() ? accounts::Code{0} : result.error().code;
}

}  // namespace tests
