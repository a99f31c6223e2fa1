#include "modules/service_account.h"

namespace modules {
namespace {

std::string textOf(const std::optional<PropertyValue>& value) {
  const auto* const text = value ? value->asText() : nullptr;
  return text == nullptr ? std::string{} : text->string();
}

}  // namespace

std::optional<PropertyValue> ServiceAccount::value(std::string_view key) const {
  if (const auto* const own = _properties.find(key)) return *own;
  if (_parent == nullptr) return std::nullopt;
  return _parent->accountPropertyForKey(key);
}

std::string ServiceAccount::displayName() const {
  for (const std::string_view key :
       {accountsettings::kAccountDisplayName.view(), accountsettings::kAccountUsername.view(),
        accountsettings::kAccountTypeString.view()}) {
    if (auto name = textOf(value(key)); !name.empty()) return name;
  }
  return std::string{_kind.name};
}

std::string ServiceAccount::username() const { return textOf(value(accountsettings::kAccountUsername)); }

std::string ServiceAccount::host() const {
  if (!_kind.hostSection.empty()) {
    const auto* const section = _properties.dictionary(_kind.hostSection);
    const auto* const host = section == nullptr ? nullptr : section->text(_kind.hostKeyInSection);
    if (host != nullptr && !host->empty()) return host->string();
  }
  auto host = textOf(value(kHostnameKey));
  return host.empty() ? std::string{_kind.host} : host;
}

std::optional<accountsettings::ServiceAddress> ServiceAccount::service() const {
  auto name = host();
  if (name.empty()) return std::nullopt;
  const auto secureValue = value(kSecureKey);
  const bool isSecure = !secureValue || secureValue->booleanValue().value_or(true);
  const auto portValue = value(kPortKey);
  const auto given = portValue ? portValue->integerValue().value_or(0) : 0;
  const auto usual = isSecure ? _kind.securePort : _kind.plainPort;
  const auto port = given > 0 && given <= UINT16_MAX ? static_cast<std::uint16_t>(given) : usual;
  return accountsettings::ServiceAddress{std::move(name), port, isSecure};
}

}  // namespace modules
