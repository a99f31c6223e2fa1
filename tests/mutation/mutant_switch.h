#pragma once

#include <fcntl.h>
#include <unistd.h>

#include <cstdlib>
#include <mutex>
#include <set>
#include <string>
#include <string_view>

namespace mutation {

// What the mutated copy of one source asks at each of its mutants. The environment names the one mutant that is active
// in MUTANT ("accountsettings/basic_account.cpp:17"), if any, and in MUTANTS_REACHED the file to which each mutant that
// is met is added, as a line of that form. May be asked by several threads.
class MutatedSource {
 public:
  explicit MutatedSource(std::string_view path) : _path{path} {
    const std::string_view active = variable("MUTANT");
    const bool isHere = active.starts_with(_path + ":");
    if (isHere) _active = std::atoi(active.substr(_path.size() + 1).data());
  }

  bool isActive(int number) {
    if (!_reachedFile.empty()) noteReached(number);
    return number == _active;
  }

 private:
  static std::string_view variable(const char* name) {
    const char* const value = std::getenv(name);
    return value == nullptr ? std::string_view{} : value;
  }
  void noteReached(int number) {
    const std::scoped_lock lock{_guard};
    if (_reached.insert(number).second) tellReached(number);
  }
  // A test may end its process at any moment, so nothing is held back.
  void tellReached(int number) const {
    const std::string line = _path + ":" + std::to_string(number) + "\n";
    const int file = ::open(_reachedFile.c_str(), O_WRONLY | O_APPEND | O_CREAT | O_CLOEXEC, 0600);
    if (file < 0 || ::write(file, line.data(), line.size()) < 0) std::abort();
    ::close(file);
  }

  std::string _path;
  std::string _reachedFile{variable("MUTANTS_REACHED")};
  std::mutex _guard;
  std::set<int> _reached;
  int _active = -1;
};

}  // namespace mutation
