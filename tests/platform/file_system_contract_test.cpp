// What every file system does, the device's and the tests' own.

#include <gtest/gtest.h>

#include <cerrno>
#include <filesystem>
#include <iterator>

#include "platform/linux/files/file_services.h"
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

  OfTheTests() {
    files.putDirectory(base);
    files.root = base;
  }
  void link(std::string_view below, const Path& target) { files.putLink(base / below, target); }
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
  void link(std::string_view below, const Path& target) const { std::filesystem::create_symlink(target, base / below); }
  static unsigned permissions(const Path& path) { return permissionsOf(path); }
  static std::string_view someAccount() { return "mobile"; }
};

// A rehearsal on a device, which must stay as it is.
struct OfARehearsal : OfTheDevice {
  std::shared_ptr<platform::RehearsedFiles> rehearsed =
      platform::makeRehearsalFileSystem(*platform::makeLinuxPlatform({.systemRoot = scratch.path()}).directories);
  std::ptrdiff_t links = 0;  // that the test planted on the device

  OfARehearsal() = default;
  OfARehearsal(const OfARehearsal&) = delete;
  OfARehearsal& operator=(const OfARehearsal&) = delete;
  ~OfARehearsal() {
    const std::filesystem::recursive_directory_iterator entries{scratch.path()};
    EXPECT_EQ(std::distance(begin(entries), end(entries)), 3 + links) << "etc, passwd, group and links";
  }
  void link(std::string_view below, const Path& target) {
    OfTheDevice::link(below, target);
    ++links;
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

TYPED_TEST(FileSystemContract, SaysForWhatItLookedForAnAccountThatItDoesNotFind) {
  this->put("file", "text");
  const std::string_view account = this->subject.someAccount();
  const std::string message = "Could not find the account nobody-of-that-name for " + this->at("file").string() +
                              ": No such file or directory (errno 2)";
  EXPECT_EQ(this->files.setOwner(this->at("file"), "nobody-of-that-name", account).description(), message);
  EXPECT_EQ(this->files.setOwner(this->at("file"), account, "nobody-of-that-name").description(), message);
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

// Every subject has a directory with a file, and a link to either by each way of writing it.
template <typename Subject>
class LinksContract : public FileSystemContract<Subject> {
 protected:
  LinksContract() {
    EXPECT_TRUE(this->files.createDirectories(this->at("directory/below"), 0755).isOk());
    this->put("directory/file", "text");
  }
  void expectTextThrough(std::string_view below) { EXPECT_EQ(this->textAt(below), "text") << below; }
};
TYPED_TEST_SUITE(LinksContract, Subjects);

TYPED_TEST(LinksContract, AreFollowedAtTheEndOfAPath) {
  this->subject.link("relative", "directory/file");
  this->subject.link("absolute", "/directory/file");
  this->subject.link("chain", "absolute");
  for (const char* const link : {"relative", "absolute", "chain"}) {
    this->expectTextThrough(link);
    EXPECT_EQ(this->files.kindOf(this->at(link)), FileKind::file) << link;
  }
}

TYPED_TEST(LinksContract, AreFollowedInTheMiddleOfAPath) {
  this->subject.link("relative", "directory");
  this->subject.link("absolute", "/directory");
  this->subject.link("up", "relative/below/..");
  for (const char* const link : {"relative", "absolute", "up"}) {
    this->expectTextThrough(std::string{link} + "/file");
    EXPECT_EQ(this->files.kindOf(this->at(link)), FileKind::directory) << link;
  }
}

TYPED_TEST(LinksContract, LeadNewFilesAndDirectoriesIntoWhatTheyLeadTo) {
  this->subject.link("link", "/directory");
  this->put("link/new", "new");
  ASSERT_TRUE(this->files.createDirectories(this->at("link/a/b"), 0755).isOk());
  ASSERT_TRUE(this->files.rename(this->at("link/file"), this->at("moved")).isOk());
  EXPECT_EQ(this->textAt("directory/new"), "new");
  EXPECT_EQ(this->files.kindOf(this->at("directory/a/b")), FileKind::directory);
  EXPECT_EQ(this->files.kindOf(this->at("directory/file")).cause(), platform::Cause::missing);
  this->expectTextThrough("moved");
}

TYPED_TEST(LinksContract, ThatDangleLeadToNothing) {
  this->subject.link("link", "/nothing");
  EXPECT_EQ(this->files.kindOf(this->at("link")).cause(), platform::Cause::missing);
  EXPECT_EQ(this->files.read(this->at("link"), anySize).status().errorNumber(), ENOENT);
  EXPECT_EQ(this->files.create(this->at("link"), bytes("new")).errorNumber(), EEXIST);
  EXPECT_EQ(this->files.create(this->at("link/new"), bytes("new")).errorNumber(), ENOENT);
  EXPECT_EQ(this->files.kindOf(this->at("nothing")).cause(), platform::Cause::missing);
}

TYPED_TEST(LinksContract, InACircleAreRefused) {
  this->subject.link("one", "two");
  this->subject.link("two", "one");
  EXPECT_EQ(this->files.kindOf(this->at("one")), FileKind::other);
  EXPECT_EQ(this->files.read(this->at("one"), anySize).status().errorNumber(), ELOOP);
  EXPECT_EQ(this->files.read(this->at("one/file"), anySize).status().errorNumber(), ELOOP);
}

TYPED_TEST(LinksContract, AreReplacedThemselves) {
  this->subject.link("link", "directory/file");
  ASSERT_TRUE(this->files.replace(this->at("link"), bytes("new")).isOk());
  EXPECT_EQ(this->textAt("link"), "new");
  this->expectTextThrough("directory/file");
}

TYPED_TEST(LinksContract, AreRemovedThemselves) {
  this->subject.link("link", "directory");
  ASSERT_TRUE(this->files.remove(this->at("link")).isOk());
  EXPECT_EQ(this->files.kindOf(this->at("link")).cause(), platform::Cause::missing);
  this->expectTextThrough("directory/file");
}

TYPED_TEST(LinksContract, AreMovedThemselves) {
  this->subject.link("link", "/directory/file");
  ASSERT_TRUE(this->files.rename(this->at("link"), this->at("directory/moved")).isOk());
  EXPECT_EQ(this->files.kindOf(this->at("link")).cause(), platform::Cause::missing);
  this->expectTextThrough("directory/moved");
  ASSERT_TRUE(this->files.replace(this->at("directory/file"), bytes("new")).isOk());
  EXPECT_EQ(this->textAt("directory/moved"), "new");
}

TYPED_TEST(LinksContract, AreCopiedAsWhatTheyLeadTo) {
  this->subject.link("link", "/directory/file");
  ASSERT_TRUE(this->files.copy(this->at("link"), this->at("copy")).isOk());
  EXPECT_EQ(this->textAt("copy"), "text");
  EXPECT_EQ(this->files.copy(this->at("directory/file"), this->at("link")).errorNumber(), EEXIST);
}

TYPED_TEST(LinksContract, AreNeitherGivenAwayNorTakenForDirectories) {
  const std::string_view account = this->subject.someAccount();
  this->subject.link("link", "directory");
  EXPECT_EQ(this->files.setOwner(this->at("link"), account, account).errorNumber(), ELOOP);
  EXPECT_EQ(this->files.createDirectories(this->at("link"), 0755).errorNumber(), ENOTDIR);
}

TYPED_TEST(FileSystemContract, NamesWhatFailed) {
  const Path path = this->at("nothing");
  EXPECT_NE(this->files.remove(path).description().find(path.string()), std::string::npos);
  EXPECT_NE(this->files.remove(path).description().find("No such file or directory"), std::string::npos);
}

}  // namespace
}  // namespace tests
