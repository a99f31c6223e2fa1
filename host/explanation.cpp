#include "host/explanation.h"

namespace host {
namespace {

constexpr std::string_view kOutside = "end of the run";  // where nothing but the last word is left

}  // namespace

void Explanation::began(std::string_view stage, std::string_view words) {
  _open.push_back({std::string{stage}, std::string{words}});
  _isNewStage = true;
}

void Explanation::ended() {
  if (!_open.empty()) _open.pop_back();
  _isNewStage = true;
}

void Explanation::add(const records::Fact& fact) {
  if (_isNewStage) {
    const std::string words = _open.empty() ? std::string{} : _open.back().words;
    _stages.push_back({std::string{stage()}, words, std::string{outerStage()}, {}});
  }
  _isNewStage = false;
  _stages.back().facts.push_back(fact);
}

std::string_view Explanation::stage() const { return _open.empty() ? kOutside : std::string_view{_open.back().name}; }

std::string_view Explanation::outerStage() const {
  return _open.size() < 2 ? std::string_view{} : _open[_open.size() - 2].name;
}

}  // namespace host
