#pragma once

#include <string>
#include <utility>
#include <variant>

#include "platform/export.h"

namespace platform {

// The outcome of a call to a service: success, or an error with a text that says what was tried and why it failed.
class [[nodiscard]] ACCOUNT_EXPORT Status {
 public:
  Status() = default;  // success
  // `errorNumber` as in errno; `attempt` says what was tried, such as "rename /a to /b".
  static Status failure(int errorNumber, std::string attempt);

  [[nodiscard]] bool isOk() const { return _errorNumber == 0; }
  [[nodiscard]] int errorNumber() const { return _errorNumber; }
  // "Could not rename /a to /b: No such file or directory (errno 2)"; empty for success.
  [[nodiscard]] std::string description() const;

 private:
  int _errorNumber = 0;
  std::string _attempt;
};

// A value, or the error that stands in its place.
template <typename Value>
class [[nodiscard]] Result {
 public:
  Result(Value value) : _outcome{std::move(value)} {}
  Result(Status failure) : _outcome{std::move(failure)} {}

  [[nodiscard]] bool isOk() const { return std::holds_alternative<Value>(_outcome); }
  [[nodiscard]] const Value& value() const { return std::get<Value>(_outcome); }
  [[nodiscard]] Value take() { return std::get<Value>(std::move(_outcome)); }
  [[nodiscard]] Status status() const { return isOk() ? Status{} : std::get<Status>(_outcome); }

 private:
  std::variant<Value, Status> _outcome;
};

}  // namespace platform
