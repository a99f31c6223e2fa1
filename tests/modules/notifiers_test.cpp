#include <gmock/gmock.h>

#include "tests/modules/module_device.h"

namespace tests {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::StartsWith;

const std::string kMail = "com.vorlix.Dataclass.Mail";
const std::string kNotes = "com.vorlix.Dataclass.Notes";

class Notifiers : public ModuleDevice {
 protected:
  // A store of one account that is enabled for mail and notes, as a file holds it.
  std::shared_ptr<AccountsManager> storeFromFile() {
    const Dictionary account{
        {"Type", "Mail"}, {"Class", "IMAPAccount"}, {"Identifier", "A"}, {"Enabled Dataclasses", Array{kMail, kNotes}}};
    device.put(AccountsManager::fullPathToAccountSettingsPlist(),
               Dictionary{{"Version", accountsettings::kCurrentVersion}, {"Accounts", Array{account}}});
    return AccountsManager::init();
  }
  void putNotifiers(const Array& entries) { putCreators("Mail", entries); }
  static std::string willChangeFailure(const BasicAccount& account) {
    return failureOf([&] { AccountsManager::accountWillChange_forDataclass(account, kMail); });
  }
};

TEST_F(Notifiers, HearOfASingleChangeBeforeAndAfterIt) {
  putNotifiers({notifier("FullNotifier", {kMail})});
  const auto store = storeFromFile();
  const auto account = store->accountWithIdentifier("A");
  AccountsManager::accountWillChange_forDataclass(*account, kMail);
  AccountsManager::accountDidChange_forDataclass(*account, kMail);
  EXPECT_THAT(journal(), ElementsAre("will A " + kMail, "did A " + kMail));
}

TEST_F(Notifiers, WithoutTheSingleChangeOperationsArePassedOver) {
  putNotifiers({notifier("SavesOnlyNotifier", {kMail}), notifier("FullNotifier", {kMail})});
  const auto store = storeFromFile();
  AccountsManager::accountWillChange_forDataclass(*store->accountWithIdentifier("A"), kMail);
  EXPECT_THAT(journal(), ElementsAre("will A " + kMail));
}

TEST_F(Notifiers, HearNothingOfOtherDataClasses) {
  putNotifiers({notifier("FullNotifier", {kNotes})});
  const auto store = storeFromFile();
  AccountsManager::accountWillChange_forDataclass(*store->accountWithIdentifier("A"), kMail);
  EXPECT_THAT(journal(), IsEmpty());
}

TEST_F(Notifiers, HearOfASaveWithTheirChanges) {
  putNotifiers({notifier("SavesOnlyNotifier", {kMail}), notifier("FullNotifier", {kNotes})});
  const auto store = storeFromFile();
  store->accountWithIdentifier("A")->setEnabled_forDataclass(false, kNotes);
  store->saveAllAccounts();
  EXPECT_THAT(journal(), ElementsAre("FullNotifier {ChangeType = 1; AccountID = \"A\"; AccountType = \"Mail\"; "
                                     "OriginalDataclasses = (\"" +
                                     kMail + "\", \"" + kNotes + "\")}"));
}

TEST_F(Notifiers, HearNothingWhileNotificationsAreSkipped) {
  putNotifiers({notifier("SavesOnlyNotifier", {kMail})});
  const auto store = storeFromFile();
  AccountsManager::_setShouldSkipNotifications(true);
  store->deleteAccountWithIdentifier("A");
  store->saveAllAccounts();
  EXPECT_THAT(journal(), IsEmpty());
}

TEST_F(Notifiers, HearNothingOfASaveThatFailed) {
  putNotifiers({notifier("SavesOnlyNotifier", {kMail})});
  const auto store = storeFromFile();
  store->deleteAccountWithIdentifier("A");
  device.files->failing.insert("rename");
  store->saveAllAccounts();
  EXPECT_THAT(journal(), IsEmpty());
}

TEST_F(Notifiers, WithoutTheOperationForSavesAreAFault) {
  putNotifiers({notifier("DeafNotifier", {kMail})});
  const auto store = storeFromFile();
  store->accountWithIdentifier("A")->setDisplayName("Home");
  EXPECT_THROW(store->saveAllAccounts(), AssertionFailure);
}

TEST_F(Notifiers, OfATypeThatTheConfigurationLacksAreAnAssertionFailure) {
  putCreators("CalDAV", {});
  const auto store = storeFromFile();
  EXPECT_EQ(willChangeFailure(*store->accountWithIdentifier("A")),
            "Malformed AccountCreators information. Could not find the information for the type Mail");
}

struct FaultyNotifier {
  const char* name;
  Dictionary entry;
  std::string message;

  friend void PrintTo(const FaultyNotifier& fault, std::ostream* stream) { *stream << fault.name; }
};

class FaultyNotifiers : public Notifiers, public ::testing::WithParamInterface<FaultyNotifier> {};

TEST_P(FaultyNotifiers, EndTheCallWithAnAssertionFailure) {
  putNotifiers({GetParam().entry});
  const auto store = storeFromFile();
  EXPECT_EQ(willChangeFailure(*store->accountWithIdentifier("A")), GetParam().message);
}

Dictionary notifierOf(Dictionary details) {
  details.set("Supported Dataclasses", Array{kMail});
  return {{"Type", "NotifierAccount"}, {"Description", details}};
}

INSTANTIATE_TEST_SUITE_P(
    Entries, FaultyNotifiers,
    ::testing::Values(
        FaultyNotifier{"NoFramework", notifierOf({{"Class", "FullNotifier"}}),
                       "Malformed AccountCreators information. Could not find the path to the framework for the "
                       "notifier with type Mail"},
        FaultyNotifier{"NoClass", notifierOf(without("Class", description("notifiers", ""))),
                       "Malformed AccountCreators information. Could not find the name of the class for notificatinos "
                       "with the type Mail"},
        FaultyNotifier{"EmptyClass", notifierOf(description("notifiers", "")),
                       "Malformed AccountCreators information. Could not find the name of the class for notificatinos "
                       "with the type Mail"},
        FaultyNotifier{"UnknownClass", notifierOf(description("notifiers", "Nobody")),
                       "Could not find a class for class name Nobody"},
        FaultyNotifier{"ClassOfNoModule", notifierOf(description("without_class", "FullNotifier")),
                       "Could not find a class for class name FullNotifier"}),
    [](const auto& instance) { return std::string{instance.param.name}; });

TEST_F(Notifiers, WithAnUnresolvedSymbolCannotBeOpened) {
  putNotifiers({notifierOf(description("unresolved_symbol", "FullNotifier"))});
  const auto store = storeFromFile();
  EXPECT_THAT(willChangeFailure(*store->accountWithIdentifier("A")),
              StartsWith("Could not load the account creator framework " +
                         (root() / "usr/lib/samples/unresolved_symbol.so").string() + ". Error "));
}

}  // namespace
}  // namespace tests
