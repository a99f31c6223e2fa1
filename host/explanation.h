#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "records/fact.h"

namespace host {

// What a run did, as it was told: the stages that did anything, in their order, each with its facts.
class Explanation {
 public:
  struct Stage {
    std::string name;
    std::string words;   // what it does, where the name says too little for people; may be empty
    std::string within;  // the stage that it is a part of; may be empty
    std::vector<records::Fact> facts;
  };

  void began(std::string_view stage, std::string_view words = {});
  void ended();
  void add(const records::Fact& fact);
  // From here on something is missing.
  void loseTrack() { _isComplete = false; }

  [[nodiscard]] const std::vector<Stage>& stages() const { return _stages; }
  [[nodiscard]] bool isComplete() const { return _isComplete; }
  // The present stage ("end of the run" outside of any), and the one that it is a part of, which may be empty.
  [[nodiscard]] std::string_view stage() const;
  [[nodiscard]] std::string_view outerStage() const;

  // Calls `action` with every fact, in order.
  template <typename Action>
  void forEachFact(const Action& action) const {
    for (const Stage& each : _stages) {
      for (const records::Fact& fact : each.facts) action(fact);
    }
  }
  template <typename Kind>
  [[nodiscard]] std::size_t count() const {
    std::size_t count = 0;
    forEachFact([&count](const records::Fact& fact) { count += std::holds_alternative<Kind>(fact) ? 1U : 0U; });
    return count;
  }

 private:
  struct Open {
    std::string name;
    std::string words;
  };

  std::vector<Stage> _stages;
  std::vector<Open> _open;  // the stages that began and did not end, the innermost last
  bool _isNewStage = true;
  bool _isComplete = true;
};

struct Verdict;

// The run that is explained, as far as the host knows it.
struct ExplainedRun {
  std::string_view dataClass;
  bool success = false;
  bool isRehearsal = false;
  std::string_view version{};  // of the host
  std::string root{};
  std::string time{};  // of its start, as in 2026-03-07T10:15:00Z
  double seconds = 0;  // that it took
};

// For people: by stage and account, what changed in short, and nothing of what did not. Values are cut and long lists
// of accounts that merely changed are counted; nothing that went is left out, neither an account nor a member of a
// list. No character of it does anything to a terminal.
[[nodiscard]] std::string textOf(const Explanation& explanation, const Verdict& verdict, const ExplainedRun& run);

// Mail "June" (4F1C…): it has no type [dropped-no-type]
[[nodiscard]] std::string textOf(const records::Lost& lost);

// What a person has to know of the verdict, a line each: why the accounts are not saved, and each loss, with the place
// that still has its data.
[[nodiscard]] std::vector<std::string> warningsOf(const Verdict& verdict);

// For machines: one JSON document, as docs/EXPLAIN.md describes it.
[[nodiscard]] std::string jsonDocumentOf(const Explanation& explanation, const Verdict& verdict,
                                         const ExplainedRun& run);

}  // namespace host
