#include "accounts/watch.h"

#include <poll.h>
#include <sys/epoll.h>
#include <sys/eventfd.h>
#include <sys/timerfd.h>

#include <array>
#include <atomic>
#include <cerrno>
#include <csignal>
#include <list>
#include <new>
#include <optional>
#include <system_error>
#include <thread>
#include <utility>

#include "client/changes.h"
#include "client/path_notices.h"
#include "platform/linux/files/descriptor.h"

namespace accounts {
namespace {

using platform::Descriptor;
using std::chrono::nanoseconds;

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
      : device{std::move(watched)},
        records{identifiedRecords(*since.content().store)},
        callback{std::move(told)},
        notices{device->beginning(), device->root(), device->settingsFile()} {}

  std::shared_ptr<const Device> device;
  Records records;  // as they were found last
  Callback callback;
  std::list<Change> untold;
  PathNotices notices;
  Descriptor timer{::timerfd_create(CLOCK_MONOTONIC, TFD_NONBLOCK | TFD_CLOEXEC)};
  Descriptor both{::epoll_create1(EPOLL_CLOEXEC)};
  Descriptor stop{::eventfd(0, EFD_NONBLOCK | EFD_CLOEXEC)};
  std::atomic<bool> isOver = false;
  bool isWayFollowed = false;
  std::optional<FileIdentity> file = std::nullopt;  // that was found last, unless it may differ without showing it
  std::thread thread = {};

  // Answers false, with errno, where the system does not let it.
  [[nodiscard]] bool begin() {
    if (!notices.descriptor().isOpen() || !timer.isOpen() || !both.isOpen() || !stop.isOpen()) return false;
    for (const Descriptor* each : {&notices.descriptor(), &std::as_const(timer)}) {
      epoll_event event{.events = EPOLLIN, .data = {}};
      if (::epoll_ctl(both.number(), EPOLL_CTL_ADD, each->number(), &event) != 0) return false;
    }
    // What came since the accounts were looked at is looked for once their file is watched.
    isWayFollowed = notices.follow();
    return isWayFollowed && lookIn(kAtOnce);
  }

  void dispatch() {
    drain(timer);
    try {
      listen();
      look();
      tell();
    } catch (const std::bad_alloc&) {
      static_cast<void>(lookIn(kBetweenTries));
      throw;
    }
  }

  void run() {
    std::array<pollfd, 2> descriptors{{{both.number(), POLLIN, 0}, {stop.number(), POLLIN, 0}}};
    while (!isOver) {
      if (::poll(descriptors.data(), descriptors.size(), -1) < 0 && errno != EINTR) return;
      try {
        if (!isOver) dispatch();
      } catch (const std::bad_alloc&) {
        continue;  // dispatching goes on where it was
      }
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
  [[nodiscard]] bool lookIn(nanoseconds time) const {
    const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(time);
    const itimerspec once{.it_interval = {}, .it_value = {seconds.count(), (time - seconds).count()}};
    return ::timerfd_settime(timer.number(), 0, &once, nullptr) == 0;
  }

  void listen() {
    if (notices.take() == PathNotices::News::onTheWay) {
      isWayFollowed = false;
      file.reset();
    }
    if (isWayFollowed) return;
    isWayFollowed = notices.follow();
    if (isWayFollowed) file.reset();
    if (!isWayFollowed) static_cast<void>(lookIn(kBetweenTries));
  }

  // What the file has is untold from then on. A file that is not there changes nothing.
  void look() {
    const FileIdentity identity = FileIdentity::of(device->settingsFile());
    if (file == identity) return;
    const Result<Store> store = device->load();
    const bool isMissing = store.isOk() ? !(*store)->loadOutcome().reading.isOk() : store.error().code == Code::missing;
    if (!store.isOk() && !isMissing) {
      static_cast<void>(lookIn(kBetweenTries));
      return;
    }
    if (!isMissing) {
      Records now = identifiedRecords(**store);
      const std::vector<Change> changes = changesBetween(records, now, device);
      untold.insert(untold.end(), changes.begin(), changes.end());
      records = std::move(now);
    }
    file = identity;
  }

  // A callback that memory did not suffice for is called again.
  void tell() {
    while (!untold.empty() && !isOver) {
      std::list<Change> next;
      next.splice(next.begin(), untold, untold.begin());
      try {
        callback(next.front());
      } catch (const std::bad_alloc&) {
        untold.splice(untold.begin(), next);
        throw;
      }
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
    if (caller == Watch::Caller::ownThread) content->thread = threadWithoutSignals([content] { content->run(); });
  } catch (const std::system_error& refused) {
    return failure(refused.what());
  }
  return Watch{std::move(content)};
}

Watch::Watch(std::shared_ptr<Content> content) : _content{std::move(content)} {}
Watch::Watch(Watch&&) noexcept = default;

Watch& Watch::operator=(Watch&& other) noexcept {
  Watch own{std::move(other)};
  std::swap(_content, own._content);
  return *this;
}

Watch::~Watch() {
  if (_content != nullptr) _content->end();
}

int Watch::descriptor() const {
  return _content == nullptr || _content->thread.joinable() ? -1 : _content->both.number();
}

void Watch::dispatch() {
  const std::shared_ptr<Content> held = _content;  // the callback may destroy the watch
  if (held != nullptr && !held->thread.joinable()) held->dispatch();
}

}  // namespace accounts
