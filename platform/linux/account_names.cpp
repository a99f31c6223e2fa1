#include "platform/linux/account_names.h"

#include <grp.h>
#include <pwd.h>

#include <cerrno>
#include <cstdio>
#include <memory>

namespace platform {
namespace {

// A name that stands behind a longer entry (a group with very many members) is not found.
constexpr std::size_t entryLimit = std::size_t{1} << 20;

// Left as it comes: an entry takes a few bytes of it, and the rest is never touched.
std::unique_ptr<char[]> roomForAnEntry() { return std::make_unique_for_overwrite<char[]>(entryLimit); }

using File = std::unique_ptr<std::FILE, int (*)(std::FILE*)>;

File openTable(const Place& place) {
  Descriptor table = place.parent.isOpen() ? openOwnFile(place) : Descriptor{};
  std::FILE* const file = table.isOpen() ? ::fdopen(table.number(), "re") : nullptr;
  if (file != nullptr) static_cast<void>(table.release());
  return {file, &std::fclose};
}

std::optional<uid_t> userInTable(const Place& place, const std::string& name) {
  const File table = openTable(place);
  if (!table) return std::nullopt;
  const auto buffer = roomForAnEntry();
  passwd entry{};
  passwd* found = nullptr;
  while (::fgetpwent_r(table.get(), &entry, buffer.get(), entryLimit, &found) == 0) {
    if (name == found->pw_name) return found->pw_uid;
  }
  return std::nullopt;
}

std::optional<gid_t> groupInTable(const Place& place, const std::string& name) {
  const File table = openTable(place);
  if (!table) return std::nullopt;
  const auto buffer = roomForAnEntry();
  struct group entry {};
  struct group* found = nullptr;
  while (::fgetgrent_r(table.get(), &entry, buffer.get(), entryLimit, &found) == 0) {
    if (name == found->gr_name) return found->gr_gid;
  }
  return std::nullopt;
}

}  // namespace

std::optional<uid_t> AccountNames::user(const std::string& name) const {
  if (_root != "/") return userInTable(_paths.openParentOfTarget(_root / "etc/passwd"), name);
  const auto buffer = roomForAnEntry();
  passwd entry{};
  passwd* found = nullptr;
  ::getpwnam_r(name.c_str(), &entry, buffer.get(), entryLimit, &found);
  return found == nullptr ? std::nullopt : std::optional{found->pw_uid};
}

std::optional<gid_t> AccountNames::group(const std::string& name) const {
  if (_root != "/") return groupInTable(_paths.openParentOfTarget(_root / "etc/group"), name);
  const auto buffer = roomForAnEntry();
  struct group entry {};
  struct group* found = nullptr;
  ::getgrnam_r(name.c_str(), &entry, buffer.get(), entryLimit, &found);
  return found == nullptr ? std::nullopt : std::optional{found->gr_gid};
}

}  // namespace platform
