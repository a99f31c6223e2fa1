#pragma once

namespace platform {

// Tells the browser that the syncing of its tabs was switched on or off. Nobody may be listening; nothing comes back.
class CloudTabsNotice {
 public:
  virtual ~CloudTabsNotice() = default;
  virtual void post(bool enabled) = 0;
};

}  // namespace platform
