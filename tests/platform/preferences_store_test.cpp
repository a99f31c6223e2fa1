#include <gtest/gtest.h>

#include "tests/support/fake_platform.h"
#include "tests/support/real_device.h"

namespace tests {
namespace {

constexpr std::string_view preferences = "var/mobile/Library/Preferences/com.vorlix.example.plist";
constexpr std::string_view domain = "com.vorlix.example";

TEST(Preferences, AreReadWhenTheirDomainIsSynchronised) {
  const RealDevice device;
  auto& store = *device.services.preferences;
  device.put(preferences, "<key>Switch</key><true/>");
  EXPECT_EQ(store.boolean(domain, "Switch"), std::nullopt);
  store.synchronize(domain);
  EXPECT_EQ(store.boolean(domain, "Switch"), true);
  device.put(preferences, "<key>Switch</key><false/>");
  EXPECT_EQ(store.boolean(domain, "Switch"), true);
  store.synchronize(domain);
  EXPECT_EQ(store.boolean(domain, "Switch"), false);
}

TEST(Preferences, AreAbsentWithoutAFileOrAKey) {
  const RealDevice device;
  auto& store = *device.services.preferences;
  store.synchronize(domain);
  EXPECT_EQ(store.boolean(domain, "Switch"), std::nullopt);
  device.put(preferences, "<key>Other</key><true/>");
  store.synchronize(domain);
  EXPECT_EQ(store.boolean(domain, "Switch"), std::nullopt);
}

TEST(Preferences, AreSwitchesInWhateverFormOneCanBeWritten) {
  const std::pair<std::string, std::optional<bool>> cases[] = {{"<true/>", true},
                                                               {"<false/>", false},
                                                               {"<integer>1</integer>", true},
                                                               {"<real>0</real>", false},
                                                               {"<string>YES</string>", true},
                                                               {"<string>off</string>", false},
                                                               {"<array/>", std::nullopt},
                                                               {"<data></data>", std::nullopt}};
  for (const auto& [value, expected] : cases) {
    const RealDevice device;
    device.put(preferences, "<key>Switch</key>" + value);
    device.services.preferences->synchronize(domain);
    EXPECT_EQ(device.services.preferences->boolean(domain, "Switch"), expected) << value;
  }
}

TEST(Preferences, OfADomainThatIsNoFileNameAreAbsent) {
  const RealDevice device;
  device.put("var/mobile/Library/other.plist", "<key>Switch</key><true/>");
  device.services.preferences->synchronize("../other");
  EXPECT_EQ(device.services.preferences->boolean("../other", "Switch"), std::nullopt);
}

TEST(Preferences, OfATestAreWhatTheTestSaysOnceSynchronised) {
  FakePreferencesStore store;
  store.switches[{std::string{domain}, "Switch"}] = true;
  EXPECT_EQ(store.boolean(domain, "Switch"), std::nullopt);
  store.synchronize(domain);
  EXPECT_EQ(store.boolean(domain, "Switch"), true);
}

}  // namespace
}  // namespace tests
