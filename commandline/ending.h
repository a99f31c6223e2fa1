#pragma once

#include <span>
#include <stdexcept>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>

namespace commandline {

// Ends a program before it has done what it was asked. Thrown; runProgram says the message, which is one line, on
// standard error, and answers the status.
class Ending : public std::runtime_error {
 public:
  template <typename Status>
    requires std::is_enum_v<Status>
  Ending(Status status, const std::string& message, std::string hint = {})
      : std::runtime_error{message}, _status{static_cast<int>(status)}, _hint{std::move(hint)} {}

  [[nodiscard]] int status() const { return _status; }
  // A question such as "did you mean --json?", for people alone; empty where there is none.
  [[nodiscard]] const std::string& hint() const { return _hint; }

 private:
  int _status;
  std::string _hint;
};

// The exit status that means the same for every program: what was asked makes no sense, and nothing was done.
enum class CommonStatus : int { wrongUse = 2 };

// Wrong use of what the help explains, and so with a word on where to find it.
class WrongUse : public Ending {
 public:
  explicit WrongUse(const std::string& message, std::string hint = {})
      : Ending{CommonStatus::wrongUse, message + " (see --help)", std::move(hint)} {}
};

// The hint that names the candidate which the word was most likely meant to be; empty where none is like it. Case does
// not count, a neighbouring pair of letters in the wrong order is one mistake.
[[nodiscard]] std::string hintFor(std::string_view word, std::span<const std::string> candidates);

}  // namespace commandline
