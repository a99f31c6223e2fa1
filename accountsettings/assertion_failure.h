#pragma once

#include <stdexcept>
#include <string>
#include <string_view>

#include "platform/export.h"
#include "records/message.h"

namespace accountsettings {

// A programming or configuration error: the library's internal-inconsistency failure. It is thrown where it is found
// and means that the call did nothing more. `what()` names the method, the source file and the message.
class ACCOUNT_EXPORT AssertionFailure : public std::logic_error {
 public:
  AssertionFailure(std::string method, std::string file, std::string message);
  AssertionFailure(const AssertionFailure&) = default;
  AssertionFailure& operator=(const AssertionFailure&) = default;
  ~AssertionFailure() override;

  [[nodiscard]] const std::string& method() const { return _method; }
  [[nodiscard]] const std::string& file() const { return _file; }
  [[nodiscard]] const std::string& message() const { return _message; }

 private:
  std::string _method;
  std::string _file;
  std::string _message;
};

// Throws the failure of `method` in `file` ("BasicAccount" or "AccountsManager"), its message formatted with the
// arguments.
[[noreturn]] ACCOUNT_EXPORT void failAssertion(std::string_view method, std::string_view file, std::string_view format,
                                               std::initializer_list<records::MessageArgument> arguments = {});

}  // namespace accountsettings
