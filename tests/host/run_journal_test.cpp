#include "host/snapshots/run_journal.h"

#include <gtest/gtest.h>

#include <memory>
#include <string>

#include "host/snapshots/problem.h"
#include "tests/support/fake_file_keeper.h"

namespace host::snapshots {
namespace {

class AMark : public testing::Test {
 protected:
  AMark() { files->putDirectory("/snapshots"); }
  void addToFile(std::string_view text) {
    platform::Bytes& bytes = files->nodes.at("/snapshots/running").bytes;
    bytes.insert(bytes.end(), text.begin(), text.end());
  }

  std::shared_ptr<tests::FakeFileSystem> files = std::make_shared<tests::FakeFileSystem>();
  RunJournal journal{{files, std::make_shared<tests::FakeFileKeeper>(*files)}, "/snapshots"};
};

TEST_F(AMark, IsNotSetBeforeItBeginsAndNotAfterItIsCleared) {
  EXPECT_FALSE(journal.read());
  journal.begin("1", std::nullopt);
  EXPECT_TRUE(journal.read());
  journal.clear();
  EXPECT_FALSE(journal.read());
}

TEST_F(AMark, TellsWhatWasNoted) {
  journal.begin("2", "1");
  journal.noteChange("/a", "aa", false);
  journal.noteChange("/a", kAbsent, false);
  journal.noteChange("/b", "bb", true);
  journal.noteEdit("/c");
  const RunMark mark = *journal.read();
  EXPECT_EQ(mark.snapshot, "2");
  EXPECT_EQ(mark.restores, "1");
  EXPECT_EQ(mark.left.at("/a"), (std::set<std::string>{"aa", kAbsent}));
  EXPECT_EQ(mark.made, std::set<Path>{"/b"});
  EXPECT_EQ(mark.edited, std::set<Path>{"/c"});
}

TEST_F(AMark, ForgetsALastLineThatWasCutOff) {
  journal.begin("1", std::nullopt);
  journal.noteChange("/a", "aa", false);
  addToFile(R"({"path":"/b","sta)");
  EXPECT_EQ(journal.read()->left.size(), 1U);
}

TEST_F(AMark, ForgetsALastLineOfWhichOnlyTheEndIsOnTheDisk) {
  journal.begin("1", std::nullopt);
  journal.noteChange("/a", "aa", false);
  addToFile(std::string(15, '\0') + "\",\"state\":\"bb\"}\n");
  EXPECT_EQ(journal.read()->left.size(), 1U);
}

TEST_F(AMark, IsRefusedWhereAnotherLineIsDamaged) {
  journal.begin("1", std::nullopt);
  addToFile("{\"path\":\"/b\",\"sta\n");
  journal.noteEdit("/c");
  EXPECT_THROW(static_cast<void>(journal.read()), Problem);
}

TEST_F(AMark, IsRefusedWhereItIsEmpty) {
  files->put("/snapshots/running", "");
  EXPECT_THROW(static_cast<void>(journal.read()), Problem);
}

}  // namespace
}  // namespace host::snapshots
