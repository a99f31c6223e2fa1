#include <poll.h>
#include <sys/inotify.h>

#include <condition_variable>
#include <mutex>

#include "platform/linux/files/descriptor.h"
#include "tests/support/device_with_accounts.h"

namespace tests {
namespace {

using accounts::Change;
using accounts::Edit;
using accounts::Watch;
using testing::ElementsAre;

class WatchingAccounts : public DeviceWithAccounts {
 protected:
  Watch::Callback recorder() {
    return [this](const Change& change) {
      const std::lock_guard guard{mutex};
      static constexpr const char* kinds[] = {"added ", "changed ", "removed "};
      told.push_back(kinds[static_cast<int>(change.kind)] + change.account.identifier());
      for (const std::string& key : change.keys) told.back() += " " + key;
      isTold.notify_all();
    };
  }

  // What was told, once it is so much, or after some seconds.
  std::vector<std::string> toldAtLeast(std::size_t count) {
    std::unique_lock guard{mutex};
    isTold.wait_for(guard, 10s, [&] { return told.size() >= count; });
    return told;
  }

  [[nodiscard]] Watch watched(Watch::Callback callback, Watch::Caller caller = Watch::Caller::ownThread) const {
    return std::move(opened().watch(looked(), std::move(callback), caller)).value();
  }

  void setPort(int port) const {
    ASSERT_TRUE(opened().change([&](Edit& edit) { return edit.set("M1", "Port", port).isOk(); }).isOk());
  }

