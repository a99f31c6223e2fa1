#pragma once

#include <stdexcept>
#include <string>

namespace tools {

// The program's exit statuses are a contract: scripts tell by them what became of what they asked.
enum class ExitStatus : int {
  done = 0,
  failed = 1,              // the accounts could not be read or saved; the file is as it was
  findings = 1,            // a file that was to be verified has faults; for scripts as good as one that cannot be read
  wrongUse = 2,            // what was asked makes no sense; nothing was changed
  noSuchAccount = 3,       // nothing was changed
  faultyInstallation = 4,  // the configuration or a module is at fault; the message says whether the change was saved
};

// Ends the command. The message is one line for standard error.
class Failure : public std::runtime_error {
 public:
  Failure(ExitStatus status, const std::string& message) : std::runtime_error{message}, _status{status} {}
  [[nodiscard]] ExitStatus status() const { return _status; }

 private:
  ExitStatus _status;
};

}  // namespace tools
