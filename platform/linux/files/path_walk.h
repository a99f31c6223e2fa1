#pragma once

#include <sys/stat.h>

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

#include "platform/linux/files/file_access.h"

namespace platform {

// Where a walk begins. How the base itself is reached is the caller's own word and is followed as it is.
struct WalkBase {
  std::filesystem::path path;
  std::filesystem::path root;  // where absolute links begin
};

// One way down from a base, a name at a time, on opened directories: nothing that is moved or replaced meanwhile
// changes what was judged. Links are followed by the rule of PathResolver. Everything fails with errno set.
class PathWalk {
 public:
  explicit PathWalk(const WalkBase& base) : _base{base} {}

  // The directory that the path, relative to the base, leads to, opened for the *at calls.
  [[nodiscard]] Descriptor openDirectory(const std::filesystem::path& below);

  // The place of what the path leads to, which is no link; nothing need stand there.
  [[nodiscard]] Place openParentOfTarget(const std::filesystem::path& below);

 private:
  // What stands at a name; not open where nothing does.
  struct Thing {
    Descriptor descriptor;
    struct stat status {};
  };

  bool walk(const std::filesystem::path& below);
  bool step(bool& isAtEnd);
  bool enter(Thing thing);
  bool goUp();
  bool follow(const Thing& link);
  bool startAt(const std::filesystem::path& directory);
  void putAhead(const std::filesystem::path& names);
  [[nodiscard]] Thing look(const std::string& name) const;
  [[nodiscard]] bool isOfLinksOwner() const;
  bool mayFollow(const struct stat& link);

  const WalkBase& _base;
  std::vector<Descriptor> _directories;  // from the beginning down
  std::vector<std::string> _ahead;       // the names still to come, the next one last
  bool _isUnderRoot = false;             // ".." of the first directory is itself
  std::string _leaf = ".";               // the end of the walk in the last directory, "." for that itself
  Thing _target;                         // what stands there
  std::optional<uid_t> _linksOwner;      // the user whose link was followed, and whose the target must be
  int _links = 0;
};

}  // namespace platform
