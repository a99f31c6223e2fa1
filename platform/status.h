#pragma once

#include <concepts>
#include <cstdint>
#include <optional>
#include <string>
#include <utility>
#include <variant>

#include "platform/export.h"

namespace platform {

// What kind of failure it was, for whoever decides by it. Everybody else tells the description.
enum class Cause : std::uint8_t {
  none,        // it succeeded
  missing,     // nothing stands there, or nothing has that name
  unsafe,      // refused, since somebody may have planted it: a link, or a file with a second name elsewhere
  excessive,   // refused, since it is too large, or would take memory or time out of all proportion
  malformed,   // its bytes are not of the form that they should have
  unsuitable,  // of a sound form, but something else than what was asked for
  other        // everything else: no permission, a full or failing disk, a service that does not answer
};

// The outcome of a call to a service: success, or an error with a text that says what was tried and why it failed.
class [[nodiscard]] ACCOUNT_EXPORT Status {
 public:
  Status() = default;  // success
  // `errorNumber` as in errno; `attempt` says what was tried, such as "rename /a to /b". The cause is missing for
  // ENOENT and ENOTDIR, unsafe for ELOOP and EMLINK, excessive for EFBIG, and other for the rest.
  static Status failure(int errorNumber, std::string attempt);
  // A failure that the operating system has no number for; `reason` says in a few words why. Not for Cause::none.
  static Status failure(Cause cause, std::string attempt, std::string reason);

  [[nodiscard]] bool isOk() const { return _cause == Cause::none; }
  [[nodiscard]] Cause cause() const { return _cause; }
  // 0 for success, and for a failure without a number.
  [[nodiscard]] int errorNumber() const { return _errorNumber; }
  // Why alone, "No such file or directory (errno 2)"; empty for success.
  [[nodiscard]] std::string reason() const;
  // "Could not rename /a to /b: No such file or directory (errno 2)"; empty for success.
  [[nodiscard]] std::string description() const;

 private:
  Cause _cause = Cause::none;
  int _errorNumber = 0;
  std::string _attempt;
  std::string _reason;  // where there is no error number
};

// A value, or the error that stands in its place.
template <typename Value>
class [[nodiscard]] Result {
 public:
  template <typename Given = Value>
    requires std::convertible_to<Given, Value>
  Result(Given&& value) : _outcome{std::in_place_type<Value>, std::forward<Given>(value)} {}
  Result(Status failure) : _outcome{std::move(failure)} {}

  [[nodiscard]] bool isOk() const { return std::holds_alternative<Value>(_outcome); }
  [[nodiscard]] const Value& value() const { return std::get<Value>(_outcome); }
  [[nodiscard]] Value take() { return std::get<Value>(std::move(_outcome)); }
  // The value, or this one where there is none: for whoever does not ask why.
  [[nodiscard]] Value valueOr(Value otherwise) const& { return isOk() ? value() : std::move(otherwise); }
  [[nodiscard]] Value valueOr(Value otherwise) && { return isOk() ? take() : std::move(otherwise); }
  // The value, or nothing: for whoever does not ask why.
  [[nodiscard]] std::optional<Value> optional() && { return isOk() ? std::optional{take()} : std::nullopt; }
  [[nodiscard]] Status status() const { return isOk() ? Status{} : std::get<Status>(_outcome); }
  [[nodiscard]] Cause cause() const { return isOk() ? Cause::none : std::get<Status>(_outcome).cause(); }

  // Whether it is this value.
  friend bool operator==(const Result& result, const Value& value)
    requires std::equality_comparable<Value>
  {
    return result.isOk() && result.value() == value;
  }

 private:
  std::variant<Value, Status> _outcome;
};

}  // namespace platform
