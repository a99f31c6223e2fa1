// What the device's file system does with what a real one holds: links, pipes, masks, other volumes, other owners.

#include <dirent.h>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <fstream>
#include <thread>

#include "platform/linux/files/file_services.h"
#include "platform/linux/linux_platform.h"
#include "tests/support/fake_platform.h"
#include "tests/support/scratch_directory.h"

namespace tests {
namespace {

namespace fs = std::filesystem;
using platform::Bytes;
using platform::FileKind;
using platform::Path;

constexpr std::size_t anySize = SIZE_MAX;
const Bytes someBytes{'n', 'e', 'w'};

class LinuxFiles : public testing::Test {
 protected:
  ScratchDirectory scratch;
  std::shared_ptr<platform::FileSystem> files = platform::makeLinuxPlatform({.systemRoot = scratch.path()}).files;

  Path plantLink(std::string_view name, const Path& target) const {
    fs::create_symlink(target, scratch / name);
    return scratch / name;
  }
  Path plantPipe(std::string_view name) const {
    EXPECT_EQ(::mkfifo((scratch / name).c_str(), 0600), 0);
    return scratch / name;
  }
  // How many entries the directory has.
  [[nodiscard]] std::ptrdiff_t entries(std::string_view name = "") const {
    return std::distance(fs::directory_iterator{scratch / name}, {});
  }
  // Below entries with a comment, and with members.
  void nameTheCaller(std::string_view name, const std::string& comment = {}) const {
    scratch.put("etc/passwd", "root:x:0:0:" + comment + ":/:/bin/sh\n" + std::string{name} +
                                  ":x:" + std::to_string(::getuid()) + ":0::/:\n");
    scratch.put("etc/group",
                "root:x:0:" + comment + "\n" + std::string{name} + ":x:" + std::to_string(::getgid()) + ":\n");
  }
};

TEST_F(LinuxFiles, AreReadThroughALink) {
  scratch.put("file", "text");
  const Path link = plantLink("link", "file");
  EXPECT_EQ(files->kindOf(link), FileKind::file);
  EXPECT_EQ(files->read(link, anySize).value(), (Bytes{'t', 'e', 'x', 't'}));
}

TEST_F(LinuxFiles, AreNotCreatedThroughALinkThatLeadsNowhere) {
  const Path link = plantLink("link", scratch / "elsewhere");
  EXPECT_EQ(files->create(link, someBytes).errorNumber(), EEXIST);
  EXPECT_FALSE(fs::exists(scratch / "elsewhere"));
}

TEST_F(LinuxFiles, ReplaceALinkItselfAndNotItsTarget) {
  scratch.put("target", "old");
  ASSERT_TRUE(files->replace(plantLink("link", scratch / "target"), someBytes).isOk());
  EXPECT_EQ(scratch.contents("target"), "old");
  EXPECT_EQ(scratch.contents("link"), "new");
  EXPECT_FALSE(fs::is_symlink(scratch / "link"));
}

TEST_F(LinuxFiles, AreNotCopiedToALink) {
  scratch.put("file", "text");
  EXPECT_EQ(files->copy(scratch / "file", plantLink("to", scratch / "elsewhere")).errorNumber(), EEXIST);
  EXPECT_FALSE(fs::exists(scratch / "elsewhere"));
}

TEST_F(LinuxFiles, AreRemovedAsLinksWithTheirTargetsUntouched) {
  scratch.put("target/file", "text");
  scratch.put("tree/file", "text");
  plantLink("tree/link", scratch / "target");
  ASSERT_TRUE(files->remove(scratch / "tree").isOk());
  ASSERT_TRUE(files->remove(plantLink("link", scratch / "target")).isOk());
  EXPECT_EQ(scratch.contents("target/file"), "text");
  EXPECT_EQ(entries(), 1);
}

TEST_F(LinuxFiles, MoveALinkItself) {
  scratch.put("target", "text");
  ASSERT_TRUE(files->rename(plantLink("link", "target"), scratch / "moved").isOk());
  EXPECT_TRUE(fs::is_symlink(scratch / "moved"));
}

TEST_F(LinuxFiles, MakeNoDirectoryThroughALink) {
  fs::create_directory(scratch / "target");
  EXPECT_EQ(files->createDirectories(plantLink("link", scratch / "target"), 0777).errorNumber(), ENOTDIR);
  EXPECT_EQ(files->createDirectories(plantLink("nowhere", scratch / "x"), 0777).errorNumber(), ENOTDIR);
  EXPECT_FALSE(fs::exists(scratch / "x"));
}

TEST_F(LinuxFiles, GiveNoLinkAndNoHardLinkAway) {
  nameTheCaller("mobile");
  scratch.put("file", "text");
  EXPECT_EQ(files->setOwner(plantLink("link", scratch / "file"), "mobile", "mobile").errorNumber(), ELOOP);
  fs::create_hard_link(scratch / "file", scratch / "second name");
  EXPECT_EQ(files->setOwner(scratch / "file", "mobile", "mobile").errorNumber(), EMLINK);
}

TEST_F(LinuxFiles, RefuseAPipeWithoutWaitingForItsOtherSide) {
  const Path pipe = plantPipe("pipe");
  EXPECT_EQ(files->kindOf(pipe), FileKind::other);
  EXPECT_EQ(files->read(pipe, anySize).status().errorNumber(), EINVAL);
  EXPECT_EQ(files->copy(pipe, scratch / "copy").errorNumber(), EINVAL);
  EXPECT_EQ(files->create(pipe, someBytes).errorNumber(), EEXIST);
  EXPECT_TRUE(files->remove(pipe).isOk());
}

TEST_F(LinuxFiles, RefuseADevice) {
  EXPECT_EQ(files->kindOf("/dev/zero"), FileKind::other);
  EXPECT_EQ(files->read("/dev/zero", anySize).status().errorNumber(), EINVAL);
  EXPECT_EQ(files->copy("/dev/zero", scratch / "copy").errorNumber(), EINVAL);
}

TEST_F(LinuxFiles, AreReadWholeWhereTheirSizeIsNotKnownBefore) {
  const auto contents = files->read("/proc/self/status", anySize);
  ASSERT_TRUE(contents.isOk());
  EXPECT_GT(contents.value().size(), 100U);
  EXPECT_EQ(files->read("/proc/self/status", 100).status().errorNumber(), EFBIG);
}

TEST_F(LinuxFiles, HaveTheirPermissionsWhateverTheMask) {
  for (const mode_t mask : {0000U, 0077U, 0777U}) {
    ::umask(mask);
    const std::string name = std::to_string(mask);
    EXPECT_TRUE(files->create(scratch / ("created" + name), someBytes).isOk());
    EXPECT_TRUE(files->replace(scratch / ("replaced" + name), someBytes).isOk());
    EXPECT_TRUE(files->createDirectories(scratch / (name + "/below"), 0777).isOk());
    ::umask(0022);
    EXPECT_EQ(permissionsOf(scratch / ("created" + name)), 0600U);
    EXPECT_EQ(permissionsOf(scratch / ("replaced" + name)), 0600U);
    EXPECT_EQ(permissionsOf(scratch / name), 0755U);
    EXPECT_EQ(permissionsOf(scratch / (name + "/below")), 0777U);
  }
}

TEST_F(LinuxFiles, AreTakenBackWhenTheyCannotBeWrittenWhole) {
  const rlimit small{.rlim_cur = 1000, .rlim_max = RLIM_INFINITY};
  ::signal(SIGXFSZ, SIG_IGN);
  ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &small), 0);
  scratch.put("old", "old");
  EXPECT_EQ(files->create(scratch / "file", Bytes(2000)).errorNumber(), EFBIG);
  EXPECT_EQ(files->replace(scratch / "old", Bytes(2000)).errorNumber(), EFBIG);
  EXPECT_EQ(scratch.contents("old"), "old");
  EXPECT_EQ(entries(), 1);
}

