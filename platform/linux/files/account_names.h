#pragma once

#include <sys/types.h>

#include <chrono>
#include <filesystem>
#include <mutex>
#include <optional>
#include <string>

#include "platform/export.h"
#include "platform/linux/files/path_resolution.h"
#include "platform/status.h"

namespace platform {

// The numbers behind account names on a device: on the running system as its name services know them, in a file tree
// elsewhere by that tree's own etc/passwd and etc/group.
class AccountNames {
 public:
  explicit AccountNames(std::filesystem::path systemRoot)
      : _root{std::move(systemRoot)}, _paths{FileTrees{.systemRoot = _root}} {}

  // ENOENT where there is no such name; another error where the names cannot be read.
  [[nodiscard]] Result<uid_t> user(const std::string& name) const;
  [[nodiscard]] Result<gid_t> group(const std::string& name) const;

  struct Owner {
    uid_t user;
    gid_t group;

    bool operator==(const Owner&) const = default;
  };
  // Both for what stands at the path, which a failure names. What was found is believed for a second, since
  // each save asks for the same two. For any number of threads.
  [[nodiscard]] Result<Owner> ownerOf(const std::filesystem::path& path, const std::string& user,
                                      const std::string& group) const;

 private:
  using Clock = std::chrono::steady_clock;

  struct Finding {
    std::string user;
    std::string group;
    Owner owner;
    Clock::time_point time;
  };

  std::filesystem::path _root;
  PathResolver _paths;
  mutable std::mutex _guard;
  mutable std::optional<Finding> _lastFinding;
};

// The number of one user, as AccountNames has it.
[[nodiscard]] ACCOUNT_EXPORT Result<uid_t> numberOfUser(const std::filesystem::path& systemRoot,
                                                        const std::string& name);

}  // namespace platform
