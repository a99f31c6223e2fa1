#pragma once

#include <memory>
#include <string_view>
#include <vector>

#include "accountsettings/basic_account.h"
#include "accountsettings/service_objects.h"

namespace modules {

// The sync account object of every account whose containers are refreshed over a network. A request begins a refresh
// when its data class is enabled at that moment; asked again before it was taken, it keeps its place, and a user's
// asking makes it a user's request.
class RefreshQueue final : public accountsettings::RefreshQueueObject {
 public:
  // More requests than anybody can have meant are refused.
  static constexpr std::size_t kMaxRequests = 1024;

  explicit RefreshQueue(const std::shared_ptr<accountsettings::BasicAccount>& account) : _account{account} {}

  bool refreshContainerWithIdentifier_forDataclass_isUserRequested(std::string_view identifier,
                                                                   std::string_view dataclass,
                                                                   bool isUserRequested) override;
  bool refreshContainerListForDataclass_isUserRequested(std::string_view dataclass, bool isUserRequested) override;
  bool refreshContainersForDataclass_isUserRequested(std::string_view dataclass, bool isUserRequested) override;

  [[nodiscard]] const std::vector<accountsettings::RefreshRequest>& pendingRequests() const override {
    return _requests;
  }
  [[nodiscard]] std::vector<accountsettings::RefreshRequest> takeRequests() override;

 private:
  bool begin(accountsettings::RefreshRequest request);

  // The record owns this object, so it is not owned in turn.
  std::weak_ptr<accountsettings::BasicAccount> _account;
  std::vector<accountsettings::RefreshRequest> _requests;
};

}  // namespace modules
