// Which account a word on the command line means.

#include <algorithm>

#include "tools/account_view.h"
#include "tools/session.h"

namespace tools {
namespace {

using accountsettings::Text;
using Accounts = std::vector<Account>;

std::string identifierOf(const BasicAccount& account) { return account.identifier().value_or(Text{}).string(); }

[[noreturn]] void refuseAmbiguous(const std::string& word, const Accounts& candidates) {
  std::string message = "several accounts are meant by " + word + ": ";
  for (const Account& each : candidates)
    message += (each == candidates.front() ? "" : ", ") + namesOf(*each).described();
  throw Failure{ExitStatus::wrongUse, message};
}

}  // namespace

Account Session::accountMeantBy(const std::string& word) {
  // A child's identifier leads to its parent.
  const auto found = accounts().accountWithIdentifier(word);
  if (found != nullptr && identifierOf(*found) == word) return found;
  const auto all = accounts().allBasicSyncableAccounts();
  const auto exact = std::ranges::find(all, word, [](const Account& each) { return identifierOf(*each); });
  if (exact != all.end()) return *exact;
  Accounts candidates;
  std::ranges::copy_if(all, std::back_inserter(candidates),
                       [&](const Account& each) { return namesOf(*each).areMeantBy(word); });
  if (candidates.size() > 1) refuseAmbiguous(word, candidates);
  if (candidates.size() == 1) return candidates.front();
  throw Failure{ExitStatus::noSuchAccount, "no account has the identifier " + word};
}

}  // namespace tools
