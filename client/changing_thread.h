#pragma once

#include <mutex>
#include <set>
#include <thread>
#include <utility>

#include "platform/file_system.h"

namespace accounts {

// Which threads are changing which device. A thread that began a second change of one would wait for its own lock.
class ChangingThread {
 public:
  explicit ChangingThread(const platform::Path& file) : _entry{std::this_thread::get_id(), file} {
    const std::lock_guard guard{mutex()};
    _isFirst = entries().insert(_entry).second;
  }
  ChangingThread(const ChangingThread&) = delete;
  ChangingThread& operator=(const ChangingThread&) = delete;
  ~ChangingThread() {
    if (!_isFirst) return;
    const std::lock_guard guard{mutex()};
    entries().erase(_entry);
  }
  [[nodiscard]] bool isFirst() const { return _isFirst; }

 private:
  using Entry = std::pair<std::thread::id, platform::Path>;
  static std::mutex& mutex() {
    static std::mutex& mutex = *new std::mutex;
    return mutex;
  }
  static std::set<Entry>& entries() {
    static std::set<Entry>& entries = *new std::set<Entry>;
    return entries;
  }

  Entry _entry;
  bool _isFirst = false;
};

}  // namespace accounts
