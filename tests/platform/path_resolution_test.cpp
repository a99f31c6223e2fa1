// Which links the device's file system follows on the way to a path, with and without the kernel's own help.

#include <fcntl.h>
#include <grp.h>
#include <gtest/gtest.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <array>
#include <cerrno>

#include "platform/linux/linux_platform.h"
#include "tests/support/child_process.h"
#include "tests/support/scratch_directory.h"

namespace tests {
namespace {

namespace fs = std::filesystem;
using platform::Cause;
using platform::FileKind;
using platform::Path;

constexpr uid_t somebody = 501;
constexpr uid_t somebodyElse = 502;

// From now on the process is on a kernel that does not know openat2.
void forgetOpenat2() {
  constexpr std::uint32_t refused = SECCOMP_RET_ERRNO | ENOSYS;
  std::array<sock_filter, 4> steps{{{BPF_LD | BPF_W | BPF_ABS, 0, 0, 0},
                                    {BPF_JMP | BPF_JEQ | BPF_K, 0, 1, SYS_openat2},
                                    {BPF_RET | BPF_K, 0, 0, refused},
                                    {BPF_RET | BPF_K, 0, 0, SECCOMP_RET_ALLOW}}};
  const sock_fprog program{steps.size(), steps.data()};
  ASSERT_EQ(::prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0), 0);
  ASSERT_EQ(::prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &program), 0);
  ASSERT_EQ(::syscall(SYS_openat2, AT_FDCWD, "/", nullptr, 0), -1);
  ASSERT_EQ(errno, ENOSYS);
}

// The file tree ROOT with ROOT/data/file, and beside it a directory that the device has no business in.
class Resolution : public testing::TestWithParam<bool> {
 protected:
  ScratchDirectory scratch;
  Path root = scratch / "root";
  Path outside = scratch / "outside";

  void SetUp() override {
    scratch.put("root/data/file", "inside");
    scratch.put("outside/file", "outside");
    if (!GetParam()) forgetOpenat2();
  }
  [[nodiscard]] std::shared_ptr<platform::FileSystem> files() const {
    return platform::makeLinuxPlatform({.systemRoot = root, .home = scratch / "home"}).files;
  }
  [[nodiscard]] std::string text(const Path& path) const {
    const auto contents = files()->read(path, SIZE_MAX);
    if (!contents.isOk()) return "error " + std::to_string(contents.status().errorNumber());
    return {contents.value().begin(), contents.value().end()};
  }
  [[nodiscard]] static std::string error(int number) { return "error " + std::to_string(number); }
  void link(std::string_view below, const Path& target) const { fs::create_symlink(target, scratch / below); }
  void give(std::string_view below, uid_t owner) const {
    ASSERT_EQ(::lchown((scratch / below).c_str(), owner, owner), 0);
  }
};
INSTANTIATE_TEST_SUITE_P(WithAndWithoutOpenat2, Resolution, testing::Bool());

TEST_P(Resolution, FindsAFileWithoutLinks) { EXPECT_EQ(text(root / "data/file"), "inside"); }

TEST_P(Resolution, FollowsLinksOfTheProcesssUser) {
  link("root/relative", "data");
  link("root/absolute", "/data");
  link("root/chain", "relative/../absolute/file");
  EXPECT_EQ(text(root / "relative/file"), "inside");
  EXPECT_EQ(text(root / "absolute/file"), "inside");
  EXPECT_EQ(text(root / "chain"), "inside");
}

TEST_P(Resolution, NeverLeavesTheRoot) {
  link("root/up", "../outside");
  link("root/far-up", "../../../../../../outside");
  link("root/data/over", "../../outside/file");
  link("root/absolute", outside);
  for (const char* const path : {"up/file", "far-up/file", "data/over", "absolute/file", "../outside/file"}) {
    EXPECT_EQ(text(root / path), error(ENOENT)) << path;
    EXPECT_EQ(files()->kindOf(root / path).cause(), Cause::missing) << path;
  }
  EXPECT_EQ(text(root / "../data/file"), "inside");
}

