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
constexpr std::size_t kMaxEntrySize = std::size_t{1} << 20;
constexpr std::size_t kMaxTableSize = std::size_t{1} << 26;

// Room for the texts of an entry: little, and where that does not do, as much as an entry may take.
class Room {
 public:
  // Asks again with more room where there was too little; answers what the last asking answered.
  template <typename Question>
  int ask(const Question& question) {
    const int error = question(_data, _size);
    if (error != ERANGE || _large != nullptr) return error;
    _large = std::make_unique_for_overwrite<char[]>(kMaxEntrySize);
    _data = _large.get();
    _size = kMaxEntrySize;
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

// The number behind a name in a table of the tree, which `next` reads an entry at a time.
template <typename Entry, typename Number>
Result<Number> numberInTable(const PathResolver& paths, const std::filesystem::path& path, const std::string& name,
                             char* Entry::*nameOf, Number Entry::*numberOf,
                             int (*next)(std::FILE*, Entry*, char*, std::size_t, Entry**)) {
  struct stat opened {};
  const Descriptor file = paths.openFile(path, opened);
  Bytes bytes;
  if (!file.isOpen() || !readUpTo(file.number(), opened, kMaxTableSize, bytes)) return notFound(errno, name);
  const std::unique_ptr<std::FILE, int (*)(std::FILE*)> table{::fmemopen(bytes.data(), bytes.size(), "r"),
                                                              &std::fclose};
  if (!table) return notFound(errno, name);
  Room room;
  Entry entry{};
  Entry* found = nullptr;
  const auto read = [&](char* data, std::size_t size) { return next(table.get(), &entry, data, size, &found); };
  while (room.ask(read) == 0) {
    if (name == found->*nameOf) return found->*numberOf;
  }
  return notFound(0, name);
}

// The same as the name services of the running system, which `find` asks, know it.
template <typename Entry, typename Number>
Result<Number> numberInSystem(const std::string& name, Number Entry::*numberOf,
                              int (*find)(const char*, Entry*, char*, std::size_t, Entry**)) {
  Room room;
  Entry entry{};
  Entry* found = nullptr;
  const int error =
      room.ask([&](char* data, std::size_t size) { return find(name.c_str(), &entry, data, size, &found); });
  return found == nullptr ? Result<Number>{notFound(error, name)} : found->*numberOf;
}

}  // namespace

Result<uid_t> AccountNames::user(const std::string& name) const {
  if (_root == "/") return numberInSystem(name, &passwd::pw_uid, &::getpwnam_r);
  return numberInTable(_paths, _root / "etc/passwd", name, &passwd::pw_name, &passwd::pw_uid, &::fgetpwent_r);
}

Result<gid_t> AccountNames::group(const std::string& name) const {
  if (_root == "/") return numberInSystem(name, &::group::gr_gid, &::getgrnam_r);
  return numberInTable(_paths, _root / "etc/group", name, &::group::gr_name, &::group::gr_gid, &::fgetgrent_r);
}

Result<AccountNames::Owner> AccountNames::ownerOf(const std::filesystem::path& path, const std::string& user,
                                                  const std::string& group) const {
  constexpr std::chrono::seconds kBelieved{1};
  const Clock::time_point now = Clock::now();
  const std::scoped_lock lock{_guard};
  const bool isKnown = _lastFinding && _lastFinding->user == user && _lastFinding->group == group;
  if (isKnown && now - _lastFinding->time < kBelieved) return _lastFinding->owner;
  const std::string purpose = " for " + path.string();
  const Result<uid_t> userNumber = this->user(user);
  if (!userNumber.isOk()) return notFound(userNumber.status().errorNumber(), user, purpose);
  const Result<gid_t> groupNumber = this->group(group);
  if (!groupNumber.isOk()) return notFound(groupNumber.status().errorNumber(), group, purpose);
  _lastFinding = {user, group, {userNumber.value(), groupNumber.value()}, now};
  return _lastFinding->owner;
}

Result<uid_t> numberOfUser(const std::filesystem::path& systemRoot, const std::string& name) {
  return AccountNames{systemRoot}.user(name);
}

}  // namespace platform
