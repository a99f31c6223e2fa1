// What every keeper of files does, the device's and the tests' own.

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <cstdio>
#include <functional>
#include <thread>
#include <tuple>

#include "platform/linux/files/file_services.h"
#include "platform/linux/linux_platform.h"
#include "tests/support/fake_file_keeper.h"
#include "tests/support/scratch_directory.h"

namespace tests {
namespace {

using platform::Bytes;
using platform::Cause;
using platform::FileAttributes;
using platform::FileKind;
using platform::Path;

Bytes bytes(std::string_view text) { return {text.begin(), text.end()}; }

struct KeeperOfTheTests {
  FakeFileSystem fileSystem;
  FakeFileKeeper keeper{fileSystem};
  Path base = "/device";

  KeeperOfTheTests() { fileSystem.putDirectory(base); }
  platform::FileSystem& files() { return fileSystem; }
  platform::FileKeeper& service() { return keeper; }
};

struct KeeperOfTheDevice {
  ScratchDirectory scratch;
  Path base = scratch.path();
  platform::Platform device = platform::makeLinuxPlatform({.systemRoot = base});
  std::shared_ptr<platform::FileSystem> fileSystem = device.files;
  std::shared_ptr<platform::FileKeeper> keeper = platform::makeFileKeeper(*device.directories);

  platform::FileSystem& files() { return *fileSystem; }
  platform::FileKeeper& service() { return *keeper; }
};

template <typename Subject>
class FileKeeperContract : public testing::Test {
 protected:
  Subject subject;
  platform::FileSystem& files = subject.files();
  platform::FileKeeper& keeper = subject.service();
  const FileAttributes attributes{.kind = FileKind::file,
                                  .size = 4,
                                  .owner = ::geteuid(),
                                  .group = ::getegid(),
                                  .permissions = 0641,
                                  .modifiedSeconds = 1'234'567,
                                  .modifiedNanoseconds = 89};

