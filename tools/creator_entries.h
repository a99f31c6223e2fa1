#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/property_value.h"

namespace tools {

// The kinds of entry that the library knows.
inline constexpr std::string_view kFullAccountEntry = "FullAccount";
inline constexpr std::string_view kSyncAccountEntry = "SyncAccount";
inline constexpr std::string_view kNotifierEntry = "NotifierAccount";

// One thing that is wrong with the file that says which modules and classes stand behind each account type. The texts
// are clauses of a sentence for people; `kind` is for scripts, and so a contract (docs/MODULES.md lists the kinds).
struct ModuleFinding {
  std::string_view kind;
  std::string place;  // "CalDAV[2]", or "CalDAV" for the type's whole list
  std::string what;
  std::string effect;  // what comes of it
};

// One entry of the file.
struct CreatorEntry {
  std::string place;
  std::string accountType;
  // As they are written; empty where they are missing, or where nobody would find them.
  std::string kind;
  std::string framework;
  std::string className;
  std::vector<std::string> dataclasses;  // that a notifier listens to, in their order
  // Whether the library ever calls the class; nothing while nobody has looked into the module.
  std::optional<bool> isCalled;
  std::vector<std::string> answers;  // the class's operations, where it was looked up
};

struct CreatorTable {
  std::vector<CreatorEntry> entries;  // in the file's order
  std::vector<ModuleFinding> findings;
};

// What comes of an entry that the library stumbles over.
[[nodiscard]] std::string effectOfFailure(std::string_view kind);

// The entries, and what is wrong with them as it can be seen without opening a module. Account types and data classes
// are those of the configuration; throws AssertionFailure where that is missing.
[[nodiscard]] CreatorTable creatorTableIn(const platform::Dictionary& file);

}  // namespace tools
