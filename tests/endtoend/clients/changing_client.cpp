// A program on the interface for programs, for tests that kill it:
//
//   changing_client add ROOT NAME FIRST END    adds accounts NAME-FIRST, NAME-FIRST+2, ..., sets keys between them
//   changing_client count ROOT NAME FIRST END  sets the number of the account NAME to FIRST, FIRST+1, ...
//   changing_client watch ROOT                 tells of changes, with the numbers that were set, until its input ends
//
// After each change that was saved it says when it began, when it ended (nanoseconds) and which it was.

#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <iostream>
#include <string>

#include "accounts/account_settings.h"

namespace {

using accounts::Edit;
using std::chrono::steady_clock;

constexpr const char* kShared = "Shared";

accounts::AccountSettings opened(const char* root) {
  accounts::OpenOptions options;
  options.root = root;
  options.timeLimit = std::chrono::minutes{5};
  auto settings = accounts::AccountSettings::open(options);
  if (!settings.isOk()) {
    std::cerr << settings.error().sentence << '\n';
    std::exit(1);
  }
  return std::move(settings).value();
}

bool addOrSet(Edit& edit, const std::string& name, int number) {
  const std::string own = name + "-" + std::to_string(number);
  if (number % 2 == 0) return edit.add({"LDAP", "LDAPAccount", {{"Identifier", own}}, ""}).isOk();
  return edit.set(kShared, own, number).isOk();
}

// What was answered before must still stand, be it followed by a change whose answer died with this program's
// forerunner.
bool count(Edit& edit, const std::string& name, int number) {
  const auto stands = edit.account(name)->integer("Count").value_or(-1);
  if (number > 0 && stands != number - 1 && stands != number) {
    std::cerr << name << " has " << stands << " before " << number << '\n';
    std::exit(3);
  }
  return edit.set(name, "Count", number).isOk();
}

int change(const std::string& manner, char** arguments) {
  const auto settings = opened(arguments[0]);
  const std::string name = arguments[1];
  for (int number = std::atoi(arguments[2]); number < std::atoi(arguments[3]); ++number) {
    const auto began = steady_clock::now();
    const auto saved = settings.change(
        [&](Edit& edit) { return manner == "add" ? addOrSet(edit, name, number) : count(edit, name, number); });
    if (!saved.isOk()) {
      std::cerr << saved.error().sentence << '\n';
      return 2;
    }
    const std::string line = std::to_string(began.time_since_epoch().count()) + " " +
                             std::to_string(steady_clock::now().time_since_epoch().count()) + " " +
                             std::to_string(number) + "\n";
    if (::write(STDOUT_FILENO, line.data(), line.size()) < 0) return 4;
  }
  return 0;
}

int watch(const char* root) {
  static constexpr const char* kinds[] = {"added", "changed", "removed"};
  const auto settings = opened(root);
  const auto watch = settings.watch(settings.accounts().value(), [](const accounts::Change& change) {
    std::cout << kinds[static_cast<int>(change.kind)] << ' ' << change.account.identifier();
    for (const std::string& key : change.keys) {
      const auto number = change.account.integer(key);
      std::cout << ' ' << key << (number ? "=" + std::to_string(*number) : "");
    }
    std::cout << std::endl;
  });
  if (!watch.isOk()) return 1;
  std::cout << "watching" << std::endl;
  std::string line;
  while (std::getline(std::cin, line)) continue;
  return 0;
}

}  // namespace

int main(int argumentCount, char** arguments) {
  const std::string manner = argumentCount > 2 ? arguments[1] : "";
  if (manner == "watch") return watch(arguments[2]);
  return argumentCount == 6 ? change(manner, arguments + 2) : 64;
}
