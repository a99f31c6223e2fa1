#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "accountsettings/account_objects.h"
#include "platform/export.h"
#include "platform/property_value.h"

// What the account objects of the shipped modules can be asked beyond what every module owes. A program that holds such
// an object asks by a dynamic_cast to the class that it needs; an object of another module may offer it or not.
namespace accountsettings {

// Where the service behind an account is reached.
struct ServiceAddress {
  std::string host;
  std::uint16_t port = 0;
  bool isSecure = true;

  friend bool operator==(const ServiceAddress&, const ServiceAddress&) = default;
};

// A full account object that knows its service. What it tells is as of the moment when it was made, except for the
// parent, which speaks for itself.
class ACCOUNT_EXPORT ServiceAccountObject : public FullAccountObject {
 public:
  ~ServiceAccountObject() override;
  [[nodiscard]] virtual const platform::Dictionary& properties() const = 0;
  [[nodiscard]] virtual const std::shared_ptr<BasicAccount>& parentAccount() const = 0;
  // What people call the account: the name that the user gave it, else the parent's, else the user name, else the name
  // of its kind. Never empty.
  [[nodiscard]] virtual std::string displayName() const = 0;
  // The name to sign in with, the parent's where the account has none; empty where neither has one.
  [[nodiscard]] virtual std::string username() const = 0;
  // Nothing where neither the account nor its type names a host.
  [[nodiscard]] virtual std::optional<ServiceAddress> service() const = 0;
};

// One thing to refresh.
struct RefreshRequest {
  enum class Scope : std::uint8_t { container, containerList, allContainers };

  Scope scope = Scope::allContainers;
  std::string dataclass;
  std::string containerIdentifier;  // of a single container only
  bool isUserRequested = false;     // a user waits for it

  friend bool operator==(const RefreshRequest&, const RefreshRequest&) = default;
};

// A sync account object that keeps what it was asked for until somebody who has a network does it.
class ACCOUNT_EXPORT RefreshQueueObject : public SyncAccountObject {
 public:
  ~RefreshQueueObject() override;
  // In the order in which they were first asked; each thing stands there once.
  [[nodiscard]] virtual const std::vector<RefreshRequest>& pendingRequests() const = 0;
  // The same, and the queue is empty afterwards.
  [[nodiscard]] virtual std::vector<RefreshRequest> takeRequests() = 0;
};

}  // namespace accountsettings
