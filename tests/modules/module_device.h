#pragma once

#include <gtest/gtest.h>

#include <filesystem>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "accountsettings/accounts_manager.h"
#include "accountsettings/assertion_failure.h"
#include "platform/linux/linux_platform.h"
#include "tests/modules/sample_journal.h"
#include "tests/support/account_configuration.h"
#include "tests/support/assertion_failures.h"
#include "tests/support/fake_platform.h"
#include "tests/support/scratch_directory.h"

namespace tests {

using accountsettings::AccountsManager;
using accountsettings::AssertionFailure;
using accountsettings::BasicAccount;

// A device whose root is a real directory with the sample modules in it, opened by the real loader. Everything else of
// it is in memory.
class ModuleDevice : public ::testing::Test {
 protected:
  FakeDevice device;

  ModuleDevice() {
    device.directories->root = _scratch.path();
    std::filesystem::create_directories(root() / "usr/lib");
    std::filesystem::copy(SAMPLE_MODULES_DIR, root() / "usr/lib/samples");
    device.changePlatform(
        [](platform::Platform& services) { services.modules = platform::makeLinuxPlatform().modules; });
    device.files->putDirectory(root() / "var/mobile/Library/Preferences");
    putAccountConfiguration(device);
  }
  ModuleDevice(const ModuleDevice&) = delete;
  ModuleDevice& operator=(const ModuleDevice&) = delete;
  ~ModuleDevice() override = default;

  [[nodiscard]] const Path& root() const { return device.directories->root; }

  // Configures the creators of one account type; to be called before the first use of any.
  void putCreators(const std::string& type, const Array& entries) {
    device.put("/resources/AccountCreators.plist", Dictionary{{type, entries}});
  }

  // What the sample modules were asked to do since this was last called.
  static std::vector<std::string> journal() { return std::exchange(samples::journal(), {}); }

  // The message of the assertion failure that the call ends in; where it ends in none, a text that no failure has.
  template <typename Call>
  static std::string failureOf(const Call& call) {
    return tests::failureOf(call).message();
  }

 private:
  const ScratchDirectory _scratch;
};

inline Dictionary description(const std::string& module, const std::string& className) {
  return {{"Framework", "usr/lib/samples/" + module + ".so"}, {"Class", className}};
}

inline Dictionary creator(const std::string& type, const std::string& module, const std::string& className) {
  return {{"Type", type}, {"Description", description(module, className)}};
}

inline Dictionary notifier(const std::string& className, const Array& dataclasses) {
  auto details = description("notifiers", className);
  details.set("Supported Dataclasses", dataclasses);
  return {{"Type", "NotifierAccount"}, {"Description", details}};
}

// The dictionary without one key.
inline Dictionary without(std::string_view key, Dictionary dictionary) {
  dictionary.remove(key);
  return dictionary;
}

}  // namespace tests