  std::mutex mutex;
  std::condition_variable isTold;
  std::vector<std::string> told;
};

TEST_F(WatchingAccounts, TellsWhatWasAddedChangedAndRemovedWithItsKeys) {
  const Watch watch = watched(recorder());
  ASSERT_TRUE(opened()
                  .change([](Edit& edit) {
                    return edit.add({"LDAP", "A", {{"Identifier", "L1"}}, ""}).isOk() &&
                           edit.set("C1", "Port", 1).isOk() && edit.remove("M1").isOk();
                  })
                  .isOk());
  EXPECT_THAT(toldAtLeast(3), ElementsAre("removed M1", "changed C1 Port", "added L1"));
}

TEST_F(WatchingAccounts, TellsWhatCameBetweenLookAndWatch) {
  const auto seen = looked();
  setPort(1);
  const auto watch = opened().watch(seen, recorder());
  EXPECT_THAT(toldAtLeast(1), ElementsAre("changed M1 Port"));
}

TEST_F(WatchingAccounts, TellsOfAnEditorThatMovesAFileOntoTheSettings) {
  const Watch watch = watched(recorder());
  replaceAccounts(kAccounts + account("E1"));
  EXPECT_THAT(toldAtLeast(1), ElementsAre("added E1"));
}

TEST_F(WatchingAccounts, TellsOfAnEditorThatWritesInPlace) {
  const Watch watch = watched(recorder());
  putAccounts(kAccounts + account("E1"));
  EXPECT_THAT(toldAtLeast(1), ElementsAre("added E1"));
}

TEST_F(WatchingAccounts, TakesAFileThatCannotBeReadForNoChange) {
  const Watch watch = watched(recorder());
  device.root.put(kSettings, "no property list");
  std::filesystem::remove(device.root / kSettings);
  putAccounts(kAccounts + account("E1"));
  EXPECT_THAT(toldAtLeast(1), ElementsAre("added E1"));
}

TEST_F(WatchingAccounts, GoesOnWhereTheDirectoryIsReplaced) {
  const Watch watch = watched(recorder());
  std::filesystem::rename(device.root / "var/mobile/Library/Preferences", device.root / "var/mobile/Library/Old");
  putAccounts(kAccounts + account("E1"));
  EXPECT_THAT(toldAtLeast(1), ElementsAre("added E1"));
}

TEST_F(WatchingAccounts, GoesOnWhereADirectoryOnTheWayIsReplacedAndTheFileChangedLater) {
  const Watch watch = watched(recorder());
  std::filesystem::rename(device.root / "var/mobile/Library", device.root / "var/mobile/Old");
  putAccounts(kAccounts + account("E1"));
  EXPECT_THAT(toldAtLeast(1), ElementsAre("added E1"));
  setPort(1);
  EXPECT_THAT(toldAtLeast(2), ElementsAre("added E1", "changed M1 Port"));
}

TEST_F(WatchingAccounts, TellsWhatComesWithADirectoryThatIsMovedIntoItsPlace) {
  const Watch watch = watched(recorder());
  std::filesystem::rename(device.root / "var/mobile", device.root / "var/old");
  putAccounts(kAccounts + account("E1"));
  EXPECT_THAT(toldAtLeast(1), ElementsAre("added E1"));
  std::filesystem::rename(device.root / "var/mobile", device.root / "var/new");
  std::filesystem::rename(device.root / "var/old", device.root / "var/mobile");
  EXPECT_THAT(toldAtLeast(2), ElementsAre("added E1", "removed E1"));
}

TEST_F(WatchingAccounts, TellsOfAFileThatTheSettingsAreALinkTo) {
  std::filesystem::rename(device.root / kSettings, device.root / "real.plist");
  std::filesystem::create_symlink("../../../../real.plist", device.root / kSettings);
  const Watch watch = watched(recorder());
  device.root.put("real.plist", withAccounts(kAccounts + account("E1")));
  EXPECT_THAT(toldAtLeast(1), ElementsAre("added E1"));
}

TEST_F(WatchingAccounts, FollowsALinkOnTheWayThatIsLedElsewhere) {
  std::filesystem::rename(device.root / "var/mobile/Library", device.root / "first");
  std::filesystem::copy(device.root / "first", device.root / "second", std::filesystem::copy_options::recursive);
  std::filesystem::create_symlink("/first", device.root / "var/mobile/Library");
  const Watch watch = watched(recorder());
  device.root.put("second/Preferences/com.vorlix.accountsettings.plist", withAccounts(kAccounts + account("E1")));
  std::filesystem::create_symlink("/second", device.root / "link");
  std::filesystem::rename(device.root / "link", device.root / "var/mobile/Library");
  EXPECT_THAT(toldAtLeast(1), ElementsAre("added E1"));
}

TEST_F(WatchingAccounts, TakesAFileThatIsGoneForNoChangeWhereItMayBeMissing) {
  auto may = options();
  may.mayBeMissing = true;
  Watch watch = opened(may).watch(looked(), recorder(), Watch::Caller::eventLoop).value();
  watch.dispatch();
  const std::string kept = device.root.contents(kSettings);
  std::filesystem::remove(device.root / kSettings);
  device.root.put("var/mobile/Library/Preferences/other.plist", "");
  watch.dispatch();
  device.root.put(kSettings, kept);
  watch.dispatch();
  EXPECT_THAT(told, ElementsAre());
}

TEST_F(WatchingAccounts, TellsAgainWhatMemoryDidNotSufficeFor) {
  bool isFirst = true;
  const Watch watch = watched([&](const Change& change) {
    if (std::exchange(isFirst, false)) throw std::bad_alloc{};
    recorder()(change);
  });
  setPort(1);
  EXPECT_THAT(toldAtLeast(1), ElementsAre("changed M1 Port"));
}

TEST_F(WatchingAccounts, LoadsNothingWhereAnotherFileOfTheDirectoryIsWritten) {
  Watch watch = watched(recorder(), Watch::Caller::eventLoop);
  watch.dispatch();
  const platform::Descriptor reads{::inotify_init1(IN_NONBLOCK | IN_CLOEXEC)};
  ASSERT_GE(::inotify_add_watch(reads.number(), (device.root / kSettings).c_str(), IN_OPEN), 0);
  device.root.put("var/mobile/Library/Preferences/other.plist", "");
  watch.dispatch();
  pollfd descriptor{reads.number(), POLLIN, 0};
  EXPECT_EQ(::poll(&descriptor, 1, 0), 0);
}

TEST_F(WatchingAccounts, ServesAnEventLoop) {
  Watch watch = watched(recorder(), Watch::Caller::eventLoop);
  watch.dispatch();
  pollfd descriptor{watch.descriptor(), POLLIN, 0};
  EXPECT_EQ(::poll(&descriptor, 1, 0), 0) << "there is nothing to tell yet";
  setPort(1);
  ASSERT_EQ(::poll(&descriptor, 1, 10000), 1);
  watch.dispatch();
  EXPECT_THAT(told, ElementsAre("changed M1 Port"));
}

TEST_F(WatchingAccounts, TellsNothingAfterItsEnd) {
  auto watch = std::optional{watched(recorder())};
  watch.reset();
  setPort(1);
  EXPECT_THAT(told, ElementsAre());
}

TEST_F(WatchingAccounts, MayBeEndedByWhomItCalls) {
  std::optional<Watch> watch;
  watch.emplace(watched(
      [&](const Change& change) {
        watch.reset();
        recorder()(change);
      },
      Watch::Caller::eventLoop));
  putAccounts(account("E1") + account("E2"));
  watch->dispatch();
  EXPECT_THAT(told, ElementsAre("removed M1"));
}

TEST_F(WatchingAccounts, MayChangeWhatItIsToldOf) {
  const Watch watch = watched([this](const Change& change) {
    if (change.account.integer("Port") == 1) setPort(2);
    recorder()(change);
  });
  setPort(1);
  EXPECT_THAT(toldAtLeast(2), ElementsAre("changed M1 Port", "changed M1 Port"));
}

TEST_F(WatchingAccounts, SaysThatTheProcessWatchesTooMuchAlready) {
  const auto settings = opened();
  const auto seen = looked();
  const Watch other = watched(recorder());
  EXPECT_EQ(withoutDescriptors([&] { return codeOf(settings.watch(seen, recorder())); }), accounts::Code::notWatched);
}

TEST_F(WatchingAccounts, WatchesNothingOnceItWasMovedFrom) {
  Watch from = watched(recorder(), Watch::Caller::eventLoop);
  Watch to = watched(recorder(), Watch::Caller::eventLoop);
  to = std::move(from);
  setPort(1);
  EXPECT_EQ(from.descriptor(), -1);
  from.dispatch();
  EXPECT_THAT(told, ElementsAre());
  to.dispatch();
  EXPECT_THAT(told, ElementsAre("changed M1 Port"));
}

TEST_F(WatchingAccounts, SaysWhereThereIsNothingToWatch) {
  const auto settings = opened();
  const auto seen = looked();
  std::filesystem::rename(device.root / "var/mobile/Library", device.root / "elsewhere");
  EXPECT_EQ(codeOf(settings.watch(seen, recorder())), accounts::Code::notWatched);
}

}  // namespace
}  // namespace tests
