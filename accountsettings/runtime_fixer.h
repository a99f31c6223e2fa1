#pragma once

#include <cstdint>
#include <string_view>

#include "accountsettings/basic_account.h"

namespace accountsettings {

enum class FixAnswer : std::uint8_t { nothingToDo = 0, repaired = 1, drop = 2 };

// Inspects every top-level account as the store loads it and again as the store saves it.
class ACCOUNT_EXPORT RuntimeFixer {
 public:
  virtual ~RuntimeFixer();

  // Repairs the account in place where it needs it. `loggingMessage` says what the store is doing: "loading accounts"
  // or "saving accounts".
  virtual FixAnswer fixBasicAccountIfNeeded_loggingMessage(BasicAccount& account, std::string_view loggingMessage) = 0;
  // Called after a load (false) or a save (true, also a failed one) in which some fixer had something to do.
  virtual void accountsHaveBeenSaved(bool saved) = 0;
};

}  // namespace accountsettings
