#include <nlohmann/json.hpp>

#include "host/explanation_output.h"
#include "host/fact_json.h"

namespace host {
namespace {

using Json = nlohmann::ordered_json;
using records::RunFact;

Json jsonOfStage(const Explanation::Stage& stage) {
  Json json{{"stage", stage.name}};
  if (!stage.words.empty()) json["words"] = stage.words;
  if (!stage.within.empty()) json["within"] = stage.within;
  Json steps = Json::array();
  for (const RunFact& fact : stage.facts) steps.push_back(jsonOf(fact));
  json["steps"] = std::move(steps);
  return json;
}

Json jsonOfResult(const Explanation& explanation, const Outcome& outcome) {
  Json json{{"dataClass", outcome.dataClass}, {"success", outcome.success}};
  const RunFact* const save = explanation.lastSave();
  json["saved"] = save != nullptr && save->kind == RunFact::Kind::saved;
  if (save != nullptr) {
    json["accounts"] = save->count;
    json["version"] = save->version;
  }
  json["lost"] = explanation.lostFiles();
  return json;
}

}  // namespace

std::string jsonDocumentOf(const Explanation& explanation, const Outcome& outcome) {
  Json stages = Json::array();
  for (const Explanation::Stage& stage : explanation.stages()) stages.push_back(jsonOfStage(stage));
  const Json document{{"schema", 1},
                      {"rehearsal", outcome.isRehearsal},
                      {"complete", explanation.isComplete()},
                      {"stages", std::move(stages)},
                      {"result", jsonOfResult(explanation, outcome)}};
  return document.dump(2, ' ', false, Json::error_handler_t::replace) + "\n";
}

}  // namespace host
