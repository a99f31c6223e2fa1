#include <nlohmann/json.hpp>
#include <optional>

#include "host/explanation.h"
#include "host/fact_json.h"
#include "host/verdict.h"

namespace host {
namespace {

using Json = nlohmann::ordered_json;

Json jsonOfResult(const Explanation& explanation, const Verdict& verdict, const ExplainedRun& run) {
  Json json{{"dataClass", run.dataClass}, {"success", run.success}};
  addVerdict(verdict, json);
  // How many accounts of which version the settings file had and has, as far as the run told.
  explanation.forEachFact([&json](const records::Fact& fact) {
    if (const auto* const loaded = std::get_if<records::Loaded>(&fact)) json["storedVersion"] = loaded->version;
    if (const auto* const saved = std::get_if<records::Saved>(&fact)) {
      json["accounts"] = saved->accounts;
      json["version"] = saved->version;
    }
  });
  json["counts"] = Json::object();
  for (const auto& [name, count] : countsOf(explanation, verdict).named()) json["counts"][std::string{name}] = count;
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
