#include "host/explanation.h"

#include <gtest/gtest.h>

#include "host/verdict.h"
#include "platform/text.h"

namespace tests {
namespace {

using namespace records;  // the facts
using host::Explanation;
using host::Verdict;

Fact dropped(std::string_view identifier) {
  return Lost{.code = LossCode::droppedNoType, .account = {.type = "Mail", .identifier = std::string{identifier}}};
}

Fact changed(Change change) { return Changed{{.type = "Mail", .identifier = "a"}, {std::move(change)}}; }

std::string textOf(const Fact& fact, const Verdict& verdict = {}) {
  Explanation explanation;
  explanation.began("stage");
  explanation.add(fact);
  return host::textOf(explanation, verdict, {.dataClass = "accounts", .success = true});
}

bool contains(const std::string& text, std::string_view part) { return text.find(part) != std::string::npos; }

TEST(AnExplanation, GroupsFactsByTheStageInWhichTheyWereTold) {
  Explanation explanation;
  explanation.began("outer");
  explanation.add(dropped("a"));
  explanation.began("inner");
  explanation.add(dropped("b"));
  explanation.add(dropped("c"));
  explanation.ended();
  explanation.add(dropped("d"));
  ASSERT_EQ(explanation.stages().size(), 3U);
  EXPECT_EQ(explanation.stages()[1].name, "inner");
  EXPECT_EQ(explanation.stages()[1].within, "outer");
  EXPECT_EQ(explanation.stages()[1].facts.size(), 2U);
  EXPECT_EQ(explanation.stages()[2].name, "outer");
}

TEST(AnExplanation, LeavesOutStagesThatDidNothing) {
  Explanation explanation;
  explanation.began("idle");
  explanation.ended();
  EXPECT_TRUE(explanation.stages().empty());
}

TEST(TheText, ShowsHowAKeyChanged) {
  EXPECT_TRUE(contains(textOf(changed({.key = "Port", .from = 1, .to = 2})), "    ~ Port: 1 -> 2\n"));
  EXPECT_TRUE(contains(textOf(changed({.key = "Port", .to = 2})), "    + Port: 2\n"));
  EXPECT_TRUE(contains(textOf(changed({.key = "Port", .from = 1})), "    - Port: 1\n"));
}

TEST(TheText, ShowsWhatAListGainedAndLost) {
  const platform::Array before{"a", "b"};
  EXPECT_TRUE(contains(textOf(changed({.key = "L", .from = before, .to = platform::Array{"b", "c"}})),
                       "    ~ L: +\"c\" -\"a\"\n"));
  EXPECT_TRUE(contains(textOf(changed({.key = "L", .from = before, .to = platform::Array{"b", "a"}})),
                       "    ~ L: in another order\n"));
}

TEST(TheText, CutsALongValueBetweenTwoCharacters) {
  std::string letters = "x";
  for (int count = 0; count < 100; ++count) letters += "\u00e9";
  const std::string text = textOf(changed({.key = "Note", .to = letters}));
  EXPECT_TRUE(contains(text, "\u00e9\u2026\n")) << text;
  EXPECT_TRUE(platform::isWellFormedText(text));
}

TEST(TheText, NeverCutsAListOfNames) {
  platform::Array names;
  for (const char* const name : {"Mail", "Contacts", "Calendars", "Reminders", "Bookmarks"}) {
    names.emplace_back("com.vorlix.Dataclass." + std::string{name});
  }
  EXPECT_TRUE(contains(textOf(changed({.key = "Enabled Dataclasses", .to = names})), "Dataclass.Bookmarks\")\n"));
}

TEST(TheText, TellsAStepInWordsWithItsNameBeside) {
  Explanation explanation;
  explanation.began("_step:", "version 4 to 5: accounts get their own type");
  explanation.add(dropped("a"));
  EXPECT_TRUE(contains(host::textOf(explanation, {}, {}), "\nversion 4 to 5: accounts get their own type (_step:)\n"));
}

TEST(TheText, GivesTheCodeOfALossBesideItsText) {
  EXPECT_TRUE(contains(textOf(dropped("a")), "  lost: Mail (a): it has no type [dropped-no-type]\n"));
}

TEST(TheText, EndsWithTheVerdictAndEachLoss) {
  const Verdict lost{.kind = Verdict::Kind::lost, .lost = {{.code = LossCode::droppedNoType, .where = "/copy"}}};
  EXPECT_TRUE(contains(textOf(dropped("a"), lost), "result: success; ACCOUNTS WERE LOST\n"));
  EXPECT_TRUE(contains(textOf(dropped("a"), lost),
                       "WARNING: lost: account: it has no type [dropped-no-type]; its data is still in /copy\n"));
  const Verdict unsaved{.kind = Verdict::Kind::notSaved, .cause = "no space"};
  EXPECT_TRUE(contains(textOf(dropped("a"), unsaved), "WARNING: the accounts were not saved: no space\n"));
}

TEST(TheText, HidesCredentialsWhereverTheyStand) {
  const std::string secret = "do not show me";
  const platform::Dictionary nested{{"Token", secret}};
  const std::vector<Change> changes{
      {.key = "Password", .from = secret, .to = "x" + secret},
      {.key = "Passwords", .from = platform::Array{secret}, .to = platform::Array{}},
      {.key = "Harmless", .oldKey = "Password", .to = secret},
      {.key = "Settings", .from = nested, .to = platform::Array{nested}},
      {.key = "List", .from = platform::Array{nested}, .to = platform::Array{1}},
      {.key = "Blob", .to = platform::Bytes(secret.begin(), secret.end())},
  };
  for (const Change& change : changes) {
    Explanation explanation;
    explanation.add(changed(change));
    EXPECT_FALSE(contains(host::textOf(explanation, {}, {}), secret)) << change.key;
    EXPECT_FALSE(contains(host::jsonDocumentOf(explanation, {}, {}), secret)) << change.key;
  }
}

}  // namespace
}  // namespace tests
