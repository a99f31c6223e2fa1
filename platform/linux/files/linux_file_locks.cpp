#include "platform/linux/files/file_services.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/file.h>
#include <sys/inotify.h>
#include <sys/sysmacros.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdio>
#include <fstream>
#include <mutex>
#include <sstream>
#include <vector>

#include "platform/linux/files/account_names.h"
#include "platform/linux/files/directory_trees.h"

namespace platform {
namespace {

using std::chrono::milliseconds;
using std::chrono::steady_clock;

constexpr mode_t kReadableByAll = 0644;
constexpr unsigned kOpenToAll = 01777;
constexpr milliseconds kLongWait{1000};
constexpr milliseconds kShortestPause{1};
constexpr milliseconds kLongestPause{100};
constexpr milliseconds kBetweenTries{10};  // where the kernel tells of nothing
// The file may come and go between two steps only if somebody plays with it; then there is no lock to be had.
constexpr int kAttempts = 100;

Descriptor makeLockFile(const Place& place) {
  constexpr int kFlags = O_RDONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC;
  Descriptor file{::openat(place.parent.number(), place.leaf.c_str(), kFlags, kReadableByAll)};
  if (file.isOpen()) ::fchmod(file.number(), kReadableByAll);
  return file;
}

// Whether a step met what it does where somebody exchanged the entry since it was looked at.
bool meansExchanged(int cause) {
  constexpr std::array kCauses{ENOENT, ENOTDIR, EISDIR, ENOTEMPTY, ELOOP, EINVAL, EAGAIN};
  return std::ranges::find(kCauses, cause) != kCauses.end();
}

// As the kernel names it in its list of locks.
std::string deviceAndNode(const struct stat& file) {
  std::array<char, 64> text{};
  std::snprintf(text.data(), text.size(), "%02x:%02x:%ju", ::major(file.st_dev), ::minor(file.st_dev),
                static_cast<std::uintmax_t>(file.st_ino));
  return text.data();
}

// Who holds the lock of the file, as far as the kernel tells it to this process.
std::string holderOf(const Descriptor& file) {
  struct stat status {};
  if (::fstat(file.number(), &status) != 0) return "another process";
  std::ifstream locks{"/proc/locks"};
  std::string line;
  while (std::getline(locks, line)) {
    std::istringstream words{line};
    std::string number;
    std::string kind;
    std::string manner;
    std::string access;
    std::string process;
    std::string node;
    words >> number >> kind >> manner >> access >> process >> node;
    if (kind != "FLOCK" || node != deviceAndNode(status)) continue;
    std::ifstream names{"/proc/" + process + "/comm"};
    std::string name;
    std::getline(names, name);
    return "process " + process + (name.empty() ? name : " (" + name + ")");
  }
  return "another process";
}

// The file at the lock's name: found, made, or put in the place of what somebody else may have put there.
class LockFile {
 public:
  LockFile(const FileLockOptions& options, std::string_view name)
      : _options{options}, _path{options.directory / name}, _paths{options.trees} {}

  [[nodiscard]] const std::filesystem::path& path() const { return _path; }
  [[nodiscard]] const Descriptor& descriptor() const { return _file; }
  // Where it is not open without a failure, there is none, and none is to be made.
  [[nodiscard]] bool isOpen() const { return _file.isOpen(); }

  bool open() {
    _file = {};
    _place = _paths.openParent(_path);
    if (!_place.parent.isOpen() && errno == ENOENT) {
      if (isShared()) return true;
      const bool isThere = makeDirectories(_paths, _options.directory, kOpenToAll).has_value();
      if (!isThere && errno != EEXIST) return false;  // somebody else may have made it meanwhile
      _place = _paths.openParent(_path);
    }
    for (int attempt = 0; _place.parent.isOpen() && attempt < kAttempts; ++attempt) {
      if (tryToOpen()) return true;
      if (errno != EAGAIN) return false;
    }
    return false;
  }

  // Whether the file that was opened still stands at the name.
  [[nodiscard]] bool isAtItsPlace() const {
    struct stat opened {};
    struct stat present {};
    return ::fstat(_file.number(), &opened) == 0 &&
           ::fstatat(_place.parent.number(), _place.leaf.c_str(), &present, AT_SYMLINK_NOFOLLOW) == 0 &&
           opened.st_dev == present.st_dev && opened.st_ino == present.st_ino;
  }

