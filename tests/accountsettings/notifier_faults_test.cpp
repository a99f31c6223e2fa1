#include "accountsettings/assertion_failure.h"
#include "tests/support/change_notifications.h"

namespace tests {
namespace {

using accountsettings::AssertionFailure;

// What is wrong with a notifier is said by the name of the operation that found it.
class FaultsOfNotifiers : public ChangeNotifications {
 protected:
  static std::string failureOf(const std::function<void()>& call) {
    try {
      call();
    } catch (const AssertionFailure& failure) {
      EXPECT_EQ(failure.file(), "AccountsManager");
      return failure.method() + ": " + failure.message();
    }
    return "no failure";
  }
  std::string failureOfSave() {
    const Store store = load({exchange("a", {kMail})});
    store->allBasicAccounts()[0]->setDisplayName("Home");
    return failureOf([&] { store->saveAllAccounts(); });
  }
  static std::string failureOfSearch(std::string_view type = "Exchange") {
    return failureOf([type] { (void)AccountsManager::_notifierClassNamesForAccountType_dataclass(type, kMail); });
  }
  static constexpr const char* kFind = "+[AccountsManager _notifierClassNamesForAccountType:dataclass:]: ";
  static std::string missing(std::string_view what) {
    return kFind + ("Malformed AccountCreators information. Could not find the " + std::string{what});
  }
};

TEST_F(FaultsOfNotifiers, IncludeATypeThatTheConfigurationDoesNotKnow) {
  putNotifiers("CalDAV", {});
  EXPECT_EQ(failureOfSearch(), missing("information for the type Exchange"));
}

TEST_F(FaultsOfNotifiers, IncludeAConfigurationThatCannotBeRead) {
  device.files->nodes.erase("/resources/AccountCreators.plist");
  EXPECT_EQ(failureOfSearch(), missing("information for the type Exchange"));
}

TEST_F(FaultsOfNotifiers, IncludeAMissingFramework) {
  putNotifiers("Exchange",
               {Dictionary{{"Type", "NotifierAccount"},
                           {"Description", Dictionary{{"Class", "X"}, {"Supported Dataclasses", Array{kMail}}}}}});
  EXPECT_EQ(failureOfSearch(), missing("path to the framework for the notifier with type Exchange"));
}

TEST_F(FaultsOfNotifiers, IncludeAModuleThatCannotBeOpened) {
  device.directories->root = "/images/device";
  device.modules->errors = {{"/images/device/Modules/Test", "out of symbols"}};
  EXPECT_EQ(failureOfSearch(), kFind + std::string{"Could not load the account creator framework "
                                                   "/images/device/Modules/Test. Error out of symbols"});
}

TEST_F(FaultsOfNotifiers, IncludeAMissingOrEmptyClassName) {
  const Dictionary nameless{{"Framework", "/Modules/Test"}, {"Supported Dataclasses", Array{kMail}}};
  const Dictionary entry{{"Type", "NotifierAccount"}, {"Description", nameless}};
  device.put("/resources/AccountCreators.plist",
             Dictionary{{"Exchange", Array{entry}}, {"LDAP", Array{notifier("", {kMail})}}});
  for (const std::string type : {"Exchange", "LDAP"}) {
    EXPECT_EQ(failureOfSearch(type), missing("name of the class for notificatinos with the type " + type));
  }
}

TEST_F(FaultsOfNotifiers, IncludeAClassThatNoModuleDefines) {
  putNotifiers("Exchange", {notifier("Nobody", {kMail})});
  EXPECT_EQ(failureOfSave(),
            "-[AccountsManager _sendNotificationsForChangedAccounts]: Could not find a class for "
            "class name Nobody");
  const Account account = made(exchange("a", {kMail}));
  EXPECT_EQ(failureOf([&] { AccountsManager::accountWillChange_forDataclass(*account, kMail); }),
            "+[AccountsManager accountWillChange:forDataclass:]: Could not find a class for class name Nobody");
  EXPECT_EQ(failureOf([&] { AccountsManager::accountDidChange_forDataclass(*account, kMail); }),
            "+[AccountsManager accountDidChange:forDataclass:]: Could not find a class for class name Nobody");
}

TEST_F(FaultsOfNotifiers, IncludeNotListeningToSavesSinceTheClassIsOfAnotherKind) {
  const platform::ClassRegistration other{std::make_shared<platform::ClassInfo>("OtherKind")};
  putNotifiers("Exchange", {notifier("OtherKind", {kMail})});
  EXPECT_EQ(failureOfSave(),
            "-[AccountsManager _sendNotificationsForChangedAccounts]: The notifier OtherKind does "
            "not answer noteAccountChanges:");
}

TEST_F(FaultsOfNotifiers, DoNotIncludeAClassOfAnotherKindWhereASingleChangeIsTold) {
  const platform::ClassRegistration other{std::make_shared<platform::ClassInfo>("OtherKind")};
  putNotifiers("Exchange", {notifier("OtherKind", {kMail})});
  const Account account = made(exchange("a", {kMail}));
  EXPECT_EQ(failureOf([&] { AccountsManager::accountWillChange_forDataclass(*account, kMail); }), "no failure");
  EXPECT_EQ(failureOf([&] { AccountsManager::accountDidChange_forDataclass(*account, kMail); }), "no failure");
}

TEST_F(FaultsOfNotifiers, NameAnAbsentTypeAsNothing) {
  const Account account = made(exchange("a", {kMail}));
  account->removeAccountPropertyForKey("Type");
  EXPECT_EQ(failureOf([&] { AccountsManager::accountWillChange_forDataclass(*account, kMail); }),
            missing("information for the type (null)"));
  EXPECT_EQ(failureOfSearch(""), missing("information for the type "));
}

TEST_F(FaultsOfNotifiers, IncludeNotListeningToSaves) {
  const platform::ClassRegistration deaf{std::make_shared<AccountClassInfo>("DeafNotifier")};
  putNotifiers("Exchange", {notifier("DeafNotifier", {kMail})});
  EXPECT_EQ(failureOfSave(),
            "-[AccountsManager _sendNotificationsForChangedAccounts]: The notifier DeafNotifier does "
            "not answer noteAccountChanges:");
}

TEST_F(FaultsOfNotifiers, DoNotIncludeNotListeningToSingleChanges) {
  const Account account = made(exchange("a", {kMail}));
  EXPECT_EQ(failureOf([&] { AccountsManager::accountWillChange_forDataclass(*account, kMail); }), "no failure");
  EXPECT_EQ(failureOf([&] { AccountsManager::accountDidChange_forDataclass(*account, kMail); }), "no failure");
}

}  // namespace
}  // namespace tests
