// What every file system does, the device's and the tests' own.

#include <gtest/gtest.h>

#include <cerrno>
#include <filesystem>
#include <iterator>

#include "platform/linux/files/rehearsal_file_system.h"
#include "platform/linux/linux_platform.h"
#include "tests/support/fake_file_system.h"
#include "tests/support/scratch_directory.h"

namespace tests {
namespace {

using platform::Bytes;
using platform::Cause;
using platform::FileKind;
using platform::Path;

constexpr std::size_t anySize = SIZE_MAX;

Bytes bytes(std::string_view text) { return {text.begin(), text.end()}; }

struct OfTheTests {
  FakeFileSystem files;
  Path base = "/device";

  OfTheTests() { files.putDirectory(base); }
  platform::FileSystem& service() { return files; }
  unsigned permissions(const Path& path) { return files.nodes.at(path).permissions; }
  static std::string_view someAccount() { return "mobile"; }
};

struct OfTheDevice {
  ScratchDirectory scratch;
  Path base = scratch.path();
  std::shared_ptr<platform::FileSystem> files = platform::makeLinuxPlatform({.systemRoot = scratch.path()}).files;

  OfTheDevice() {
    scratch.put("etc/passwd", "mobile:x:" + std::to_string(::getuid()) + ":0::/:/bin/sh\n");
    scratch.put("etc/group", "mobile:x:" + std::to_string(::getgid()) + ":\n");
  }
  platform::FileSystem& service() { return *files; }
  static unsigned permissions(const Path& path) { return permissionsOf(path); }
  static std::string_view someAccount() { return "mobile"; }
};

// A rehearsal on a device, which must stay as it is.
struct OfARehearsal : OfTheDevice {
  std::shared_ptr<platform::RehearsedFiles> rehearsed = platform::makeRehearsalFileSystem(files, scratch.path());

  OfARehearsal() = default;
  OfARehearsal(const OfARehearsal&) = delete;
  OfARehearsal& operator=(const OfARehearsal&) = delete;
  ~OfARehearsal() {
    const std::filesystem::recursive_directory_iterator entries{scratch.path()};
    EXPECT_EQ(std::distance(begin(entries), end(entries)), 3) << "etc, passwd and group";
  }
  platform::FileSystem& service() { return *rehearsed; }
  [[nodiscard]] unsigned permissions(const Path& path) const { return rehearsed->permissionsAt(path).value_or(0); }
};

template <typename Subject>
class FileSystemContract : public testing::Test {
 protected:
  Subject subject;
  platform::FileSystem& files = subject.service();

