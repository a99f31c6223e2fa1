#pragma once

#include <sys/inotify.h>

#include <string>
#include <string_view>
#include <vector>

#include "platform/file_system.h"
#include "platform/linux/files/descriptor.h"

namespace accounts {

// Tells when another file may stand at a path than before, or other bytes in it: by whatever happens in its directory,
// in each directory on the way to it, and in those to which links lead, all from one descriptor of the kernel's. It
// opens no file, so which links may be followed is for who does.
//
// What the kernel does not tell of: another volume that is mounted on the way, a file that is written through a hard
// link in another directory, and what happens in a directory on the way that the program may not list, until the
// directory in it is moved itself.
class PathNotices {
 public:
  // The path stands below the beginning, which is taken as given. Absolute links on the way begin at the root.
  PathNotices(const platform::Path& beginning, const platform::Path& root, const platform::Path& path);

  // Listens along the way as it is by now. False, with errno, where it does not lead to a directory of the file: then
  // it tells when the first thing that is missing comes. A change after this call is not missed.
  [[nodiscard]] bool follow();

  // Readable when there is something to take; not open, with errno, where the system does not let it.
  [[nodiscard]] const platform::Descriptor& descriptor() const { return _notices; }

  // What happened since it was asked last: to another file in the same directory, or to a name on the way, the file's
  // own included, so that the way is to be followed anew.
  enum class News : std::uint8_t { none, nearby, onTheWay };
  [[nodiscard]] News take();

 private:
  struct Stop {
    int watch;  // the kernel's number of the directory
    std::string name;
    bool isLast;
  };
  using Stops = std::vector<Stop>;
  [[nodiscard]] bool walk(Stops& stops) const;
  [[nodiscard]] News newsOf(const inotify_event& event, std::string_view name) const;

  platform::Path _beginning;
  platform::Path _root;
  platform::Path _below;
  platform::Descriptor _notices{::inotify_init1(IN_NONBLOCK | IN_CLOEXEC)};
  Stops _stops;
};

}  // namespace accounts
