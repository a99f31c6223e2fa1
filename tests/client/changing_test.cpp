#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <stdexcept>
#include <thread>

#include "tests/support/device_with_accounts.h"

namespace tests {
namespace {

using accounts::Account;
using accounts::Change;
using accounts::Code;
using accounts::Edit;
using accounts::Value;
using testing::ElementsAre;
using testing::Optional;

class ChangingAccounts : public DeviceWithAccounts {
 protected:
  // What the change did to each account.
  static std::vector<std::string> told(const accounts::Result<accounts::Saved>& saved) {
    std::vector<std::string> lines;
    if (!saved.isOk()) return {saved.error().sentence};
    static constexpr const char* kinds[] = {"added ", "changed ", "removed "};
    for (const Change& change : saved->changes) {
      lines.push_back(kinds[static_cast<int>(change.kind)] + change.account.identifier());
      for (const std::string& key : change.keys) lines.back() += " " + key;
    }
    return lines;
  }

  [[nodiscard]] ino_t node() const {
    struct stat status {};
    ::stat((device.root / kSettings).c_str(), &status);
    return status.st_ino;
  }

  [[nodiscard]] accounts::Result<accounts::Saved> setPort(const Value& port, const accounts::OpenOptions& how) const {
    return opened(how).change([&](Edit& edit) { return edit.set("M1", "Port", port).isOk(); });
  }
  [[nodiscard]] accounts::Result<accounts::Saved> setPort(const Value& port) const { return setPort(port, options()); }
};

TEST_F(ChangingAccounts, SavesAProperty) {
  EXPECT_THAT(told(setPort(143)), ElementsAre("changed M1 Port"));
  EXPECT_THAT(looked().withIdentifier("M1")->integer("Port"), Optional(143));
}

TEST_F(ChangingAccounts, ErasesAProperty) {
  const auto saved = opened().change([](Edit& edit) { return edit.erase("M1", "Port").isOk(); });
  EXPECT_THAT(told(saved), ElementsAre("changed M1 Port"));
  EXPECT_EQ(looked().withIdentifier("M1")->property("Port"), std::nullopt);
}

TEST_F(ChangingAccounts, ChangesAChildAndNothingOfItsParent) {
  const auto saved = opened().change([](Edit& edit) { return edit.set("C1", "Username", "ada").isOk(); });
  EXPECT_THAT(told(saved), ElementsAre("changed C1 Username"));
  EXPECT_THAT(looked().withIdentifier("C1")->username(), Optional(std::string{"ada"}));
}

TEST_F(ChangingAccounts, AddsAndRemovesAccountsAndChildren) {
  const auto saved = opened().change([](Edit& edit) {
    return edit.add({"LDAP", "LDAPAccount", {{"Identifier", "L1"}}, ""}).isOk() &&
           edit.add({"CardDAV", "CardDAVAccount", {{"Identifier", "C2"}}, "V1"}).isOk() && edit.remove("C1").isOk() &&
           edit.remove("M1").isOk();
  });
  EXPECT_THAT(told(saved), ElementsAre("removed M1", "removed C1", "added C2", "added L1"));
  EXPECT_EQ(looked().size(), 2U);
  EXPECT_EQ(looked().withIdentifier("C2")->parentIdentifier(), "V1");
}

TEST_F(ChangingAccounts, GivesANewAccountAnIdentifierOfItsOwn) {
  std::string identifier;
  ASSERT_TRUE(opened()
                  .change([&](Edit& edit) {
                    identifier = edit.add({"LDAP", "LDAPAccount", {}, ""}).value().identifier();
                    return true;
                  })
                  .isOk());
  EXPECT_EQ(identifier.size(), 36U);
  EXPECT_TRUE(looked().withIdentifier(identifier).has_value());
}

TEST_F(ChangingAccounts, SwitchesDataclasses) {
  const auto saved = opened().change([&](Edit& edit) {
    return edit.setEnabled("M1", kNotes, true).isOk() && edit.setEnabled("M1", kMail, false).isOk();
  });
  EXPECT_THAT(told(saved), ElementsAre("changed M1 Enabled Dataclasses"));
  EXPECT_THAT(looked().withIdentifier("M1")->enabledDataclasses(), ElementsAre(kNotes));
}

TEST_F(ChangingAccounts, RemovesEveryAccountOfTheIdentifier) {
  putAccounts(account("L1") + account("L2") + account("L1"));
  const auto saved = opened().change([](Edit& edit) { return edit.remove("L1").isOk(); });
  EXPECT_THAT(told(saved), ElementsAre("removed L1"));
  EXPECT_EQ(looked().size(), 1U);
}

TEST_F(ChangingAccounts, HasNothingOfAnAccountOnceItWasRemoved) {
  auto edit = opened().edit();
  ASSERT_TRUE(edit->remove("V1").isOk());
  EXPECT_FALSE(edit->account("V1").has_value());
  EXPECT_FALSE(edit->account("C1").has_value());
  EXPECT_EQ(codeOf(edit->remove("V1")), Code::unknownAccount);
  EXPECT_EQ(codeOf(edit->set("C1", "Port", 1)), Code::unknownAccount);
  EXPECT_EQ(codeOf(edit->add({"CardDAV", "CardDAVAccount", {{"Identifier", "C2"}}, "V1"})), Code::unknownAccount);
  EXPECT_EQ(edit->accounts().size(), 1U);
}

TEST_F(ChangingAccounts, AddsAnotherAccountInThePlaceOfOneThatWasRemoved) {
  const auto saved = opened().change([](Edit& edit) {
    return edit.remove("M1").isOk() && edit.set("V1", "Port", 1).isOk() &&
           edit.add({"LDAP", "LDAPAccount", {{"Identifier", "M1"}, {"Word", "anew"}}, ""}).isOk();
  });
  ASSERT_TRUE(saved.isOk()) << saved.error().sentence;
  EXPECT_EQ(looked().size(), 2U);
  EXPECT_THAT(looked().withIdentifier("M1")->text("Word"), Optional(std::string{"anew"}));
}

TEST_F(ChangingAccounts, AddsARecordAsItIsInItsOrder) {
  const Value::Dictionary record{{"Port", 1}, {"Class", "LDAPAccount"}, {"Identifier", "L1"}, {"Type", "LDAP"}};
  ASSERT_TRUE(opened().change([&](Edit& edit) { return edit.add({"", "", record, ""}).isOk(); }).isOk());
  EXPECT_THAT(looked().withIdentifier("L1")->keys(), ElementsAre("Port", "Class", "Identifier", "Type"));
}

TEST_F(ChangingAccounts, RewritesTheFileWithWhatLoadingRepaired) {
  putAccounts(account("M1", "Mail", "<key>AccountPath</key><string>~/Library/Mail/IMAP-a@b</string>"));
  ASSERT_TRUE(opened()
                  .change([](Edit& edit) {
                    edit.rewrite();
                    return true;
                  })
                  .isOk());
  EXPECT_THAT(device.root.contents(kSettings), testing::HasSubstr("IMAPAccount"));
}

TEST_F(ChangingAccounts, AreTriedWithoutALockOrATrace) {
  const std::string before = device.root.contents(kSettings);
  const auto settings = opened();
  auto edit = settings.edit();
  auto trial = settings.trial();
  ASSERT_TRUE(trial->set("M1", "Port", 1).isOk());
  EXPECT_THAT(told(trial->save()), ElementsAre("changed M1 Port"));
  ASSERT_TRUE(edit->save().isOk());
  EXPECT_EQ(device.root.contents(kSettings), before);
}

TEST_F(ChangingAccounts, ShowsWhatWasChangedSoFar) {
  auto edit = opened().edit();
  ASSERT_TRUE(edit->set("C1", "Port", 1).isOk());
  EXPECT_THAT(edit->account("C1")->integer("Port"), Optional(1));
  EXPECT_EQ(edit->accounts().size(), 2U);
  EXPECT_EQ(looked().withIdentifier("C1")->integer("Port"), std::nullopt);
}

TEST_F(ChangingAccounts, LeavesTheFileAloneWhereNothingChanges) {
  const ino_t before = node();
  EXPECT_THAT(told(setPort(993)), ElementsAre());
  EXPECT_EQ(node(), before);
}

TEST_F(ChangingAccounts, SavesNothingThatIsGivenUpOrThrown) {
  const ino_t before = node();
  EXPECT_EQ(codeOf(opened().change([](Edit& edit) {
              EXPECT_TRUE(edit.remove("M1").isOk());
              return false;
            })),
            Code::cancelled);
  EXPECT_THROW(static_cast<void>(opened().change([](Edit&) -> bool { throw std::runtime_error{"caller's"}; })),
               std::runtime_error);
  EXPECT_EQ(node(), before);
  EXPECT_TRUE(setPort(1).isOk()) << "the lock was given back";
}

TEST_F(ChangingAccounts, SaysWhichSingleStepCannotBeDone) {
  auto edit = opened().edit();
  EXPECT_EQ(codeOf(edit->set("X", "Port", 1)), Code::unknownAccount);
  EXPECT_EQ(codeOf(edit->remove("X")), Code::unknownAccount);
  EXPECT_EQ(codeOf(edit->set("M1", "Identifier", "M2")), Code::unsuitable);
  EXPECT_EQ(codeOf(edit->erase("V1", "ChildAccounts")), Code::unsuitable);
  EXPECT_EQ(codeOf(edit->setEnabled("M1", kContacts, true)), Code::unsuitable);
  EXPECT_EQ(codeOf(edit->add({"LDAP", "LDAPAccount", {{"Identifier", "C1"}}, ""})), Code::alreadyThere);
  EXPECT_EQ(codeOf(edit->add({"No such type", "A", {}, ""})), Code::wouldBeDropped);
  EXPECT_EQ(codeOf(edit->add({"CalDAV", "A", {}, "C1"})), Code::unsuitable);
}

TEST_F(ChangingAccounts, AnswersTheFirstStepThatFailedWhereItIsGivenUp) {
  const auto saved = opened().change([](Edit& edit) {
    static_cast<void>(edit.set("M1", "Port", 1));
    static_cast<void>(edit.add({"No such type", "A", {}, ""}));
    return edit.remove("X").isOk();
  });
  EXPECT_EQ(codeOf(saved), Code::wouldBeDropped);
  EXPECT_THAT(saved.error().sentence, testing::HasSubstr("No such type"));
  auto edit = opened().edit();
  EXPECT_EQ(edit->failure(), std::nullopt);
  EXPECT_EQ(codeOf(edit->erase("V1", "Identifier")), Code::unsuitable);
  EXPECT_EQ(edit->failure()->code, Code::unsuitable);
}

TEST_F(ChangingAccounts, IsOverOnceItWasMovedFrom) {
  auto from = std::move(opened().edit()).value();
  const auto to = std::move(from);
  EXPECT_EQ(codeOf(from.set("M1", "Port", 1)), Code::finished);
  EXPECT_EQ(codeOf(from.add({"LDAP", "A", {}, ""})), Code::finished);
  EXPECT_EQ(codeOf(from.remove("M1")), Code::finished);
  EXPECT_EQ(codeOf(from.save()), Code::finished);
  from.rewrite();
  EXPECT_THAT(from.accounts(), ElementsAre());
  EXPECT_FALSE(from.account("M1").has_value());
  EXPECT_FALSE(from.failure().has_value());
  EXPECT_EQ(to.accounts().size(), 2U);
}

TEST_F(ChangingAccounts, IsOverOnceItIsSaved) {
  auto edit = opened().edit();
  ASSERT_TRUE(edit->save().isOk());
  EXPECT_EQ(codeOf(edit->save()), Code::finished);
  EXPECT_EQ(codeOf(edit->set("M1", "Port", 1)), Code::finished);
}

TEST_F(ChangingAccounts, SavesNoAccountThatTheNextLoadWouldDrop) {
  for (const auto& [identifier, key, value] : {std::tuple{"M1", "Type", "No such type"},
                                               {"C1", "Type", "No such type"},
                                               {"V1", "Class", ""},
                                               {"M1", "Class", "Of no mail account"}}) {
    EXPECT_EQ(codeOf(opened().change([&, identifier = identifier, key = key, value = value](Edit& edit) {
                return edit.set(identifier, key, value).isOk();
              })),
              Code::wouldBeDropped)
        << identifier << key;
  }
}

TEST_F(ChangingAccounts, RemovesNoRecordThatItCannotLoadUnlessItMay) {
  putAccounts(kAccounts + account("later", "A type to come"));
  EXPECT_EQ(codeOf(setPort(1)), Code::wouldDropOthers);
  auto may = options();
  may.mayDropUnreadable = true;
  EXPECT_TRUE(opened(may).change([](Edit& edit) { return edit.set("M1", "Port", 1).isOk(); }).isOk());
}

TEST_F(ChangingAccounts, DoesNotWaitForItself) {
  const auto settings = opened();
  const auto edit = settings.edit();
  EXPECT_EQ(codeOf(settings.edit()), Code::nested);
}

TEST_F(ChangingAccounts, WaitsForAnotherThreadsChange) {
  auto first = std::optional{std::move(opened().edit()).value()};
  std::thread second{[this] { EXPECT_EQ(codeOf(opened().edit()), Code::busy); }};
  second.join();
  first.reset();
  EXPECT_TRUE(setPort(1).isOk());
}

TEST_F(ChangingAccounts, KeepsNobodyFromLooking) {
  const auto settings = opened();
  const auto edit = settings.edit();
  EXPECT_EQ(settings.accounts().value().size(), 2U);
}

TEST_F(ChangingAccounts, TakesTheMigrationLock) {
  const auto edit = opened().edit();
  const int file = ::open((device.root / kLock).c_str(), O_RDONLY | O_CLOEXEC);
  EXPECT_EQ(::flock(file, LOCK_EX | LOCK_NB), -1);
  ::close(file);
}

TEST_F(ChangingAccounts, RefusesALockFileThatAStrangerMayHold) {
  if (::geteuid() != 0) GTEST_SKIP() << "only root can become somebody else";
  EXPECT_EQ(besideAStrangersLock([this] { return codeOf(setPort(1)); }), Code::refused);
}

// --- Somebody who takes no lock replaces the file meanwhile ---

TEST_F(ChangingAccounts, KeepsWhatAnEditorSavedMeanwhile) {
  auto edit = opened().edit();
  ASSERT_TRUE(edit->set("M1", "Port", 1).isOk());
  replaceAccounts(kAccounts + account("E1"));
  EXPECT_THAT(told(edit->save()), ElementsAre("changed M1 Port"));
  EXPECT_TRUE(looked().withIdentifier("E1").has_value());
  EXPECT_THAT(looked().withIdentifier("M1")->integer("Port"), Optional(1));
}

TEST_F(ChangingAccounts, SaysWhereAnEditorTookTheAccountAway) {
  auto edit = opened().edit();
  ASSERT_TRUE(edit->set("M1", "Port", 1).isOk());
  replaceAccounts(account("E1"));
  EXPECT_EQ(codeOf(edit->save()), Code::conflict);
  EXPECT_EQ(looked().size(), 1U);
}

TEST_F(ChangingAccounts, OverwritesNoFileThatALaterReleasePutThere) {
  auto edit = opened().edit();
  ASSERT_TRUE(edit->set("M1", "Port", 1).isOk());
  replaceAccounts(kAccounts, 13);
  EXPECT_EQ(codeOf(edit->save()), Code::newer);
}

// --- Saves that fail ---

TEST_F(ChangingAccounts, SaysThatTheFileCouldNotBeReplaced) {
  device.root.put("var/mobile/tmp", "a file where the new one is to be made");
  const ino_t before = node();
  EXPECT_EQ(codeOf(setPort(1)), Code::notSaved);
  EXPECT_EQ(node(), before);
}

TEST_F(ChangingAccounts, SaysThatTheDiskIsFullWhicheverStepOfTheSaveFinds) {
  int failures = 0;
  for (int operation = 1; operation < 100; ++operation) {
    const auto files = fillDiskAt(operation);
    const auto settings = accounts::AccountSettings::open();
    if (!settings) continue;  // found before there was anything to save
    const auto saved = settings->change([&](Edit& edit) { return edit.set("M1", "Port", operation).isOk(); });
    if (files->mishapAt().empty()) break;
    if (saved.isOk()) continue;  // what could be done without
    EXPECT_EQ(saved.error().code, Code::noSpace) << files->mishapAt() << ": " << saved.error().sentence;
    ++failures;
  }
  EXPECT_GT(failures, 2);
}

TEST_F(ChangingAccounts, SaysThatTheUserMayNotSave) {
  const auto settings = opened();
  const Code code = asStranger([&] { return codeOf(settings.edit()); });
  EXPECT_EQ(code, Code::noPermission);
}

TEST_F(ChangingAccounts, SaysThatThoseWhoListenCouldNotBeTold) {
  auto opens = options();
  opens.opensModules = true;
  const auto saved = setPort(1, opens);
  ASSERT_TRUE(saved.isOk());
  EXPECT_EQ(saved->notAnnounced->code, Code::notAnnounced);
  EXPECT_THAT(looked().withIdentifier("M1")->integer("Port"), Optional(1));
  EXPECT_EQ(codeOf(opened(opens).willChange(*looked().withIdentifier("M1"), kMail)), Code::notAnnounced);
}

TEST_F(ChangingAccounts, MakesTheFirstFileOfADevice) {
  std::filesystem::remove(device.root / kSettings);
  auto may = options();
  may.mayBeMissing = true;
  const auto saved = opened(may).change([](Edit& edit) {
    return edit.add({"LDAP", "A", {{"Identifier", "L1"}}, ""}).isOk();
  });
  EXPECT_THAT(told(saved), ElementsAre("added L1"));
  EXPECT_EQ(looked().size(), 1U);
}

}  // namespace
}  // namespace tests
