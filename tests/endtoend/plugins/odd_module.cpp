// Classes that make accounts, and some that only look so; and a module that, where ODD_MODULE says so, does not survive
// being opened.

#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <stdexcept>
#include <string_view>

#include "accountsettings/account_objects.h"

namespace {

using accountsettings::AccountClassInfo;
using accountsettings::BasicAccount;

std::shared_ptr<AccountClassInfo> classNamed(const char* name) { return std::make_shared<AccountClassInfo>(name); }

std::shared_ptr<const AccountClassInfo> makerOfEverything() {
  auto info = classNamed("Maker");
  info->accountWithBasicAccount = [](const std::shared_ptr<BasicAccount>&) { return nullptr; };
  info->accountToRefreshForBasicAccount = [](const std::shared_ptr<BasicAccount>&) { return nullptr; };
  info->noteAccountChanges = [](const std::vector<platform::Dictionary>&) {};
  return info;
}

// Its own full accounts are mail accounts alone.
std::shared_ptr<const AccountClassInfo> makerForMail() {
  static AccountClassInfo made{"MailMade"};
  made.initWithProperties = [](const platform::Dictionary&) { return nullptr; };
  auto info = classNamed("MailMaker");
  info->classForAccountType = [](std::string_view type) { return type == "Mail" ? &made : nullptr; };
  return info;
}

std::shared_ptr<const AccountClassInfo> thrower() {
  auto info = classNamed("Thrower");
  info->classForAccountType = [](std::string_view) -> const AccountClassInfo* { throw std::runtime_error{"no"}; };
  return info;
}

const platform::ClassRegistration maker{makerOfEverything()};
const platform::ClassRegistration mailMaker{makerForMail()};
const platform::ClassRegistration throws{thrower()};
const platform::ClassRegistration bare{classNamed("Bare")};
const platform::ClassRegistration foreign{std::make_shared<const platform::ClassInfo>("Foreign")};

[[gnu::constructor]] void begin() {
  const char* const setting = std::getenv("ODD_MODULE");
  const std::string_view way = setting == nullptr ? "" : setting;
  if (way == "talks") static_cast<void>(::dprintf(STDOUT_FILENO, "odd module: opened\n"));
  if (way == "dies") std::raise(SIGSEGV);
  if (way == "exits") ::_exit(3);
  if (way == "hangs") ::pause();
}

}  // namespace
