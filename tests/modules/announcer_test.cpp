// The announcer on a real bus, a private one, with a real subscriber, while accountctl edits a real file.

#include <gmock/gmock.h>
#include <spawn.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstring>
#include <fstream>

#include "accountsettings/accounts_manager.h"
#include "tests/modules/module_device.h"
#include "tests/support/bus_subscriber.h"
#include "tests/support/private_bus.h"

namespace tests {
namespace {

using namespace std::chrono_literals;
using std::chrono::steady_clock;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using Texts = std::vector<std::string>;

constexpr const char* kPath = "/com/vorlix/Accounts";
constexpr const char* kInterface = "com.vorlix.Accounts1";
constexpr const char* kSettings = "var/mobile/Library/Preferences/com.vorlix.accountsettings.plist";
const std::string kMail = "com.vorlix.Dataclass.Mail";
const std::string kNotes = "com.vorlix.Dataclass.Notes";

const std::string kOneAccount = R"(<?xml version="1.0" encoding="UTF-8"?>
<plist version="1.0"><dict><key>Version</key><integer>)" +
                                std::to_string(accountsettings::kCurrentVersion) +
                                R"(</integer><key>Accounts</key><array><dict>
<key>Type</key><string>Mail</string><key>Class</key><string>IMAPAccount</string>
<key>Identifier</key><string>A</string>
<key>Enabled Dataclasses</key><array><string>com.vorlix.Dataclass.Mail</string></array>
</dict></array></dict></plist>
)";

// A device in a directory of the test's own: an account in its settings file, and the shipped modules where the shipped
// configuration names them.
class EditedDevice {
 public:
  EditedDevice() {
    put("etc/passwd", "mobile:*:" + std::to_string(::getuid()) + ":" + std::to_string(::getgid()) + ":::\n");
    put("etc/group", "mobile:*:" + std::to_string(::getgid()) + ":\n");
    put(kSettings, kOneAccount);
    const auto modules = root() / Path{SHIPPED_MODULES_DIR}.relative_path();
    std::filesystem::create_directories(modules.parent_path());
    std::filesystem::create_directory_symlink(SHIPPED_MODULES_DIR, modules);
  }

  [[nodiscard]] const Path& root() const { return _scratch.path(); }
  void put(const char* below, const std::string& text) const {
    std::filesystem::create_directories((root() / below).parent_path());
    std::ofstream{root() / below} << text;
  }
  [[nodiscard]] Dictionary firstAccount() const {
    const auto settings = platform::makeLinuxPlatform().propertyLists->readDictionary(root() / kSettings).optional();
    return *settings.value().array("Accounts")->at(0).asDictionary();
  }

  // Runs accountctl on the device, opening its modules, and answers its exit status.
  [[nodiscard]] int edit(const Texts& words) const { return run({"--modules"}, words); }
  [[nodiscard]] int editWithoutModules(const Texts& words) const { return run({}, words); }

 private:
  [[nodiscard]] int run(Texts arguments, const Texts& words) const {
    arguments.insert(arguments.begin(), {ACCOUNTCTL, "--root", root()});
    arguments.insert(arguments.end(), words.begin(), words.end());
    std::vector<char*> pointers;
    for (std::string& argument : arguments) pointers.push_back(argument.data());
    pointers.push_back(nullptr);
    pid_t process = 0;
    if (::posix_spawn(&process, ACCOUNTCTL, nullptr, nullptr, pointers.data(), environ) != 0) return -1;
    int status = 0;
    return ::waitpid(process, &status, 0) == process && WIFEXITED(status) ? WEXITSTATUS(status) : -1;
  }

  const ScratchDirectory _scratch;
};

std::string changed(int type, const std::string& identifier, const std::string& accountType, const Texts& originals) {
  std::string text = "AccountsChanged AccountID " + identifier + "; AccountType " + accountType + "; ChangeType " +
                     std::to_string(type) + "; OriginalDataclasses ";
  for (const std::string& dataclass : originals) text += dataclass + ",";
  return text;
}

class Announcer : public ::testing::Test {
 protected:
  const EditedDevice device;
  PrivateBus bus;
  BusSubscriber subscriber{kPath, kInterface};
};

TEST_F(Announcer, TellsOfADataclassThatIsSwitchedOnBeforeDuringAndAfter) {
  EXPECT_EQ(device.edit({"enable", "A", "Notes"}), 0);
  EXPECT_THAT(subscriber.heard(), ElementsAre("AccountWillChange A " + kNotes, changed(1, "A", "Mail", {kMail}),
                                              "AccountDidChange A " + kNotes));
}

TEST_F(Announcer, TellsOfARenamedAccountForEachOfItsDataclasses) {
  ASSERT_EQ(device.editWithoutModules({"enable", "A", "Notes"}), 0);
  EXPECT_EQ(device.edit({"rename", "A", "Home"}), 0);
  EXPECT_THAT(subscriber.heard(), ElementsAre("AccountWillChange A " + kMail, "AccountWillChange A " + kNotes,
                                              changed(1, "A", "Mail", {kMail, kNotes}), "AccountDidChange A " + kMail,
                                              "AccountDidChange A " + kNotes));
}