TEST_P(Resolution, WritesAndRemovesNothingOutsideTheRoot) {
  link("root/absolute", outside);
  link("root/up", "../outside");
  for (const char* const way : {"absolute", "up"}) {
    EXPECT_EQ(files()->create(root / way / "new", {}).errorNumber(), ENOENT);
    EXPECT_EQ(files()->remove(root / way / "file").errorNumber(), ENOENT);
    EXPECT_EQ(files()->rename(root / "data/file", root / way / "file").errorNumber(), ENOENT);
    EXPECT_NE(files()->createDirectories(root / way / "new", 0777).errorNumber(), 0);
  }
  EXPECT_EQ(scratch.contents("outside/file"), "outside");
  EXPECT_EQ(std::distance(fs::directory_iterator{outside}, {}), 1);
}

TEST_P(Resolution, TakesTheWayToTheRootAsItIsGiven) {
  link("way", "root");
  root = scratch / "way";
  EXPECT_EQ(text(root / "data/file"), "inside");
}

TEST_P(Resolution, KeepsADirectoryOutsideOfTheRootToItself) {
  scratch.put("elsewhere/file", "at home");
  link("home", "elsewhere");
  link("elsewhere/up", "../outside");
  link("elsewhere/absolute", "/data/file");
  EXPECT_EQ(text(scratch / "home/file"), "at home");
  EXPECT_EQ(text(scratch / "home/up/file"), error(EXDEV));
  EXPECT_EQ(text(scratch / "home/absolute"), "inside");
}

TEST_P(Resolution, EndsWhereLinksGoInACircle) {
  link("root/one", "two/x");
  link("root/two", "one/x");
  EXPECT_EQ(text(root / "one/file"), error(ELOOP));
}

TEST_P(Resolution, TellsWhatIsMissingFromWhatIsNoDirectory) {
  link("root/nowhere", "nothing");
  link("root/link", "data/file");
  EXPECT_EQ(text(root / "nowhere"), error(ENOENT));
  EXPECT_EQ(text(root / "nowhere/file"), error(ENOENT));
  EXPECT_EQ(text(root / "link/file"), error(ENOTDIR));
  EXPECT_EQ(text(root / "data/file/file"), error(ENOTDIR));
}

TEST_P(Resolution, RefusesALinkInADirectoryInWhichOthersWrite) {
  link("root/data/link", "file");
  fs::permissions(root / "data", fs::perms{0777});
  EXPECT_EQ(text(root / "data/link"), error(ELOOP));
  EXPECT_EQ(files()->kindOf(root / "data/link"), FileKind::other);
  fs::permissions(root / "data", fs::perms{01777});
  EXPECT_EQ(text(root / "data/link"), "inside");
}

TEST_P(Resolution, RefusesAFileWithASecondNameThatMayBeSomebodyElses) {
  fs::create_hard_link(root / "data/file", root / "data/second");
  EXPECT_EQ(text(root / "data/second"), "inside");
  fs::permissions(root / "data", fs::perms{01777});
  EXPECT_EQ(text(root / "data/second"), error(EMLINK));
  EXPECT_EQ(files()->copy(root / "data/second", root / "copy").errorNumber(), EMLINK);
}

class ResolutionAsRoot : public Resolution {
 protected:
  void SetUp() override {
    Resolution::SetUp();
    if (::geteuid() != 0) GTEST_SKIP() << "only root makes other users' files";
    for (const char* const directory : {"root/his", "root/his/own", "root/secret"})
      fs::create_directory(scratch / directory);
    scratch.put("root/his/own/file", "his");
    scratch.put("root/secret/file", "secret");
    fs::permissions(root / "secret/file", fs::perms{0600});
    for (const char* const owned : {"root/his", "root/his/own", "root/his/own/file"}) give(owned, somebody);
  }
  void plant(std::string_view below, const Path& target, uid_t owner) const {
    link(below, target);
    give(below, owner);
  }
};
INSTANTIATE_TEST_SUITE_P(WithAndWithoutOpenat2, ResolutionAsRoot, testing::Bool());

TEST_P(ResolutionAsRoot, FollowsAUsersLinkToWhatIsThatUsers) {
  plant("root/his/link", "/his/own/file", somebody);
  plant("root/his/way", "own", somebody);
  EXPECT_EQ(text(root / "his/link"), "his");
  EXPECT_EQ(text(root / "his/way/file"), "his");
  EXPECT_TRUE(files()->create(root / "his/way/new", {}).isOk());
}

