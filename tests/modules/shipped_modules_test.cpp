#include <gmock/gmock.h>

#include <cstdio>
#include <cstdlib>

#include "accountsettings/device_local_account.h"
#include "accountsettings/service_objects.h"
#include "tests/modules/module_device.h"

namespace tests {
namespace {

using accountsettings::AccountClassInfo;
using accountsettings::RefreshQueueObject;
using accountsettings::RefreshRequest;
using accountsettings::ServiceAccountObject;
using accountsettings::ServiceAddress;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr const char* kMail = "com.vorlix.Dataclass.Mail";
constexpr const char* kCalendars = "com.vorlix.Dataclass.Calendars";

class ShippedModules : public ModuleDevice {
 protected:
  ShippedModules() { device.directories->root = "/"; }

  std::shared_ptr<BasicAccount> account(Dictionary properties) {
    const auto type = properties.text("Type")->string();
    putCreators(type, Array{shipped("FullAccount", type), shipped("SyncAccount", type)});
    if (!properties.contains("Class")) properties.set("Class", "AnyAccount");
    properties.set("Identifier", "A");
    return BasicAccount::initWithProperties(properties);
  }

  std::shared_ptr<ServiceAccountObject> service(const Dictionary& properties) {
    return std::dynamic_pointer_cast<ServiceAccountObject>(account(properties)->fullAccountUsingLoader(nullptr));
  }
  std::optional<ServiceAddress> addressOf(const Dictionary& properties) { return service(properties)->service(); }