TEST_F(LinuxFiles, LeaveNoDirectoryBehindThatWasMadeOnTheWayToAFailure) {
  const std::string tooLong(300, 'x');
  EXPECT_EQ(files->createDirectories(scratch / ("a/b/" + tooLong), 0755).errorNumber(), ENAMETOOLONG);
  EXPECT_EQ(entries(), 0);
}

TEST_F(LinuxFiles, AreRemovedHoweverDeepTheyLie) {
  // Deeper than a path may be long, and than descriptors may be open.
  constexpr int levels = 1200;
  int directory = ::open(scratch.path().c_str(), O_PATH);
  for (int level = 0; level < levels; ++level) {
    ASSERT_EQ(::mkdirat(directory, "deep", 0700), 0);
    const int below = ::openat(directory, "deep", O_PATH);
    ::close(directory);
    directory = below;
  }
  ::close(::openat(directory, "file", O_CREAT | O_WRONLY, 0600));
  ::close(directory);
  ASSERT_TRUE(files->remove(scratch / "deep").isOk());
  EXPECT_EQ(entries(), 0);
}

TEST_F(LinuxFiles, AreRemovedWhenADirectoryHoldsManyOfThem) {
  for (int number = 0; number < 500; ++number) {
    scratch.put("tree/file" + std::to_string(number), "");
    scratch.put("tree/directory" + std::to_string(number) + "/file", "");
  }
  ASSERT_TRUE(files->remove(scratch / "tree").isOk());
  EXPECT_EQ(entries(), 0);
}

