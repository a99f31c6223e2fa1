// The interface as programs in C see it, each of its failures above all. None of them can be `cancelled`: who gives an
// edit up frees it.

#include <fcntl.h>
#include <sys/file.h>

#include <ctime>
#include <functional>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include "account-settings.h"
#include "tests/support/device_with_accounts.h"

namespace tests {
namespace {

using Call = std::function<bool(account_settings_error** error)>;

struct Freed {
  void operator()(account_settings_error* error) const { account_settings_error_free(error); }
  void operator()(account_settings* settings) const { account_settings_free(settings); }
  void operator()(account_settings_edit* edit) const { account_settings_edit_free(edit); }
  void operator()(account_settings_account* account) const { account_settings_account_free(account); }
  void operator()(account_settings_accounts* accounts) const { account_settings_accounts_free(accounts); }
  void operator()(account_settings_changes* changes) const { account_settings_changes_free(changes); }
  void operator()(account_settings_value* value) const { account_settings_value_free(value); }
  void operator()(account_settings_watch* watch) const { account_settings_watch_free(watch); }
};
template <typename Handle>
std::unique_ptr<Handle, Freed> owned(Handle* handle) {
  return std::unique_ptr<Handle, Freed>{handle};
}

class FailuresInC : public DeviceWithAccounts {
 protected:
  // The code of the error, which has a sentence; 0 where the call answers that it was done.
  static std::int32_t codeOf(const Call& call) {
    account_settings_error* error = nullptr;
    const bool isDone = call(&error);
    EXPECT_EQ(isDone, error == nullptr);
    if (error == nullptr) return 0;
    const std::int32_t code = account_settings_error_code(error);
    EXPECT_STRNE(account_settings_error_sentence(error), "");
    account_settings_error_free(error);
    return code;
  }

  [[nodiscard]] auto opened(std::uint32_t flags = 0, account_settings_error** error = nullptr) const {
    return owned(account_settings_open(device.root.path().c_str(), 100, flags, error));
  }
  [[nodiscard]] std::int32_t whyNotOpened() const {
    return codeOf([this](auto** error) { return opened(0, error) != nullptr; });
  }

  [[nodiscard]] static auto begun(const account_settings* settings, account_settings_error** error = nullptr) {
    return owned(account_settings_edit_begin(settings, error));
  }
  [[nodiscard]] std::int32_t whyNotBegun() const {
    const auto settings = opened();
    return codeOf([&](auto** error) { return begun(settings.get(), error) != nullptr; });
  }