  [[nodiscard]] Path at(std::string_view below) const { return subject.base / below; }
  void put(std::string_view below, std::string_view text) { ASSERT_TRUE(files.create(at(below), bytes(text)).isOk()); }
  std::string textAt(std::string_view below) {
    const auto contents = files.read(at(below), SIZE_MAX);
    return contents.isOk() ? std::string{contents.value().begin(), contents.value().end()} : "(unreadable)";
  }
};

using Subjects = testing::Types<KeeperOfTheTests, KeeperOfTheDevice>;
TYPED_TEST_SUITE(FileKeeperContract, Subjects);

TYPED_TEST(FileKeeperContract, TellsWhatStandsAtAPath) {
  this->put("file", "text");
  const auto file = this->keeper.attributesOf(this->at("file"));
  ASSERT_TRUE(file.isOk());
  EXPECT_EQ(file.value().kind, FileKind::file);
  EXPECT_EQ(file.value().size, 4U);
  EXPECT_EQ(file.value().permissions, 0600U);
  EXPECT_EQ(this->keeper.attributesOf(this->subject.base).value().kind, FileKind::directory);
  EXPECT_EQ(this->keeper.attributesOf(this->at("nothing")).status().errorNumber(), ENOENT);
}

TYPED_TEST(FileKeeperContract, ReadsAttributesAndBytesTogether) {
  this->put("file", "text");
  const auto file = this->keeper.read(this->at("file"), 4);
  ASSERT_TRUE(file.isOk());
  EXPECT_EQ(file.value().bytes, bytes("text"));
  EXPECT_EQ(file.value().attributes, this->keeper.attributesOf(this->at("file")).value());
  EXPECT_EQ(this->keeper.read(this->at("file"), 3).status().errorNumber(), EFBIG);
  EXPECT_EQ(this->keeper.read(this->at("nothing"), 4).status().errorNumber(), ENOENT);
  EXPECT_EQ(this->keeper.read(this->subject.base, 4).value().attributes.kind, FileKind::directory);
}

TYPED_TEST(FileKeeperContract, ReadsOfTargetsFilesAlone) {
  this->put("file", "text");
  const auto file = this->keeper.readTarget(this->at("file"), 4);
  ASSERT_TRUE(file.isOk());
  EXPECT_EQ(file.value().bytes, bytes("text"));
  EXPECT_EQ(file.value().attributes, this->keeper.attributesOf(this->at("file")).value());
  EXPECT_EQ(this->keeper.readTarget(this->at("file"), 3).status().errorNumber(), EFBIG);
  EXPECT_EQ(this->keeper.readTarget(this->at("nothing"), 4).status().errorNumber(), ENOENT);
  EXPECT_EQ(this->keeper.readTarget(this->subject.base, 4).status().errorNumber(), EISDIR);
}

TYPED_TEST(FileKeeperContract, GivesNoSpecialModeBits) {
  FileAttributes special = this->attributes;
  special.permissions = 06755;
  ASSERT_TRUE(this->keeper.restore(this->at("file"), bytes("text"), special).isOk());
  EXPECT_EQ(this->keeper.attributesOf(this->at("file")).value().permissions, 0755U);
}

TYPED_TEST(FileKeeperContract, RestoresAFileWithAllThatItWas) {
  this->put("file", "something else");
  ASSERT_TRUE(this->keeper.restore(this->at("file"), bytes("text"), this->attributes).isOk());
  EXPECT_EQ(this->textAt("file"), "text");
  EXPECT_EQ(this->keeper.attributesOf(this->at("file")).value(), this->attributes);
}

TYPED_TEST(FileKeeperContract, RestoresAFileThatIsGone) {
  ASSERT_TRUE(this->keeper.restore(this->at("file"), bytes("text"), this->attributes).isOk());
  EXPECT_EQ(this->textAt("file"), "text");
  EXPECT_EQ(this->keeper.entriesOf(this->subject.base).value(), std::vector<std::string>{"file"});
}

TYPED_TEST(FileKeeperContract, RestoresNothingOntoADirectoryOrIntoAMissingOne) {
  ASSERT_TRUE(this->files.createDirectories(this->at("directory"), 0755).isOk());
  EXPECT_EQ(this->keeper.restore(this->at("directory"), bytes("text"), this->attributes).errorNumber(), EISDIR);
  EXPECT_EQ(this->keeper.restore(this->at("nothing/file"), bytes("text"), this->attributes).errorNumber(), ENOENT);
  EXPECT_EQ(this->keeper.entriesOf(this->at("directory")).value(), std::vector<std::string>{});
}

TYPED_TEST(FileKeeperContract, AddsToTheEndOfAFile) {
  this->put("file", "one");
  ASSERT_TRUE(this->keeper.append(this->at("file"), bytes(" two")).isOk());
  EXPECT_EQ(this->textAt("file"), "one two");
}

TYPED_TEST(FileKeeperContract, AddsToNothingThatIsMissingOrADirectory) {
  EXPECT_EQ(this->keeper.append(this->at("nothing"), bytes("text")).errorNumber(), ENOENT);
  EXPECT_EQ(this->keeper.append(this->subject.base, bytes("text")).errorNumber(), EISDIR);
}

TYPED_TEST(FileKeeperContract, ListsADirectoryInOrder) {
  for (const char* const name : {"b", "a", "c"}) this->put(name, "");
  EXPECT_EQ(this->keeper.entriesOf(this->subject.base).value(), (std::vector<std::string>{"a", "b", "c"}));
  EXPECT_EQ(this->keeper.entriesOf(this->at("nothing")).status().errorNumber(), ENOENT);
  EXPECT_EQ(this->keeper.entriesOf(this->at("a")).status().errorNumber(), ENOTDIR);
}

TYPED_TEST(FileKeeperContract, SeesToItThatNoFileStandsAtAPath) {
  this->put("file", "text");
  EXPECT_TRUE(this->keeper.removeFile(this->at("file")).isOk());
  EXPECT_EQ(this->files.kindOf(this->at("file")).cause(), Cause::missing);
  EXPECT_TRUE(this->keeper.removeFile(this->at("file")).isOk());
  EXPECT_TRUE(this->keeper.removeFile(this->at("nothing/file")).isOk());
  EXPECT_EQ(this->keeper.removeFile(this->subject.base).errorNumber(), EISDIR);
}

const FileAttributes kOurs{.owner = ::geteuid(), .group = ::getegid(), .permissions = 0600};

TEST(LinuxFileKeeper, FollowsNoLinkAtAPathItself) {
  const ScratchDirectory scratch;
  scratch.put("target", "precious");
  std::filesystem::create_symlink(scratch / "target", scratch / "link");
  const auto keeper = platform::makeFileKeeper(*platform::makeLinuxPlatform().directories);
  EXPECT_EQ(keeper->attributesOf(scratch / "link").value().kind, FileKind::other);
  EXPECT_EQ(keeper->append(scratch / "link", bytes("x")).errorNumber(), ELOOP);
  EXPECT_TRUE(keeper->restore(scratch / "link", bytes("new"), kOurs).isOk());
  EXPECT_EQ(scratch.contents("target"), "precious");
  EXPECT_EQ(scratch.contents("link"), "new");
}

TEST(LinuxFileKeeper, ReadsNoSecondNameThatSomebodyMayHavePlanted) {
  const ScratchDirectory scratch;
  scratch.put("file", "text");
  std::filesystem::create_hard_link(scratch / "file", scratch / "second");
  ASSERT_EQ(::chmod(scratch.path().c_str(), 0777), 0);
  const auto keeper = platform::makeFileKeeper(*platform::makeLinuxPlatform().directories);
  EXPECT_EQ(keeper->read(scratch / "second", 4).status().errorNumber(), EMLINK);
}

TEST(LinuxFileKeeper, ReadsRootsOnlyFileInTheDirectoryOfAnother) {
  if (::getuid() != 0) GTEST_SKIP() << "only root has files in the directories of others";
  const ScratchDirectory scratch;
  scratch.put("file", "text");
  ASSERT_EQ(::chmod((scratch / "file").c_str(), 0600), 0);
  ASSERT_EQ(::chown(scratch.path().c_str(), 65534, 65534), 0);
  const auto keeper = platform::makeFileKeeper(*platform::makeLinuxPlatform().directories);
  EXPECT_EQ(keeper->read(scratch / "file", 4).value().bytes, bytes("text"));
}

// Does something again and again, beside the test, as long as it stands.
class Meanwhile {
 public:
  explicit Meanwhile(std::function<void()> work)
      : _thread{[this, work = std::move(work)] {
          while (!_isOver) work();
        }} {}
  Meanwhile(const Meanwhile&) = delete;
  Meanwhile& operator=(const Meanwhile&) = delete;
  ~Meanwhile() {
    _isOver = true;
    _thread.join();
  }

