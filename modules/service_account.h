#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "accountsettings/basic_account.h"
#include "accountsettings/service_objects.h"

namespace modules {

using accountsettings::BasicAccount;
using platform::Dictionary;
using platform::PropertyValue;

// Keys under which accounts keep the address of their service.
inline constexpr platform::StringConstant kHostnameKey{"Hostname"};  // text
inline constexpr platform::StringConstant kPortKey{"PortNumber"};    // integer, 1 to 65535
inline constexpr platform::StringConstant kSecureKey{"SSLEnabled"};  // boolean; absent: secure

// What holds for every account of a kind until its properties say otherwise.
struct ServiceKind {
  std::string_view name = {};  // what people call the kind
  std::string_view host = {};  // empty where each account has its own
  std::uint16_t securePort = 0;
  std::uint16_t plainPort = 0;
  // Where the host stands inside a dictionary of the account instead: that dictionary's key and the host's.
  std::string_view hostSection = {};
  std::string_view hostKeyInSection = {};
};

// The full account object of every account that has a service somewhere.
class ServiceAccount final : public accountsettings::ServiceAccountObject {
 public:
  // The kind must live as long as the object.
  ServiceAccount(const Dictionary& properties, const ServiceKind& kind) : _properties{properties}, _kind{kind} {}

  void setParentAccount(std::shared_ptr<BasicAccount> parent) override { _parent = std::move(parent); }
  [[nodiscard]] const Dictionary& properties() const override { return _properties; }
  [[nodiscard]] const std::shared_ptr<BasicAccount>& parentAccount() const override { return _parent; }
  [[nodiscard]] std::string displayName() const override;
  [[nodiscard]] std::string username() const override;
  [[nodiscard]] std::optional<accountsettings::ServiceAddress> service() const override;

 private:
  [[nodiscard]] std::string host() const;
  // The account's own value, else its parent's; nothing where neither has one.
  [[nodiscard]] std::optional<PropertyValue> value(std::string_view key) const;

  Dictionary _properties;
  const ServiceKind& _kind;
  std::shared_ptr<BasicAccount> _parent;
};

}  // namespace modules
