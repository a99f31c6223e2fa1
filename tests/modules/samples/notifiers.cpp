// Notifiers: one with every operation, one that hears of saves only, and one that misses what it must have.

#include "accountsettings/account_objects.h"
#include "records/description.h"
#include "tests/modules/sample_journal.h"

namespace {

using accountsettings::AccountClassInfo;
using platform::Dictionary;

void noteSingle(const std::string& what, std::string_view identifier, std::string_view dataclass) {
  samples::journal().push_back(what + " " + std::string{identifier} + " " + std::string{dataclass});
}

auto notifierNamed(const std::string& name) {
  auto info = std::make_shared<AccountClassInfo>(name);
  info->noteAccountChanges = [name](const std::vector<Dictionary>& changes) {
    for (const Dictionary& change : changes) samples::journal().push_back(name + " " + records::description(change));
  };
  return info;
}

auto fullNotifier() {
  auto info = notifierNamed("FullNotifier");
  info->accountWillChange_forDataclass = [](auto account, auto dataclass) { noteSingle("will", account, dataclass); };
  info->accountDidChange_forDataclass = [](auto account, auto dataclass) { noteSingle("did", account, dataclass); };
  return info;
}

const platform::ClassRegistration full{fullNotifier()};
const platform::ClassRegistration savesOnly{notifierNamed("SavesOnlyNotifier")};
const platform::ClassRegistration deaf{std::make_shared<AccountClassInfo>("DeafNotifier")};

}  // namespace
