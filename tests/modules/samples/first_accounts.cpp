// Makers of full and sync accounts, each of another kind.

#include "accountsettings/basic_account.h"
#include "tests/modules/sample_journal.h"

namespace {

using accountsettings::AccountClassInfo;
using accountsettings::BasicAccount;
using Account = std::shared_ptr<BasicAccount>;

std::string nameOf(const Account& account) {
  return account == nullptr ? "nothing" : account->identifier().value_or("nothing").string();
}

class SampleAccount final : public accountsettings::FullAccountObject {
 public:
  void setParentAccount(Account parent) override { samples::journal().push_back("parent " + nameOf(parent)); }
};

class SampleSyncAccount final : public accountsettings::SyncAccountObject {
 public:
  bool refreshContainerWithIdentifier_forDataclass_isUserRequested(std::string_view identifier,
                                                                   std::string_view dataclass,
                                                                   bool isUserRequested) override {
    return note("container " + std::string{identifier} + " of ", dataclass, isUserRequested);
  }
  bool refreshContainerListForDataclass_isUserRequested(std::string_view dataclass, bool isUserRequested) override {
    return note("list of ", dataclass, isUserRequested);
  }
  bool refreshContainersForDataclass_isUserRequested(std::string_view dataclass, bool isUserRequested) override {
    return note("containers of ", dataclass, isUserRequested);
  }

 private:
  static bool note(const std::string& what, std::string_view dataclass, bool isUserRequested) {
    samples::journal().push_back("refresh " + what + std::string{dataclass} + (isUserRequested ? " for a user" : ""));
    return true;
  }
};

std::shared_ptr<AccountClassInfo> classNamed(const char* name) { return std::make_shared<AccountClassInfo>(name); }

const AccountClassInfo* sampleClass(std::string_view type) {
  static const auto info = [] {
    auto made = classNamed("SampleAccount");
    made->initWithProperties = [](const platform::Dictionary& properties) {
      samples::journal().push_back("init with " + properties.text("Identifier")->string());
      return std::make_shared<SampleAccount>();
    };
    return made;
  }();
  samples::journal().push_back("class for " + std::string{type});
  return info.get();
}

auto creatorByType() {
  auto info = classNamed("CreatorByType");
  info->classForAccountType = sampleClass;
  // Not to be asked, since there is a class for the type.
  info->accountWithBasicAccount = [](const Account&) { return nullptr; };
  return info;
}

auto creatorByRecord() {
  auto info = classNamed("CreatorByRecord");
  info->accountWithBasicAccount = [](const Account& account) {
    samples::journal().push_back("account with " + nameOf(account));
    return std::make_shared<SampleAccount>();
  };
  return info;
}

auto creatorOfNoClass() {
  auto info = classNamed("CreatorOfNoClass");
  info->classForAccountType = [](std::string_view) { return nullptr; };
  return info;
}

auto creatorOfNothing() {
  auto info = classNamed("CreatorOfNothing");
  info->accountWithBasicAccount = [](const Account&) { return nullptr; };
  info->accountToRefreshForBasicAccount = [](const Account&) { return nullptr; };
  return info;
}

auto syncCreator() {
  auto info = classNamed("SyncCreator");
  info->accountToRefreshForBasicAccount = [](const Account& account) {
    samples::journal().push_back("sync account for " + nameOf(account));
    return std::make_shared<SampleSyncAccount>();
  };
  return info;
}

const platform::ClassRegistration byType{creatorByType()};
const platform::ClassRegistration byRecord{creatorByRecord()};
const platform::ClassRegistration ofNoClass{creatorOfNoClass()};
const platform::ClassRegistration ofNothing{creatorOfNothing()};
const platform::ClassRegistration withoutOperations{classNamed("CreatorWithoutOperations")};
const platform::ClassRegistration sync{syncCreator()};
const platform::ClassRegistration noAccountClass{std::make_shared<platform::ClassInfo>("NoAccountClass")};
const struct Opened {
  Opened() { samples::journal().emplace_back("opened first"); }
} opened;

}  // namespace
