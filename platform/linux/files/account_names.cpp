#include "platform/linux/files/account_names.h"

#include <grp.h>
#include <pwd.h>

#include <array>
#include <cerrno>
#include <cstdio>
#include <memory>

namespace platform {
namespace {

// A name that stands behind a longer entry (a group with very many members) is not found.
constexpr std::size_t entryLimit = std::size_t{1} << 20;

// Room for the texts of an entry: little, and where that does not do, as much as an entry may take.
class Room {
 public:
  // Asks again with more room where there was too little; answers what the last asking answered.
  template <typename Question>
  int ask(const Question& question) {
    const int error = question(_data, _size);
    if (error != ERANGE || _large != nullptr) return error;
    _large = std::make_unique_for_overwrite<char[]>(entryLimit);
    _data = _large.get();
    _size = entryLimit;
    return question(_data, _size);
  }

 private:
  std::array<char, 1024> _small;
  std::unique_ptr<char[]> _large;
  char* _data = _small.data();
  std::size_t _size = _small.size();
};

// `error` is 0 where everything was read and the name was not there.
Status notFound(int error, const std::string& name, const std::string& purpose = {}) {
  return Status::failure(error == 0 ? ENOENT : error, "find the account " + name + purpose);
}

using File = std::unique_ptr<std::FILE, int (*)(std::FILE*)>;

File openTable(const Place& place) {
  Descriptor table = place.parent.isOpen() ? openOwnFile(place) : Descriptor{};
  std::FILE* const file = table.isOpen() ? ::fdopen(table.number(), "re") : nullptr;
  if (file != nullptr) static_cast<void>(table.release());
  return {file, &std::fclose};
}

Result<uid_t> userInTable(const Place& place, const std::string& name) {
  const File table = openTable(place);
  if (!table) return notFound(errno, name);
  Room room;
  passwd entry{};
  passwd* found = nullptr;
  const auto next = [&](char* data, std::size_t size) {
    return ::fgetpwent_r(table.get(), &entry, data, size, &found);
  };
  while (room.ask(next) == 0) {
    if (name == found->pw_name) return found->pw_uid;
  }
  return notFound(0, name);
}

Result<gid_t> groupInTable(const Place& place, const std::string& name) {
  const File table = openTable(place);
  if (!table) return notFound(errno, name);
  Room room;
  struct group entry {};
  struct group* found = nullptr;
  const auto next = [&](char* data, std::size_t size) {
    return ::fgetgrent_r(table.get(), &entry, data, size, &found);
  };
  while (room.ask(next) == 0) {
    if (name == found->gr_name) return found->gr_gid;
  }
  return notFound(0, name);
}

}  // namespace

Result<uid_t> AccountNames::user(const std::string& name) const {
  if (_root != "/") return userInTable(_paths.openParentOfTarget(_root / "etc/passwd"), name);
  Room room;
  passwd entry{};
  passwd* found = nullptr;
  const int error =
      room.ask([&](char* data, std::size_t size) { return ::getpwnam_r(name.c_str(), &entry, data, size, &found); });
  return found == nullptr ? Result<uid_t>{notFound(error, name)} : found->pw_uid;
}

Result<gid_t> AccountNames::group(const std::string& name) const {
  if (_root != "/") return groupInTable(_paths.openParentOfTarget(_root / "etc/group"), name);
  Room room;
  struct group entry {};
  struct group* found = nullptr;
  const int error =
      room.ask([&](char* data, std::size_t size) { return ::getgrnam_r(name.c_str(), &entry, data, size, &found); });
  return found == nullptr ? Result<gid_t>{notFound(error, name)} : found->gr_gid;
}

Result<AccountNames::Owner> AccountNames::ownerOf(const std::filesystem::path& path, const std::string& user,
                                                  const std::string& group) const {
  const std::string purpose = " for " + path.string();
  const Result<uid_t> userNumber = this->user(user);
  if (!userNumber.isOk()) return notFound(userNumber.status().errorNumber(), user, purpose);
  const Result<gid_t> groupNumber = this->group(group);
  if (!groupNumber.isOk()) return notFound(groupNumber.status().errorNumber(), group, purpose);
  return Owner{userNumber.value(), groupNumber.value()};
}

}  // namespace platform
