#pragma once

#include <sys/types.h>

#include <filesystem>
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
  };
  // Both for what stands at the path, which a failure names.
  [[nodiscard]] Result<Owner> ownerOf(const std::filesystem::path& path, const std::string& user,
                                      const std::string& group) const;

 private:
  std::filesystem::path _root;
  PathResolver _paths;
};

// The number of one user, as AccountNames has it.
[[nodiscard]] ACCOUNT_EXPORT Result<uid_t> numberOfUser(const std::filesystem::path& systemRoot,
                                                        const std::string& name);

}  // namespace platform
