#include "modules/refresh_queue.h"

#include <algorithm>
#include <string>
#include <tuple>
#include <utility>

namespace modules {

using accountsettings::RefreshRequest;

bool RefreshQueue::refreshContainerWithIdentifier_forDataclass_isUserRequested(std::string_view identifier,
                                                                               std::string_view dataclass,
                                                                               bool isUserRequested) {
  if (identifier.empty()) return false;
  return begin({RefreshRequest::Scope::container, std::string{dataclass}, std::string{identifier}, isUserRequested});
}

bool RefreshQueue::refreshContainerListForDataclass_isUserRequested(std::string_view dataclass, bool isUserRequested) {
  return begin({RefreshRequest::Scope::containerList, std::string{dataclass}, {}, isUserRequested});
}

bool RefreshQueue::refreshContainersForDataclass_isUserRequested(std::string_view dataclass, bool isUserRequested) {
  return begin({RefreshRequest::Scope::allContainers, std::string{dataclass}, {}, isUserRequested});
}

std::vector<RefreshRequest> RefreshQueue::takeRequests() { return std::exchange(_requests, {}); }

bool RefreshQueue::begin(RefreshRequest request) {
  const auto account = _account.lock();
  if (account == nullptr || !account->isEnabledForDataclass(request.dataclass)) return false;
  const auto whatIsAsked = [](const RefreshRequest& each) {
    return std::tie(each.scope, each.dataclass, each.containerIdentifier);
  };
  const auto pending = std::ranges::find(_requests, whatIsAsked(request), whatIsAsked);
  if (pending != _requests.end()) {
    pending->isUserRequested = pending->isUserRequested || request.isUserRequested;
    return true;
  }
  if (_requests.size() == kMaxRequests) return false;
  _requests.push_back(std::move(request));
  return true;
}

}  // namespace modules