TEST_F(LinuxFiles, AreNotRemovedByAPathThatNamesNoEntry) {
  scratch.put("directory/file", "text");
  fs::current_path(scratch / "directory");
  EXPECT_EQ(files->remove("").errorNumber(), ENOENT);
  EXPECT_EQ(files->remove(scratch / "directory/.").errorNumber(), EINVAL);
  EXPECT_EQ(files->remove(scratch / "directory/..").errorNumber(), EINVAL);
  EXPECT_EQ(files->remove("/").errorNumber(), EINVAL);
  EXPECT_EQ(scratch.contents("directory/file"), "text");
}

TEST_F(LinuxFiles, StayWhereTheyAreWhenTheyWouldHaveToCrossVolumes) {
  if (::access("/dev/shm", W_OK) != 0) GTEST_SKIP() << "no second volume here";
  scratch.put("here", "text");
  const Path there = Path{"/dev/shm"} / scratch.path().filename();
  EXPECT_EQ(files->rename(scratch / "here", there).errorNumber(), EXDEV);
  EXPECT_EQ(scratch.contents("here"), "text");
  EXPECT_FALSE(fs::exists(there));
}

TEST_F(LinuxFiles, AreGivenToTheAccountsOfTheDeviceAndNotOfTheCaller) {
  nameTheCaller("known-only-to-the-device");
  scratch.put("file", "text");
  EXPECT_TRUE(files->setOwner(scratch / "file", "known-only-to-the-device", "known-only-to-the-device").isOk());
  EXPECT_EQ(files->setOwner(scratch / "file", "daemon", "daemon").errorNumber(), ENOENT);
}

