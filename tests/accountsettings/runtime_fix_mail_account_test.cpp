#include "accountsettings/as_runtime_fix_mail_account.h"

#include <gtest/gtest.h>

#include <algorithm>

#include "accountsettings/assertion_failure.h"
#include "accountsettings/mail_functions.h"
#include "tests/support/account_store.h"

namespace tests {
namespace {

using accountsettings::ASRuntimeFixMailAccount;
using accountsettings::BasicAccount;
using accountsettings::FixAnswer;

class FixingMailAccounts : public AccountStore {
 protected:
  static Dictionary mail(std::string_view className, const std::optional<PropertyValue>& path = std::nullopt,
                         std::string_view type = "Mail") {
    Dictionary dictionary = properties("m", {{"Class", className}}, type);
    if (path) dictionary.set("AccountPath", *path);
    return dictionary;
  }
  static FixAnswer fix(const Account& account) {
    return ASRuntimeFixMailAccount::init()->fixBasicAccountIfNeeded_loggingMessage(*account, "loading accounts");
  }
  static Account made(const Dictionary& dictionary) {
    return accountsettings::BasicAccount::initWithProperties(dictionary);
  }
  [[nodiscard]] std::ptrdiff_t notices() const {
    return std::ranges::count(device.outputs, "preferences com.vorlix.mobilemail MailAccounts");
  }
};

TEST_F(FixingMailAccounts, LooksAtTheTwoTypesThatTheMailApplicationKeeps) {
  EXPECT_EQ(ASRuntimeFixMailAccount::init()->supportedAccountTypes(),
            (std::unordered_set<std::string_view>{"Mail", "Nimbra"}));
  EXPECT_EQ(&ASRuntimeFixMailAccount::init()->supportedAccountTypes(),
            &ASRuntimeFixMailAccount::init()->supportedAccountTypes());
}

TEST_F(FixingMailAccounts, IsTheOneFixerThatAStoreMakesAndAFreshOneEachTime) {
  const Store store = load({});
  const auto fixers = store->_createRuntimeFixers();
  ASSERT_EQ(fixers.size(), 1U);
  EXPECT_NE(std::dynamic_pointer_cast<ASRuntimeFixMailAccount>(fixers[0]), nullptr);
  EXPECT_NE(fixers[0], store->_createRuntimeFixers()[0]);
}

// All that a fixer has to answer.
class DroppingFixer final : public accountsettings::RuntimeFixer {
 public:
  FixAnswer fixBasicAccountIfNeeded_loggingMessage(BasicAccount& /*account*/, std::string_view message) override {
    heard.emplace_back(message);
    return FixAnswer::drop;
  }
  void accountsHaveBeenSaved(bool saved) override { heard.emplace_back(saved ? "saved" : "loaded"); }

  std::vector<std::string> heard;
};

TEST(AFixer, AnswersTwoOperationsAndNothingElse) {
  FakeDevice device;
  putAccountConfiguration(device);
  DroppingFixer dropping;
  accountsettings::RuntimeFixer& fixer = dropping;
  EXPECT_EQ(fixer.fixBasicAccountIfNeeded_loggingMessage(*account("a"), "loading accounts"), FixAnswer::drop);
  fixer.accountsHaveBeenSaved(false);
  EXPECT_EQ(dropping.heard, (std::vector<std::string>{"loading accounts", "loaded"}));
}

TEST_F(FixingMailAccounts, LeavesEveryClassAloneThatTheMailApplicationKnows) {
  for (const char* const className : {"WexmoAccount", "NimbraAccount", "POPAccount", "IMAPAccount", "AOLAccount",
                                      "LocalAccount", "GmailAccount", "YahooAccount"}) {
    for (const char* const type : {"Mail", "Nimbra"}) {
      const Account account = made(mail(className, "Mail/POP-x", type));
      EXPECT_EQ(fix(account), FixAnswer::nothingToDo) << className;
      EXPECT_EQ(account->accountClass(), Text{className});
    }
  }
}

TEST_F(FixingMailAccounts, LeavesAccountsOfOtherTypesAlone) {
  for (const char* const type : {"Exchange", "Gmail", "Yahoo", "KeldorIMAP"}) {
    EXPECT_EQ(fix(made(mail("MailAccount", "Mail/POP-x", type))), FixAnswer::nothingToDo) << type;
  }
  EXPECT_TRUE(device.logMessages().empty());
}

TEST_F(FixingMailAccounts, DerivesTheClassFromThePath) {
  const std::vector<std::pair<std::string, const char*>> cases{
      {"/var/mobile/Library/Mail/Lumo-x", "WexmoAccount"},
      {"Mail/Nimbra-x", "NimbraAccount"},
      {"Mail/AOL-x", "AOLAccount"},
      {"Mail/Mailboxes", "LocalAccount"},
      {"Mail/IMAP-anna@gmail.com@imap.gmail.com", "GmailAccount"},
      {"Mail/IMAP-anna@imap.mail.yahoo.com", "YahooAccount"},
      {"Mail/POP-x", "POPAccount"},
      {"Mail/IMAP-x", "IMAPAccount"}};
  for (const auto& [path, className] : cases) {
    const Account account = made(mail("MailAccount", path));
    EXPECT_EQ(fix(account), FixAnswer::repaired) << path;
    EXPECT_EQ(account->accountClass(), Text{className});
  }
}

TEST_F(FixingMailAccounts, LetsTheEarlierFragmentOfTheTableWinWhereverItStands) {
  const std::vector<std::string> inOrder{
      "Mail/Lumo-",           "Mail/Nimbra-", "Mail/AOL-", "Mail/Mailboxes", "gmail.com@imap.gmail.com",
      "@imap.mail.yahoo.com", "Mail/POP-",    "Mail/IMAP-"};
  const std::vector<const char*> classes{"WexmoAccount", "NimbraAccount", "AOLAccount", "LocalAccount",
                                         "GmailAccount", "YahooAccount",  "POPAccount", "IMAPAccount"};
  for (std::size_t first = 0; first < inOrder.size(); ++first) {
    std::string path;
    for (std::size_t fragment = first; fragment < inOrder.size(); ++fragment) path = inOrder[fragment] + path;
    const Account account = made(mail("MailAccount", path));
    fix(account);
    EXPECT_EQ(account->accountClass(), Text{classes[first]}) << path;
  }
}

TEST_F(FixingMailAccounts, DerivesTheClassOfAnAccountThatHasLostIt) {
  const Account account = made(mail("MailAccount", "Mail/POP-x"));
  account->_forcedSetAccountProperty_forKey(5, "Class");
  EXPECT_EQ(fix(account), FixAnswer::repaired);
  EXPECT_EQ(account->accountClass(), Text{"POPAccount"});
}

TEST_F(FixingMailAccounts, DropsAnAccountWhosePathSaysNothing) {
  const std::vector<std::optional<PropertyValue>> paths{std::nullopt, "", "mail/imap-x", "Mail/Exchange-x", 5};
  for (const auto& path : paths) {
    const Account account = made(mail("MailAccount", path, "Nimbra"));
    EXPECT_EQ(fix(account), FixAnswer::drop);
    EXPECT_EQ(account->properties(), mail("MailAccount", path, "Nimbra"));
  }
  EXPECT_EQ(messagesOf("-[ASRuntimeFixMailAccount _cleanupAccountClass:]").front(),
            "Could not fix the class of the mail account: {Identifier = \"m\"; Type = \"Nimbra\"; Class = "
            "\"MailAccount\"}");
}

TEST_F(FixingMailAccounts, AnnouncesARepairOnceItHasBeenSaved) {
  const Store store = load({});
  store->insertAccount(made(mail("MailAccount", "Mail/IMAP-x")));
  store->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), (Array{mail("IMAPAccount", "Mail/IMAP-x")}));
  EXPECT_EQ(notices(), 1);
  store->saveAllAccounts();
  EXPECT_EQ(notices(), 1);
}

