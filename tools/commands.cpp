#include "tools/commands.h"

#include <limits>

namespace tools {
namespace {

constexpr std::size_t kAnyNumber = std::numeric_limits<std::size_t>::max();

constexpr std::string_view kId =
    "ID is an account's or a child account's identifier, the beginning of one that no other has, or what a person "
    "calls the account: its name, its user name, or user@host, in any case.";
constexpr std::string_view kList =
    "On a terminal, long cells are shortened in the middle so that a line fits; --wide shortens nothing, --columns "
    "says which columns are shown.";
constexpr std::string_view kVerify =
    "Without FILE, every file of the device is examined. Nothing is changed. The status is 0 where nothing was found, "
    "5 where something was, and 1 where a file could not be read.";
constexpr std::string_view kIdAndDataclass =
    "ID is an account's identifier, its unique beginning, name, user name or user@host. DATACLASS is written Mail or "
    "com.vorlix.Dataclass.Mail, in any case; the account's type must support it.";
constexpr std::string_view kProperties =
    "TYPE is one that the command types lists, CLASS the name of the account's class. KEY=VALUE gives a property a "
    "text, KEY:=JSON any other value. Give no password so: other users of the machine see what stands on a command "
    "line.";
constexpr std::string_view kChangedProperties =
    "KEY=VALUE gives a property a text, KEY:=JSON any other value, KEY:=null takes it away. What the next load would "
    "drop or repair is refused. Give no password so: other users of the machine see what stands on a command line.";

constexpr std::string_view kDiff =
    "A and B are files of accounts, snapshots, or the roots of devices; without B, the device's own accounts are "
    "meant. Exit status: 0 the same, 1 different, 2 trouble.";
constexpr std::string_view kRecover =
    "FROM is a file of accounts, a snapshot, or the root of a device; accountctl --file FROM list tells what is in it. "
    "ACCOUNT is a place such as Accounts[2], or what show takes; without one, every account comes back that is not "
    "there. --set KEY=VALUE repairs what is brought back. An account that is there is never doubled. A file of the "
    "first releases comes back as a file, for the next migration to convert.";

constexpr std::string_view kCheckModules =
    "FILE is an AccountCreators.plist; without it, the configuration's own is meant. Each module is opened, which runs "
    "its code, in a process of its own. Under another root, that takes --modules. The status is 0 where nothing was "
    "found, 5 where something was, and 1 where FILE could not be read.";
constexpr std::string_view kNewDevice =
    "DIR is made where it is missing; one that is not empty, or not yours alone, is refused. The device has no "
    "accounts, whoever makes it as the mobile user, and copies of the configuration and of the modules that it names.";

}  // namespace

const std::vector<Command>& commands() {
  static const std::vector<Command> kAll{
      {"list", "", "all accounts, children below their parents", kList, 0, 0, listAccounts, false, listFile},
      {"show", "ID", "one account with its properties", kId, 1, 1, showAccount, false, showInFile},
      {"verify", "[FILE]", "what is wrong, what a migration does about it, and what to do", kVerify, 0, 1,
       verifySettings, false, verifyFiles},
      {"diff", "A [B]", "what differs between two files, snapshots or devices", kDiff, 1, 2, compareAccounts},
      {"recover", "FROM [ACCOUNT]...", "bring accounts back into the store", kRecover, 1, kAnyNumber, recoverAccounts,
       true},
      {"types", "", "the account types, with their data classes", "", 0, 0, listTypes},
      {"enable", "ID DATACLASS", "switch a data class on", kIdAndDataclass, 2, 2, enableDataclass, true},
      {"disable", "ID DATACLASS", "switch a data class off", kIdAndDataclass, 2, 2, disableDataclass, true},
      {"rename", "ID NAME", "change what the account is called", kId, 2, 2, renameAccount, true},
      {"set", "ID KEY=VALUE...", "give an account properties, or take some away", kChangedProperties, 2, kAnyNumber,
       setProperties, true},
      {"add", "TYPE CLASS [KEY=VALUE]...", "add an account and print its identifier", kProperties, 2, kAnyNumber,
       addAccount, true},
      {"remove", "ID", "remove an account, with its children", kId, 1, 1, removeAccount, true},
      {"save", "", "repair what needs it and save the accounts", "", 0, 0, saveAccounts, true},
      {"check-modules", "[FILE]", "what each account module is called for, and why one never is", kCheckModules, 0, 1,
       checkModules},
      {"new-device", "DIR", "make a scratch device to try account modules on", kNewDevice, 1, 1, makeDevice},
      {"help", "[COMMAND]", "what a command does and takes", "", 0, 1, helpOnCommand},
  };
  return kAll;
}

}  // namespace tools
