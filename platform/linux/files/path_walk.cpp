#include "platform/linux/files/path_walk.h"

#include <fcntl.h>

#include <array>
#include <cerrno>
#include <climits>

namespace platform {
namespace {

constexpr int mostLinks = 40;
constexpr mode_t writableByOthers = S_IWGRP | S_IWOTH;

bool fail(int cause) {
  errno = cause;
  return false;
}

bool isOurs(uid_t owner) { return owner == 0 || owner == ::geteuid(); }

bool isClosedToOthers(const struct stat& directory) {
  return (directory.st_mode & writableByOthers) == 0 || (directory.st_mode & S_ISVTX) != 0;
}

}  // namespace

Descriptor PathWalk::openDirectory(const std::filesystem::path& below) {
  if (!walk(below)) return {};
  if (_leaf == ".") return std::move(_directories.back());
  if (!_target.descriptor.isOpen()) {
    errno = ENOENT;
    return {};
  }
  if (!S_ISDIR(_target.status.st_mode)) {
    errno = ENOTDIR;
    return {};
  }
  return std::move(_target.descriptor);
}

Place PathWalk::openParentOfTarget(const std::filesystem::path& below) {
  if (!walk(below)) return {};
  return {std::move(_directories.back()), _leaf};
}

bool PathWalk::walk(const std::filesystem::path& below) {
  _isUnderRoot = _base.path == _base.root;
  putAhead(below);
  if (!startAt(_base.path)) return false;
  for (bool isAtEnd = _ahead.empty(); !isAtEnd;) {
    if (!step(isAtEnd)) return false;
  }
  return isOfLinksOwner() || fail(ELOOP);
}

bool PathWalk::step(bool& isAtEnd) {
  const std::string name = std::move(_ahead.back());
  _ahead.pop_back();
  isAtEnd = _ahead.empty();
  _leaf.assign(1, '.');
  if (name == ".") return true;
  if (name == "..") return goUp();
  Thing thing = look(name);
  const bool isThere = thing.descriptor.isOpen();
  if (!isThere && (errno != ENOENT || !isAtEnd)) return false;
  if (isThere && S_ISLNK(thing.status.st_mode)) {
    if (!follow(thing)) return false;
    isAtEnd = _ahead.empty();
    return true;
  }
  if (!isAtEnd) return enter(std::move(thing));
  _leaf = name;
  _target = std::move(thing);
  return true;
}

PathWalk::Thing PathWalk::look(const std::string& name) const {
  constexpr int flags = O_PATH | O_NOFOLLOW | O_CLOEXEC;
  Thing thing;
  thing.descriptor = Descriptor{::openat(_directories.back().number(), name.c_str(), flags)};
  if (thing.descriptor.isOpen() && ::fstat(thing.descriptor.number(), &thing.status) != 0) return {};
  return thing;
}

bool PathWalk::enter(Thing thing) {
  if (!S_ISDIR(thing.status.st_mode)) return fail(ENOTDIR);
  const bool isOpenToAll = (thing.status.st_mode & S_IXOTH) != 0;
  if (_linksOwner && thing.status.st_uid != *_linksOwner && !isOpenToAll) return fail(ELOOP);
  _directories.push_back(std::move(thing.descriptor));
  return true;
}

bool PathWalk::goUp() {
  if (_directories.size() == 1) return _isUnderRoot || fail(EXDEV);
  _directories.pop_back();
  return true;
}

bool PathWalk::follow(const Thing& link) {
  if (++_links > mostLinks || !mayFollow(link.status)) return fail(ELOOP);
  std::array<char, PATH_MAX> text{};
  const ssize_t size = ::readlinkat(link.descriptor.number(), "", text.data(), text.size());
  if (size <= 0) return size < 0 ? false : fail(ENOENT);
  const std::filesystem::path target{std::string{text.data(), static_cast<std::size_t>(size)}};
  putAhead(target.relative_path());
  if (!target.is_absolute()) return true;
  _isUnderRoot = true;
  return startAt(_base.root);
}

bool PathWalk::startAt(const std::filesystem::path& directory) {
  _directories.clear();
  _directories.emplace_back(::open(directory.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
  return _directories.back().isOpen();
}

void PathWalk::putAhead(const std::filesystem::path& names) {
  const std::vector<std::filesystem::path> all{names.begin(), names.end()};
  for (auto name = all.rbegin(); name != all.rend(); ++name) _ahead.push_back(name->empty() ? "." : name->string());
}

bool PathWalk::mayFollow(const struct stat& link) {
  struct stat holder {};
  if (::fstat(_directories.back().number(), &holder) != 0 || !isClosedToOthers(holder)) return false;
  if (isOurs(link.st_uid) && isOurs(holder.st_uid)) return true;
  if (link.st_uid != holder.st_uid || (_linksOwner && *_linksOwner != link.st_uid)) return false;
  _linksOwner = link.st_uid;
  return true;
}

// What is not there yet would be made in the directory, which then is what must be the owner's.
bool PathWalk::isOfLinksOwner() const {
  if (!_linksOwner) return true;
  struct stat status = _target.status;
  const bool isThere = _leaf != "." && _target.descriptor.isOpen();
  if (!isThere && ::fstat(_directories.back().number(), &status) != 0) return false;
  return status.st_uid == *_linksOwner;
}

}  // namespace platform
