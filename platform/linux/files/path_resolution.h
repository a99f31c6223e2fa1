#pragma once

#include <filesystem>
#include <vector>

#include "platform/linux/files/file_access.h"
#include "platform/linux/files/file_trees.h"
#include "platform/linux/files/path_walk.h"

namespace platform {

// Finds the directories that a path names: the one place where it is decided which links on the way are followed.
//
// A run may be root in directories in which others write, and whoever plants a link there must not lead it to what is
// not theirs. A symbolic link is followed where
// - its owner is root or the process's user, it lies in a directory of one of these, and nobody else can write there (a
//   sticky directory counts as one in which nobody else does); or
// - its owner also owns the directory, nobody else can write there, and it leads to what the same owner owns, through
//   directories that are that owner's or open to everybody.
// Every other link is refused (ELOOP), and where it leads is not looked at.
//
// A path begins at a base: the device's root, a directory that the caller named outside of it, or else the file
// system's root. Below the device's root an absolute link and ".." mean what they mean on the device, and never leave
// it. Another base is never left by ".." (EXDEV); absolute links in a directory of the device begin at the device's
// root.
class PathResolver {
 public:
  explicit PathResolver(const FileTrees& trees = {});

  // The path's place, its parent directory opened; what stands at the path itself is not looked at.
  [[nodiscard]] Place openParent(const std::filesystem::path& path) const;

  // The same for what the path leads to where a link stands at it.
  [[nodiscard]] Place openParentOfTarget(const std::filesystem::path& path) const;

 private:
  [[nodiscard]] const WalkBase& baseOf(const std::filesystem::path& path) const;

  std::vector<WalkBase> _bases;
};

}  // namespace platform
