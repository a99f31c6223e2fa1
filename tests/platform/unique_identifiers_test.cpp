#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <set>

#include "platform/linux/linux_platform.h"
#include "tests/support/fake_platform.h"

namespace tests {
namespace {

struct OfTheTests {
  static std::shared_ptr<platform::UniqueIdentifiers> make() { return std::make_shared<FakeUniqueIdentifiers>(); }
};

struct OfTheDevice {
  static std::shared_ptr<platform::UniqueIdentifiers> make() { return platform::makeLinuxPlatform().identifiers; }
};

template <typename Subject>
class IdentifiersContract : public testing::Test {
 protected:
  std::shared_ptr<platform::UniqueIdentifiers> identifiers = Subject::make();
};

using Subjects = testing::Types<OfTheTests, OfTheDevice>;
TYPED_TEST_SUITE(IdentifiersContract, Subjects);

TYPED_TEST(IdentifiersContract, AreRandomUuidsInUpperCase) {
  const auto identifier = this->identifiers->makeUuid();
  ASSERT_TRUE(identifier.isOk());
  EXPECT_EQ(identifier.value().size(), 36U);
  EXPECT_THAT(identifier.value(), testing::MatchesRegex("[0-9A-F]+-[0-9A-F]+-4[0-9A-F]+-[89AB][0-9A-F]+-[0-9A-F]+"));
}

TYPED_TEST(IdentifiersContract, NeverComeTwice) {
  std::set<std::string> seen;
  for (int count = 0; count < 1000; ++count) EXPECT_TRUE(seen.insert(this->identifiers->makeUuid().value()).second);
}

TEST(IdentifiersOfATest, CanBeUnavailable) {
  FakeUniqueIdentifiers identifiers;
  identifiers.canMake = false;
  EXPECT_FALSE(identifiers.makeUuid().isOk());
}

}  // namespace
}  // namespace tests
