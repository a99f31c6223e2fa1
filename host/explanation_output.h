#pragma once

#include <string>
#include <string_view>

#include "host/explanation.h"

namespace host {

// How the run that is explained ended, as far as the host knows it.
struct Outcome {
  std::string_view dataClass;
  bool success = false;
  bool isRehearsal = false;
};

// For people: by stage and account, what changed in short, and nothing of what did not. Values are cut and long lists
// of accounts that merely changed are counted; nothing that went is left out.
[[nodiscard]] std::string textOf(const Explanation& explanation, const Outcome& outcome);

// For machines: one JSON document, as docs/EXPLAIN.md describes it.
[[nodiscard]] std::string jsonDocumentOf(const Explanation& explanation, const Outcome& outcome);

}  // namespace host
