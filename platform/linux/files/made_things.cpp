#include "platform/linux/files/made_things.h"

namespace platform {
namespace {

constexpr std::size_t mostKept = 16;

}  // namespace

void MadeThings::remember(const std::filesystem::path& path, Descriptor thing) {
  const std::scoped_lock lock{_guard};
  if (_things.size() >= mostKept && !_things.contains(path)) _things.erase(_things.begin());
  _things.insert_or_assign(path, std::move(thing));
}

void MadeThings::makeRoomFor(const std::filesystem::path& path) { remember(path, {}); }

void MadeThings::forget(const std::filesystem::path& path) { static_cast<void>(take(path)); }

Descriptor MadeThings::take(const std::filesystem::path& path) {
  const std::scoped_lock lock{_guard};
  auto taken = _things.extract(path);
  return taken ? std::move(taken.mapped()) : Descriptor{};
}

bool isSame(const Descriptor& one, const Descriptor& other) {
  struct stat first {};
  struct stat second {};
  return ::fstat(one.number(), &first) == 0 && ::fstat(other.number(), &second) == 0 && first.st_dev == second.st_dev &&
         first.st_ino == second.st_ino;
}

}  // namespace platform
