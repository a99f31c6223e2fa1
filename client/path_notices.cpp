#include "client/path_notices.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <deque>
#include <filesystem>
#include <utility>

namespace accounts {
namespace {

using platform::Path;

// What is written in place comes with IN_CLOSE_WRITE, a hard link with IN_CREATE, every save with IN_MOVED_TO.
constexpr std::uint32_t kEntries = IN_MOVED_FROM | IN_MOVED_TO | IN_CREATE | IN_DELETE | IN_CLOSE_WRITE;
constexpr std::uint32_t kGone = IN_MOVE_SELF | IN_DELETE_SELF;
constexpr std::uint32_t kEnded = IN_IGNORED | IN_UNMOUNT;
constexpr int kMaxLinks = 40;

Path withoutSlash(const Path& directory) { return directory.has_filename() ? directory : directory.parent_path(); }

}  // namespace

PathNotices::PathNotices(const Path& beginning, const Path& root, const Path& path)
    : _beginning{withoutSlash(beginning)}, _root{withoutSlash(root)}, _below{path.lexically_relative(_beginning)} {}

bool PathNotices::follow() {
  Stops stops;
  const bool isWhole = walk(stops);
  const int cause = errno;
  _stops.swap(stops);
  for (const Stop& past : stops) {
    const bool isOn = std::ranges::any_of(_stops, [&](const Stop& stop) { return stop.watch == past.watch; });
    if (!isOn) ::inotify_rm_watch(_notices.number(), past.watch);
  }
  errno = cause;
  return isWhole;
}

// Each directory is listened to before its entry is looked at, so what changes in between is told of.
bool PathNotices::walk(Stops& stops) const {
  Path directory = _beginning;
  std::deque<Path> ahead{_below.begin(), _below.end()};
  for (int links = 0; !ahead.empty();) {
    const Path name = std::move(ahead.front());
    ahead.pop_front();
    if (name.empty() || name == ".") continue;
    if (name == "..") {
      if (directory != _root && directory != _beginning) directory = directory.parent_path();
      continue;
    }
    const int watch = ::inotify_add_watch(_notices.number(), directory.c_str(), kEntries | kGone | IN_ONLYDIR);
    if (watch >= 0) stops.push_back({watch, name.string(), ahead.empty()});
    if (watch < 0 && (errno != EACCES || ahead.empty())) return false;
    std::error_code isNoLink;
    const Path target = std::filesystem::read_symlink(directory / name, isNoLink);
    if (isNoLink) {
      directory /= name;
      continue;
    }
    if (++links > kMaxLinks) return errno = ELOOP, false;
    if (target.is_absolute()) directory = _root;
    const Path names = target.relative_path();
    ahead.insert(ahead.begin(), names.begin(), names.end());
  }
  return true;
}

PathNotices::News PathNotices::take() {
  alignas(inotify_event) std::array<char, 4096> buffer{};
  News news = News::none;
  for (ssize_t size = 0; (size = ::read(_notices.number(), buffer.data(), buffer.size())) > 0;) {
    for (ssize_t place = 0; place < size;) {
      inotify_event event{};
      std::memcpy(&event, buffer.data() + place, sizeof event);
      place += static_cast<ssize_t>(sizeof event);
      news = std::max(news, newsOf(event, event.len == 0 ? "" : buffer.data() + place));
      place += event.len;
    }
  }
  return news;
}

PathNotices::News PathNotices::newsOf(const inotify_event& event, std::string_view name) const {
  if ((event.mask & IN_Q_OVERFLOW) != 0) return News::onTheWay;
  News news = News::none;
  for (const Stop& stop : _stops) {
    if (stop.watch != event.wd) continue;
    if (stop.name == name || (event.mask & (kGone | kEnded)) != 0) return News::onTheWay;
    if (stop.isLast) news = News::nearby;
  }
  return news;
}

}  // namespace accounts
