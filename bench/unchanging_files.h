#pragma once

#include "platform/file_system.h"

namespace bench {

// A file system to whose files nothing happens: every change succeeds, and none is made. What is there, what it holds
// and which temporary name is free is for whoever derives from this to say.
class UnchangingFiles : public platform::FileSystem {
 public:
  using Path = platform::Path;
  using Status = platform::Status;

  Status create(const Path& /*path*/, std::span<const std::uint8_t> /*bytes*/) override { return {}; }
  Status replace(const Path& /*path*/, std::span<const std::uint8_t> /*bytes*/) override { return {}; }
  Status copy(const Path& /*from*/, const Path& /*to*/) override { return {}; }
  Status remove(const Path& /*path*/) override { return {}; }
  Status createDirectories(const Path& /*path*/, unsigned /*permissions*/) override { return {}; }
  Status setOwner(const Path& /*path*/, std::string_view /*owner*/, std::string_view /*group*/) override { return {}; }
  Status rename(const Path& /*from*/, const Path& /*to*/) override { return {}; }
};

}  // namespace bench
