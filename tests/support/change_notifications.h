#pragma once

#include <gmock/gmock.h>

#include <functional>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "accountsettings/account_objects.h"
#include "tests/support/account_store.h"

namespace tests {

using accountsettings::AccountClassInfo;
using Changes = std::vector<Dictionary>;
using Names = std::vector<std::string>;

constexpr const char* kMail = "com.vorlix.Dataclass.Mail";
constexpr const char* kCalendars = "com.vorlix.Dataclass.Calendars";
constexpr const char* kNotes = "com.vorlix.Dataclass.Notes";

// A device with one notifier for each of three data classes and one for two of them, for Exchange accounts.
class ChangeNotifications : public AccountStore {
 protected:
  ChangeNotifications() {
    putNotifiers("Exchange", {notifier("MailNotifier", {kMail}), notifier("CalendarsNotifier", {kCalendars}),
                              notifier("NotesNotifier", {kNotes}), notifier("BothNotifier", {kMail, kCalendars})});
    for (const char* const name : {"MailNotifier", "CalendarsNotifier", "NotesNotifier", "BothNotifier"}) listen(name);
  }

  static Dictionary notifier(std::string_view className, Array dataclasses) {
    return {{"Type", "NotifierAccount"},
            {"Description", Dictionary{{"Framework", "Modules/Test"},
                                       {"Class", className},
                                       {"Supported Dataclasses", std::move(dataclasses)}}}};
  }
  void putNotifiers(std::string_view type, const Array& entries) {
    device.put("/resources/AccountCreators.plist", Dictionary{{type, entries}});
  }
  void listen(const std::string& name) {
    auto info = std::make_shared<AccountClassInfo>(name);
    info->noteAccountChanges = [this, name](const Changes& changes) {
      EXPECT_EQ(heard.count(name), 0U) << "one call for each notifier and save";
      heard[name] = changes;
    };
    _classes.push_back(std::make_unique<platform::ClassRegistration>(std::move(info)));
  }

  static Dictionary exchange(std::string_view identifier, Array dataclasses,
                             std::initializer_list<Dictionary::Entry> more = {}) {
    Dictionary dictionary = properties(identifier, more, "Exchange");
    dictionary.set("Enabled Dataclasses", std::move(dataclasses));
    return dictionary;
  }
  static Account made(const Dictionary& dictionary) {
    return accountsettings::BasicAccount::initWithProperties(dictionary);
  }
  static Dictionary entry(int change, std::string_view identifier, Array original) {
    return {{"ChangeType", change},
            {"AccountID", identifier},
            {"AccountType", "Exchange"},
            {"OriginalDataclasses", std::move(original)}};
  }

  void save(const Store& store) {
    heard.clear();
    store->saveAllAccounts();
  }
  [[nodiscard]] Names whoHeard() const {
    Names names;
    for (const auto& [name, changes] : heard) names.push_back(name);
    return names;
  }
  // Saves the account with the edit and answers who heard of it.
  Names whoHearsOf(const Dictionary& loaded, const std::function<void(accountsettings::BasicAccount&)>& edit) {
    const Store store = load({loaded});
    edit(*store->allBasicAccounts()[0]);
    save(store);
    return whoHeard();
  }

  std::map<std::string, Changes> heard;  // by notifier, of the last save

 private:
  std::vector<std::unique_ptr<platform::ClassRegistration>> _classes;
};

}  // namespace tests
