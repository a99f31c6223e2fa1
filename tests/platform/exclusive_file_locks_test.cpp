#include <fcntl.h>
#include <grp.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <unistd.h>

#include <csignal>
#include <thread>

#include "platform/linux/linux_platform.h"
#include "tests/support/child_process.h"
#include "tests/support/fake_platform.h"
#include "tests/support/scratch_directory.h"

namespace tests {
namespace {

namespace fs = std::filesystem;
using namespace std::chrono_literals;

constexpr std::string_view name = "SomethingInProgress";
constexpr auto aMoment = 150ms;
constexpr auto longEnough = 10s;
constexpr uid_t somebodyElse = 65534;

struct OfTheTests {
  FakeExclusiveFileLocks locks;
  platform::ExclusiveFileLocks& service() { return locks; }
};

struct OfTheDevice {
  ScratchDirectory scratch;
  std::shared_ptr<platform::ExclusiveFileLocks> locks =
      platform::makeLinuxPlatform({.lockDirectory = scratch.path()}).locks;
  platform::ExclusiveFileLocks& service() { return *locks; }
};

template <typename Subject>
class LocksContract : public testing::Test {
 protected:
  Subject subject;
  platform::ExclusiveFileLocks& locks = subject.service();
};

using Subjects = testing::Types<OfTheTests, OfTheDevice>;
TYPED_TEST_SUITE(LocksContract, Subjects);

TYPED_TEST(LocksContract, GiveALockBackAndTakeItAgain) {
  const auto lock = this->locks.lockNamed(name);
  ASSERT_TRUE(lock.isOk());
  EXPECT_TRUE(lock.value()->lock().isOk());
  lock.value()->unlock();
  EXPECT_TRUE(lock.value()->lock().isOk());
}

TYPED_TEST(LocksContract, HoldNothingBeforeTheyAreTaken) {
  const auto idle = this->locks.lockNamed(name);
  EXPECT_TRUE(this->locks.lockNamed(name).value()->lock().isOk());
}

TYPED_TEST(LocksContract, AreFreeAgainOnceTheirHolderIsGone) {
  EXPECT_TRUE(this->locks.lockNamed(name).value()->lock().isOk());
  EXPECT_TRUE(this->locks.lockNamed(name).value()->lock().isOk());
}

TYPED_TEST(LocksContract, OfDifferentNamesAreHeldTogether) {
  const auto first = this->locks.lockNamed("first");
  const auto second = this->locks.lockNamed("second");
  EXPECT_TRUE(first.value()->lock().isOk());
  EXPECT_TRUE(second.value()->lock().isOk());
}

class LinuxLocks : public testing::Test {
 protected:
  ScratchDirectory scratch;
  fs::path file = scratch / name;
  std::shared_ptr<platform::ExclusiveFileLocks> locks =
      platform::makeLinuxPlatform({.lockDirectory = scratch.path()}).locks;

