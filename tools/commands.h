#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

#include "tools/session.h"

namespace tools {

using Words = std::vector<std::string>;

// One command of the program. It answers what is to be printed on standard output, whole lines or nothing, and ends
// with a Failure where it cannot do what it was asked.
struct Command {
  std::string_view name;
  std::string_view arguments;  // as the help shows them
  std::string_view summary;
  std::size_t fewestArguments;
  std::size_t mostArguments;
  std::string (*run)(Session& session, const Words& arguments, bool asJson);
};

[[nodiscard]] const std::vector<Command>& commands();

// reports.cpp
std::string listAccounts(Session& session, const Words& arguments, bool asJson);
std::string showAccount(Session& session, const Words& arguments, bool asJson);
std::string listTypes(Session& session, const Words& arguments, bool asJson);

// changes.cpp; each saves the accounts.
std::string enableDataclass(Session& session, const Words& arguments, bool asJson);
std::string disableDataclass(Session& session, const Words& arguments, bool asJson);
std::string renameAccount(Session& session, const Words& arguments, bool asJson);
std::string addAccount(Session& session, const Words& arguments, bool asJson);
std::string removeAccount(Session& session, const Words& arguments, bool asJson);
std::string saveAccounts(Session& session, const Words& arguments, bool asJson);

}  // namespace tools