  [[nodiscard]] Path at(std::string_view below) const { return below.empty() ? subject.base : subject.base / below; }
  std::string textAt(std::string_view below) {
    const auto contents = files.read(at(below), anySize);
    return contents.isOk() ? std::string{contents.value().begin(), contents.value().end()} : "(unreadable)";
  }
  void put(std::string_view below, std::string_view text) { ASSERT_TRUE(files.create(at(below), bytes(text)).isOk()); }
};

using Subjects = testing::Types<OfTheTests, OfTheDevice, OfARehearsal>;
TYPED_TEST_SUITE(FileSystemContract, Subjects);

TYPED_TEST(FileSystemContract, TellsWhatStandsAtAPath) {
  this->put("file", "text");
  EXPECT_EQ(this->files.kindOf(this->at("file")), FileKind::file);
  EXPECT_EQ(this->files.kindOf(this->at("")), FileKind::directory);
  EXPECT_EQ(this->files.kindOf("/"), FileKind::directory);
  EXPECT_EQ(this->files.kindOf(this->at("nothing")).cause(), Cause::missing);
  EXPECT_EQ(this->files.kindOf(this->at("nothing/below")).cause(), Cause::missing);
}

TYPED_TEST(FileSystemContract, ReadsAsManyBytesAsTheLimitAllows) {
  this->put("file", "12345");
  EXPECT_EQ(this->files.read(this->at("file"), 5).value(), bytes("12345"));
  EXPECT_EQ(this->files.read(this->at("file"), 4).status().errorNumber(), EFBIG);
}

TYPED_TEST(FileSystemContract, ReadsAnEmptyFile) {
  this->put("file", "");
  EXPECT_EQ(this->files.read(this->at("file"), 0).value(), Bytes{});
}

TYPED_TEST(FileSystemContract, ReadsNoDirectoryAndNoMissingFile) {
  EXPECT_EQ(this->files.read(this->at(""), anySize).status().errorNumber(), EISDIR);
  EXPECT_EQ(this->files.read(this->at("nothing"), anySize).status().errorNumber(), ENOENT);
}

TYPED_TEST(FileSystemContract, CreatesAFileForItsOwnerAlone) {
  ASSERT_TRUE(this->files.create(this->at("file"), bytes("text")).isOk());
  EXPECT_EQ(this->textAt("file"), "text");
  EXPECT_EQ(this->subject.permissions(this->at("file")), 0600U);
}

TYPED_TEST(FileSystemContract, CreatesNothingWhereSomethingStands) {
  this->put("file", "old");
  EXPECT_EQ(this->files.create(this->at("file"), bytes("new")).errorNumber(), EEXIST);
  EXPECT_EQ(this->textAt("file"), "old");
}

TYPED_TEST(FileSystemContract, CreatesNothingInAMissingDirectory) {
  EXPECT_EQ(this->files.create(this->at("nothing/file"), bytes("text")).errorNumber(), ENOENT);
  EXPECT_EQ(this->files.replace(this->at("nothing/file"), bytes("text")).errorNumber(), ENOENT);
  EXPECT_EQ(this->files.kindOf(this->at("nothing")).cause(), Cause::missing);
}

TYPED_TEST(FileSystemContract, ReplacesAFileOrMakesOne) {
  ASSERT_TRUE(this->files.replace(this->at("file"), bytes("first")).isOk());
  ASSERT_TRUE(this->files.replace(this->at("file"), bytes("second")).isOk());
  EXPECT_EQ(this->textAt("file"), "second");
  EXPECT_EQ(this->subject.permissions(this->at("file")), 0600U);
}

TYPED_TEST(FileSystemContract, ReplacesNoDirectory) {
  ASSERT_TRUE(this->files.createDirectories(this->at("directory"), 0755).isOk());
  EXPECT_EQ(this->files.replace(this->at("directory"), bytes("text")).errorNumber(), EISDIR);
  EXPECT_EQ(this->files.kindOf(this->at("directory")), FileKind::directory);
}

TYPED_TEST(FileSystemContract, CopiesAFileByteForByte) {
  const std::string text(200'000, '\xe9');
  this->put("from", text);
  ASSERT_TRUE(this->files.copy(this->at("from"), this->at("to")).isOk());
  EXPECT_EQ(this->textAt("to"), text);
  EXPECT_EQ(this->textAt("from"), text);
  EXPECT_EQ(this->subject.permissions(this->at("to")), 0600U);
}

TYPED_TEST(FileSystemContract, CopiesNothingThatIsMissingOrADirectory) {
  EXPECT_EQ(this->files.copy(this->at("nothing"), this->at("to")).errorNumber(), ENOENT);
  EXPECT_EQ(this->files.copy(this->at(""), this->at("to")).errorNumber(), EISDIR);
  EXPECT_EQ(this->files.kindOf(this->at("to")).cause(), Cause::missing);
}

TYPED_TEST(FileSystemContract, CopiesOntoNothingThatIsThereNorIntoAMissingDirectory) {
  this->put("from", "new");
  this->put("to", "old");
  EXPECT_EQ(this->files.copy(this->at("from"), this->at("to")).errorNumber(), EEXIST);
  EXPECT_EQ(this->files.copy(this->at("from"), this->at("nothing/to")).errorNumber(), ENOENT);
  EXPECT_EQ(this->textAt("to"), "old");
}

TYPED_TEST(FileSystemContract, RemovesAFile) {
  this->put("file", "text");
  ASSERT_TRUE(this->files.remove(this->at("file")).isOk());
  EXPECT_EQ(this->files.kindOf(this->at("file")).cause(), Cause::missing);
  EXPECT_EQ(this->files.remove(this->at("file")).errorNumber(), ENOENT);
}

TYPED_TEST(FileSystemContract, RemovesADirectoryWithAllBelowItAndNothingBesideIt) {
  ASSERT_TRUE(this->files.createDirectories(this->at("tree/a/b"), 0755).isOk());
  ASSERT_TRUE(this->files.createDirectories(this->at("tree/c"), 0755).isOk());
  this->put("tree/a/b/file", "text");
  this->put("tree/file", "text");
  this->put("trees", "text");
  ASSERT_TRUE(this->files.remove(this->at("tree")).isOk());
  EXPECT_EQ(this->files.kindOf(this->at("tree")).cause(), Cause::missing);
  EXPECT_EQ(this->textAt("trees"), "text");
}

TYPED_TEST(FileSystemContract, MakesADirectoryWithExactlyItsPermissionsAndThoseAboveIt) {
  ASSERT_TRUE(this->files.createDirectories(this->at("a/b/c"), 0777).isOk());
  EXPECT_EQ(this->subject.permissions(this->at("a/b/c")), 0777U);
  EXPECT_EQ(this->subject.permissions(this->at("a/b")), 0755U);
  EXPECT_EQ(this->subject.permissions(this->at("a")), 0755U);
}

TYPED_TEST(FileSystemContract, LeavesADirectoryThatIsThereAsItIs) {
  ASSERT_TRUE(this->files.createDirectories(this->at("a"), 0700).isOk());
  ASSERT_TRUE(this->files.createDirectories(this->at("a"), 0777).isOk());
  EXPECT_EQ(this->subject.permissions(this->at("a")), 0700U);
}

TYPED_TEST(FileSystemContract, MakesNoDirectoryWhereAFileStands) {
  this->put("file", "text");
  EXPECT_EQ(this->files.createDirectories(this->at("file"), 0777).errorNumber(), ENOTDIR);
  EXPECT_EQ(this->files.createDirectories(this->at("file/below/it"), 0777).errorNumber(), ENOTDIR);
  EXPECT_EQ(this->textAt("file"), "text");
}

TYPED_TEST(FileSystemContract, GivesAFileToAnAccountThatTheDeviceKnows) {
  this->put("file", "text");
  const std::string_view account = this->subject.someAccount();
  EXPECT_TRUE(this->files.setOwner(this->at("file"), account, account).isOk());
  EXPECT_EQ(this->files.setOwner(this->at("file"), "nobody-of-that-name", account).errorNumber(), ENOENT);
  EXPECT_EQ(this->files.setOwner(this->at("file"), account, "nobody-of-that-name").errorNumber(), ENOENT);
  EXPECT_EQ(this->files.setOwner(this->at("nothing"), account, account).errorNumber(), ENOENT);
}

TYPED_TEST(FileSystemContract, ProposesATemporaryNameAtWhichNothingStands) {
  const auto name = this->files.temporaryName();
  ASSERT_TRUE(name.isOk());
  EXPECT_TRUE(name.value().is_absolute());
  EXPECT_EQ(this->files.kindOf(name.value()).cause(), Cause::missing);
}

TYPED_TEST(FileSystemContract, MovesAFileOntoAnother) {
  this->put("from", "new");
  this->put("to", "old");
  ASSERT_TRUE(this->files.rename(this->at("from"), this->at("to")).isOk());
  EXPECT_EQ(this->textAt("to"), "new");
  EXPECT_EQ(this->files.kindOf(this->at("from")).cause(), Cause::missing);
}

TYPED_TEST(FileSystemContract, MovesNothingThatIsMissingNorOntoADirectory) {
  this->put("from", "new");
  ASSERT_TRUE(this->files.createDirectories(this->at("directory"), 0755).isOk());
  EXPECT_EQ(this->files.rename(this->at("nothing"), this->at("to")).errorNumber(), ENOENT);
  EXPECT_EQ(this->files.rename(this->at("from"), this->at("nothing/to")).errorNumber(), ENOENT);
  EXPECT_EQ(this->files.rename(this->at("from"), this->at("directory")).errorNumber(), EISDIR);
  EXPECT_EQ(this->textAt("from"), "new");
}

TYPED_TEST(FileSystemContract, NamesWhatFailed) {
  const Path path = this->at("nothing");
  EXPECT_NE(this->files.remove(path).description().find(path.string()), std::string::npos);
  EXPECT_NE(this->files.remove(path).description().find("No such file or directory"), std::string::npos);
}

}  // namespace
}  // namespace tests
