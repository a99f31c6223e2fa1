#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string_view>

#include "platform/run_fact.h"

namespace host {

// The name of a kind of fact, as machines and people read it: "added", "save-failed".
[[nodiscard]] std::string_view actionOf(platform::RunFact::Kind kind);

// One fact as a JSON object; its members are listed in docs/EXPLAIN.md. Credentials are hidden.
[[nodiscard]] nlohmann::ordered_json jsonOf(const platform::RunFact& fact);

// The key and the value that decide whether a changed value may be shown: those of the key that it had before, where
// that one names a credential.
[[nodiscard]] std::string_view keyForShowing(const platform::RecordChange& change);

}  // namespace host