TEST_F(Announcer, TellsOfAnAddedAccountWithoutEarlierDataclasses) {
  EXPECT_EQ(device.edit({"add", "LDAP", "LDAPAccount", "Identifier=B",
                         R"(Enabled Dataclasses:=["com.vorlix.Dataclass.ContactsSearch"])"}),
            0);
  EXPECT_THAT(subscriber.heard(),
              ElementsAre("AccountWillChange B com.vorlix.Dataclass.ContactsSearch", changed(0, "B", "LDAP", {}),
                          "AccountDidChange B com.vorlix.Dataclass.ContactsSearch"));
}

TEST_F(Announcer, TellsOfARemovedAccountWithWhatItWas) {
  EXPECT_EQ(device.edit({"remove", "A"}), 0);
  EXPECT_THAT(subscriber.heard(), ElementsAre("AccountWillChange A " + kMail, changed(2, "A", "Mail", {kMail}),
                                              "AccountDidChange A " + kMail));
}

TEST_F(Announcer, TellsNothingOfASaveThatChangesNothing) {
  EXPECT_EQ(device.edit({"save"}), 0);
  EXPECT_THAT(subscriber.heard(), IsEmpty());
}

TEST_F(Announcer, TellsNothingMoreOfAChangeThatCouldNotBeSaved) {
  device.put("etc/passwd", "");
  EXPECT_EQ(device.edit({"enable", "A", "Notes"}), 1);
  EXPECT_THAT(subscriber.heard(), ElementsAre("AccountWillChange A " + kNotes));
}

TEST_F(Announcer, IsNotAskedUnderAnotherRoot) {
  EXPECT_EQ(device.editWithoutModules({"enable", "A", "Notes"}), 0);
  EXPECT_THAT(subscriber.heard(), IsEmpty());
}

TEST_F(Announcer, TellsNothingOfARepairThatTheLoadMade) {
  const std::string repairable = "<string>MailAccount</string><key>AccountPath</key><string>Mail/IMAP-x</string>";
  std::string settings = kOneAccount;
  settings.replace(settings.find("<string>IMAPAccount</string>"), std::strlen("<string>IMAPAccount</string>"),
                   repairable);
  device.put(kSettings, settings);
  EXPECT_EQ(device.edit({"save"}), 0);
  EXPECT_EQ(device.firstAccount().text("Class")->string(), "IMAPAccount");
  EXPECT_THAT(subscriber.heard(), IsEmpty());
}

TEST_F(Announcer, FindsABusThatWasStartedAgain) {
  bus.stop();
  EXPECT_EQ(device.edit({"enable", "A", "Notes"}), 0);
  bus.start();
  BusSubscriber later{kPath, kInterface};
  EXPECT_EQ(device.edit({"disable", "A", "Notes"}), 0);
  EXPECT_THAT(later.heard(), ElementsAre("AccountWillChange A " + kNotes, changed(1, "A", "Mail", {kMail, kNotes}),
                                         "AccountDidChange A " + kNotes));
}

TEST_F(Announcer, TellsNothingOfATextThatNoMessageCarries) {
  EXPECT_EQ(device.edit({"add", "LDAP", "LDAPAccount", "Identifier=\uFFFF"}), 0);
  EXPECT_EQ(device.edit({"remove", "A"}), 0);
  EXPECT_THAT(subscriber.heard(), ElementsAre("AccountWillChange A " + kMail, changed(2, "A", "Mail", {kMail}),
                                              "AccountDidChange A " + kMail));
}

TEST(AnnouncerWithoutABus, LetsTheChangeBeMadeAllTheSame) {
  const EditedDevice device;
  ::setenv("DBUS_SYSTEM_BUS_ADDRESS", "unix:path=/nonexistent/bus", 1);
  EXPECT_EQ(device.edit({"enable", "A", "Notes"}), 0);
  EXPECT_EQ(*device.firstAccount().array("Enabled Dataclasses"), (Array{kMail, kNotes}));
}

TEST(AnnouncerWithoutABus, DoesNotWaitLongForOneThatDoesNotAnswer) {
  const EditedDevice device;
  const std::string path = device.root() / "bus";
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  ASSERT_LT(path.size(), sizeof address.sun_path);
  std::memcpy(static_cast<char*>(address.sun_path), path.c_str(), path.size());
  const int silent = ::socket(AF_UNIX, SOCK_STREAM, 0);
  ASSERT_EQ(::bind(silent, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
  ASSERT_EQ(::listen(silent, 8), 0);
  ::setenv("DBUS_SYSTEM_BUS_ADDRESS", ("unix:path=" + path).c_str(), 1);
  const auto start = steady_clock::now();
  EXPECT_EQ(device.edit({"enable", "A", "Notes"}), 0);
  EXPECT_LT(steady_clock::now() - start, 30s);
  ::close(silent);
}

}  // namespace
}  // namespace tests
