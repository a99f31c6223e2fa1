#include "records/message.h"

#include <gtest/gtest.h>

#include <functional>
#include <optional>
#include <string>

using platform::Array;
using platform::Dictionary;
using platform::PropertyValue;
using platform::StringConstant;
using platform::Text;
using records::message;

namespace {

constexpr StringConstant kConstant = "constant";

TEST(Messages, ReplaceEachPlaceholderInOrder) {
  EXPECT_EQ(message("%@ %s %d %ld", {"object", "string", 3, std::int64_t{-4}}), "object string 3 -4");
  EXPECT_EQ(message("none", {}), "none");
  EXPECT_EQ(message("%@%@", {"a", "b"}), "ab");
}

TEST(Messages, LeaveAPlaceholderWithoutArgument) {
  EXPECT_EQ(message("%@ and %@", {"one"}), "one and %@");
  EXPECT_EQ(message("%@", {}), "%@");
}

TEST(Messages, LeaveAlonePercentSignsThatAreNoPlaceholders) {
  EXPECT_EQ(message("100% %x %@ %", {"a"}), "100% %x a %");
}

TEST(Messages, DoNotLookForPlaceholdersInArguments) { EXPECT_EQ(message("%@ %@", {"%@", "b"}), "%@ b"); }

TEST(Messages, ShowTextsBareAndContainersDescribed) {
  const PropertyValue text{"bare"};
  const PropertyValue array{Array{"quoted"}};
  const Dictionary dictionary{{"Password", "x"}};
  EXPECT_EQ(message("%@ %@ %@ %@ %@", {text, array, dictionary, Text{"t"}, kConstant}),
            R"(bare ("quoted") {Password = <hidden>} t constant)");
}

TEST(Messages, ShowWhatIsAbsentAsNull) {
  const std::optional<PropertyValue> absent;
  const std::optional<std::string> present{"there"};
  EXPECT_EQ(message("%@ %@", {absent, present}), "(null) there");
}

TEST(Messages, RenderAnObjectOnlyWhenRead) {
  int rendered = 0;
  const std::function<std::string()> render = [&rendered] { return "object " + std::to_string(++rendered); };
  const records::MessageArgument argument{render};
  EXPECT_EQ(rendered, 0);
  EXPECT_EQ(message("%@", {argument}), "object 1");
}

}  // namespace
