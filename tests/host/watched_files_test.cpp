#include "host/snapshots/watched_files.h"

#include <gtest/gtest.h>

#include "tests/support/fake_file_keeper.h"

namespace host::snapshots {
namespace {

constexpr const char* kSettings = "/device/settings";
constexpr const char* kMail = "/device/mail";
constexpr const char* kTemporary = "/device/temporary";

platform::Bytes bytes(std::string_view text) { return {text.begin(), text.end()}; }

class WatchedRun : public testing::Test {
 protected:
  WatchedRun() {
    files->putDirectory("/snapshots");
    files->put(kSettings, "old");
    files->put(kMail, "mail");
    journal.begin("1", std::nullopt);
  }
  static Manifest snapshot() {
    Manifest manifest;
    manifest.files = {
        {.path = kSettings, .part = Part::settings, .contents = checksum("old"), .attributes = {}, .copy = "1"},
        {.path = kMail, .part = Part::legacy, .contents = checksum("mail"), .attributes = {}, .copy = "2"}};
    return manifest;
  }
  bool save(std::string_view text) {
    static_cast<void>(watched.temporaryName());
    return watched.create(kTemporary, bytes(text)).isOk() && watched.rename(kTemporary, kSettings).isOk();
  }

  std::shared_ptr<tests::FakeFileSystem> files = std::make_shared<tests::FakeFileSystem>();
  Storage storage{files, std::make_shared<tests::FakeFileKeeper>(*files)};
  RunJournal journal{storage, "/snapshots"};
  WatchedFiles watched{storage, snapshot(), journal};
};

TEST_F(WatchedRun, NotesWhatEachChangeLeaves) {
  ASSERT_TRUE(save("new"));
  ASSERT_TRUE(watched.remove(kMail).isOk());
  const RunMark mark = *journal.read();
  EXPECT_EQ(mark.left.at(kSettings), std::set<std::string>{checksum("new")});
  EXPECT_EQ(mark.left.at(kMail), std::set<std::string>{kAbsent});
  EXPECT_EQ(mark.left.at(kTemporary), std::set<std::string>{checksum("new")});
  EXPECT_EQ(mark.made, std::set<Path>{kTemporary});
  EXPECT_TRUE(mark.edited.empty());
}

TEST_F(WatchedRun, NotesAChangeBeforeItIsMade) {
  files->failing = {"remove"};
  EXPECT_FALSE(watched.remove(kMail).isOk());
  EXPECT_EQ(journal.read()->left.at(kMail), std::set<std::string>{kAbsent});
}

TEST_F(WatchedRun, DoesNotMakeAChangeThatCannotBeNoted) {
  files->failing = {"append"};
  EXPECT_FALSE(watched.remove(kMail).isOk());
  EXPECT_FALSE(save("new"));
  EXPECT_EQ(files->contents(kMail), "mail");
  EXPECT_EQ(files->contents(kSettings), "old");
  EXPECT_FALSE(files->exists(kTemporary));
}

TEST_F(WatchedRun, NotesThatSomebodyElseChangedAFile) {
  files->put(kSettings, "edited by somebody");
  ASSERT_TRUE(save("new"));
  EXPECT_EQ(journal.read()->edited, std::set<Path>{kSettings});
  ASSERT_TRUE(save("newer"));
  EXPECT_EQ(journal.read()->edited, std::set<Path>{kSettings});
}

TEST_F(WatchedRun, DoesNotTakeItsOwnChangesForThoseOfOthers) {
  ASSERT_TRUE(save("new"));
  ASSERT_TRUE(save("newer"));
  EXPECT_TRUE(journal.read()->edited.empty());
}

TEST_F(WatchedRun, LeavesOtherFilesUnnoted) {
  ASSERT_TRUE(watched.replace("/device/report", bytes("text")).isOk());
  EXPECT_TRUE(journal.read()->left.empty());
}

}  // namespace
}  // namespace host::snapshots
