#include <nlohmann/json.hpp>
#include <optional>

#include "host/explanation.h"
#include "host/fact_json.h"
#include "host/verdict.h"

namespace host {
namespace {

using Json = nlohmann::ordered_json;

// How many accounts of which version the settings file had and has, as far as the run told.
void addState(const Explanation& explanation, Json& result) {
  const auto put = [&result](std::size_t accounts, std::uint64_t version) {
    result["accounts"] = accounts;
    result["version"] = version;
  };
  explanation.forEachFact([&](const records::Fact& fact) {
    if (const auto* const loaded = std::get_if<records::Loaded>(&fact)) result["storedVersion"] = loaded->version;
    if (const auto* const saved = std::get_if<records::Saved>(&fact)) put(saved->accounts, saved->version);
  });
}

Json jsonOfResult(const Explanation& explanation, const Verdict& verdict, const ExplainedRun& run) {
  Json json{{"dataClass", run.dataClass}, {"success", run.success}};
  addVerdict(verdict, json);
  addState(explanation, json);
  const Counts counts = countsOf(explanation, verdict);
  json["counts"] = {{"kept", counts.kept},           {"changed", counts.changed}, {"added", counts.added},
                    {"converted", counts.converted}, {"moved", counts.moved},     {"folded", counts.folded},
                    {"dropped", counts.dropped},     {"lost", counts.lost}};
  return json;
}

}  // namespace

std::string jsonDocumentOf(const Explanation& explanation, const Verdict& verdict, const ExplainedRun& run) {
  Json stages = Json::array();
  for (const Explanation::Stage& stage : explanation.stages()) {
    Json json{{"stage", stage.name}};
    if (!stage.words.empty()) json["words"] = stage.words;
    if (!stage.within.empty()) json["within"] = stage.within;
    json["facts"] = Json::array();
    for (const records::Fact& fact : stage.facts) json["facts"].push_back(jsonOf(fact));
    stages.push_back(std::move(json));
  }
  const Json document{{"schema", 2},
                      {"host", run.version},
                      {"root", run.root},
                      {"time", run.time},
                      {"rehearsal", run.isRehearsal},
                      {"complete", explanation.isComplete()},
                      {"stages", std::move(stages)},
                      {"result", jsonOfResult(explanation, verdict, run)}};
  return document.dump(2, ' ', false, Json::error_handler_t::replace) + "\n";
}

}  // namespace host