  static bool set(account_settings_edit* edit, const char* identifier, const char* key,
                  account_settings_error** error = nullptr) {
    const auto value = owned(account_settings_value_of_text("1"));
    return account_settings_edit_set(edit, identifier, key, value.get(), error);
  }
  static std::int32_t whyNotSaved(account_settings_edit* edit) {
    return codeOf([edit](auto** error) { return owned(account_settings_edit_save(edit, error)) != nullptr; });
  }
};

TEST_F(FailuresInC, OfOpeningSayWhatTheFileIsLike) {
  std::filesystem::permissions((device.root / kSettings).parent_path(), std::filesystem::perms::all);
  std::filesystem::create_hard_link(device.root / kSettings, device.root / "second");
  EXPECT_EQ(whyNotOpened(), ACCOUNT_SETTINGS_REFUSED);
  putAccounts(kAccounts, 3);
  std::filesystem::remove(device.root / "second");
  EXPECT_EQ(whyNotOpened(), ACCOUNT_SETTINGS_NOT_MIGRATED);
  putAccounts(kAccounts, 99);
  EXPECT_EQ(whyNotOpened(), ACCOUNT_SETTINGS_NEWER);
  device.root.put(kSettings, "no property list");
  EXPECT_EQ(whyNotOpened(), ACCOUNT_SETTINGS_UNREADABLE);
  EXPECT_EQ(asStranger([this] { return whyNotOpened(); }), ACCOUNT_SETTINGS_NO_PERMISSION);
  std::filesystem::remove(device.root / kSettings);
  EXPECT_EQ(whyNotOpened(), ACCOUNT_SETTINGS_MISSING);
  EXPECT_NE(opened(ACCOUNT_SETTINGS_MAY_BE_MISSING), nullptr);
}

TEST_F(FailuresInC, SayThatTheConfigurationIsMissing) {
  platform::setCurrent(
      platform::makeLinuxPlatform({.systemRoot = device.root.path(), .resources = device.root.path()}));
  EXPECT_EQ(codeOf([](auto** error) { return owned(account_settings_open(nullptr, 0, 0, error)) != nullptr; }),
            ACCOUNT_SETTINGS_BROKEN_INSTALLATION);
}

TEST_F(FailuresInC, OfWaitingSayThatAMigrationRuns) {
  device.root.put(kLock, "");
  const int lock = ::open((device.root / kLock).c_str(), O_RDONLY | O_CLOEXEC);
  ::flock(lock, LOCK_EX);
  EXPECT_EQ(whyNotOpened(), ACCOUNT_SETTINGS_BUSY);
  EXPECT_NE(opened(ACCOUNT_SETTINGS_MAY_BE_MIGRATING), nullptr);
  ::close(lock);
}

TEST_F(FailuresInC, OfBeginningSayWhyThereIsNoEdit) {
  const auto settings = opened();
  const auto edit = begun(settings.get());
  EXPECT_EQ(whyNotBegun(), ACCOUNT_SETTINGS_NESTED);
  putAccounts(kAccounts + account("later", "A type to come"));
  EXPECT_EQ(codeOf([&](auto** error) { return owned(account_settings_trial_begin(settings.get(), error)) != nullptr; }),
            ACCOUNT_SETTINGS_WOULD_DROP_OTHERS);
}

TEST_F(FailuresInC, OfOneStepSayWhatItCannotDo) {
  const auto settings = opened();
  const auto edit = begun(settings.get());
  EXPECT_EQ(codeOf([&](auto** error) { return set(edit.get(), "X", "Port", error); }),
            ACCOUNT_SETTINGS_UNKNOWN_ACCOUNT);
  EXPECT_EQ(codeOf([&](auto** error) { return set(edit.get(), "M1", "Identifier", error); }),
            ACCOUNT_SETTINGS_UNSUITABLE);
  const auto properties = owned(account_settings_value_of_dictionary());
  const auto taken = owned(account_settings_value_of_text("C1"));
  ASSERT_TRUE(account_settings_value_set(properties.get(), "Identifier", taken.get()));
  EXPECT_EQ(codeOf([&](auto** error) {
              return owned(account_settings_edit_add(edit.get(), "LDAP", "A", properties.get(), nullptr, error)) !=
                     nullptr;
            }),
            ACCOUNT_SETTINGS_ALREADY_THERE);
}

TEST_F(FailuresInC, OfAnEditAreTheFirstOfItsSteps) {
  const auto settings = opened();
  const auto edit = begun(settings.get());
  ASSERT_TRUE(set(edit.get(), "M1", "Port"));
  EXPECT_EQ(account_settings_edit_failure(edit.get()), nullptr);
  EXPECT_FALSE(set(edit.get(), "X", "Port") || set(edit.get(), "M1", "Identifier"));
  const auto failure = owned(account_settings_edit_failure(edit.get()));
  EXPECT_EQ(account_settings_error_code(failure.get()), ACCOUNT_SETTINGS_UNKNOWN_ACCOUNT);
  EXPECT_STREQ(account_settings_error_sentence(failure.get()), "no account has the identifier X");
}

TEST_F(FailuresInC, OfTextsThatAreNullAreAnswered) {
  const auto settings = opened();
  const auto seen = owned(account_settings_look(settings.get(), nullptr));
  const auto account = owned(account_settings_accounts_at(seen.get(), 0));
  const auto edit = begun(settings.get());
  for (const Call& call : std::vector<Call>{
           [&](auto** error) { return set(edit.get(), nullptr, "Port", error); },
           [&](auto** error) { return set(edit.get(), "M1", nullptr, error); },
           [&](auto** error) { return account_settings_edit_set(edit.get(), "M1", "Port", nullptr, error); },
           [&](auto** error) { return account_settings_edit_remove(edit.get(), nullptr, error); },
           [&](auto** error) { return account_settings_edit_erase(edit.get(), "M1", nullptr, error); },
           [&](auto** error) { return account_settings_edit_set_enabled(edit.get(), "M1", nullptr, true, error); },
           [&](auto** error) { return account_settings_did_change(settings.get(), account.get(), nullptr, error); }}) {
    EXPECT_EQ(codeOf(call), ACCOUNT_SETTINGS_UNSUITABLE);
  }
  EXPECT_EQ(account_settings_edit_find(edit.get(), nullptr), nullptr);
  EXPECT_EQ(account_settings_accounts_find(seen.get(), nullptr), nullptr);
  EXPECT_EQ(account_settings_accounts_find_sync(seen.get(), nullptr), nullptr);
  EXPECT_EQ(account_settings_accounts_of_type(seen.get(), nullptr), nullptr);
  EXPECT_EQ(account_settings_accounts_with_dataclass(seen.get(), nullptr), nullptr);
  EXPECT_EQ(account_settings_account_property(account.get(), nullptr), nullptr);
  EXPECT_FALSE(account_settings_account_is_enabled(account.get(), nullptr));
}

TEST_F(FailuresInC, OfPlacesThatAreNotThereAreAnswered) {
  const auto settings = opened();
  const auto edit = begun(settings.get());
  ASSERT_TRUE(set(edit.get(), "M1", "Port"));
  const auto saved = owned(account_settings_edit_save(edit.get(), nullptr));
  EXPECT_EQ(account_settings_changes_kind(saved.get(), 0), ACCOUNT_SETTINGS_CHANGED);
  EXPECT_EQ(account_settings_changes_kind(saved.get(), 1), -1);
  EXPECT_EQ(account_settings_changes_account(saved.get(), 1), nullptr);
  EXPECT_EQ(account_settings_changes_key(saved.get(), 1, 0), nullptr);
  EXPECT_EQ(account_settings_changes_key(saved.get(), 0, 1), nullptr);
}

TEST(ValuesInC, AreNoneWhereWhatTheyAreToHoldIsNull) {
  const auto list = owned(account_settings_value_of_list());
  const auto dictionary = owned(account_settings_value_of_dictionary());
  EXPECT_EQ(account_settings_value_of_text(nullptr), nullptr);
  EXPECT_EQ(account_settings_value_of_data(nullptr, 1), nullptr);
  EXPECT_NE(owned(account_settings_value_of_data(nullptr, 0)), nullptr);
  EXPECT_FALSE(account_settings_value_append(list.get(), nullptr));
  EXPECT_FALSE(account_settings_value_append(dictionary.get(), list.get()));
  EXPECT_FALSE(account_settings_value_set(dictionary.get(), nullptr, list.get()));
  EXPECT_FALSE(account_settings_value_set(dictionary.get(), "key", nullptr));
  EXPECT_EQ(account_settings_value_at(list.get(), 0), nullptr);
}

TEST(ValuesInC, AreFilledAtACostThatDoesNotGrow) {
  const auto list = owned(account_settings_value_of_list());
  const auto one = owned(account_settings_value_of_integer(1));
  const std::clock_t began = std::clock();
  for (int count = 0; count < 20000; ++count) ASSERT_TRUE(account_settings_value_append(list.get(), one.get()));
  EXPECT_LT(std::clock() - began, 2 * CLOCKS_PER_SEC);
  EXPECT_EQ(account_settings_value_count(list.get()), 20000U);
}

TEST(ValuesInC, ArePassedOnWithAllThatTheyWereFilledWith) {
  const auto list = owned(account_settings_value_of_list());
  const auto dictionary = owned(account_settings_value_of_dictionary());
  const auto one = owned(account_settings_value_of_integer(1));
  ASSERT_TRUE(account_settings_value_set(dictionary.get(), "key", list.get()));
  ASSERT_TRUE(account_settings_value_set(dictionary.get(), "key", one.get()));
  ASSERT_TRUE(account_settings_value_set(dictionary.get(), "other", one.get()));
  ASSERT_TRUE(account_settings_value_append(list.get(), dictionary.get()));
  const auto held = owned(account_settings_value_at(list.get(), 0));
  ASSERT_EQ(account_settings_value_count(held.get()), 2U);
  EXPECT_STREQ(account_settings_value_key_at(held.get(), 0), "key");
  std::int64_t integer = 0;
  EXPECT_TRUE(account_settings_value_integer(owned(account_settings_value_at(held.get(), 0)).get(), &integer));
}

TEST_F(FailuresInC, OfSavingSayWhyNothingWasSaved) {
  const auto settings = opened();
  auto edit = begun(settings.get());
  ASSERT_TRUE(set(edit.get(), "M1", "Type"));
  EXPECT_EQ(whyNotSaved(edit.get()), ACCOUNT_SETTINGS_WOULD_BE_DROPPED);
  EXPECT_EQ(whyNotSaved(edit.get()), ACCOUNT_SETTINGS_FINISHED);
  edit = begun(settings.get());
  ASSERT_TRUE(set(edit.get(), "M1", "Port"));
  replaceAccounts(account("E1"));
  EXPECT_EQ(whyNotSaved(edit.get()), ACCOUNT_SETTINGS_CONFLICT);
  edit = begun(settings.get());
  ASSERT_TRUE(set(edit.get(), "E1", "Port"));
  device.root.put("var/mobile/tmp", "a file where the new one is to be made");
  EXPECT_EQ(whyNotSaved(edit.get()), ACCOUNT_SETTINGS_NOT_SAVED);
}

TEST_F(FailuresInC, OfSavingSayThatTheDiskIsFull) {
  std::set<std::int32_t> codes;
  for (int operation = 1; operation < 100; ++operation) {
    const auto files = fillDiskAt(operation);
    const auto settings = owned(account_settings_open(nullptr, 0, 0, nullptr));
    const auto edit = settings == nullptr ? nullptr : begun(settings.get());
    if (edit == nullptr) continue;
    ASSERT_TRUE(set(edit.get(), "M1", std::to_string(operation).c_str()));
    codes.insert(whyNotSaved(edit.get()));
    if (files->mishapAt().empty()) break;
  }
  EXPECT_THAT(codes, testing::UnorderedElementsAre(0, ACCOUNT_SETTINGS_NO_SPACE));
}

TEST_F(FailuresInC, SayThatThoseWhoListenCouldNotBeTold) {
  const auto settings = opened(ACCOUNT_SETTINGS_OPENS_MODULES);
  const auto seen = owned(account_settings_look(settings.get(), nullptr));
  const auto account = owned(account_settings_accounts_find(seen.get(), "M1"));
  EXPECT_EQ(
      codeOf([&](auto** error) { return account_settings_will_change(settings.get(), account.get(), kMail, error); }),
      ACCOUNT_SETTINGS_NOT_ANNOUNCED);
  const auto edit = begun(settings.get());
  ASSERT_TRUE(set(edit.get(), "M1", "Port"));
  const auto saved = owned(account_settings_edit_save(edit.get(), nullptr));
  EXPECT_STRNE(account_settings_changes_not_announced(saved.get()), nullptr);
}

TEST_F(FailuresInC, SayThatNothingCanBeWatched) {
  const auto settings = opened();
  const auto seen = owned(account_settings_look(settings.get(), nullptr));
  std::filesystem::rename(device.root / "var/mobile/Library", device.root / "elsewhere");
  EXPECT_EQ(codeOf([&](auto** error) {
              return account_settings_watch_begin(settings.get(), seen.get(), nullptr, nullptr,
                                                  ACCOUNT_SETTINGS_EVENT_LOOP, error) != nullptr;
            }),
            ACCOUNT_SETTINGS_NOT_WATCHED);
}

TEST_F(FailuresInC, OfAnotherDirectorySayThatTheConfigurationIsMissing) {
  const char* const root = device.root.path().c_str();
  EXPECT_EQ(codeOf([&](auto** error) {
              return owned(account_settings_open_at(root, nullptr, root, 0, 0, nullptr, nullptr, error)) != nullptr;
            }),
            ACCOUNT_SETTINGS_BROKEN_INSTALLATION);
}

TEST_F(FailuresInC, SayThatThereIsNotEnoughMemory) {
  runOutOfMemory();
  EXPECT_EQ(codeOf([](auto** error) { return owned(account_settings_open(nullptr, 0, 0, error)) != nullptr; }),
            ACCOUNT_SETTINGS_NO_MEMORY);
}

TEST_F(FailuresInC, OfBeginningRefuseALockFileThatAStrangerMayHold) {
  if (::geteuid() != 0) GTEST_SKIP() << "only root can give a file away";
  EXPECT_EQ(besideAStrangersLock([this] { return whyNotBegun(); }), ACCOUNT_SETTINGS_REFUSED);
}

TEST_F(FailuresInC, OfSavingSayThatALaterReleasesFileIsThereNow) {
  const auto settings = opened();
  const auto edit = begun(settings.get());
  ASSERT_TRUE(set(edit.get(), "M1", "Port"));
  replaceAccounts(kAccounts, 99);
  EXPECT_EQ(whyNotSaved(edit.get()), ACCOUNT_SETTINGS_NEWER);
}

TEST_F(FailuresInC, SayThatTheProcessWatchesTooMuchAlready) {
  const auto settings = opened();
  const auto seen = owned(account_settings_look(settings.get(), nullptr));
  const auto begun = [&](auto** error) {
    return account_settings_watch_begin(settings.get(), seen.get(), nullptr, nullptr, ACCOUNT_SETTINGS_EVENT_LOOP,
                                        error);
  };
  EXPECT_NE(owned(begun(static_cast<account_settings_error**>(nullptr))), nullptr);
  const auto codeOfOneMore = [&] { return codeOf([&](auto** error) { return begun(error) != nullptr; }); };
  EXPECT_EQ(withoutDescriptors(codeOfOneMore), ACCOUNT_SETTINGS_NOT_WATCHED);
}

class LookingInC : public FailuresInC {};

TEST_F(LookingInC, ReadsATextThatAChildHasOfItsParent) {
  const auto seen = owned(account_settings_look(opened().get(), nullptr));
  const auto child = owned(account_settings_accounts_find(seen.get(), "C1"));
  const char* const name = account_settings_account_text(child.get(), "DisplayName");
  EXPECT_STREQ(name, "Cirrant");
  EXPECT_EQ(account_settings_account_text(child.get(), "DisplayName"), name);
  EXPECT_EQ(account_settings_account_text(child.get(), "Enabled Dataclasses"), nullptr);
  EXPECT_EQ(account_settings_account_text(child.get(), "unknown"), nullptr);
}

TEST_F(LookingInC, TellsAnAccountThatListsNoDataclassesFromOneThatSwitchedAllOff) {
  putAccounts(account("A") + account("B", "LDAP", "<key>Enabled Dataclasses</key><array/>"));
  const auto seen = owned(account_settings_look(opened().get(), nullptr));
  const auto lists = [&](const char* identifier) {
    return account_settings_account_lists_dataclasses(
        owned(account_settings_accounts_find(seen.get(), identifier)).get());
  };
  EXPECT_FALSE(lists("A"));
  EXPECT_TRUE(lists("B"));
}

TEST_F(LookingInC, CountsTheKeysOfAChange) {
  const auto edit = begun(opened().get());
  ASSERT_TRUE(set(edit.get(), "M1", "A") && set(edit.get(), "M1", "B"));
  const auto saved = owned(account_settings_edit_save(edit.get(), nullptr));
  EXPECT_EQ(account_settings_changes_key_count(saved.get(), 0), 2U);
  EXPECT_EQ(account_settings_changes_key_count(saved.get(), 1), 0U);
}

TEST_F(LookingInC, SaysForWhomAThreadIsWaiting) {
  device.root.put(kLock, "");
  const int lock = ::open((device.root / kLock).c_str(), O_RDONLY | O_CLOEXEC);
  ::flock(lock, LOCK_EX);
  std::string said;
  const auto tell = [](const char* sentence, void* data) { *static_cast<std::string*>(data) += sentence; };
  EXPECT_EQ(account_settings_open_at(device.root.path().c_str(), nullptr, nullptr, 1500, 0, tell, &said, nullptr),
            nullptr);
  EXPECT_THAT(said, testing::StartsWith("waiting for "));
  ::close(lock);
}

}  // namespace
}  // namespace tests