TEST_P(ResolutionAsRoot, RefusesAUsersLinkToWhatIsNotThatUsers) {
  plant("root/his/link", "/secret/file", somebody);
  plant("root/his/way", "/secret", somebody);
  plant("root/his/up", "..", somebody);
  EXPECT_EQ(text(root / "his/link"), error(ELOOP));
  EXPECT_EQ(text(root / "his/way/file"), error(ELOOP));
  EXPECT_EQ(files()->kindOf(root / "his/link"), FileKind::other);
  EXPECT_EQ(files()->kindOf(root / "his/way/file").cause(), Cause::unsafe);
  EXPECT_EQ(files()->create(root / "his/way/new", {}).errorNumber(), ELOOP);
  EXPECT_EQ(files()->create(root / "his/up/new", {}).errorNumber(), ELOOP);
  EXPECT_EQ(files()->remove(root / "his/way/file").errorNumber(), ELOOP);
  EXPECT_EQ(scratch.contents("root/secret/file"), "secret");
}

TEST_P(ResolutionAsRoot, RefusesAUsersWayThroughWhatIsClosedToThatUser) {
  fs::permissions(root / "secret", fs::perms{0700});
  scratch.put("root/secret/his/file", "his, and out of reach");
  for (const char* const owned : {"root/secret/his", "root/secret/his/file"}) give(owned, somebody);
  plant("root/his/way", "/secret/his", somebody);
  EXPECT_EQ(text(root / "his/way/file"), error(ELOOP));
  fs::permissions(root / "secret", fs::perms{0711});
  EXPECT_EQ(text(root / "his/way/file"), "his, and out of reach");
}

TEST_P(ResolutionAsRoot, FollowsRootsLinkInAUsersDirectoryToWhatIsThatUsers) {
  plant("root/his/link", "own/file", 0);
  plant("root/his/way", "/his/own", 0);
  EXPECT_EQ(text(root / "his/link"), "his");
  EXPECT_EQ(text(root / "his/way/file"), "his");
  EXPECT_TRUE(files()->create(root / "his/way/new", {}).isOk());
}

TEST_P(ResolutionAsRoot, FollowsAUsersLinkInRootsDirectoryToWhatIsThatUsers) {
  plant("root/data/his", "/his/own/file", somebody);
  plant("root/data/secret", "/secret/file", somebody);
  EXPECT_EQ(text(root / "data/his"), "his");
  EXPECT_EQ(text(root / "data/secret"), error(ELOOP));
}

TEST_P(ResolutionAsRoot, RefusesRootsLinkThatAUserMayHaveMovedToWhatTheUserCannotRead) {
  plant("root/his/link", "/secret/file", 0);
  plant("root/his/way", "/secret", 0);
  EXPECT_EQ(text(root / "his/link"), error(ELOOP));
  EXPECT_EQ(text(root / "his/way/file"), error(ELOOP));
  EXPECT_EQ(files()->copy(root / "his/link", root / "copy").errorNumber(), ELOOP);
  EXPECT_EQ(files()->create(root / "his/way/new", {}).errorNumber(), ELOOP);
}

TEST_P(ResolutionAsRoot, ReadsForAUserWhatEverybodyMayReadButWritesNothingThere) {
  fs::permissions(root / "secret/file", fs::perms{0644});
  plant("root/his/link", "/secret/file", 0);
  plant("root/his/way", "/secret", 0);
  EXPECT_EQ(text(root / "his/link"), "secret");
  EXPECT_EQ(files()->create(root / "his/way/new", {}).errorNumber(), ELOOP);
  fs::permissions(root / "secret", fs::perms{0700});
  EXPECT_EQ(text(root / "his/link"), error(ELOOP));
}

TEST_P(ResolutionAsRoot, ReadsNoProcesssFileForAUser) {
  root = "/";
  plant("root/his/link", "/proc/self/maps", somebody);
  EXPECT_EQ(text(scratch / "root/his/link"), error(ELOOP));
}

TEST_P(ResolutionAsRoot, RefusesALinkThatOneUserMadeInAnothersDirectory) {
  plant("root/his/others", "own/file", somebodyElse);
  EXPECT_EQ(text(root / "his/others"), error(ELOOP));
}

