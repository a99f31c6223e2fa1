// Notifiers that write down what they are told, and one that can hold its process up: where NOTIFIER_GATE names a pipe,
// it waits, before the process's first change, until somebody has opened the pipe's other end and closed it again.

#include <cstdlib>
#include <fstream>
#include <iterator>
#include <memory>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "accountsettings/account_objects.h"

namespace {

using accountsettings::AccountClassInfo;

std::string setting(const char* name) {
  const char* const value = std::getenv(name);
  return value == nullptr ? "" : value;
}

void writeDown(const std::string& line) { std::ofstream{setting("NOTIFIER_JOURNAL"), std::ios::app} << line << '\n'; }

void waitAtGate() {
  static const std::string everything = [] {
    std::ifstream gate{setting("NOTIFIER_GATE")};
    return std::string{std::istreambuf_iterator<char>{gate}, {}};
  }();
}

std::shared_ptr<AccountClassInfo> journalist(const char* name) {
  auto info = std::make_shared<AccountClassInfo>(name);
  info->noteAccountChanges = [](const std::vector<platform::Dictionary>& changes) {
    writeDown("changes of " + std::to_string(changes.size()));
  };
  return info;
}

std::shared_ptr<const AccountClassInfo> gated() {
  auto info = journalist("GatedNotifier");
  info->accountWillChange_forDataclass = [](std::string_view identifier, std::string_view dataclass) {
    writeDown("will " + std::string{identifier} + " " + std::string{dataclass});
    waitAtGate();
  };
  info->accountDidChange_forDataclass = [](std::string_view identifier, std::string_view dataclass) {
    writeDown("did " + std::string{identifier} + " " + std::string{dataclass});
  };
  return info;
}

[[noreturn]] void fail() { throw std::runtime_error{"no pen at hand"}; }

std::shared_ptr<const AccountClassInfo> throwingBefore() {
  auto info = journalist("ThrowsBefore");
  info->accountWillChange_forDataclass = [](std::string_view, std::string_view) { fail(); };
  return info;
}

std::shared_ptr<const AccountClassInfo> throwingAtSave() {
  auto info = journalist("ThrowsAtSave");
  info->noteAccountChanges = [](const std::vector<platform::Dictionary>&) { fail(); };
  return info;
}

std::shared_ptr<const AccountClassInfo> throwingAfter() {
  auto info = journalist("ThrowsAfter");
  info->accountDidChange_forDataclass = [](std::string_view, std::string_view) { fail(); };
  return info;
}

const platform::ClassRegistration gatedNotifier{gated()};
const platform::ClassRegistration throwsBefore{throwingBefore()};
const platform::ClassRegistration throwsAtSave{throwingAtSave()};
const platform::ClassRegistration throwsAfter{throwingAfter()};
const platform::ClassRegistration deafNotifier{std::make_shared<const AccountClassInfo>("DeafNotifier")};

}  // namespace