 private:
  std::atomic<bool> _isOver = false;
  std::thread _thread;
};

TEST(LinuxFileKeeper, ReadsNoSecondNameThatIsGoneAgainOnceItIsOpen) {
  if (::getuid() != 0) GTEST_SKIP() << "only root reads for another what he may not";
  const ScratchDirectory scratch;
  scratch.put("secret", "secret");
  ASSERT_EQ(::chmod((scratch / "secret").c_str(), 0600), 0);
  const Path theirs = scratch / "theirs";
  std::filesystem::create_directory(theirs);
  ASSERT_EQ(::chown(theirs.c_str(), 65534, 65534), 0);
  const Meanwhile planter{[&] {
    std::ignore = ::link((scratch / "secret").c_str(), (theirs / "second").c_str());
    std::ignore = ::unlink((theirs / "second").c_str());
  }};
  const auto keeper = platform::makeFileKeeper(*platform::makeLinuxPlatform().directories);
  for (int read = 0; read < 20'000; ++read) ASSERT_FALSE(keeper->read(theirs / "second", 10).isOk());
}

TEST(LinuxFileKeeper, ReadsAttributesAndBytesOfOneFileWhateverTakesItsPlace) {
  const ScratchDirectory scratch;
  scratch.put("file", "short");
  scratch.put("other", "something longer");
  const Meanwhile exchanger{[&] {
    ::renameat2(AT_FDCWD, (scratch / "file").c_str(), AT_FDCWD, (scratch / "other").c_str(), RENAME_EXCHANGE);
  }};
  const auto keeper = platform::makeFileKeeper(*platform::makeLinuxPlatform().directories);
  int torn = 0;
  for (int round = 0; round < 2000; ++round) {
    const auto file = keeper->read(scratch / "file", 100);
    torn += file.isOk() && file.value().attributes.size == file.value().bytes.size() ? 0 : 1;
  }
  EXPECT_EQ(torn, 0);
}

TEST(LinuxFileKeeper, PutsAwayWhatADeadRestoreLeft) {
  const ScratchDirectory scratch;
  scratch.put(".restoring-file", "half a fi");
  const auto keeper = platform::makeFileKeeper(*platform::makeLinuxPlatform().directories);
  ASSERT_TRUE(keeper->restore(scratch / "file", bytes("file"), kOurs).isOk());
  EXPECT_EQ(keeper->entriesOf(scratch.path()).value(), std::vector<std::string>{"file"});
}

}  // namespace
}  // namespace tests