TEST_F(FixingMailAccounts, AnnouncesARepairAfterAFailedSaveToo) {
  const Store store = load({});
  store->insertAccount(made(mail("MailAccount", "Mail/IMAP-x")));
  device.files->failing = {"rename"};
  store->saveAllAccounts();
  EXPECT_EQ(notices(), 1);
}

TEST_F(FixingMailAccounts, AnnouncesARepairBeforeAnybodyIsToldOfTheSave) {
  const Store store = load({});
  const Account account = made(mail("MailAccount", "Mail/IMAP-x"));
  account->setEnabled_forDataclass(true, "com.vorlix.Dataclass.Mail");
  store->insertAccount(account);
  EXPECT_THROW(store->saveAllAccounts(), accountsettings::AssertionFailure);  // the configuration names no notifiers
  EXPECT_EQ(notices(), 1);
}

TEST_F(FixingMailAccounts, SaysNothingOfARepairMadeWhileLoading) {
  const Store store = load({mail("MailAccount", "Mail/IMAP-x")});
  EXPECT_EQ(store->allBasicAccounts()[0]->accountClass(), Text{"IMAPAccount"});
  store->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), (Array{mail("IMAPAccount", "Mail/IMAP-x")}));
  EXPECT_EQ(notices(), 0);
}

TEST_F(FixingMailAccounts, AnnouncesAnAccountThatItDropsAtASave) {
  const Store store = load({});
  store->insertAccount(made(mail("MailAccount")));
  store->saveAllAccounts();
  EXPECT_EQ(notices(), 1);
  EXPECT_EQ(fileAccounts(), (Array{mail("MailAccount")}));
  EXPECT_EQ(AccountsManager::init()->count(), 0U);
}

TEST_F(FixingMailAccounts, AnnouncesNothingOfAnAccountThatNeedsNoRepair) {
  const Store store = load({mail("IMAPAccount")});
  store->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), (Array{mail("IMAPAccount")}));
  EXPECT_EQ(notices(), 0);
}

TEST_F(FixingMailAccounts, ForgetsARepairOnceItWasToldWhetherItWasSaved) {
  const auto fixer = ASRuntimeFixMailAccount::init();
  const Account account = made(mail("MailAccount", "Mail/POP-x"));
  fixer->fixBasicAccountIfNeeded_loggingMessage(*account, "loading accounts");
  fixer->accountsHaveBeenSaved(false);
  fixer->accountsHaveBeenSaved(true);
  EXPECT_EQ(notices(), 0);
}

TEST_F(FixingMailAccounts, ReportsAFoundGenericClassToNobody) {
  accountsettings::reportMailAccountClassFound(mail("MailAccount"), "converted");
  EXPECT_TRUE(device.outputs.empty());
}

}  // namespace
}  // namespace tests
