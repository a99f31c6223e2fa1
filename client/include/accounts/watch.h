#pragma once

#include <cstdint>
#include <functional>
#include <memory>

#include "accounts/account.h"

namespace accounts {

// Tells of each account that comes, changes or goes, whatever program wrote the file, until it is destroyed.
//
// Changes are told in an order that fits the file: what went first, then in the file's order, children behind their
// parent. What is written in quick succession may be told together, each account once with all its keys. While there is
// no file, or none of this release that can be read, the accounts count as unchanged.
//
// It is used by one thread at a time, be it another one each time. The callback is called by one thread at a time.
class ACCOUNTS_API Watch {
 public:
  // It may look, change and destroy the watch. It must not throw but for want of memory; then it is called again with
  // the same change, after a second or with the next change.
  using Callback = std::function<void(const Change&)>;
  // Who calls the callback: a thread of the watch's own, or whoever calls `dispatch`.
  enum class Caller : std::int32_t { ownThread, eventLoop };

  // Can be moved, and not copied; what was moved from watches nothing.
  Watch(Watch&&) noexcept;
  Watch& operator=(Watch&&) noexcept;
  // From then on nothing is called; waits for a call that the watch's own thread is making, unless it is made by that
  // call itself.
  ~Watch();

  // Readable when there is something to dispatch; it is the watch's own, for poll(2) only, which another thread may
  // call meanwhile. -1 with a thread of its own.
  [[nodiscard]] int descriptor() const;
  // Calls the callback for what changed since the last time, in this thread, and returns. Nothing with a thread of its
  // own. What it could not do for want of memory, which passes through, the next call does.
  void dispatch();

  struct Content;  // internal
  explicit Watch(std::shared_ptr<Content> content);

 private:
  std::shared_ptr<Content> _content;
};

}  // namespace accounts
