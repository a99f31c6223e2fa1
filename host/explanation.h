#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

#include "platform/run_fact.h"

namespace host {

// What a run did, as it was told: the stages that did anything, in their order, each with its facts.
class Explanation {
 public:
  struct Stage {
    std::string name;
    std::string within;  // the stage that it is a part of; may be empty
    std::vector<platform::RunFact> facts;
  };

  void began(std::string_view stage);
  void ended();
  void add(const platform::RunFact& fact);
  // From here on something is missing.
  void loseTrack() { _isComplete = false; }

  [[nodiscard]] const std::vector<Stage>& stages() const { return _stages; }
  [[nodiscard]] bool isComplete() const { return _isComplete; }
  // The present stage ("end of the run" outside of any), and the one that it is a part of, which may be empty.
  [[nodiscard]] std::string_view stage() const;
  [[nodiscard]] std::string_view outerStage() const;
  // How the last attempt to save ended; null where there was none.
  [[nodiscard]] const platform::RunFact* lastSave() const;
  // The settings file that stood there and could not be read; null where there was none.
  [[nodiscard]] const platform::RunFact* unreadFile() const;
  // The removed files whose accounts are on the device no longer, since they could not be converted or no save of them
  // went through.
  [[nodiscard]] std::vector<std::string> lostFiles() const;
  [[nodiscard]] std::size_t count(platform::RunFact::Kind kind) const;

 private:
  template <typename Condition>
  [[nodiscard]] const platform::RunFact* lastFact(const Condition& condition) const;
  template <typename Action>
  void forEachFact(const Action& action) const;

  std::vector<Stage> _stages;
  std::vector<std::string> _open;  // the stages that began and did not end, the innermost last
  bool _isNewStage = true;
  bool _isComplete = true;
};

}  // namespace host
