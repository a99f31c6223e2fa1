#pragma once

#include <cstdint>
#include <string>

#include "commandline/ending.h"
#include "platform/status.h"

namespace host::snapshots {

// Why something that was asked of the snapshots is not done.
class Problem : public commandline::Ending {
 public:
  // The exit status that each ends the host with.
  enum class Kind : std::uint8_t {
    wrongUse = 2,  // it should not have been asked
    failed = 5,    // it could not be done
    locked = 8,    // a lock could not be had in time
  };

  Problem(Kind kind, const std::string& text) : Ending{kind, text} {}
};

[[noreturn]] inline void fail(const std::string& text) { throw Problem{Problem::Kind::failed, text}; }
[[noreturn]] inline void failWrongUse(const std::string& text) { throw Problem{Problem::Kind::wrongUse, text}; }

// Throws where the call failed, with its description.
inline void require(const platform::Status& status) {
  if (!status.isOk()) fail(status.description());
}

// The value; throws where there is none.
template <typename Value>
[[nodiscard]] Value required(platform::Result<Value> result) {
  require(result.status());
  return result.take();
}

}  // namespace host::snapshots
