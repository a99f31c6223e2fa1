#include "commandline/options.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "commandline/ending.h"

namespace tests {
namespace {

using commandline::Form;
using commandline::Option;
using commandline::WrongUse;
using testing::ElementsAre;
using testing::IsEmpty;
using Arguments = std::vector<const char*>;

// A program with an option of each sort.
class Reading : public ::testing::Test {
 protected:
  std::vector<std::string> read(const Arguments& arguments) { return commandline::readOptions(options, arguments); }
  std::string refusalOf(const Arguments& arguments) {
    try {
      read(arguments);
      return "none";
    } catch (const WrongUse& refusal) {
      hint = refusal.hint();
      return refusal.what();
    }
  }

  bool json = false;
  bool help = false;
  std::optional<std::string> keep;
  std::optional<std::filesystem::path> root;
  std::optional<std::string> explain;
  std::optional<std::string> rehearse;
  std::string hint;
  std::vector<Option> options{{"--json", "", "print JSON", &json},
                              {"--help,-h", "", "print this text", &help},
                              {"--keep", "N", "how many", &keep},
                              {"--root", "DIR", "the root", &root},
                              {"--explain", "", "say why", Form{&explain, {"text", "json"}}},
                              {"--dry-run", "", "change nothing", Form{&rehearse, {}}}};
};

TEST_F(Reading, LeavesWhatIsNotGivenAlone) {
  EXPECT_THAT(read({}), IsEmpty());
  EXPECT_FALSE(json || help || keep || root || explain || rehearse);
}

TEST_F(Reading, TakesValuesBehindABlankOrAnEqualsSign) {
  EXPECT_THAT(read({"--keep", "3", "--root=/tmp/a=b"}), IsEmpty());
  EXPECT_EQ(keep, "3");
  EXPECT_EQ(root, "/tmp/a=b");
}

TEST_F(Reading, MakesPathsWhole) {
  read({"--root", "here"});
  EXPECT_EQ(root, std::filesystem::current_path() / "here");
}

TEST_F(Reading, FindsOptionsAmongTheWordsUntilTwoHyphensEndThem) {
  EXPECT_THAT(read({"one", "--json", "two", "-", "", "--", "--keep", "--", "-h"}),
              ElementsAre("one", "two", "-", "", "--keep", "--", "-h"));
  EXPECT_TRUE(json);
  EXPECT_FALSE(help);
}

TEST_F(Reading, TakesWordsAsTheyAre) {
  EXPECT_THAT(read({"[a,b]", "'quoted'", "a b", "{}", "%%", "\xff"}),
              ElementsAre("[a,b]", "'quoted'", "a b", "{}", "%%", "\xff"));
  EXPECT_THAT(read({"--keep", "[a,b]"}), IsEmpty());
  EXPECT_EQ(keep, "[a,b]");
}

TEST_F(Reading, KnowsAShortName) {
  read({"-h"});
  EXPECT_TRUE(help);
}

TEST_F(Reading, TakesAFormOnlyBehindAnEqualsSign) {
  EXPECT_THAT(read({"--explain", "json"}), ElementsAre("json"));
  EXPECT_EQ(explain, "");
  read({"--explain=json", "--dry-run"});
  EXPECT_EQ(explain, "json");
  EXPECT_EQ(rehearse, "");
}

TEST_F(Reading, TakesAValueThatBeginsWithAHyphenOnlyBehindAnEqualsSign) {
  read({"--keep=--json"});
  EXPECT_EQ(keep, "--json");
  EXPECT_EQ(refusalOf({"--keep", "--json"}), "--keep needs a value (see --help)");
  EXPECT_EQ(refusalOf({"--keep", "--", "x"}), "--keep needs a value (see --help)");
}

TEST_F(Reading, TakesASwitchAsOftenAsItIsGiven) {
  EXPECT_THAT(read({"--json", "--json"}), IsEmpty());
  EXPECT_TRUE(json);
}

struct Refusal {
  Arguments arguments;
  const char* message;
};

TEST_F(Reading, RefusesInASentence) {
  const Refusal refusals[] = {
      {{"--jsn"}, "unknown option: --jsn (see --help)"},
      {{"--jsn=x"}, "unknown option: --jsn (see --help)"},
      {{"--keep", "1", "-k"}, "unknown option: -k (see --help)"},
      {{"--rep"}, "unknown option: --rep (see --help)"},
      {{"--rooted"}, "unknown option: --rooted (see --help)"},
      {{"--json=yes"}, "unknown option: --json (see --help)"},
      {{"--json=true"}, "unknown option: --json (see --help)"},
      {{"--json="}, "unknown option: --json (see --help)"},
      {{"--keep"}, "--keep needs a value (see --help)"},
      {{"--keep", ""}, "--keep needs a value (see --help)"},
      {{"--keep=", "word"}, "--keep needs a value (see --help)"},
      {{"--root="}, "--root needs a value (see --help)"},
      {{"--keep", "1", "--keep=1"}, "--keep is given twice (see --help)"},
      {{"--explain=yaml"}, "--explain is followed by nothing, =text or =json (see --help)"},
      {{"--explain="}, "--explain is followed by nothing, =text or =json (see --help)"},
      {{"--explain", "--explain=json"}, "--explain is given twice (see --help)"},
      {{"--dry-run=yes"}, "--dry-run takes no value (see --help)"},
      {{"--dry-run", "--dry-run"}, "--dry-run is given twice (see --help)"},
  };
  for (const auto& [arguments, message] : refusals) EXPECT_EQ(refusalOf(arguments), message);
}

TEST_F(Reading, SuggestsWhatWasMeant) {
  refusalOf({"--jsn"});
  EXPECT_EQ(hint, "did you mean --json?");
  refusalOf({"--Explian=json"});
  EXPECT_EQ(hint, "did you mean --explain?");
  refusalOf({"--quux"});
  EXPECT_EQ(hint, "");
}

TEST_F(Reading, IsExplainedByTheHelp) {
  EXPECT_EQ(commandline::helpOf(options, {}),
            "  --json      print JSON\n"
            "  --help, -h  print this text\n"
            "  --keep N    how many\n"
            "  --root DIR  the root\n"
            "  --explain   say why\n"
            "  --dry-run   change nothing\n");
}

TEST(Hints, NameTheClosestWordIfAnyIsClose) {
  const std::vector<std::string> words{"list", "show", "remove", "rename"};
  EXPECT_EQ(commandline::hintFor("lst", words), "did you mean list?");
  EXPECT_EQ(commandline::hintFor("shwo", words), "did you mean show?");
  EXPECT_EQ(commandline::hintFor("RENAMED", words), "did you mean rename?");
  EXPECT_EQ(commandline::hintFor("banana", words), "");
  EXPECT_EQ(commandline::hintFor("", words), "");
  EXPECT_EQ(commandline::hintFor("x", {}), "");
}

}  // namespace
}  // namespace tests
