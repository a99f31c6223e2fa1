#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <nlohmann/json.hpp>
#include <set>

#include "accountsettings/basic_account.h"
#include "commandline/program.h"
#include "commandline/text.h"
#include "platform/base_directories.h"
#include "platform/platform.h"
#include "tools/commands.h"

namespace tools {
namespace {

namespace fs = std::filesystem;
using commandline::printable;
using Json = nlohmann::ordered_json;
using platform::Dictionary;

constexpr int kSchema = 1;
constexpr const char* kResources = "usr/share/account-settings";

// What stands on a device from its first start on.
constexpr struct {
  const char* path;
  mode_t mode;
} kDirectories[] = {
    {"etc", 0755},
    {"tmp", 01777},
    {"var", 0755},
    {"var/mobile", 0755},
    {"var/mobile/Library", 0755},
    {"var/mobile/Library/Preferences", 0755},
    {"var/mobile/Library/Mail", 0700},
    {"var/mobile/Library/Logs", 0755},
    {"var/mobile/Library/Logs/CrashReporter", 0755},
    {"var/mobile/tmp", 0700},
    {"usr", 0755},
    {"usr/share", 0755},
};

void write(const fs::path& path, const std::string& text) {
  std::ofstream file{path};
  if (!(file << text).flush()) throw Failure{ExitStatus::failed, "cannot be written: " + path.string()};
}

// The device that is being made.
class ScratchDevice {
 public:
  explicit ScratchDevice(fs::path root) : _root{std::move(root)}, _resources{_root / kResources} {}

  [[nodiscard]] std::string root() const { return printable(_root.string()); }
  [[nodiscard]] std::string resources() const { return printable(_resources.string()); }

  // Nobody else may have a hand in the directory while it is filled: what is written would go where their links lead.
  void takeEmptyDirectory() const {
    const auto refuse = [&](const std::string& why) {
      throw Failure{ExitStatus::failed, "no device is made in " + _root.string() + ": " + why};
    };
    fs::create_directories(_root);
    struct stat status {};
    if (::lstat(_root.c_str(), &status) != 0 || !S_ISDIR(status.st_mode)) refuse("it is no directory");
    if (status.st_uid != ::geteuid()) refuse("it belongs to somebody else");
    if ((status.st_mode & (S_IWGRP | S_IWOTH)) != 0) refuse("others may write in it");
    if (!fs::is_empty(_root)) refuse("it is not empty");
  }

  // The mobile user is whoever makes the device, who can then save its accounts.
  void makeDirectoriesAndUsers() const {
    for (const auto& [path, mode] : kDirectories) {
      fs::create_directory(_root / path);
      fs::permissions(_root / path, fs::perms{mode});
    }
    const auto user = std::to_string(::geteuid());
    const auto group = std::to_string(::getegid());
    write(_root / "etc/passwd",
          "root:*:0:0::/var/root:/bin/sh\nmobile:*:" + user + ":" + group + "::/var/mobile:/bin/sh\n");
    write(_root / "etc/group", "wheel:*:0:root\nmobile:*:" + group + ":\n");
  }

  // The configuration, and the modules that it names, to where it names them. Says which modules are not there.
  void copyConfiguration() const {
    const auto directories = platform::current().directories;
    fs::copy(directories->resources(), _resources, fs::copy_options::recursive);
    for (const std::string& name : namedModules()) {
      const auto place = fs::path{name}.relative_path().lexically_normal();
      const bool isBelowRoot = !place.empty() && *place.begin() != "..";
      if (!isBelowRoot || !fs::is_regular_file(directories->systemRoot() / place)) {
        commandline::say("accountctl", "there is no module " + name + " to be copied");
        continue;
      }
      fs::create_directories((_root / place).parent_path());
      fs::copy_file(directories->systemRoot() / place, _root / place);
    }
  }

  // A settings file as a migration leaves it.
  void saveNoAccounts() const {
    accounts::OpenOptions options;
    options.root = _root;
    options.resources = _resources;
    options.mayBeMissing = true;
    const auto settings = required(accounts::AccountSettings::open(options));
    accounts::Edit edit = required(settings.edit());
    edit.rewrite();
    required(edit.save());
  }

 private:
  static std::set<std::string> namedModules() {
    std::set<std::string> names;
    for (const auto& [type, entries] : accountsettings::BasicAccount::_creatorsInfo().value_or(Dictionary{})) {
      const auto* const list = entries.asArray();
      for (std::size_t place = 0; list != nullptr && place < list->size(); ++place) {
        const auto* const entry = (*list)[place].asDictionary();
        const auto* const description = entry == nullptr ? nullptr : entry->dictionary("Description");
        const auto* const framework = description == nullptr ? nullptr : description->text("Framework");
        if (framework != nullptr) names.insert(framework->string());
      }
    }
    return names;
  }

  fs::path _root;
  fs::path _resources;
};

}  // namespace

Outcome makeDevice(Session& session, const Words& arguments, const Options& options) {
  session.beginLooking();
  const ScratchDevice device{fs::absolute(arguments[0]).lexically_normal()};
  try {
    device.takeEmptyDirectory();
    device.makeDirectoriesAndUsers();
    device.copyConfiguration();
  } catch (const fs::filesystem_error& failure) {
    throw Failure{ExitStatus::failed, failure.path1().string() + ": " + failure.code().message()};
  }
  device.saveNoAccounts();
  if (options.printsJson) {
    return Json{{"schema", kSchema}, {"root", device.root()}, {"resources", device.resources()}}.dump(2) + "\n";
  }
  return "a device without accounts: " + device.root() + "\nits configuration: " + device.resources() +
         "\nPut a module below it, name the module in AccountCreators.plist there, and see what becomes of it:\n" +
         "    accountctl --root " + device.root() + " --resources " + device.resources() + " --modules check-modules\n";
}

}  // namespace tools