  [[nodiscard]] bool isShared() const { return _options.manner.isShared; }
  [[nodiscard]] const std::optional<milliseconds>& timeLimit() const { return _options.manner.timeLimit; }
  void say(const std::string& line) const { _options.say(line); }

 private:
  // Answers false with errno EAGAIN where somebody was quicker. An existing file is opened without O_CREAT: in a sticky
  // directory the kernel may refuse that flag for a file of another owner.
  bool tryToOpen() {
    struct stat status {};
    if (::fstatat(_place.parent.number(), _place.leaf.c_str(), &status, AT_SYMLINK_NOFOLLOW) != 0) {
      if (errno != ENOENT) return false;
      if (isShared()) return true;
      _file = makeLockFile(_place);
      return _file.isOpen() || isToBeTriedAgain(errno == EEXIST);
    }
    const bool isRoot = ::geteuid() == 0;
    const std::string flaw = isRoot ? flawOf(status) : std::string{};
    if (!flaw.empty()) return isShared() || (replace(flaw) && isToBeTriedAgain(true));
    _file = openRegularFile(_place, status);
    if (!_file.isOpen()) return isToBeTriedAgain(isRoot ? meansExchanged(errno) : errno == ENOENT);
    return !isRoot || flawOf(status).empty() || isToBeTriedAgain(true);
  }

  static bool isToBeTriedAgain(bool isSo) { return isSo && failWith(EAGAIN); }

  // Why somebody else may have put it there.
  [[nodiscard]] std::string flawOf(const struct stat& status) const {
    if (S_ISLNK(status.st_mode)) return "it was a link";
    if (S_ISDIR(status.st_mode)) return "it was a directory";
    if (!S_ISREG(status.st_mode)) return "it was no regular file";
    if (status.st_nlink > 1) return "it had a second name";
    if (status.st_uid == 0) return {};
    const Result<uid_t> mobile = numberOfUser(_options.trees.systemRoot, "mobile");
    if (mobile.isOk() && mobile.value() == status.st_uid) return {};
    return "it belonged to the user " + std::to_string(status.st_uid);
  }

  bool replace(const std::string& flaw) {
    if (!removeTree(_place) && !meansExchanged(errno)) return false;
    if (!std::exchange(_hasSaidReplacement, true)) {
      say("the lock file " + _path.string() + " was replaced, since " + flaw);
    }
    return true;
  }

  FileLockOptions _options;
  std::filesystem::path _path;
  PathResolver _paths;
  Place _place;
  Descriptor _file;
  bool _hasSaidReplacement = false;
};

// Descriptors on which the kernel tells what becomes of files. Those that nobody uses are kept: the kernel takes
// milliseconds to close one, in which whoever got a lock would only hold it.
class Notices {
 public:
  // Not open where there is none to be had.
  static Descriptor take() {
    Notices& kept = ofThisProcess();
    const std::scoped_lock lock{kept._guard};
    const bool isForked = std::exchange(kept._process, ::getpid()) != ::getpid();
    if (isForked) kept._idle.clear();  // they are the parent's
    if (kept._idle.empty()) return Descriptor{::inotify_init1(IN_NONBLOCK | IN_CLOEXEC)};
    Descriptor notices = std::move(kept._idle.back());
    kept._idle.pop_back();
    return notices;
  }

  static void giveBack(Descriptor notices) {
    Notices& kept = ofThisProcess();
    const std::scoped_lock lock{kept._guard};
    kept._idle.push_back(std::move(notices));
  }

 private:
  static Notices& ofThisProcess() {
    static Notices& kept = *new Notices;  // destructors of globals may wait for locks
    return kept;
  }

  std::mutex _guard;
  pid_t _process = ::getpid();
  std::vector<Descriptor> _idle;
};

// Lets who waits sleep until there may be a lock to be had. Whoever gives one back closes the file, which the kernel
// tells; of who gives it back otherwise it tells nothing, and of who dies a moment early, so there is a next try
// anyway.
class Closings {
 public:
  explicit Closings(const Descriptor& file) : _notices{Notices::take()} {
    const std::string path = "/proc/self/fd/" + std::to_string(file.number());
    constexpr std::uint32_t kWatched = IN_CLOSE | IN_ATTRIB | IN_DELETE_SELF | IN_MOVE_SELF;
    if (_notices.isOpen()) _watch = ::inotify_add_watch(_notices.number(), path.c_str(), kWatched);
  }
  Closings(const Closings&) = delete;
  Closings& operator=(const Closings&) = delete;
  ~Closings() {
    if (_watch >= 0) ::inotify_rm_watch(_notices.number(), _watch);
    readAll();
    if (_notices.isOpen()) Notices::giveBack(std::move(_notices));
  }

