// Which account a word on the command line means.

#include "tools/account_view.h"
#include "tools/session.h"

namespace tools {

Account Session::accountMeantBy(const std::string& word) {
  if (const auto exact = accounts().withIdentifier(word)) return *exact;
  std::vector<Account> candidates;
  std::vector<Account> children;
  const auto consider = [&word](const Account& account, std::vector<Account>& meant) {
    if (namesOf(account).areMeantBy(word)) meant.push_back(account);
  };
  for (const Account& account : accounts()) {
    consider(account, candidates);
    for (const Account& child : account.children()) consider(child, children);
  }
  candidates.insert(candidates.end(), children.begin(), children.end());
  if (candidates.empty()) throw Failure{ExitStatus::noSuchAccount, "no account has the identifier " + word};
  if (candidates.size() == 1) return candidates.front();
  std::string named;
  for (const Account& each : candidates) named += (named.empty() ? "" : ", ") + namesOf(each).described();
  throw Failure{ExitStatus::wrongUse, "several accounts are meant by " + word + ": " + named};
}

}  // namespace tools
