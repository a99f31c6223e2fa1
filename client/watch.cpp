#include "accounts/watch.h"

#include <poll.h>
#include <sys/epoll.h>
#include <sys/eventfd.h>
#include <sys/inotify.h>
#include <sys/timerfd.h>

#include <array>
#include <atomic>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <system_error>
#include <thread>
#include <utility>

#include "client/changes.h"
#include "platform/linux/files/descriptor.h"

namespace accounts {
namespace {

using platform::Descriptor;
using std::chrono::nanoseconds;

// Hard links come with IN_CREATE, what is written in place with IN_CLOSE_WRITE, every save with IN_MOVED_TO.
constexpr std::uint32_t kWatched = IN_MOVED_TO | IN_CREATE | IN_CLOSE_WRITE | IN_MOVE_SELF | IN_DELETE_SELF;
constexpr std::uint32_t kDirectoryGone = IN_MOVE_SELF | IN_DELETE_SELF | IN_IGNORED;
constexpr nanoseconds kAtOnce{1};
constexpr nanoseconds kBetweenTries = std::chrono::seconds{1};

// A thread of a library takes no signal from the program.
template <typename Function>
std::thread threadWithoutSignals(const Function& function) {
  sigset_t all{};
  sigset_t before{};
  ::sigfillset(&all);
  ::pthread_sigmask(SIG_SETMASK, &all, &before);
  struct Restorer {
    const sigset_t& before;
    ~Restorer() { ::pthread_sigmask(SIG_SETMASK, &before, nullptr); }
  } const restorer{before};
  return std::thread{function};
}

void drain(const Descriptor& counter) {
  std::uint64_t count = 0;
  while (::read(counter.number(), &count, sizeof count) > 0) continue;
}

}  // namespace

struct Watch::Content {
  Content(std::shared_ptr<const Device> watched, const Accounts& since, Callback told)
      : device{std::move(watched)}, records{identifiedRecords(*since.content().store)}, callback{std::move(told)} {}

  std::shared_ptr<const Device> device;
  Records records;  // as they were told last
  Callback callback;
  Descriptor notices{::inotify_init1(IN_NONBLOCK | IN_CLOEXEC)};
  Descriptor timer{::timerfd_create(CLOCK_MONOTONIC, TFD_NONBLOCK | TFD_CLOEXEC)};
  Descriptor both{::epoll_create1(EPOLL_CLOEXEC)};
  Descriptor stop{::eventfd(0, EFD_NONBLOCK | EFD_CLOEXEC)};
  std::atomic<bool> isOver = false;
  int directory = -1;
  std::thread thread = {};

  // Answers false, with errno, where the system does not let it.
  [[nodiscard]] bool begin() {
    if (!notices.isOpen() || !timer.isOpen() || !both.isOpen() || !stop.isOpen()) return false;
    for (const Descriptor* each : {&notices, &timer}) {
      epoll_event event{.events = EPOLLIN, .data = {}};
      if (::epoll_ctl(both.number(), EPOLL_CTL_ADD, each->number(), &event) != 0) return false;
    }
    // What came since the accounts were looked at is looked for once the directory is watched.
    return watchDirectory() && lookIn(kAtOnce);
  }

  void dispatch() {
    drain(timer);
    const bool isGone = takeNotices();
    if (isGone && !watchDirectory()) static_cast<void>(lookIn(kBetweenTries));
    look();
  }

  void follow() {
    std::array<pollfd, 2> descriptors{{{both.number(), POLLIN, 0}, {stop.number(), POLLIN, 0}}};
    while (!isOver) {
      if (::poll(descriptors.data(), descriptors.size(), -1) < 0 && errno != EINTR) return;
      if (!isOver) dispatch();
    }
  }

  void end() {
    isOver = true;
    const std::uint64_t one = 1;
    static_cast<void>(::write(stop.number(), &one, sizeof one) == sizeof one);
    if (!thread.joinable()) return;
    thread.get_id() == std::this_thread::get_id() ? thread.detach() : thread.join();
  }

 private:
  [[nodiscard]] bool watchDirectory() {
    if (directory >= 0) ::inotify_rm_watch(notices.number(), directory);
    const auto path = device->settingsFile().parent_path();
    directory = ::inotify_add_watch(notices.number(), path.c_str(), kWatched | IN_ONLYDIR);
    return directory >= 0;
  }

  [[nodiscard]] bool lookIn(nanoseconds time) const {
    const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(time);
    const itimerspec once{.it_interval = {}, .it_value = {seconds.count(), (time - seconds).count()}};
    return ::timerfd_settime(timer.number(), 0, &once, nullptr) == 0;
  }

  // Whether the directory is to be watched anew. Which of its files was touched does not matter: what was not changed
  // is not told of.
  [[nodiscard]] bool takeNotices() const {
    alignas(inotify_event) std::array<char, 4096> buffer{};
    bool isGone = directory < 0;
    for (ssize_t size = 0; (size = ::read(notices.number(), buffer.data(), buffer.size())) > 0;) {
      for (ssize_t place = 0; place < size;) {
        inotify_event event{};
        std::memcpy(&event, buffer.data() + place, sizeof event);
        if (event.wd == directory && (event.mask & kDirectoryGone) != 0) isGone = true;
        place += static_cast<ssize_t>(sizeof event + event.len);
      }
    }
    return isGone;
  }

  void look() {
    const Result<Store> store = device->load();
    if (!store.isOk()) {
      static_cast<void>(lookIn(kBetweenTries));
      return;
    }
    Records now = identifiedRecords(**store);
    const std::vector<Change> changes = changesBetween(records, now, device);
    records = std::move(now);
    for (const Change& change : changes) {
      if (isOver) return;
      callback(change);
    }
  }
};

Result<Watch> beginWatch(std::shared_ptr<const Device> device, const Accounts& since, Watch::Callback callback,
                         Watch::Caller caller) {
  const std::string file = device->settingsFile().string();
  const auto failure = [&file](const std::string& reason) {
    return Error{Code::notWatched, "changes of " + file + " cannot be watched: " + reason};
  };
  auto content = std::make_shared<Watch::Content>(std::move(device), since, std::move(callback));
  if (!content->begin()) return failure(std::generic_category().message(errno));
  try {
    if (caller == Watch::Caller::ownThread) content->thread = threadWithoutSignals([content] { content->follow(); });
  } catch (const std::system_error& refused) {
    return failure(refused.what());
  }
  return Watch{std::move(content)};
}

Watch::Watch(std::shared_ptr<Content> content) : _content{std::move(content)} {}
Watch::Watch(Watch&&) noexcept = default;

Watch& Watch::operator=(Watch&& other) noexcept {
  std::swap(_content, other._content);
  return *this;
}

Watch::~Watch() {
  if (_content != nullptr) _content->end();
}

int Watch::descriptor() const { return _content->thread.joinable() ? -1 : _content->both.number(); }

void Watch::dispatch() {
  const std::shared_ptr<Content> held = _content;  // the callback may destroy the watch
  if (!held->thread.joinable()) held->dispatch();
}

}  // namespace accounts
