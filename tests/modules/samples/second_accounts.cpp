// A second maker of full accounts.

#include "accountsettings/basic_account.h"
#include "tests/modules/sample_journal.h"

namespace {

using accountsettings::AccountClassInfo;
using accountsettings::BasicAccount;

class OtherAccount final : public accountsettings::FullAccountObject {
 public:
  void setParentAccount(std::shared_ptr<BasicAccount>) override { samples::journal().emplace_back("other account"); }
};

auto creator() {
  auto info = std::make_shared<AccountClassInfo>("OtherCreator");
  info->accountWithBasicAccount = [](const std::shared_ptr<BasicAccount>&) { return std::make_shared<OtherAccount>(); };
  return info;
}

const platform::ClassRegistration registration{creator()};
const struct Opened {
  Opened() { samples::journal().emplace_back("opened second"); }
} opened;

}  // namespace
