#pragma once

#include <filesystem>
#include <optional>
#include <string_view>
#include <vector>

#include "platform/base_directories.h"
#include "platform/linux/files/file_access.h"
#include "platform/linux/files/overlay.h"

namespace platform {

// Where a device's files lie. Paths outside of them are taken from the file system's root on.
struct FileTrees {
  std::filesystem::path systemRoot = "/";
  std::vector<std::filesystem::path> ofDevice = {};   // directories of the device that may lie outside of its root
  std::vector<std::filesystem::path> ofMachine = {};  // directories of the system that the program runs on
};

[[nodiscard]] inline FileTrees treesOf(const BaseDirectories& directories) {
  return {.systemRoot = directories.systemRoot(),
          .ofDevice = {directories.home(), directories.sharedResources()},
          .ofMachine = {directories.resources()}};
}

// What stands at a name: nothing where its mode is 0.
struct Entry {
  // Of a directory, for the *at calls; of one that only a rehearsal has, the innermost device directory above. What a
  // path leads to need not be opened.
  Descriptor descriptor{};
  struct stat status {};
  const Overlay::Node* node = nullptr;  // set where a rehearsal says what stands there

  [[nodiscard]] bool isThere() const { return status.st_mode != 0; }
};

// Where a path leads: a directory, a name in it ("." for the directory itself), and what stands there.
struct Spot {
  Entry directory;
  std::string leaf;
  Entry entry;
};

// Finds the directories that a path names: the one place where links on the way are followed, by the rule of
// planting.h. What that refuses is ELOOP, and where it leads is not looked at.
//
// A path begins at a base: the device's root, a directory that the caller named outside of it, or else the file
// system's root; how the base itself is reached is the caller's own word. Below the device's root an absolute link and
// ".." mean what they mean on the device, and never leave it. Another base is never left by ".." (EXDEV); absolute
// links in a directory of the device begin at the device's root.
//
// A rehearsal's overlay stands in front of the device at every step of the way.
class PathResolver {
 public:
  explicit PathResolver(const FileTrees& trees = {}, const Overlay* overlay = nullptr);

  // The path's place on the device, its parent directory opened; what stands at the path itself is not looked at.
  [[nodiscard]] Place openParent(const std::filesystem::path& path) const { return openParent(path, false); }

  // The same for changes that are to be synced.
  [[nodiscard]] Place openParentToChange(const std::filesystem::path& path) const { return openParent(path, true); }

  // The same for what the path leads to where a link stands at it.
  [[nodiscard]] Place openParentOfTarget(const std::filesystem::path& path) const;

  // Where the path leads, with a link at its end taken as itself, or followed; nothing, with errno set, where its
  // parent cannot be entered. Where nothing stands, the entry is not there, and that is no failure.
  [[nodiscard]] std::optional<Spot> find(const std::filesystem::path& path) const;
  [[nodiscard]] std::optional<Spot> findTarget(const std::filesystem::path& path) const;

  // What the path leads to on the device as an O_PATH descriptor, in one call of the kernel. Not open, with errno
  // ELOOP, where a link, an oddity of the path's writing, or a name that a rehearsal changed stands in the way; the
  // calls above then know more.
  [[nodiscard]] Descriptor openPlain(const std::filesystem::path& path) const;

  // The same of the path's place; what stands at the path itself is not looked at, but is as on the device.
  [[nodiscard]] Place openParentOfUnchanged(const std::filesystem::path& path) const;

  // The regular file that the path leads to, for reading, as openOwnFile has it.
  [[nodiscard]] Descriptor openFile(const std::filesystem::path& path, struct stat& opened) const;

  struct Base {
    std::filesystem::path path;
    std::filesystem::path root;  // where absolute links begin
  };

 private:
  [[nodiscard]] Place openParent(const std::filesystem::path& path, bool isToSync) const;
  [[nodiscard]] const Base& baseOf(const std::filesystem::path& path) const;
  [[nodiscard]] bool isBase(const std::filesystem::path& path) const;
  [[nodiscard]] bool isAsOnDevice(std::string_view path) const;  // whether a rehearsal changed none of its names

  std::vector<Base> _bases;
  const Overlay* _overlay;
};

}  // namespace platform
