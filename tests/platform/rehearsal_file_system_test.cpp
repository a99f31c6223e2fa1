// What a rehearsal's files are beyond those of any file system: the device's, with what was changed in memory.

#include "platform/linux/files/file_services.h"

#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <filesystem>

#include "platform/linux/linux_platform.h"
#include "tests/support/scratch_directory.h"

namespace tests {
namespace {

using platform::Bytes;
using platform::Cause;
using platform::FileKind;
using platform::Path;

Bytes bytes(std::string_view text) { return {text.begin(), text.end()}; }

class Rehearsal : public testing::Test {
 protected:
  Rehearsal() {
    scratch.put("etc/passwd", "mobile:x:" + std::to_string(::getuid()) + ":0::/:/bin/sh\n");
    scratch.put("etc/group", "mobile:x:" + std::to_string(::getgid()) + ":\n");
    scratch.put("directory/file", "as it is");
    scratch.put("directory/below/other", "as it is");
  }
  std::string textAt(std::string_view below) {
    const auto contents = files->read(scratch / below, SIZE_MAX);
    return contents.isOk() ? std::string{contents.value().begin(), contents.value().end()} : "(unreadable)";
  }

  ScratchDirectory scratch;
  platform::Platform services = platform::makeLinuxPlatform({.systemRoot = scratch.path()});
  std::shared_ptr<platform::RehearsedFiles> files = platform::makeRehearsalFileSystem(*services.directories);
};

TEST_F(Rehearsal, ReadsWhatLiesOnTheDevice) {
  EXPECT_EQ(textAt("directory/file"), "as it is");
  EXPECT_EQ(files->kindOf(scratch / "directory"), FileKind::directory);
}

TEST_F(Rehearsal, ReplacesAFileInMemoryOnly) {
  ASSERT_TRUE(files->replace(scratch / "directory/file", bytes("new")).isOk());
  EXPECT_EQ(textAt("directory/file"), "new");
  EXPECT_EQ(scratch.contents("directory/file"), "as it is");
}

TEST_F(Rehearsal, FindsNothingBelowADirectoryThatItRemoved) {
  ASSERT_TRUE(files->remove(scratch / "directory/below").isOk());
  EXPECT_EQ(files->kindOf(scratch / "directory/below/other").cause(), Cause::missing);
  EXPECT_EQ(files->read(scratch / "directory/below/other", SIZE_MAX).status().cause(), Cause::missing);
  EXPECT_EQ(textAt("directory/file"), "as it is");
  EXPECT_EQ(scratch.contents("directory/below/other"), "as it is");
}

TEST_F(Rehearsal, RemovesAFileInMemoryOnly) {
  ASSERT_TRUE(files->remove(scratch / "directory/file").isOk());
  EXPECT_EQ(files->kindOf(scratch / "directory/file").cause(), Cause::missing);
  EXPECT_TRUE(files->create(scratch / "directory/file", bytes("again")).isOk());
  EXPECT_EQ(scratch.contents("directory/file"), "as it is");
}

TEST_F(Rehearsal, HidesWhatLayInARemovedDirectoryAlsoOnceItIsMadeAgain) {
  ASSERT_TRUE(files->remove(scratch / "directory").isOk());
  EXPECT_EQ(files->read(scratch / "directory/below/other", 100).status().errorNumber(), ENOENT);
  ASSERT_TRUE(files->createDirectories(scratch / "directory/below", 0755).isOk());
  EXPECT_EQ(files->kindOf(scratch / "directory/below/other").cause(), Cause::missing);
  EXPECT_EQ(scratch.contents("directory/below/other"), "as it is");
}

TEST_F(Rehearsal, MovesAFileOfTheDeviceInMemoryOnly) {
  ASSERT_TRUE(files->rename(scratch / "directory/file", scratch / "directory/below/other").isOk());
  EXPECT_EQ(textAt("directory/below/other"), "as it is");
  EXPECT_EQ(files->kindOf(scratch / "directory/file").cause(), Cause::missing);
  EXPECT_EQ(scratch.contents("directory/file"), "as it is");
}

TEST_F(Rehearsal, FollowsLinksToWhatWasChanged) {
  std::filesystem::create_symlink("file", scratch / "directory/link");
  std::filesystem::create_directory_symlink("directory", scratch / "short");
  ASSERT_TRUE(files->replace(scratch / "short/file", bytes("new")).isOk());
  EXPECT_EQ(textAt("directory/link"), "new");
}

TEST_F(Rehearsal, ReplacesALinkAndNotWhatItLeadsTo) {
  std::filesystem::create_symlink("file", scratch / "directory/link");
  ASSERT_TRUE(files->replace(scratch / "directory/link", bytes("new")).isOk());
  EXPECT_EQ(textAt("directory/file"), "as it is");
  EXPECT_EQ(files->copy(scratch / "directory/link", scratch / "copy").isOk(), true);
}

TEST_F(Rehearsal, FollowsALinkThatItMovedAndWhatOtherLinksLeadTo) {
  std::filesystem::create_symlink("../directory/file", scratch / "directory/link");
  ASSERT_TRUE(files->createDirectories(scratch / "made/here", 0755).isOk());
  ASSERT_TRUE(files->rename(scratch / "directory/link", scratch / "made/link").isOk());
  ASSERT_TRUE(files->create(scratch / "made/here/file", bytes("new")).isOk());
  EXPECT_EQ(textAt("made/link"), "as it is");
  EXPECT_EQ(textAt("made/here/../../directory/file"), "as it is");
}

TEST_F(Rehearsal, RefusesWhatMayBePlantedAsTheDeviceDoes) {
  std::filesystem::create_directory(scratch / "open");
  std::filesystem::create_hard_link(scratch / "directory/file", scratch / "open/second");
  std::filesystem::create_symlink("../directory/file", scratch / "open/link");
  std::filesystem::permissions(scratch / "open", std::filesystem::perms{0777});
  for (const char* const path : {"open/second", "open/link"}) {
    const int cause = services.files->read(scratch / path, SIZE_MAX).status().errorNumber();
    EXPECT_NE(cause, 0) << path;
    EXPECT_EQ(files->read(scratch / path, SIZE_MAX).status().errorNumber(), cause) << path;
    EXPECT_EQ(files->copy(scratch / path, scratch / "copy").errorNumber(), cause) << path;
  }
}

TEST_F(Rehearsal, GivesAwayNoFileWithASecondName) {
  std::filesystem::create_hard_link(scratch / "directory/file", scratch / "second");
  EXPECT_EQ(files->setOwner(scratch / "second", "mobile", "mobile").errorNumber(), EMLINK);
}

TEST_F(Rehearsal, MovesNothingToAnotherVolume) {
  struct stat here {};
  struct stat there {};
  if (::stat("/dev/shm", &there) != 0 || ::stat(scratch.path().c_str(), &here) != 0 || here.st_dev == there.st_dev) {
    GTEST_SKIP() << "/dev/shm is no volume of its own here";
  }
  EXPECT_EQ(files->rename(scratch / "directory/file", "/dev/shm/never-made").errorNumber(), EXDEV);
}

TEST_F(Rehearsal, RefusesWhatIsLargerThanFilesMayGrow) {
  rlimit limit{};
  ASSERT_EQ(::getrlimit(RLIMIT_FSIZE, &limit), 0);
  const rlimit low{3, limit.rlim_max};
  ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &low), 0);
  const auto large = files->create(scratch / "large", bytes("1234"));
  const auto small = files->create(scratch / "small", bytes("123"));
  ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &limit), 0);  // what the test prints may go into a file, too
  EXPECT_EQ(large.errorNumber(), EFBIG);
  EXPECT_TRUE(small.isOk());
}

TEST_F(Rehearsal, ProposesTemporaryNamesInADirectoryThatItMade) {
  const Path directory = scratch / "var/tmp";
  ASSERT_TRUE(files->createDirectories(directory, 0700).isOk());
  ::setenv("TMPDIR", directory.c_str(), 1);
  const auto first = files->temporaryName();
  ASSERT_TRUE(first.isOk());
  EXPECT_EQ(first.value().parent_path(), directory);
  ASSERT_TRUE(files->create(first.value(), bytes("text")).isOk());
  EXPECT_NE(files->temporaryName(), first.value());
  EXPECT_FALSE(std::filesystem::exists(directory));
}

TEST_F(Rehearsal, WritesNothingIntoADirectoryThatMayNotBeWritten) {
  if (::geteuid() == 0) GTEST_SKIP() << "root may write everywhere";
  std::filesystem::permissions(scratch / "directory", std::filesystem::perms{0555});
  EXPECT_EQ(files->create(scratch / "directory/new", bytes("text")).errorNumber(), EACCES);
  EXPECT_EQ(files->remove(scratch / "directory/file").errorNumber(), EACCES);
  std::filesystem::permissions(scratch / "directory", std::filesystem::perms{0755});
}

}  // namespace
}  // namespace tests
