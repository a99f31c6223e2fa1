#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "records/fact_observer.h"

namespace tests {

// An observer that keeps every fact, and the stage in which it was told.
class FactRecorder final : public records::FactObserver {
 public:
  std::vector<records::Fact> facts;
  std::vector<std::string> stages;  // of each fact; empty outside of any

  void stageBegan(std::string_view stage, std::string_view) override { _open.emplace_back(stage); }
  void stageEnded(std::string_view) override { _open.pop_back(); }
  void told(const records::Fact& fact) override;
  void lostTrack() noexcept override {}

  // Each fact in one line, "changed a: Port 1 -> 2, -Host", without those of loading, copying and saving.
  [[nodiscard]] std::vector<std::string> lines() const;

 private:
  std::vector<std::string> _open;
};

[[nodiscard]] std::string lineOf(const records::Fact& fact);

}  // namespace tests
