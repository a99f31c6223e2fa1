#include "platform/status.h"

#include <cerrno>
#include <system_error>

namespace platform {

Status Status::failure(int errorNumber, std::string attempt) {
  Status status;
  status._errorNumber = errorNumber == 0 ? EIO : errorNumber;
  status._attempt = std::move(attempt);
  return status;
}

std::string Status::description() const {
  if (isOk()) return {};
  return "Could not " + _attempt + ": " + std::generic_category().message(_errorNumber) + " (errno " +
         std::to_string(_errorNumber) + ")";
}

}  // namespace platform