TEST_F(LinuxFiles, AreGivenToAnAccountBehindOneWithALongEntry) {
  nameTheCaller("mobile", std::string(70'000, 'x'));
  scratch.put("file", "text");
  EXPECT_TRUE(files->setOwner(scratch / "file", "mobile", "mobile").isOk());
}

TEST_F(LinuxFiles, AreGivenByNumber) {
  if (::getuid() != 0) GTEST_SKIP() << "only root gives files away";
  scratch.put("etc/passwd", "broken line\nmobile:x:501:502::/:\n");
  scratch.put("etc/group", "mobile:x:503:\n");
  scratch.put("file", "text");
  ASSERT_TRUE(files->setOwner(scratch / "file", "mobile", "mobile").isOk());
  struct stat status {};
  ASSERT_EQ(::stat((scratch / "file").c_str(), &status), 0);
  EXPECT_EQ(status.st_uid, 501U);
  EXPECT_EQ(status.st_gid, 503U);
}

TEST_F(LinuxFiles, AreSoonGivenToNobodyWhoIsNoMore) {
  nameTheCaller("mobile");
  scratch.put("file", "text");
  ASSERT_TRUE(files->setOwner(scratch / "file", "mobile", "mobile").isOk());
  nameTheCaller("somebody");
  std::this_thread::sleep_for(std::chrono::milliseconds{1100});
  EXPECT_EQ(files->setOwner(scratch / "file", "mobile", "mobile").errorNumber(), ENOENT);
}

TEST_F(LinuxFiles, FindNoAccountsInAPipe) {
  fs::create_directory(scratch / "etc");
  plantPipe("etc/passwd");
  scratch.put("file", "text");
  EXPECT_EQ(files->setOwner(scratch / "file", "mobile", "mobile").errorNumber(), EINVAL);
}

TEST_F(LinuxFiles, BelongToTheRunningSystemsAccountsUnderItsOwnRoot) {
  const auto ownFiles = platform::makeLinuxPlatform().files;
  scratch.put("file", "text");
  EXPECT_EQ(ownFiles->setOwner(scratch / "file", "no-such-account", "root").errorNumber(), ENOENT);
  const auto given = ownFiles->setOwner(scratch / "file", "root", "root");
  EXPECT_EQ(given.errorNumber(), ::getuid() == 0 ? 0 : EPERM);
}

TEST_F(LinuxFiles, TakeTheirTemporaryNamesFromTheTemporaryDirectory) {
  ::setenv("TMPDIR", scratch.path().c_str(), 1);
  const auto first = files->temporaryName();
  ASSERT_TRUE(first.isOk());
  EXPECT_EQ(first.value().parent_path(), scratch.path());
  ASSERT_TRUE(files->create(first.value(), someBytes).isOk());
  EXPECT_NE(files->temporaryName(), first.value());
}

TEST_F(LinuxFiles, LeaveOutTheSlashesBehindTheTemporaryDirectory) {
  ::setenv("TMPDIR", (scratch.path().string() + "///").c_str(), 1);
  const std::string name = files->temporaryName().value().string();
  const std::string beginning = scratch.path().string() + "/file";
  EXPECT_TRUE(name.starts_with(beginning)) << name;
  EXPECT_EQ(name.size(), beginning.size() + 6);
}

TEST_F(LinuxFiles, TakeTheirTemporaryNamesFromTheCommonDirectoryWhereTheChosenOneIsNone) {
  scratch.put("file", "text");
  for (const Path& chosen : {Path{}, scratch / "nothing", scratch / "file"}) {
    ::setenv("TMPDIR", chosen.c_str(), 1);
    EXPECT_EQ(files->temporaryName().value().parent_path(), "/tmp") << chosen;
  }
  ::unsetenv("TMPDIR");
  EXPECT_EQ(files->temporaryName().value().parent_path(), "/tmp");
}

TEST_F(LinuxFiles, TakeARelativeTemporaryDirectoryFromTheWorkingDirectoryWhileThatIsThere) {
  fs::create_directories(scratch / "here/temporary");
  fs::current_path(scratch / "here");
  ::setenv("TMPDIR", "temporary", 1);
  const auto name = files->temporaryName();
  EXPECT_EQ(name.value().parent_path(), "temporary");
  EXPECT_TRUE(files->create(name.value(), someBytes).isOk());
  EXPECT_EQ(entries("here/temporary"), 1);
  fs::remove_all(scratch / "here");
  EXPECT_EQ(files->temporaryName().value().parent_path(), "/tmp");
  fs::current_path("/");
}

TEST(TheTemporaryDirectory, IsNoneWhereNeitherTheChosenNorTheCommonOneIsThere) {
  const FakeDevice device;
  ::setenv("TMPDIR", "/nothing", 1);
  EXPECT_EQ(platform::temporaryDirectory(*device.files).status().errorNumber(), ENOENT);
  device.files->putDirectory("/tmp");
  EXPECT_EQ(platform::temporaryDirectory(*device.files), Path{"/tmp"});
}

TEST_F(LinuxFiles, KeepTheirTemporaryDirectoryBehindALinkThatOnlyTheDeviceKnows) {
  fs::create_directories(scratch / "private/tmp");
  plantLink("var", "/private");
  ::setenv("TMPDIR", (scratch / "var/tmp").c_str(), 1);
  const auto name = files->temporaryName();
  ASSERT_TRUE(name.isOk());
  EXPECT_EQ(name.value().parent_path(), scratch / "var/tmp");
  EXPECT_TRUE(files->create(name.value(), someBytes).isOk());
  EXPECT_EQ(entries("private/tmp"), 1);
}

TEST_F(LinuxFiles, AreGivenAwayOnlyAsMadeAlsoWhenManyOthersWereMadeBefore) {
  nameTheCaller("mobile");
  for (char letter = 'b'; letter < 'q'; ++letter) {
    ASSERT_TRUE(files->create(scratch / std::string(1, letter), someBytes).isOk());
  }
  ASSERT_TRUE(files->create(scratch / "a", someBytes).isOk());
  ASSERT_TRUE(files->create(scratch / "q", someBytes).isOk());
  fs::rename(scratch / "a", scratch / "away");
  scratch.put("a", "something else");
  EXPECT_EQ(files->setOwner(scratch / "a", "mobile", "mobile").errorNumber(), ESTALE);
}

TEST_F(LinuxFiles, LeaveNoDescriptorOpen) {
  const auto openDescriptors = [] { return std::distance(fs::directory_iterator{"/proc/self/fd"}, {}); };
  const auto before = openDescriptors();
  scratch.put("tree/a/file", "text");
  static_cast<void>(files->read(scratch / "tree/a/file", anySize));
  static_cast<void>(files->copy(scratch / "tree/a/file", scratch / "copy"));
  static_cast<void>(files->replace(scratch / "copy", someBytes));
  static_cast<void>(files->rename(scratch / "copy", scratch / "moved"));
  static_cast<void>(files->createDirectories(scratch / "x/y/z", 0700));
  static_cast<void>(files->remove(scratch / "x/y/z"));
  static_cast<void>(files->remove(scratch / "tree"));
  static_cast<void>(files->read(scratch.path(), anySize));
  EXPECT_EQ(openDescriptors(), before);
}

}  // namespace
}  // namespace tests