 private:
  static Dictionary shipped(const std::string& creatorType, const std::string& type) {
    const bool isMail = type == "Mail" || type == "SMTP" || type == "Gmail";
    const std::string module = isMail ? "mail-accounts" : "dav-accounts";
    const std::string family = isMail ? "Mail" : "DAV";
    const std::string kind = creatorType == "SyncAccount" ? "Sync" : "";
    return {{"Type", creatorType},
            {"Description", Dictionary{{"Framework", SHIPPED_MODULES_DIR "/" + module + ".so"},
                                       {"Class", family + kind + "AccountCreator"}}}};
  }
};

// Destroyed after whatever a test or a module makes: made before main.
class LastUser {
 public:
  const AccountClassInfo* found = nullptr;
  ~LastUser() {
    if (found != nullptr) std::fprintf(stderr, "found %s\n", found->name().c_str());
  }
};

LastUser lastUser;

TEST_F(ShippedModules, KeepTheClassesThatTheyAnsweredUntilTheProcessEnds) {
  testing::GTEST_FLAG(death_test_style) = "threadsafe";  // a process of its own, from the start
  const auto findAndEnd = [this] {
    account({{"Type", "CalDAV"}})->fullAccountUsingLoader(nullptr);
    const platform::ClassInfo* const creator = platform::current().classes->classNamed("DAVAccountCreator");
    lastUser.found = dynamic_cast<const AccountClassInfo&>(*creator).classForAccountType("CalDAV");
    std::exit(0);
  };
  EXPECT_EXIT(findAndEnd(), testing::ExitedWithCode(0), "found CalDAVServiceAccount");
}

struct Address {
  const char* name;
  Dictionary properties;
  std::optional<ServiceAddress> address;
  friend void PrintTo(const Address& entry, std::ostream* stream) { *stream << entry.name; }
};

class ServiceAddresses : public ShippedModules, public ::testing::WithParamInterface<Address> {};

TEST_P(ServiceAddresses, AreReadFromThePropertiesElseFromTheKind) {
  EXPECT_EQ(addressOf(GetParam().properties), GetParam().address);
}

INSTANTIATE_TEST_SUITE_P(
    Kinds, ServiceAddresses,
    ::testing::Values(
        Address{"NoHost", {{"Type", "Mail"}, {"Class", "IMAPAccount"}}, std::nullopt},
        Address{"EmptyHost", {{"Type", "Mail"}, {"Class", "IMAPAccount"}, {"Hostname", ""}}, std::nullopt},
        Address{"IMAP", {{"Type", "Mail"}, {"Class", "IMAPAccount"}, {"Hostname", "mx"}}, {{"mx", 993, true}}},
        Address{"POP", {{"Type", "Mail"}, {"Class", "POPAccount"}, {"Hostname", "mx"}}, {{"mx", 995, true}}},
        Address{"PlainPOP",
                {{"Type", "Mail"}, {"Class", "POPAccount"}, {"Hostname", "mx"}, {"SSLEnabled", false}},
                {{"mx", 110, false}}},
        Address{"OwnPort",
                {{"Type", "Mail"}, {"Class", "IMAPAccount"}, {"Hostname", "mx"}, {"PortNumber", 1993}},
                {{"mx", 1993, true}}},
        Address{"PortAsText",
                {{"Type", "Mail"}, {"Class", "IMAPAccount"}, {"Hostname", "mx"}, {"PortNumber", "1993"}},
                {{"mx", 1993, true}}},
        Address{"PortTooLarge",
                {{"Type", "Mail"}, {"Class", "IMAPAccount"}, {"Hostname", "mx"}, {"PortNumber", 65536}},
                {{"mx", 993, true}}},
        Address{"PortBelowOne",
                {{"Type", "Mail"}, {"Class", "IMAPAccount"}, {"Hostname", "mx"}, {"PortNumber", -1}},
                {{"mx", 993, true}}},
        Address{"Gmail", {{"Type", "Gmail"}, {"Class", "GmailAccount"}}, {{"imap.gmail.com", 993, true}}},
        Address{"SMTP", {{"Type", "SMTP"}, {"Class", "SMTPAccount"}, {"Hostname", "mx"}}, {{"mx", 587, true}}},
        Address{"UnknownMailClass", {{"Type", "Mail"}, {"Hostname", "mx"}}, {{"mx", 993, true}}},
        Address{"CalDAVHost", {{"Type", "CalDAV"}, {"Hostname", "dav"}}, {{"dav", 443, true}}},
        Address{"CalDAVPrincipal",
                {{"Type", "CalDAV"},
                 {"Hostname", "dav"},
                 {"CalDAVPrincipalConfiguration", Dictionary{{"CalDAV_Server_Key", "principal"}}}},
                {{"principal", 443, true}}},
        Address{"CalDAVPrincipalOfAnotherKind",
                {{"Type", "CalDAV"}, {"Hostname", "dav"}, {"CalDAVPrincipalConfiguration", "principal"}},
                {{"dav", 443, true}}},
        Address{"SubscribedCalendar", {{"Type", "Subscribed Calendar"}, {"Hostname", "cal"}}, {{"cal", 443, true}}}),
    [](const auto& instance) { return std::string{instance.param.name}; });

TEST_F(ShippedModules, KnowTheirRecordsProperties) {
  const auto full = service({{"Type", "CalDAV"}, {"Other", 7}});
  EXPECT_EQ(full->properties(),
            (Dictionary{{"Type", "CalDAV"}, {"Other", 7}, {"Class", "AnyAccount"}, {"Identifier", "A"}}));
  EXPECT_EQ(full->parentAccount(), nullptr);
}

TEST_F(ShippedModules, CallAnAccountByItsNameElseItsUserElseItsType) {
  EXPECT_EQ(service({{"Type", "CalDAV"}})->displayName(), "CalDAV");
  EXPECT_EQ(service({{"Type", "CalDAV"}, {"Type String", "Calendars"}})->displayName(), "Calendars");
  EXPECT_EQ(service({{"Type", "CalDAV"}, {"Type String", "Calendars"}, {"Username", "jo"}})->displayName(), "jo");
  EXPECT_EQ(service({{"Type", "CalDAV"}, {"Username", "jo"}, {"DisplayName", "Work"}})->displayName(), "Work");
}

TEST_F(ShippedModules, TakeWhatAChildLacksFromItsParent) {
  const auto child = account({{"Type", "CalDAV"}});
  child->setParentAccount(BasicAccount::initWithProperties({{"Type", "VorlixAccount"},
                                                            {"Class", "C"},
                                                            {"Username", "jo"},
                                                            {"DisplayName", "Cloud"},
                                                            {"Hostname", "cloud"}}));
  const auto full = std::dynamic_pointer_cast<ServiceAccountObject>(child->fullAccountUsingLoader(nullptr));
  EXPECT_EQ(full->displayName(), "Cloud");
  EXPECT_EQ(full->username(), "jo");
  EXPECT_EQ(full->service(), (ServiceAddress{"cloud", 443, true}));
  EXPECT_EQ(full->parentAccount(), child->parentAccount());
}

TEST_F(ShippedModules, BeginARefreshOfAnEnabledDataClass) {
  const auto record = account({{"Type", "CalDAV"}, {"Enabled Dataclasses", Array{kCalendars}}});
  EXPECT_TRUE(record->refreshContainersForDataclass(kCalendars));
  EXPECT_TRUE(record->refreshContainerListForDataclass(kCalendars));
  EXPECT_TRUE(record->refreshContainerWithIdentifier_forDataclass("work", kCalendars));
  const auto queue = std::dynamic_pointer_cast<RefreshQueueObject>(record->_cachedSyncAccount());
  using Scope = RefreshRequest::Scope;
  EXPECT_THAT(queue->takeRequests(), ElementsAre(RefreshRequest{Scope::allContainers, kCalendars, "", false},
                                                 RefreshRequest{Scope::containerList, kCalendars, "", false},
                                                 RefreshRequest{Scope::container, kCalendars, "work", false}));
  EXPECT_THAT(queue->pendingRequests(), IsEmpty());
}

TEST_F(ShippedModules, RefuseToRefreshWhatIsNotEnabled) {
  const auto record = account({{"Type", "CalDAV"}, {"Enabled Dataclasses", Array{kCalendars}}});
  EXPECT_FALSE(record->refreshContainersForDataclass(kMail));
  EXPECT_FALSE(record->refreshContainerWithIdentifier_forDataclass("", kCalendars));
  record->setEnabled_forDataclass(false, kCalendars);
  EXPECT_FALSE(record->refreshContainersForDataclass(kCalendars));
}

TEST_F(ShippedModules, KeepAPendingRefreshOnceAndRememberThatAUserWaits) {
  const auto record = account({{"Type", "CalDAV"}, {"Enabled Dataclasses", Array{kCalendars}}});
  EXPECT_TRUE(record->refreshContainersForDataclass(kCalendars));
  EXPECT_TRUE(record->refreshContainersForDataclass_isUserRequested(kCalendars, true));
  EXPECT_TRUE(record->refreshContainersForDataclass(kCalendars));
  const auto queue = std::dynamic_pointer_cast<RefreshQueueObject>(record->_cachedSyncAccount());
  EXPECT_THAT(queue->pendingRequests(),
              ElementsAre(RefreshRequest{RefreshRequest::Scope::allContainers, kCalendars, "", true}));
}

TEST_F(ShippedModules, RefuseMoreRefreshesThanAnybodyCanMean) {
  const auto record = account({{"Type", "CalDAV"}, {"Enabled Dataclasses", Array{kCalendars}}});
  int begun = 0;
  while (record->refreshContainerWithIdentifier_forDataclass(std::to_string(begun), kCalendars)) ++begun;
  EXPECT_EQ(begun, 1024);
}

TEST_F(ShippedModules, DoNotKeepARecordAlive) {
  const auto record = account({{"Type", "CalDAV"}, {"Enabled Dataclasses", Array{kCalendars}}});
  record->_cachedSyncAccount();
  record->fullAccountUsingLoader(nullptr);
  EXPECT_EQ(record.use_count(), 1);
}

}  // namespace
}  // namespace tests