TEST_P(ResolutionAsRoot, RefusesAWayOfTwoUsersLinks) {
  fs::create_directory(root / "others");
  give("root/others", somebodyElse);
  plant("root/others/link", "/his/own/file", somebodyElse);
  plant("root/his/link", "/others/link", somebody);
  EXPECT_EQ(text(root / "his/link"), error(ELOOP));
}

struct SecondName {
  const char* what;
  uid_t directoryOwner;
  unsigned directoryMode;
  uid_t fileOwner;
  unsigned fileMode;
  int error;  // 0 where it is read
};

constexpr SecondName kSecondNames[] = {
    {"root's in root's", 0, 0755, 0, 0600, 0},
    {"a user's in root's", 0, 0755, somebody, 0600, 0},
    {"a user's in his own", somebody, 0755, somebody, 0600, 0},
    {"root's in a user's", somebody, 0700, 0, 0600, EMLINK},
    {"root's in a user's, for all to read", somebody, 0700, 0, 0644, 0},
    {"another user's in a user's", somebody, 0755, somebodyElse, 0600, EMLINK},
    {"another user's in a user's, for all to read", somebody, 0755, somebodyElse, 0644, 0},
    {"root's where a group writes", 0, 0775, 0, 0600, EMLINK},
    {"root's where others write", 0, 0777, 0, 0600, EMLINK},
    {"root's in a sticky directory", 0, 01777, 0, 0600, EMLINK},
    {"a user's in a sticky directory", 0, 01777, somebody, 0600, EMLINK},
};

TEST_P(ResolutionAsRoot, ReadsASecondNameUnlessItMayBeSomebodysWhoCannotReadTheFile) {
  for (const SecondName& row : kSecondNames) {
    SCOPED_TRACE(row.what);
    fs::remove_all(root / "place");
    scratch.put("root/place/file", "text");
    fs::remove(root / "first name");
    fs::create_hard_link(root / "place/file", root / "first name");
    fs::permissions(root / "place/file", fs::perms{row.fileMode});
    fs::permissions(root / "place", fs::perms{row.directoryMode});
    give("root/place/file", row.fileOwner);
    give("root/place", row.directoryOwner);
    EXPECT_EQ(text(root / "place/file"), row.error == 0 ? "text" : error(row.error));
    EXPECT_EQ(files()->copy(root / "place/file", root / "copy").errorNumber(), row.error);
    fs::remove(root / "copy");
  }
}

TEST_P(ResolutionAsRoot, ReadsNothingThatAUserPlantedToSeeIt) {
  fs::permissions(scratch.path(), fs::perms{0755});
  plant("root/his/roots", "/secret/file", 0);
  const ChildProcess user{[this](const auto& say) {
    if (::setgroups(0, nullptr) != 0 || ::setuid(somebody) != 0) return;
    if (::symlink("/secret/file", (root / "his/link").c_str()) != 0) return;
    if (::rename((root / "his/roots").c_str(), (root / "his/moved").c_str()) != 0) return;
    say();
  }};
  ASSERT_TRUE(user.says(std::chrono::seconds{10}));
  for (const char* const planted : {"his/link", "his/moved"}) EXPECT_EQ(text(root / planted), error(ELOOP)) << planted;
}

TEST_P(ResolutionAsRoot, GivesNothingAwayThatTookThePlaceOfWhatWasMade) {
  scratch.put("root/etc/passwd", "mobile:x:501:501::/:\n");
  scratch.put("root/etc/group", "mobile:x:501:\n");
  const auto device = files();
  ASSERT_TRUE(device->create(root / "his/new", {}).isOk());
  fs::rename(root / "his/new", root / "his/away");
  scratch.put("root/his/new", "root's own");
  EXPECT_EQ(device->setOwner(root / "his/new", "mobile", "mobile").errorNumber(), ESTALE);
  ASSERT_TRUE(device->createDirectories(root / "his/directory", 0700).isOk());
  fs::rename(root / "his/directory", root / "his/elsewhere");
  fs::create_directory(root / "his/directory");
  EXPECT_EQ(device->setOwner(root / "his/directory", "mobile", "mobile").errorNumber(), ESTALE);
}

}  // namespace
}  // namespace tests
