#include <fcntl.h>
#include <grp.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <thread>

#include "platform/linux/files/file_services.h"
#include "platform/linux/linux_platform.h"
#include "tests/support/child_process.h"
#include "tests/support/fake_platform.h"
#include "tests/support/scratch_directory.h"

namespace tests {
namespace {

namespace fs = std::filesystem;
using namespace std::chrono_literals;
using platform::LockManner;

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
  std::vector<std::string> said;
  std::shared_ptr<platform::ExclusiveFileLocks> locks = locksTaken({});

  // On a device whose root is the scratch directory.
  [[nodiscard]] std::shared_ptr<platform::ExclusiveFileLocks> locksTaken(const LockManner& manner) {
    return platform::makeFileLocks({.directory = scratch.path(),
                                    .trees = {.systemRoot = scratch.path()},
                                    .manner = manner,
                                    .say = [this](std::string_view line) { said.emplace_back(line); }});
  }
  [[nodiscard]] static bool isTaken(platform::ExclusiveFileLocks& locks) {
    const auto lock = locks.lockNamed(name);
    return lock.isOk() && lock.value()->lock().isOk();
  }
  [[nodiscard]] static uid_t ownerOf(const fs::path& path) {
    struct stat status {};
    EXPECT_EQ(::lstat(path.c_str(), &status), 0) << path;
    return status.st_uid;
  }

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

TEST_F(LinuxLocks, AreSharedWithMobileInAStickyDirectory) {
  if (::getuid() != 0) GTEST_SKIP() << "only root can be two users";
  fs::permissions(scratch.path(), fs::perms{01777});
  scratch.put("etc/passwd", "mobile:x:" + std::to_string(somebodyElse) + ":0::/:\n");
  const ChildProcess mobile{[this](const auto& say) {
    if (::setgroups(0, nullptr) == 0 && ::setuid(somebodyElse) == 0) holdForEver()(say);
  }};
  ASSERT_TRUE(mobile.says(longEnough));
  EXPECT_EQ(ownerOf(file), somebodyElse);
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

// What somebody else put at the lock's name, by how root tells of it.
struct Planted {
  const char* flaw;
  void (*plant)(const fs::path& file);
};

constexpr Planted kPlanted[] = {
    {"it was a link", [](const fs::path& file) { fs::create_symlink("elsewhere", file); }},
    {"it was a directory", [](const fs::path& file) { fs::create_directories(file / "within"); }},
    {"it was no regular file", [](const fs::path& file) { ::mkfifo(file.c_str(), 0666); }},
    {"it had a second name",
     [](const fs::path& file) {
       fs::create_directory(file.parent_path() / "etc");
       ::close(::open((file.parent_path() / "etc/file").c_str(), O_CREAT | O_WRONLY, 0600));
       fs::create_hard_link(file.parent_path() / "etc/file", file);
     }},
    {"it belonged to the user 65534",
     [](const fs::path& file) {
       ::close(::open(file.c_str(), O_CREAT | O_WRONLY, 0644));
       EXPECT_EQ(0, ::lchown(file.c_str(), somebodyElse, somebodyElse));
     }},
};

TEST_F(LinuxLocks, OfRootTakeThePlaceOfWhatSomebodyPlantedAndSaySo) {
  if (::getuid() != 0) GTEST_SKIP() << "only root replaces what is another's";
  for (const Planted& planted : kPlanted) {
    SCOPED_TRACE(planted.flaw);
    fs::remove_all(file);
    said.clear();
    planted.plant(file);
    EXPECT_TRUE(isTaken(*locks));
    EXPECT_TRUE(fs::is_regular_file(fs::symlink_status(file)));
    EXPECT_EQ(ownerOf(file), 0U);
    EXPECT_EQ(said,
              std::vector<std::string>{"the lock file " + file.string() + " was replaced, since " + planted.flaw});
  }
  EXPECT_FALSE(fs::exists(scratch / "elsewhere"));
}

TEST_F(LinuxLocks, OfOthersAreRefusedOnAnythingButAFile) {
  fs::permissions(scratch.path(), fs::perms{01777});
  fs::create_symlink(scratch / "elsewhere", file);
  ASSERT_EQ(::mkfifo((scratch / "pipe").c_str(), 0666), 0);
  fs::create_directory(scratch / "directory");
  const ChildProcess user{[this](const auto& say) {
    if (::getuid() == 0 && (::setgroups(0, nullptr) != 0 || ::setuid(somebodyElse) != 0)) return;
    for (const std::string_view planted : {name, std::string_view{"pipe"}, std::string_view{"directory"}}) {
      if (locks->lockNamed(planted).isOk()) return;
    }
    say();
  }};
  EXPECT_TRUE(user.says(longEnough));
  EXPECT_FALSE(fs::exists(scratch / "elsewhere"));
}

TEST_F(LinuxLocks, LeaveTheLockOfAReplacedFileBehind) {
  ChildProcess holder{holdForEver()};
  ASSERT_TRUE(holder.says(longEnough));
  const ChildProcess waiter{[this](const auto& say) {
    if (isTaken(*locks)) say();
  }};
  EXPECT_FALSE(waiter.says(aMoment));
  fs::remove(file);
  EXPECT_TRUE(waiter.says(longEnough));
}

TEST_F(LinuxLocks, AreGivenUpAfterTheTimeThatIsSet) {
  const ChildProcess holder{holdForEver()};
  ASSERT_TRUE(holder.says(longEnough));
  const auto impatient = locksTaken({.timeLimit = aMoment});
  const auto began = std::chrono::steady_clock::now();
  EXPECT_EQ(impatient->lockNamed(name).take()->lock().errorNumber(), ETIMEDOUT);
  EXPECT_GE(std::chrono::steady_clock::now() - began, aMoment);
  EXPECT_EQ(locksTaken({.timeLimit = 0ms})->lockNamed(name).take()->lock().errorNumber(), ETIMEDOUT);
}

TEST_F(LinuxLocks, SayOnceAfterASecondForWhomTheyWait) {
  const ChildProcess holder{holdForEver()};
  ASSERT_TRUE(holder.says(longEnough));
  EXPECT_FALSE(isTaken(*locksTaken({.timeLimit = 900ms})));
  EXPECT_TRUE(said.empty());
  EXPECT_FALSE(isTaken(*locksTaken({.timeLimit = 2s})));
  ASSERT_EQ(said.size(), 1U);
  EXPECT_TRUE(said[0].starts_with("waiting for ")) << said[0];
  EXPECT_TRUE(said[0].ends_with("process, which holds the lock " + file.string()) ||
              said[0].ends_with("), which holds the lock " + file.string()))
      << said[0];
}

TEST_F(LinuxLocks, ListenAgainAndAgainOnOneDescriptor) {
  const auto held = locks->lockNamed(name);
  ASSERT_TRUE(held.value()->lock().isOk());
  const auto listening = [&] {
    EXPECT_FALSE(isTaken(*locksTaken({.timeLimit = 20ms})));
    const auto isNotices = [](const auto& entry) { return fs::read_symlink(entry.path()) == "anon_inode:inotify"; };
    return std::ranges::count_if(fs::directory_iterator{"/proc/self/fd"}, isNotices);
  };
  const auto first = listening();
  EXPECT_GT(first, 0);
  EXPECT_EQ(listening(), first);
}

TEST_F(LinuxLocks, ThatAreSharedWaitOnlyForWhoeverHoldsThemAlone) {
  const LockManner shared{.isShared = true, .timeLimit = aMoment};
  scratch.put(name, "");
  const auto first = locksTaken(shared)->lockNamed(name).take();
  EXPECT_TRUE(first->lock().isOk());
  EXPECT_TRUE(isTaken(*locksTaken(shared)));
  EXPECT_FALSE(isTaken(*locksTaken({.timeLimit = aMoment})));
  first->unlock();
  const auto alone = locks->lockNamed(name).take();
  EXPECT_TRUE(alone->lock().isOk());
  EXPECT_FALSE(isTaken(*locksTaken(shared)));
}

TEST_F(LinuxLocks, ThatAreSharedMakeAndReplaceNothing) {
  const auto shared = locksTaken({.isShared = true});
  EXPECT_TRUE(isTaken(*shared));
  EXPECT_FALSE(fs::exists(file));
  fs::create_symlink("elsewhere", file);
  static_cast<void>(isTaken(*shared));
  EXPECT_TRUE(fs::is_symlink(file));
}

TEST_F(LinuxLocks, AreNamedByAPlainFileName) {
  for (const std::string_view wrong : {"", ".", "..", "/", "a/b", "../name"}) {
    EXPECT_EQ(locks->lockNamed(wrong).status().errorNumber(), EINVAL) << wrong;
  }
}

TEST_F(LinuxLocks, LieInTheTemporaryDirectoryOfTheirRootWhichIsMadeForEverybody) {
  ASSERT_TRUE(isTaken(*platform::makeLinuxPlatform({.systemRoot = scratch.path()}).locks));
  EXPECT_TRUE(fs::is_regular_file(scratch / "tmp" / name));
  struct stat status {};
  ASSERT_EQ(::stat((scratch / "tmp").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777U, 01777U);
}

TEST_F(LinuxLocks, OfOneRootKeepNobodyOfAnotherWaiting) {
  fs::create_directories(scratch / "one");
  fs::create_directories(scratch / "two");
  const auto lock = platform::makeLinuxPlatform({.systemRoot = scratch / "one"}).locks->lockNamed(name).take();
  ASSERT_TRUE(lock->lock().isOk());
  EXPECT_TRUE(isTaken(*platform::makeLinuxPlatform({.systemRoot = scratch / "two"}).locks));
}

TEST_F(LinuxLocks, CannotBeMadeWhereNoDirectoryCan) {
  scratch.put("file", "");
  EXPECT_FALSE(platform::makeLinuxPlatform({.lockDirectory = scratch / "file/below"}).locks->lockNamed(name).isOk());
}

}  // namespace
}  // namespace tests
