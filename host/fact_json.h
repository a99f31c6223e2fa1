#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string_view>

#include "records/fact.h"

namespace host {

// The name of a kind of fact, as machines and people read it: "added", "save-failed".
[[nodiscard]] std::string_view actionOf(records::RunFact::Kind kind);

// One fact as a JSON object; its members are listed in docs/EXPLAIN.md. Credentials are hidden.
[[nodiscard]] nlohmann::ordered_json jsonOf(const records::RunFact& fact);

// The key and the value that decide whether a changed value may be shown: those of the key that it had before, where
// that one names a credential.
[[nodiscard]] std::string_view keyForShowing(const records::RecordChange& change);

}  // namespace host
