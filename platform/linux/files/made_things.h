#pragma once

#include <filesystem>
#include <map>
#include <mutex>

#include "platform/linux/files/file_access.h"

namespace platform {

// The files and directories that were made and may still be given away, kept open by path: somebody who writes in their
// directory may put something else in their place meanwhile, which would then be given away. Of the things that nobody
// asks for, some are kept open. For any number of threads.
class MadeThings {
 public:
  // Takes the memory to remember a thing, so that remembering it once it is made cannot fail.
  void makeRoomFor(const std::filesystem::path& path);
  void remember(const std::filesystem::path& path, Descriptor thing);
  void forget(const std::filesystem::path& path);
  // What was made at the path and not asked for yet; not open where nothing was.
  [[nodiscard]] Descriptor take(const std::filesystem::path& path);

 private:
  std::mutex _guard;
  std::map<std::filesystem::path, Descriptor> _things;
};

// Whether the two are the same file or directory.
[[nodiscard]] bool isSame(const Descriptor& one, const Descriptor& other);

}  // namespace platform
