#include "platform/status.h"

#include <cerrno>
#include <system_error>

namespace platform {
namespace {

Cause causeOf(int errorNumber) {
  switch (errorNumber) {
    case ENOENT:
    case ENOTDIR: return Cause::missing;
    case ELOOP:
    case EMLINK: return Cause::unsafe;
    case EFBIG: return Cause::excessive;
    default: return Cause::other;
  }
}

}  // namespace

Status Status::failure(int errorNumber, std::string attempt) {
  Status status;
  status._errorNumber = errorNumber == 0 ? EIO : errorNumber;
  status._cause = causeOf(status._errorNumber);
  status._attempt = std::move(attempt);
  return status;
}

Status Status::failure(Cause cause, std::string attempt, std::string reason) {
  Status status;
  status._cause = cause;
  status._attempt = std::move(attempt);
  status._reason = std::move(reason);
  return status;
}

std::string Status::reason() const {
  if (_errorNumber == 0) return _reason;
  return std::generic_category().message(_errorNumber) + " (errno " + std::to_string(_errorNumber) + ")";
}

std::string Status::description() const { return isOk() ? std::string{} : "Could not " + _attempt + ": " + reason(); }

}  // namespace platform
