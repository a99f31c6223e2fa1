#include "host/explanation.h"

#include <gtest/gtest.h>

#include <cerrno>

#include "host/explanation_output.h"
#include "host/run_watch.h"

namespace tests {
namespace {

using host::Explanation;
using host::RunWatch;
using platform::RecordChange;
using platform::RunFact;
using Kind = RunFact::Kind;
using Lines = std::vector<std::string>;

RunFact dropped(std::string_view identifier) {
  return {
      .kind = Kind::dropped, .subject = {.type = "Mail", .identifier = std::string{identifier}}, .reason = "a rule"};
}

RunFact changed(RecordChange change) {
  return {.kind = Kind::changed, .subject = {.type = "Mail", .identifier = "a"}, .changes = {std::move(change)}};
}

std::string textOf(const RunFact& fact) {
  Explanation explanation;
  explanation.began("stage");
  explanation.add(fact);
  return host::textOf(explanation, {.dataClass = "accounts", .success = true});
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

TEST(AnExplanation, CountsFilesAsLostOnlyWhereNoSaveWentThrough) {
  Explanation explanation;
  explanation.add({.kind = Kind::saveFailed});
  explanation.add({.kind = Kind::sourceRemoved, .path = "/mail"});
  EXPECT_EQ(explanation.lostFiles(), Lines{"/mail"});
  explanation.add({.kind = Kind::saved});
  EXPECT_EQ(explanation.lostFiles(), Lines{});
}

TEST(AnExplanation, CountsAFileAsLostThatCouldNotBeConverted) {
  Explanation explanation;
  explanation.add({.kind = Kind::failed, .path = "/mail"});
  explanation.add({.kind = Kind::saved});
  explanation.add({.kind = Kind::sourceRemoved, .path = "/exchange"});
  explanation.add({.kind = Kind::sourceRemoved, .path = "/mail"});
  EXPECT_EQ(explanation.lostFiles(), Lines{"/mail"});
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

TEST(TheText, HidesCredentialsWhereverTheyStand) {
  const std::string secret = "do not show me";
  const platform::Dictionary nested{{"Token", secret}};
  const std::vector<RecordChange> changes{
      {.key = "Password", .from = secret, .to = "x" + secret},
      {.key = "Passwords", .from = platform::Array{secret}, .to = platform::Array{}},
      {.key = "Harmless", .oldKey = "Password", .to = secret},
      {.key = "Settings", .from = nested, .to = platform::Array{nested}},
      {.key = "List", .from = platform::Array{nested}, .to = platform::Array{1}},
      {.key = "Blob", .to = platform::Bytes(secret.begin(), secret.end())},
  };
  for (const RecordChange& change : changes) {
    Explanation explanation;
    explanation.add(changed(change));
    const host::Outcome outcome{.dataClass = "accounts"};
    EXPECT_FALSE(contains(host::textOf(explanation, outcome), secret)) << change.key;
    EXPECT_FALSE(contains(host::jsonDocumentOf(explanation, outcome), secret)) << change.key;
  }
}

TEST(AWatch, WantsFactsOnlyForAnExplanation) {
  const auto progress = std::make_shared<host::ProgressLine>(-1);
  EXPECT_FALSE((RunWatch{nullptr, false, progress}.wantsFacts()));
  EXPECT_TRUE((RunWatch{nullptr, true, progress}.wantsFacts()));
}

TEST(ARunWatch, KnowsWhetherTheLastSaveFailed) {
  RunWatch watch{nullptr, false, nullptr};
  EXPECT_FALSE(watch.hasLastSaveFailed());
  watch.saveBegan();
  EXPECT_TRUE(watch.hasLastSaveFailed());  // as where an exception ends it
  watch.saveEnded({});
  EXPECT_FALSE(watch.hasLastSaveFailed());
  watch.saveBegan();
  watch.saveEnded(platform::Status::failure(EIO, "rename"));
  EXPECT_TRUE(watch.hasLastSaveFailed());
}

TEST(AnExplanation, SaysWhatBecameOfSettingsThatCouldNotBeRead) {
  const RunFact unread{.kind = Kind::unread, .reason = "why", .path = "/settings"};
  const RunFact empty{.kind = Kind::saved, .path = "/settings", .count = 0, .version = 12};
  Explanation explanation;
  explanation.began("load");
  explanation.add(unread);
  const host::Outcome outcome{.dataClass = "accounts", .success = true};
  EXPECT_TRUE(contains(host::textOf(explanation, outcome), "\n  NOT READ: /settings: why\n"));
  EXPECT_TRUE(contains(host::textOf(explanation, outcome), "/settings could not be read; it is still there.\n"));
  explanation.add(empty);
  EXPECT_TRUE(contains(host::textOf(explanation, outcome), "could not be read; an empty one was put in its place.\n"));
}

}  // namespace
}  // namespace tests
