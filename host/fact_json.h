#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string_view>

#include "host/verdict.h"
#include "records/fact.h"

namespace host {

// One fact as a JSON object; its members are listed in docs/EXPLAIN.md. Credentials are hidden.
[[nodiscard]] nlohmann::ordered_json jsonOf(const records::Fact& fact);

// Accounts as a JSON array, as they stand in facts.
[[nodiscard]] nlohmann::ordered_json jsonOf(const std::vector<records::Name>& accounts);

// Puts the verdict's members into the result that the explanation and the trace have in common.
void addVerdict(const Verdict& verdict, nlohmann::ordered_json& result);

// The key that decides whether a changed value may be shown: the one that it had before, where that one names a
// credential.
[[nodiscard]] std::string_view keyForShowing(const records::Change& change);

}  // namespace host
