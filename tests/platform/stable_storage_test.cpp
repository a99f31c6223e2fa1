// What the device's file system brings to stable storage, and what is left when that fails. The program's own fsync
// stands in the library's way.

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <vector>

#include "platform/linux/linux_platform.h"
#include "tests/support/scratch_directory.h"

namespace tests {
namespace {

struct Syncs {
  std::vector<ino_t> done{};
  std::size_t failing = 0;  // the one that fails, counted from 1
  int error = EIO;
  int interruptions = 0;  // how often a sync is interrupted before it is done
};
Syncs syncs;

}  // namespace
}  // namespace tests

extern "C" [[gnu::visibility("default")]] int fsync(int file) {
  tests::Syncs& syncs = tests::syncs;
  if (syncs.interruptions-- > 0) {
    errno = EINTR;
    return -1;
  }
  struct stat status {};
  ::fstat(file, &status);
  syncs.done.push_back(status.st_ino);
  if (syncs.done.size() != syncs.failing) return static_cast<int>(::syscall(SYS_fsync, file));
  errno = syncs.error;
  return -1;
}

namespace tests {
namespace {

namespace fs = std::filesystem;
using platform::Bytes;
using platform::Path;

const Bytes someBytes{'n', 'e', 'w'};

class StableStorage : public testing::Test {
 protected:
  ScratchDirectory scratch;
  std::shared_ptr<platform::FileSystem> files = platform::makeLinuxPlatform({.systemRoot = scratch.path()}).files;

