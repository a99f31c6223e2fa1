#pragma once

#include <algorithm>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace tools {

// What became of a module that was opened, and of the class that was looked for in it.
struct ModuleTrial {
  enum class Ended : std::uint8_t {
    answered,   // and what is below holds
    notOpened,  // `why` is the loader's reason
    died,       // it ended its process, or took too long; `why` says how
  };
  enum class Found : std::uint8_t { none, otherClass, accountClass };

  Ended ended = Ended::died;
  std::string why;
  Found found = Found::none;
  // The members of AccountClassInfo that are set. Where classForAccountType is, initWithProperties is that of the class
  // which it answers for the account type.
  std::vector<std::string> answers;

  [[nodiscard]] bool answersTo(std::string_view operation) const { return std::ranges::count(answers, operation) != 0; }
};

// Opens the module and looks the class up, in a process of its own: opening a module runs its code, which may do
// whatever the user may, and fail in whatever way. The process has ten seconds, a gigabyte more memory than this one,
// no standard input, and writes to standard error alone. With an account type, the class is asked for that type's own
// class.
[[nodiscard]] ModuleTrial tryModule(const std::string& path, const std::string& className,
                                    const std::optional<std::string>& accountType);

}  // namespace tools