  // Takes the lock in another process, says so, and holds it until it is killed.
  [[nodiscard]] ChildProcess::Task holdForEver() const {
    return [this](const auto& say) {
      const auto lock = locks->lockNamed(name);
      if (!lock.isOk() || !lock.value()->lock().isOk()) return;
      say();
      ::pause();
    };
  }
};

TEST_F(LinuxLocks, KeepASecondProcessWaitingUntilTheFirstGivesItBack) {
  const auto lock = locks->lockNamed(name);
  ASSERT_TRUE(lock.value()->lock().isOk());
  const ChildProcess second{holdForEver()};
  EXPECT_FALSE(second.says(aMoment));
  lock.value()->unlock();
  EXPECT_TRUE(second.says(longEnough));
}

TEST_F(LinuxLocks, KeepASecondHolderOfTheSameProcessWaiting) {
  const auto lock = locks->lockNamed(name);
  ASSERT_TRUE(lock.value()->lock().isOk());
  std::atomic<bool> isHeld = false;
  std::jthread second{[&] { isHeld = locks->lockNamed(name).value()->lock().isOk(); }};
  std::this_thread::sleep_for(aMoment);
  EXPECT_FALSE(isHeld);
  lock.value()->unlock();
  second.join();
  EXPECT_TRUE(isHeld);
}

TEST_F(LinuxLocks, AreFreeAtOnceWhenTheirHolderIsKilled) {
  ChildProcess holder{holdForEver()};
  ASSERT_TRUE(holder.says(longEnough));
  const ChildProcess second{holdForEver()};
  EXPECT_FALSE(second.says(aMoment));
  holder.kill();
  EXPECT_TRUE(second.says(longEnough));
}

TEST_F(LinuxLocks, AreWaitedForAcrossSignals) {
  ChildProcess holder{holdForEver()};
  ASSERT_TRUE(holder.says(longEnough));
  static int signals = 0;
  struct sigaction onSignal {};
  onSignal.sa_handler = [](int) { ++signals; };
  ::sigaction(SIGALRM, &onSignal, nullptr);
  const itimerval often{.it_interval = {0, 10'000}, .it_value = {0, 10'000}};
  ::setitimer(ITIMER_REAL, &often, nullptr);
  std::jthread release{[&holder] {
    std::this_thread::sleep_for(aMoment);
    holder.kill();
  }};
  EXPECT_TRUE(locks->lockNamed(name).value()->lock().isOk());
  EXPECT_GT(signals, 0);
}

TEST_F(LinuxLocks, AreTakenOnTheFileThatStandsThereAfterTheWait) {
  ChildProcess holder{holdForEver()};
  ASSERT_TRUE(holder.says(longEnough));
  const auto waiting = locks->lockNamed(name);
  fs::remove(file);
  const ChildProcess holderOfTheNewFile{holdForEver()};
  ASSERT_TRUE(holderOfTheNewFile.says(longEnough));
  const ChildProcess waiter{[&waiting](const auto& say) {
    if (waiting.value()->lock().isOk()) say();
  }};
  holder.kill();
  EXPECT_FALSE(waiter.says(aMoment));
}

TEST_F(LinuxLocks, LieOnAFileThatEverybodyMayReadWhateverTheMask) {
  ::umask(0777);
  ASSERT_TRUE(locks->lockNamed(name).value()->lock().isOk());
  EXPECT_EQ(permissionsOf(file), 0644U);
}

TEST_F(LinuxLocks, AreTakenWithoutWritingRights) {
  scratch.put(name, "");
  fs::permissions(file, fs::perms{0444});
  EXPECT_TRUE(locks->lockNamed(name).value()->lock().isOk());
}

TEST_F(LinuxLocks, AreOpenedForReadingAndNotInheritedByPrograms) {
  const auto lock = locks->lockNamed(name);
  int found = 0;
  for (const auto& entry : fs::directory_iterator{"/proc/self/fd"}) {
    std::error_code gone;
    if (fs::read_symlink(entry.path(), gone) != file) continue;
    const int descriptor = std::stoi(entry.path().filename().string());
    EXPECT_EQ(::fcntl(descriptor, F_GETFL) & O_ACCMODE, O_RDONLY);
    EXPECT_EQ(::fcntl(descriptor, F_GETFD) & FD_CLOEXEC, FD_CLOEXEC);
    ++found;
  }
  EXPECT_EQ(found, 1);
}

TEST_F(LinuxLocks, AreSharedBetweenUsersInAStickyDirectory) {
  if (::getuid() != 0) GTEST_SKIP() << "only root can be two users";
  fs::permissions(scratch.path(), fs::perms{01777});
  const ChildProcess stranger{[this](const auto& say) {
    if (::setgroups(0, nullptr) == 0 && ::setuid(somebodyElse) == 0) holdForEver()(say);
  }};
  ASSERT_TRUE(stranger.says(longEnough));
  struct stat status {};
  ASSERT_EQ(::stat(file.c_str(), &status), 0);
  EXPECT_EQ(status.st_uid, somebodyElse);
  const ChildProcess root{holdForEver()};
  EXPECT_FALSE(root.says(aMoment));
}

TEST_F(LinuxLocks, OfRootKeepOtherUsersWaitingToo) {
  if (::getuid() != 0) GTEST_SKIP() << "only root can be two users";
  fs::permissions(scratch.path(), fs::perms{01777});
  const auto lock = locks->lockNamed(name);
  ASSERT_TRUE(lock.value()->lock().isOk());
  const ChildProcess stranger{[this](const auto& say) {
    if (::setgroups(0, nullptr) == 0 && ::setuid(somebodyElse) == 0) holdForEver()(say);
  }};
  EXPECT_FALSE(stranger.says(aMoment));
  lock.value()->unlock();
  EXPECT_TRUE(stranger.says(longEnough));
}

TEST_F(LinuxLocks, AreRefusedOnAnythingButAFile) {
  fs::create_symlink(scratch / "elsewhere", file);
  EXPECT_EQ(locks->lockNamed(name).cause(), platform::Cause::unsafe);
  EXPECT_FALSE(fs::exists(scratch / "elsewhere"));
  ASSERT_EQ(::mkfifo((scratch / "pipe").c_str(), 0666), 0);
  EXPECT_EQ(locks->lockNamed("pipe").status().errorNumber(), EINVAL);
  fs::create_directory(scratch / "directory");
  EXPECT_EQ(locks->lockNamed("directory").status().errorNumber(), EISDIR);
}

TEST_F(LinuxLocks, AreNamedByAPlainFileName) {
  for (const std::string_view wrong : {"", ".", "..", "/", "a/b", "../name"}) {
    EXPECT_EQ(locks->lockNamed(wrong).status().errorNumber(), EINVAL) << wrong;
  }
}

TEST_F(LinuxLocks, CannotBeMadeWithoutTheirDirectory) {
  const auto elsewhere = platform::makeLinuxPlatform({.lockDirectory = scratch / "nothing"}).locks;
  EXPECT_EQ(elsewhere->lockNamed(name).cause(), platform::Cause::missing);
}

}  // namespace
}  // namespace tests