  void await(milliseconds atMost) {
    pollfd notice{_notices.number(), POLLIN, 0};
    const bool isTold = _watch >= 0;
    const milliseconds pause = std::min(isTold ? _pause : kBetweenTries, atMost);
    const bool isClosed = ::poll(&notice, isTold ? 1 : 0, static_cast<int>(pause.count())) > 0;
    _pause = isClosed ? kShortestPause : std::min(2 * _pause, kLongestPause);
    if (isClosed) readAll();
  }

 private:
  void readAll() {
    std::array<char, 4096> ignored{};
    while (::read(_notices.number(), ignored.data(), ignored.size()) > 0) continue;
  }

  Descriptor _notices;
  int _watch = -1;
  milliseconds _pause = kShortestPause;
};

class LinuxFileLock final : public ExclusiveFileLock {
 public:
  explicit LinuxFileLock(LockFile file) : _file{std::move(file)} {}
  LinuxFileLock(const LinuxFileLock&) = delete;
  LinuxFileLock& operator=(const LinuxFileLock&) = delete;
  ~LinuxFileLock() override { LinuxFileLock::unlock(); }  // before the closing that others are told of

  // A file that was removed or replaced meanwhile locks nobody out, so the one that now stands there is tried.
  Status lock() override {
    const auto began = steady_clock::now();
    bool hasSaid = false;
    std::optional<Closings> closings;
    for (int replaced = 0; replaced < kAttempts;) {
      if (!_file.isOpen()) return {};
      const bool isTaken = tryToTake();
      if (!isTaken && errno != EWOULDBLOCK && errno != EINTR) return failureOf("take the lock", _file.path());
      if (!_file.isAtItsPlace()) {
        ++replaced;
        closings.reset();
        if (!_file.open()) return failureOf("open the lock file", _file.path());
        continue;
      }
      if (isTaken) return {};
      const auto waited = steady_clock::now() - began;
      if (_file.timeLimit() && waited >= *_file.timeLimit()) return timedOut();
      if (waited >= kLongWait && !std::exchange(hasSaid, true)) _file.say("waiting for " + holder());
      // What was given back before anybody listened is found by the next try.
      closings ? closings->await(remaining(waited)) : static_cast<void>(closings.emplace(_file.descriptor()));
    }
    return Status::failure(EAGAIN, "take the lock " + _file.path().string());
  }

  void unlock() override {
    if (_file.isOpen()) ::flock(_file.descriptor().number(), LOCK_UN);
  }

 private:
  [[nodiscard]] bool tryToTake() const {
    return ::flock(_file.descriptor().number(), (_file.isShared() ? LOCK_SH : LOCK_EX) | LOCK_NB) == 0;
  }

  [[nodiscard]] std::string holder() const {
    return holderOf(_file.descriptor()) + ", which holds the lock " + _file.path().string();
  }

  [[nodiscard]] Status timedOut() const { return Status::failure(ETIMEDOUT, "wait any longer for " + holder()); }

  [[nodiscard]] milliseconds remaining(steady_clock::duration waited) const {
    if (!_file.timeLimit()) return kLongestPause;
    return std::chrono::ceil<milliseconds>(*_file.timeLimit() - waited);
  }

  LockFile _file;
};

class LinuxFileLocks final : public ExclusiveFileLocks {
 public:
  explicit LinuxFileLocks(FileLockOptions options) : _options{std::move(options)} {}

  Result<std::unique_ptr<ExclusiveFileLock>> lockNamed(std::string_view name) override {
    LockFile file{_options, name};
    if (!isEntryName(std::string{name}) || name.find('/') != std::string_view::npos) {
      return Status::failure(EINVAL, "open the lock file " + file.path().string());
    }
    if (!file.open()) return failureOf("open the lock file", file.path());
    return std::make_unique<LinuxFileLock>(std::move(file));
  }

 private:
  FileLockOptions _options;
};

}  // namespace

std::shared_ptr<ExclusiveFileLocks> makeFileLocks(FileLockOptions options) {
  return std::make_shared<LinuxFileLocks>(std::move(options));
}

}  // namespace platform
