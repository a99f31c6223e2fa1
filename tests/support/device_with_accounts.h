#pragma once

#include <gmock/gmock.h>
#include <sys/resource.h>
#include <unistd.h>

#include <filesystem>
#include <new>
#include <string>
#include <system_error>
#include <utility>

#include "accounts/account_settings.h"
#include "accountsettings/accounts_manager.h"
#include "platform/platform.h"
#include "tests/support/mishap_file_system.h"
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
    device.root.put(kSettings, withAccounts(accounts, version));
  }
  static std::string withAccounts(const std::string& accounts, int version = accountsettings::kCurrentVersion) {
    return RealDevice::xml("<key>Accounts</key><array>" + accounts + "</array><key>Version</key><integer>" +
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
    std::filesystem::rename(device.root.put("replacement", withAccounts(accounts, version)), device.root / kSettings);
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

  // What the function answers to a user who may not read the settings.
  template <typename Function>
  auto asStranger(const Function& function) const -> decltype(function()) {
    std::filesystem::permissions(device.root.path(), std::filesystem::perms::all);
    std::filesystem::permissions(device.root / kSettings, std::filesystem::perms::none);
    const uid_t user = ::geteuid();
    EXPECT_EQ(::seteuid(user == 0 ? 12346 : user), 0);
    const auto answer = function();
    EXPECT_EQ(::seteuid(user), 0);
    return answer;
  }

  // What the function answers to the settings' owner where the migration lock is a stranger's file; for root only.
  template <typename Function>
  auto besideAStrangersLock(const Function& function) const -> decltype(function()) {
    device.root.put(kLock, "");
    for (const char* directory : {"", "tmp", "var/mobile/Library/Preferences"}) {
      std::filesystem::permissions(device.root / directory, std::filesystem::perms::all);
    }
    EXPECT_EQ(::chown((device.root / kLock).c_str(), 12345, 12345), 0);
    EXPECT_EQ(::chown((device.root / kSettings).c_str(), 12346, 12346), 0);
    EXPECT_EQ(::seteuid(12346), 0);
    const auto answer = function();
    EXPECT_EQ(::seteuid(0), 0);
    return answer;
  }

  // What the function answers where the process can have no further file, and no further watch. A sanitizer looks for
  // an object's type through a pipe, and remembers what it saw: so the same is to be done once while there are files.
  template <typename Function>
  static auto withoutDescriptors(const Function& function) -> decltype(function()) {
    EXPECT_FALSE(std::generic_category().message(EMFILE).empty());
    rlimit before{};
    EXPECT_EQ(::getrlimit(RLIMIT_NOFILE, &before), 0);
    const int lowest = ::dup(0);
    ::close(lowest);
    const rlimit none{static_cast<rlim_t>(lowest), before.rlim_max};
    EXPECT_EQ(::setrlimit(RLIMIT_NOFILE, &none), 0);
    const auto answer = function();
    EXPECT_EQ(::setrlimit(RLIMIT_NOFILE, &before), 0);
    return answer;
  }

  // Makes the process's platform this device, and its memory too short for the first file that is asked for.
  void runOutOfMemory() const {
    platform::Platform services = platform::makeLinuxPlatform({.systemRoot = device.root.path()});
    const Mishap mishap{.kind = Mishap::Kind::diesBefore, .operation = 1};
    services.files =
        std::make_shared<MishapFileSystem>(services.files, mishap, []() -> void { throw std::bad_alloc{}; });
    platform::setCurrent(std::move(services));
  }

  // Makes the process's platform this device, of which nobody is told and whose disk is full at that operation.
  [[nodiscard]] std::shared_ptr<MishapFileSystem> fillDiskAt(int operation) const {
    accountsettings::AccountsManager::_setShouldSkipNotifications(true);
    platform::Platform services = platform::makeLinuxPlatform({.systemRoot = device.root.path()});
    const Mishap full{.kind = Mishap::Kind::failsOnce, .operation = operation, .errorNumber = ENOSPC};
    const auto files = std::make_shared<MishapFileSystem>(services.files, full, [] {});
    services.files = files;
    platform::setCurrent(std::move(services));
    return files;
  }

  RealDevice device;
};

template <typename Value>
accounts::Code codeOf(const accounts::Result<Value>& result) {
  return result.isOk() ? accounts::Code{0} : result.error().code;
}

}  // namespace tests
