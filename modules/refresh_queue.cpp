#include "modules/refresh_queue.h"

#include <algorithm>
#include <string>
#include <tuple>
#include <utility>

namespace modules {
namespace {

using accountsettings::RefreshRequest;

bool asksForTheSame(const RefreshRequest& left, const RefreshRequest& right) {
  return std::tie(left.scope, left.dataclass, left.containerIdentifier) ==
         std::tie(right.scope, right.dataclass, right.containerIdentifier);
}

}  // namespace

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
  const auto pending =
      std::ranges::find_if(_requests, [&](const RefreshRequest& other) { return asksForTheSame(other, request); });
  if (pending != _requests.end()) {
    pending->isUserRequested = pending->isUserRequested || request.isUserRequested;
    return true;
  }
  if (_requests.size() == kMostRequests) return false;
  _requests.push_back(std::move(request));
  return true;
}

}  // namespace modules
