#include "accountsettings/assertion_failure.h"

namespace accountsettings {

AssertionFailure::AssertionFailure(std::string method, std::string file, std::string message)
    : std::logic_error{"Assertion failure in " + method + ", " + file + ": " + message},
      _method{std::move(method)},
      _file{std::move(file)},
      _message{std::move(message)} {}

AssertionFailure::~AssertionFailure() = default;

void failAssertion(std::string_view method, std::string_view file, std::string_view format,
                   std::initializer_list<records::MessageArgument> arguments) {
  throw AssertionFailure{std::string{method}, std::string{file}, records::message(format, arguments)};
}

}  // namespace accountsettings