  void SetUp() override { syncs = {}; }
  static void failAt(std::size_t sync) { syncs = {.failing = sync}; }
  [[nodiscard]] static ino_t nodeOf(const Path& path) {
    struct stat status {};
    EXPECT_EQ(::stat(path.c_str(), &status), 0) << path;
    return status.st_ino;
  }
  // The paths' files and directories were synced, in this order and no others.
  static void expectSynced(const std::vector<Path>& paths) {
    std::vector<ino_t> nodes;
    std::ranges::transform(paths, std::back_inserter(nodes), &StableStorage::nodeOf);
    EXPECT_EQ(syncs.done, nodes);
  }
  [[nodiscard]] std::ptrdiff_t entries() const { return std::distance(fs::directory_iterator{scratch.path()}, {}); }
};

TEST_F(StableStorage, HoldsACreatedFileAndThenItsEntry) {
  ASSERT_TRUE(files->create(scratch / "file", someBytes).isOk());
  expectSynced({scratch / "file", scratch.path()});
}

TEST_F(StableStorage, HoldsACopyAndThenItsEntry) {
  scratch.put("from", "text");
  ASSERT_TRUE(files->copy(scratch / "from", scratch / "to").isOk());
  expectSynced({scratch / "to", scratch.path()});
}

TEST_F(StableStorage, HoldsAReplacementBeforeItIsMovedAndItsEntryAfterwards) {
  scratch.put("file", "old");
  ASSERT_TRUE(files->replace(scratch / "file", someBytes).isOk());
  expectSynced({scratch / "file", scratch.path(), scratch.path()});
}

TEST_F(StableStorage, HoldsTheEntryOfWhatWasMoved) {
  scratch.put("from", "text");
  fs::create_directory(scratch / "directory");
  ASSERT_TRUE(files->rename(scratch / "from", scratch / "directory/to").isOk());
  expectSynced({scratch / "directory"});
}

TEST_F(StableStorage, NoLongerHoldsTheEntryOfWhatWasRemoved) {
  scratch.put("file", "text");
  scratch.put("tree/below/file", "text");
  ASSERT_TRUE(files->remove(scratch / "file").isOk());
  ASSERT_TRUE(files->remove(scratch / "tree").isOk());
  expectSynced({scratch.path(), scratch.path()});
}

TEST_F(StableStorage, HoldsTheEntryOfEveryDirectoryThatWasMade) {
  ASSERT_TRUE(files->createDirectories(scratch / "a/b", 0700).isOk());
  ASSERT_TRUE(files->createDirectories(scratch / "a/b", 0700).isOk());
  expectSynced({scratch.path(), scratch / "a"});
}

// Others than the process's, so that something changes; only root gives files away.
class StableOwners : public StableStorage {
 protected:
  void SetUp() override {
    if (::getuid() != 0) GTEST_SKIP() << "only root gives files away";
    scratch.put("etc/passwd", "mobile:x:501:501::/:\n");
    scratch.put("etc/group", "mobile:x:501:\n");
    StableStorage::SetUp();
  }
  [[nodiscard]] int giveAway(const Path& path) const { return files->setOwner(path, "mobile", "mobile").errorNumber(); }
};

TEST_F(StableOwners, AreHeldAfterTheFileAndItsEntry) {
  ASSERT_TRUE(files->create(scratch / "file", someBytes).isOk());
  ASSERT_EQ(giveAway(scratch / "file"), 0);
  expectSynced({scratch / "file", scratch.path(), scratch / "file"});
}

TEST_F(StableOwners, AreHeldOfDirectoriesAndOfWhatWasThereBefore) {
  scratch.put("file", "text");
  ASSERT_EQ(giveAway(scratch / "file"), 0);
  ASSERT_TRUE(files->createDirectories(scratch / "directory", 0700).isOk());
  ASSERT_EQ(giveAway(scratch / "directory"), 0);
  expectSynced({scratch / "file", scratch.path(), scratch / "directory"});
}

TEST_F(StableOwners, AreNotSyncedWhereNothingChanges) {
  scratch.put("file", "text");
  ASSERT_EQ(giveAway(scratch / "file"), 0);
  ASSERT_EQ(giveAway(scratch / "file"), 0);
  expectSynced({scratch / "file"});
}

TEST_F(StableOwners, ThatAreNotHeldAreAFailure) {
  scratch.put("file", "text");
  failAt(1);
  EXPECT_EQ(giveAway(scratch / "file"), EIO);
}

TEST_F(StableStorage, IsTriedAgainAfterAnInterruption) {
  syncs.interruptions = 3;
  EXPECT_TRUE(files->create(scratch / "file", someBytes).isOk());
}

TEST_F(StableStorage, IsNotWaitedForWhenInterruptionsDoNotEnd) {
  syncs.interruptions = 1'000'000;
  EXPECT_EQ(files->create(scratch / "file", someBytes).errorNumber(), EINTR);
  EXPECT_EQ(entries(), 0);
}

TEST_F(StableStorage, IsNotAskedForByAVolumeThatHasNone) {
  syncs = {.failing = 1, .error = EINVAL};
  EXPECT_TRUE(files->create(scratch / "file", someBytes).isOk());
}

class FailedSync : public StableStorage, public testing::WithParamInterface<std::size_t> {};
INSTANTIATE_TEST_SUITE_P(OfTheBytesOrTheEntry, FailedSync, testing::Values(1U, 2U));

TEST_P(FailedSync, LeavesNoCreatedFileAndNoCopy) {
  scratch.put("from", "text");
  failAt(GetParam());
  EXPECT_EQ(files->create(scratch / "file", someBytes).errorNumber(), EIO);
  failAt(GetParam());
  EXPECT_EQ(files->copy(scratch / "from", scratch / "to").errorNumber(), EIO);
  EXPECT_EQ(entries(), 1);
}

TEST_P(FailedSync, BeforeTheMoveLeavesTheOldFileAlone) {
  scratch.put("file", "old");
  failAt(GetParam());
  EXPECT_EQ(files->replace(scratch / "file", someBytes).errorNumber(), EIO);
  EXPECT_EQ(scratch.contents("file"), "old");
  EXPECT_EQ(entries(), 1);
}

TEST_P(FailedSync, LeavesNoMadeDirectory) {
  failAt(GetParam());
  EXPECT_EQ(files->createDirectories(scratch / "a/b", 0700).errorNumber(), EIO);
  EXPECT_EQ(entries(), 0);
}

TEST_F(StableStorage, ThatFailsAfterAMoveOrARemovalIsAFailureOfThese) {
  scratch.put("from", "text");
  failAt(1);
  EXPECT_EQ(files->rename(scratch / "from", scratch / "to").errorNumber(), EIO);
  failAt(1);
  EXPECT_EQ(files->remove(scratch / "to").errorNumber(), EIO);
  failAt(3);
  EXPECT_EQ(files->replace(scratch / "file", someBytes).errorNumber(), EIO);
  EXPECT_EQ(scratch.contents("file"), "new");
}

TEST_F(StableStorage, IsAskedForBeforeAnythingIsChanged) {
  if (::getuid() == 0) GTEST_SKIP() << "root opens every directory";
  scratch.put("closed/file", "text");
  fs::permissions(scratch / "closed", fs::perms{0333});
  EXPECT_EQ(files->remove(scratch / "closed/file").errorNumber(), EACCES);
  fs::permissions(scratch / "closed", fs::perms{0700});
  EXPECT_EQ(scratch.contents("closed/file"), "text");
}

}  // namespace
}  // namespace tests
