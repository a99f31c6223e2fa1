#include "host/verdict.h"

#include <gtest/gtest.h>

namespace tests {
namespace {

using namespace records;  // the facts
using host::Explanation;
using host::Verdict;
using Codes = std::vector<std::string>;

Name mail(std::string_view identifier) { return {.type = "Mail", .identifier = std::string{identifier}}; }

const Fact kDropped = Lost{.code = LossCode::droppedNoType, .account = mail("a")};
const Fact kRefused = Lost{.code = LossCode::refusedDescription, .account = mail("b"), .file = "/mail"};
const Fact kConverted = Converted{.account = mail("c"), .from = "MailAccounts[0] of /mail", .file = "/mail"};
const Fact kCopied = CopiedAside{"/copy"};
const Fact kSaved = Saved{"/settings", 3, 12};
const Fact kUnsaved = SaveFailed{"/settings", "no space", 3, 12};
const Fact kMailRemoved = FileRemoved{"/mail", true};

Explanation told(const std::vector<Fact>& facts) {
  Explanation explanation;
  for (const Fact& fact : facts) explanation.add(fact);
  return explanation;
}

Verdict verdictOf(const std::vector<Fact>& facts, std::string_view snapshot = {}) {
  return host::verdictOf(told(facts), snapshot);
}

Codes codesOf(const Verdict& verdict) {
  Codes codes;
  for (const Lost& lost : verdict.lost) codes.emplace_back(meaningOf(lost.code).name);
  return codes;
}

TEST(TheVerdict, IsThatEverythingWasKeptWhereNothingIsTold) {
  EXPECT_EQ(verdictOf({}).kind, Verdict::Kind::kept);
  EXPECT_EQ(verdictOf({kCopied, kSaved}).kind, Verdict::Kind::kept);
}

TEST(TheVerdict, CountsARecordThatIsLeftOutAsLostOnceTheSettingsAreSaved) {
  EXPECT_EQ(codesOf(verdictOf({kDropped, kSaved})), Codes{"dropped-no-type"});
  EXPECT_EQ(verdictOf({kDropped, kSaved}).kind, Verdict::Kind::lost);
  EXPECT_EQ(codesOf(verdictOf({kDropped, kUnsaved})), Codes{}) << "it still stands in the file";
  EXPECT_EQ(verdictOf({kDropped}).kind, Verdict::Kind::kept);
}

TEST(TheVerdict, CountsARefusedDescriptionAsLostOnceItsFileIsDeleted) {
  EXPECT_EQ(codesOf(verdictOf({kRefused, kSaved})), Codes{});
  EXPECT_EQ(codesOf(verdictOf({kRefused, kSaved, kMailRemoved})), Codes{"refused-description"});
}

TEST(TheVerdict, CountsAConvertedAccountAsLostWhereItsFileIsDeletedAndNothingWasSaved) {
  EXPECT_EQ(codesOf(verdictOf({kConverted, kUnsaved, kMailRemoved})), Codes{"not-saved"});
  EXPECT_EQ(codesOf(verdictOf({kConverted, kSaved, kUnsaved, kMailRemoved})), Codes{});
  EXPECT_EQ(codesOf(verdictOf({kConverted, kUnsaved})), Codes{});
}

TEST(TheVerdict, IsThatNothingWasSavedWhereTheLastSaveFailed) {
  const Verdict verdict = verdictOf({kDropped, kSaved, kUnsaved});
  EXPECT_EQ(verdict.kind, Verdict::Kind::notSaved);
  EXPECT_EQ(verdict.cause, "no space");
  EXPECT_EQ(codesOf(verdict), Codes{"dropped-no-type"}) << "what went all the same";
  EXPECT_EQ(verdictOf({kUnsaved, kSaved}).kind, Verdict::Kind::kept);
}

TEST(TheVerdict, SaysWhereTheDataOfALostAccountStillAre) {
  EXPECT_EQ(verdictOf({kCopied, kDropped, kSaved}).lost[0].where, "/copy");
  EXPECT_EQ(verdictOf({kDropped, kSaved}).lost[0].where, "");
  EXPECT_EQ(verdictOf({kCopied, kRefused, kMailRemoved}).lost[0].where, "") << "the copy is of the settings file";
  EXPECT_EQ(verdictOf({kCopied, kRefused, kMailRemoved}, "/snapshots/1").lost[0].where, "/snapshots/1");
}

TEST(TheVerdict, KnowsThatNoCopyHasAnAccountThatWasConverted) {
  const Verdict verdict =
      verdictOf({kCopied, kConverted, Lost{.code = LossCode::replacedDuplicate, .account = mail("c")}, kSaved});
  EXPECT_EQ(verdict.lost.at(0).file, "/mail");
  EXPECT_EQ(verdict.lost.at(0).where, "");
}

TEST(Counts, TellEachAccountOnce) {
  const std::vector<Change> port{{.key = "Port", .to = 1}};
  const std::vector<Change> renamed{{.key = "Identifier", .from = "x", .to = "y"}};
  const Explanation explanation =
      told({kDropped, Changed{mail("x"), port}, Changed{mail("y"), renamed}, Changed{mail("y"), port}, kConverted,
            Changed{mail("c"), port}, Added{mail("new")}, Saved{"/settings", 5, 12}});
  const host::Counts counts = host::countsOf(explanation, host::verdictOf(explanation));
  EXPECT_EQ(counts.changed, 1U);
  EXPECT_EQ(counts.converted, 1U);
  EXPECT_EQ(counts.added, 1U);
  EXPECT_EQ(counts.kept, 2U);
  EXPECT_EQ(counts.dropped, 1U);
  EXPECT_EQ(counts.lost, 1U);
}

TEST(Counts, LeaveOutWhatHappensToChildren) {
  const Name child{.type = "Mail", .identifier = "child", .parent = "p"};
  const Explanation explanation = told({Added{child}, Changed{child, {}}, Saved{"/settings", 1, 12}});
  const host::Counts counts = host::countsOf(explanation, {});
  EXPECT_EQ(counts.kept, 1U);
  EXPECT_EQ(counts.changed, 0U);
  EXPECT_EQ(counts.added, 0U);
}

}  // namespace
}  // namespace tests
