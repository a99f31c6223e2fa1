// What a device is asked about itself: the answers it has in its property lists, and those of the tests' own devices.

#include <gtest/gtest.h>
#include <sys/utsname.h>

#include <array>

#include "tests/support/fake_platform.h"
#include "tests/support/real_device.h"

namespace tests {
namespace {

using platform::ManagedFeature;
using platform::Restriction;
using platform::SyncDataType;

constexpr std::string_view deviceInfo = "etc/vorlix/device-info.plist";
constexpr std::string_view restrictions = "etc/vorlix/profile-restrictions.plist";
constexpr std::string_view tetheredSync = "var/mobile/Library/Preferences/com.vorlix.mobile.tethered_sync.plist";
constexpr std::string_view externalSources = "var/mobile/Library/Preferences/com.vorlix.external-sources.plist";

std::string machine() {
  utsname names{};
  ::uname(&names);
  const std::string name = static_cast<const char*>(names.machine);
  return name == "armv6l" ? "armv6" : name;
}

TEST(DeviceInfo, IsWhatTheDevicesFileSays) {
  const RealDevice device;
  device.put(deviceInfo,
             "<key>CPUArchitecture</key><string>armv6</string><key>DeviceClass</key><string>Ferrox Mini</string>"
             "<key>RegionalBehaviorGoogleMail</key><true/>");
  EXPECT_EQ(device.services.deviceInfo->answer("CPUArchitecture"), PropertyValue{"armv6"});
  EXPECT_EQ(device.services.deviceInfo->answer("DeviceClass"), PropertyValue{"Ferrox Mini"});
  EXPECT_EQ(device.services.deviceInfo->answer("RegionalBehaviorGoogleMail"), PropertyValue{true});
}

TEST(DeviceInfo, HasOnlyTheMachinesArchitectureWithoutAFile) {
  const RealDevice device;
  EXPECT_EQ(device.services.deviceInfo->answer("CPUArchitecture"), PropertyValue{machine()});
  EXPECT_EQ(device.services.deviceInfo->answer("DeviceClass"), std::nullopt);
  EXPECT_EQ(device.services.deviceInfo->answer("RegionalBehaviorGoogleMail"), std::nullopt);
}

TEST(DeviceInfo, TakesAValueOfTheWrongKindForNoAnswer) {
  const RealDevice device;
  device.put(deviceInfo,
             "<key>CPUArchitecture</key><integer>6</integer><key>DeviceClass</key><array/>"
             "<key>RegionalBehaviorGoogleMail</key><array><true/></array>");
  EXPECT_EQ(device.services.deviceInfo->answer("CPUArchitecture"), PropertyValue{machine()});
  EXPECT_EQ(device.services.deviceInfo->answer("DeviceClass"), std::nullopt);
  EXPECT_EQ(device.services.deviceInfo->answer("RegionalBehaviorGoogleMail"), std::nullopt);
}

struct WrittenBoolean {
  std::string element;
  std::optional<bool> value;
};

// What a property list may hold where a boolean is asked for.
const WrittenBoolean kWrittenBooleans[] = {{"<true/>", true},
                                           {"<false/>", false},
                                           {"<integer>1</integer>", true},
                                           {"<integer>0</integer>", false},
                                           {"<real>0.5</real>", true},
                                           {"<string>YES</string>", true},
                                           {"<string>1</string>", true},
                                           {"<string>no</string>", false},
                                           {"<data/>", std::nullopt},
                                           {"<array><true/></array>", std::nullopt}};

TEST(DeviceInfo, ReadsTheRegionalNameAsABooleanFromNumbersAndTextsToo) {
  for (const auto& [element, value] : kWrittenBooleans) {
    const RealDevice device;
    device.put(deviceInfo, "<key>RegionalBehaviorGoogleMail</key>" + element);
    const std::optional<PropertyValue> answer = device.services.deviceInfo->answer("RegionalBehaviorGoogleMail");
    EXPECT_EQ(answer, value ? std::optional<PropertyValue>{*value} : std::nullopt) << element;
  }
}

TEST(DeviceInfo, AnswersNoOtherQuestion) {
  const RealDevice device;
  device.put(deviceInfo, "<key>SerialNumber</key><string>1</string>");
  EXPECT_EQ(device.services.deviceInfo->answer("SerialNumber"), std::nullopt);
}

TEST(DeviceInfo, IsReadAnewAtEachQuestion) {
  const RealDevice device;
  device.put(deviceInfo, "<key>DeviceClass</key><string>Ferrox</string>");
  EXPECT_EQ(device.services.deviceInfo->answer("DeviceClass"), PropertyValue{"Ferrox"});
  device.put(deviceInfo, "<key>DeviceClass</key><string>Tablet</string>");
  EXPECT_EQ(device.services.deviceInfo->answer("DeviceClass"), PropertyValue{"Tablet"});
}

TEST(DeviceInfo, OfATestIsWhatTheTestSays) {
  FakeDeviceInfoQuery query;
  query.answers.emplace("DeviceClass", "Ferrox");
  EXPECT_EQ(query.answer("DeviceClass"), PropertyValue{"Ferrox"});
  EXPECT_EQ(query.answer("CPUArchitecture"), std::nullopt);
}

struct FeatureName {
  ManagedFeature feature;
  std::string name;
};

const FeatureName features[] = {{ManagedFeature::cloudDocumentSync, "CloudDocumentSync"},
                                {ManagedFeature::mediaStream, "MediaStream"},
                                {ManagedFeature::sharedStreams, "SharedStreams"},
                                {ManagedFeature::cloudBackup, "CloudBackup"},
                                {ManagedFeature::cardsWhileLocked, "CardsWhileLocked"}};

Restriction restrictionOf(const platform::ProfileRestrictions& query, ManagedFeature feature) {
  return query.restrictions(std::array{feature}).at(0);
}

TEST(ProfileRestrictions, AllowDisallowOrLeaveOpenEachFeature) {
  for (const auto& [feature, name] : features) {
    const RealDevice device;
    const auto& query = *device.services.restrictions;
    EXPECT_EQ(restrictionOf(query, feature), Restriction::notSet) << name;
    device.put(restrictions, "<key>" + name + "</key><true/>");
    EXPECT_EQ(restrictionOf(query, feature), Restriction::allowed) << name;
    device.put(restrictions, "<key>" + name + "</key><false/>");
    EXPECT_EQ(restrictionOf(query, feature), Restriction::notAllowed) << name;
  }
}

TEST(ProfileRestrictions, AreReadAsBooleansFromNumbersAndTextsToo) {
  for (const auto& [element, value] : kWrittenBooleans) {
    const RealDevice device;
    device.put(restrictions, "<key>MediaStream</key>" + element);
    const Restriction set = value == true ? Restriction::allowed : Restriction::notAllowed;
    EXPECT_EQ(restrictionOf(*device.services.restrictions, ManagedFeature::mediaStream),
              value ? set : Restriction::notSet)
        << element;
  }
}

TEST(ProfileRestrictions, OfOneFeatureSayNothingOfAnother) {
  const RealDevice device;
  device.put(restrictions, "<key>MediaStream</key><false/>");
  EXPECT_EQ(restrictionOf(*device.services.restrictions, ManagedFeature::sharedStreams), Restriction::notSet);
}

TEST(ProfileRestrictions, OfSeveralFeaturesAreAnsweredInTheirOrder) {
  const RealDevice device;
  device.put(restrictions, "<key>MediaStream</key><false/><key>CloudBackup</key><true/>");
  const std::array asked{ManagedFeature::cloudBackup, ManagedFeature::sharedStreams, ManagedFeature::mediaStream};
  EXPECT_EQ(device.services.restrictions->restrictions(asked),
            (std::vector{Restriction::allowed, Restriction::notSet, Restriction::notAllowed}));
}

TEST(ProfileRestrictions, OfATestAreWhatTheTestSays) {
  FakeProfileRestrictions query;
  query.profiles[ManagedFeature::mediaStream] = Restriction::notAllowed;
  EXPECT_EQ(restrictionOf(query, ManagedFeature::mediaStream), Restriction::notAllowed);
  EXPECT_EQ(restrictionOf(query, ManagedFeature::cloudBackup), Restriction::notSet);
}

// What connections answer is the same on a device and in a test.
void expectAnswers(platform::TetheredSyncQuery& query) {
  const auto connection = query.connect();
  ASSERT_TRUE(connection.isOk());
  constexpr std::string_view domain = "com.vorlix.mobile.tethered_sync";
  const Dictionary notes{{"SyncingOS", "Windows"}};
  EXPECT_EQ(connection.value()->value(domain, "Notes"), PropertyValue{notes});
  EXPECT_EQ(connection.value()->value(domain, "Contacts"), std::nullopt);
  EXPECT_EQ(connection.value()->value(domain, std::nullopt), (PropertyValue{Dictionary{{"Notes", notes}}}));
}

TEST(TetheredSync, AnswersWithTheUsersFile) {
  const RealDevice device;
  device.put(tetheredSync, "<key>Notes</key><dict><key>SyncingOS</key><string>Windows</string></dict>");
  expectAnswers(*device.services.tetheredSync);
}

TEST(TetheredSync, OfATestAnswersWhatTheTestSays) {
  FakeTetheredSyncQuery query;
  query.domain = {{"Notes", Dictionary{{"SyncingOS", "Windows"}}}};
  expectAnswers(query);
  EXPECT_EQ(query.openConnections, 0);
}

TEST(TetheredSync, IsOutOfReachWithoutAFileAndWithOneThatCannotBeRead) {
  const RealDevice device;
  EXPECT_EQ(device.services.tetheredSync->connect().cause(), platform::Cause::missing);
  device.root.put(tetheredSync, "no property list");
  EXPECT_EQ(device.services.tetheredSync->connect().cause(), platform::Cause::malformed);
  FakeTetheredSyncQuery query;
  query.isReachable = false;
  EXPECT_FALSE(query.connect().isOk());
}

TEST(TetheredSync, KnowsNoOtherDomain) {
  const RealDevice device;
  device.put(tetheredSync, "<key>Notes</key><true/>");
  EXPECT_EQ(device.services.tetheredSync->connect().value()->value("another.domain", "Notes"), std::nullopt);
}

struct TypeName {
  SyncDataType type;
  std::string name;
};

const TypeName types[] = {{SyncDataType::bookmarks, "Bookmarks"},
                          {SyncDataType::calendars, "Calendars"},
                          {SyncDataType::contacts, "Contacts"},
                          {SyncDataType::notes, "Notes"}};

TEST(ExternalSources, AreAListOrADictionaryWithListAndError) {
  for (const auto& [type, name] : types) {
    const RealDevice device;
    const auto& query = *device.services.externalSources;
    EXPECT_FALSE(query.enabledSources(type).sources) << name;
    device.put(externalSources, "<key>" + name + "</key><array><string>a</string><integer>1</integer></array>");
    EXPECT_EQ(query.enabledSources(type).sources, (Array{"a", 1})) << name;
    EXPECT_FALSE(query.enabledSources(type).error) << name;
    device.put(externalSources, "<key>" + name +
                                    "</key><dict><key>Sources</key><array><string>b</string></array>"
                                    "<key>Error</key><string>out of order</string></dict>");
    EXPECT_EQ(query.enabledSources(type).sources, Array{"b"}) << name;
    EXPECT_EQ(query.enabledSources(type).error, "out of order") << name;
  }
}

TEST(ExternalSources, OfTheWrongKindAreNone) {
  const RealDevice device;
  device.put(externalSources,
             "<key>Contacts</key><string>a</string>"
             "<key>Notes</key><dict><key>Sources</key><string>a</string><key>Error</key><true/></dict>");
  for (const SyncDataType type : {SyncDataType::contacts, SyncDataType::notes}) {
    const auto answer = device.services.externalSources->enabledSources(type);
    EXPECT_FALSE(answer.sources);
    EXPECT_FALSE(answer.error);
  }
}

TEST(ExternalSources, OfATestAreWhatTheTestSays) {
  FakeExternalSourcesQuery query;
  query.sources[SyncDataType::notes] = {Array{"a"}, std::nullopt};
  EXPECT_EQ(query.enabledSources(SyncDataType::notes).sources, Array{"a"});
  EXPECT_FALSE(query.enabledSources(SyncDataType::contacts).sources);
}

void expectNames(const platform::SystemAccountQuery& query) {
  EXPECT_EQ(query.hostedServiceStatusKey().view(), "hostedServiceStatus");
  EXPECT_EQ(query.primaryAccountKey(), Text{"primaryAccount"});
  EXPECT_EQ(query.systemAccountTypeString().view(), "Cirrant");
}

TEST(SystemAccount, IsKnownByTheSameNamesOnEveryDevice) { expectNames(*platform::makeLinuxPlatform().systemAccount); }

TEST(SystemAccount, IsKnownByTheSameNamesInATest) { expectNames(FakeSystemAccountQuery{}); }

}  // namespace
}  // namespace tests
