#include "platform/status.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <memory>

using platform::Cause;
using platform::Result;
using platform::Status;

namespace {

TEST(Statuses, OfSuccessSayNothing) {
  EXPECT_TRUE(Status{}.isOk());
  EXPECT_EQ(Status{}.cause(), Cause::none);
  EXPECT_EQ(Status{}.description(), "");
  EXPECT_EQ(Status{}.reason(), "");
}

TEST(Statuses, SayWhatWasTriedAndWhyItFailed) {
  const Status missing = Status::failure(ENOENT, "read /file");
  EXPECT_EQ(missing.description(), "Could not read /file: No such file or directory (errno 2)");
  EXPECT_EQ(missing.reason(), "No such file or directory (errno 2)");
  const Status malformed = Status::failure(Cause::malformed, "read /file", "it is no property list");
  EXPECT_EQ(malformed.description(), "Could not read /file: it is no property list");
  EXPECT_EQ(malformed.errorNumber(), 0);
}

TEST(Statuses, KnowTheCauseOfAnErrorNumber) {
  const std::pair<int, Cause> cases[] = {{ENOENT, Cause::missing}, {ENOTDIR, Cause::missing}, {ELOOP, Cause::unsafe},
                                         {EMLINK, Cause::unsafe},  {EFBIG, Cause::excessive}, {EACCES, Cause::other},
                                         {EIO, Cause::other},      {0, Cause::other}};
  for (const auto& [number, cause] : cases) EXPECT_EQ(Status::failure(number, "try").cause(), cause) << number;
}

TEST(Statuses, OfAFailureWithoutANumberAreNoSuccess) {
  EXPECT_EQ(Status::failure(0, "try").errorNumber(), EIO);
  EXPECT_FALSE(Status::failure(Cause::other, "try", "").isOk());
}

TEST(Results, AreTheValueOrTheFailure) {
  const Result<std::string> value = "value";
  EXPECT_TRUE(value.isOk());
  EXPECT_TRUE(value.status().isOk());
  EXPECT_EQ(value, std::string{"value"});
  const Result<std::string> failure = Status::failure(ENOENT, "read /file");
  EXPECT_EQ(failure.cause(), Cause::missing);
  EXPECT_EQ(failure.valueOr("other"), "other");
  EXPECT_FALSE(failure == std::string{});
}

TEST(Results, GiveAwayWhatCannotBeCopied) {
  Result<std::unique_ptr<int>> made = std::make_unique<int>(7);
  EXPECT_EQ(*made.take(), 7);
  EXPECT_EQ(Result<int>{Status::failure(EIO, "count")}.optional(), std::nullopt);
}

}  // namespace
