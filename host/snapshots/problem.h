#pragma once

#include <cstdint>
#include <stdexcept>
#include <string>

#include "platform/status.h"

namespace host::snapshots {

// Why something that was asked of the snapshots is not done; its text is one line for the caller. Thrown.
class Problem : public std::runtime_error {
 public:
  enum class Kind : std::uint8_t {
    wrongUse,  // it should not have been asked
    failed,    // it could not be done
  };

  Problem(Kind kind, const std::string& text) : std::runtime_error{text}, _kind{kind} {}
  [[nodiscard]] Kind kind() const { return _kind; }

 private:
  Kind _kind;
};

// Throws where the call failed, with its description.
inline void require(const platform::Status& status) {
  if (!status.isOk()) throw Problem{Problem::Kind::failed, status.description()};
}

// The value; throws where there is none.
template <typename Value>
[[nodiscard]] Value required(platform::Result<Value> result) {
  require(result.status());
  return result.take();
}

}  // namespace host::snapshots
