#include "tests/support/migration_device.h"

#include "tests/support/account_configuration.h"

namespace tests {

MigrationDevice::MigrationDevice() {
  putAccountConfiguration(*this);
  files->putDirectory(kSettingsCopy.parent_path());
  files->putDirectory(kLegacyMailFile.parent_path());
}

void MigrationDevice::observe() { setObserver(std::make_shared<RecordingObserver>(outputs)); }

void MigrationDevice::switchRecordsOn() {
  preferences->switches[{"com.vorlix.accountsettings-logging", "ASSaveMigrationInformation"}] = true;
}

void MigrationDevice::putSettings(std::int64_t version, Array accounts) {
  put(kSettingsFile, Dictionary{{"Accounts", std::move(accounts)}, {"Version", version}});
}

Array MigrationDevice::savedAccounts() {
  const Dictionary file = dictionaryAt(kSettingsFile);
  const Array* const accounts = file.array("Accounts");
  return accounts == nullptr ? Array{} : *accounts;
}

std::vector<std::string> MigrationDevice::savedIdentifiers() {
  std::vector<std::string> saved;
  for (const PropertyValue& account : savedAccounts()) {
    saved.push_back(textIn(*account.asDictionary(), "Identifier"));
  }
  return saved;
}

std::vector<std::string> MigrationDevice::namesOfStages() const {
  std::vector<std::string> names;
  for (const std::string& output : outputs) {
    if (output.starts_with("began ")) names.push_back(output.substr(6));
  }
  return names;
}

std::string textIn(const Dictionary& dictionary, std::string_view key) {
  const Text* const text = dictionary.text(key);
  return text == nullptr ? "(none)" : text->string();
}

}  // namespace tests
