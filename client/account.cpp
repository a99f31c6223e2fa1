#include "accounts/account.h"

#include <algorithm>
#include <utility>

#include "accountsettings/device_local_account.h"
#include "accountsettings/service_objects.h"
#include "client/contents.h"

namespace accounts {
namespace {

using accountsettings::BasicAccount;
using platform::PropertyValue;
using platform::Text;
using Record = std::shared_ptr<BasicAccount>;

std::optional<std::string> copied(const std::optional<Text>& text) {
  return text ? std::optional{text->string()} : std::nullopt;
}

std::vector<std::string> copied(const BasicAccount::Dataclasses& dataclasses) {
  std::vector<std::string> copies;
  copies.reserve(dataclasses.size());
  for (const Text& dataclass : dataclasses) copies.push_back(dataclass.string());
  return copies;
}

template <typename Predicate>
void collect(std::vector<Account>& found, const Account& account, const Predicate& isMeant) {
  if (isMeant(account)) found.push_back(account);
  if (!account.content().record->properties().contains(accountsettings::kAccountChildAccounts)) return;
  for (const Account& child : account.children()) {
    if (isMeant(child)) found.push_back(child);
  }
}

template <typename Predicate>
std::vector<Account> allWith(const std::vector<Account>& topLevel, const Predicate& isMeant) {
  std::vector<Account> found;
  for (const Account& account : topLevel) collect(found, account, isMeant);
  return found;
}

}  // namespace

Account::Account(std::shared_ptr<const Content> content) : _content{std::move(content)} {}

// A record that the file gives no identifier is given another one at each load.
std::string Account::identifier() const {
  const Text* const own = content().record->originalProperties().text(accountsettings::kAccountIdentifier);
  return own == nullptr ? std::string{} : own->string();
}

std::string Account::type() const { return copied(content().record->type()).value_or(""); }
std::string Account::accountClass() const { return copied(content().record->accountClass()).value_or(""); }

std::optional<std::string> Account::displayName() const {
  if (type() != accountsettings::kOnMyDeviceAccountType) return copied(content().record->displayName());
  const Within within{*content().device};
  return accountsettings::DeviceLocalAccount::class_typeString();
}

std::optional<std::string> Account::username() const { return text(accountsettings::kAccountUsername); }
std::optional<std::string> Account::syncIdentifier() const { return copied(content().record->syncStoreIdentifier()); }
bool Account::isChild() const { return content().record->parentAccount() != nullptr; }

std::string Account::parentIdentifier() const {
  return copied(content().record->parentAccountIdentifier()).value_or("");
}

std::vector<Account> Account::children() const {
  std::vector<Account> children;
  const Record& parent = content().record;
  const platform::Array* const array =
      isChild() ? nullptr : std::as_const(*parent).properties().array(accountsettings::kAccountChildAccounts);
  if (array == nullptr) return children;
  const Within within{*content().device};
  for (const PropertyValue& element : *array) {
    const platform::Dictionary* const properties = element.asDictionary();
    Record child = properties == nullptr ? nullptr : BasicAccount::initWithProperties(*properties);
    if (child == nullptr) continue;
    child->setParentAccount(parent);
    children.push_back(accountOf(content().device, std::move(child)));
  }
  return children;
}

std::vector<std::string> Account::supportedDataclasses() const {
  const Within within{*content().device};
  return copied(content().record->supportedDataclasses());
}

std::vector<std::string> Account::enabledDataclasses() const {
  const Within within{*content().device};
  return copied(content().record->enabledDataclasses().value_or(BasicAccount::Dataclasses{}));
}

bool Account::isEnabled(std::string_view dataclass) const {
  const Within within{*content().device};
  return content().record->isEnabledForDataclass(dataclass);
}

bool Account::listsDataclasses() const {
  const Within within{*content().device};
  return content().record->enabledDataclasses().has_value();
}

// An account whose module is at fault can be looked at all the same.
std::optional<Service> Account::service() const {
  if (!content().device->opensModules()) return std::nullopt;
  const auto known = answerOf([this]() -> Result<std::optional<Service>> {
    const Within within{*content().device};
    const auto full = content().record->fullAccountUsingLoader(nullptr);
    const auto* const object = dynamic_cast<const accountsettings::ServiceAccountObject*>(full.get());
    const auto address = object == nullptr ? std::nullopt : object->service();
    if (!address) return std::optional<Service>{};
    return std::optional{Service{address->host, address->port, address->isSecure}};
  });
  return known ? *known : std::nullopt;
}

std::optional<Value> Account::property(std::string_view key) const {
  std::optional<PropertyValue> value = content().record->accountPropertyForKey(key);
  return value ? std::optional{valueOf(*std::move(value))} : std::nullopt;
}

std::optional<std::string> Account::text(std::string_view key) const {
  const std::optional<PropertyValue> value = content().record->accountPropertyForKey(key);
  const Text* const text = value ? value->asText() : nullptr;
  return text == nullptr ? std::nullopt : std::optional{text->string()};
}

std::optional<std::int64_t> Account::integer(std::string_view key) const {
  const std::optional<PropertyValue> value = content().record->accountPropertyForKey(key);
  return value ? value->integerValue() : std::nullopt;
}

std::optional<bool> Account::boolean(std::string_view key) const {
  const std::optional<PropertyValue> value = content().record->accountPropertyForKey(key);
  return value ? value->booleanValue() : std::nullopt;
}

std::vector<std::string> Account::keys() const {
  std::vector<std::string> keys;
  for (const auto& entry : std::as_const(*content().record).properties()) keys.push_back(entry.key.string());
  return keys;
}

std::optional<std::string> Account::ownText(std::string_view key) const {
  const Text* const text = std::as_const(*content().record).properties().text(key);
  return text == nullptr ? std::nullopt : std::optional{text->string()};
}

Value::Dictionary Account::ownProperties() const {
  return *valueOf(std::as_const(*content().record).properties()).dictionary();
}

Accounts::Accounts(std::shared_ptr<const Content> content) : _content{std::move(content)} {}

const std::vector<Account>& Accounts::all() const& { return content().topLevel(); }

std::uint64_t Accounts::dataVersion() const { return content().store->dataVersion(); }
std::size_t Accounts::unreadable() const { return content().store->loadOutcome().leftOut.size(); }

std::optional<Account> Accounts::withIdentifier(std::string_view identifier) const {
  const Record record = content().store->accountWithIdentifier(identifier);
  if (record == nullptr) return std::nullopt;
  const Account account = accountOf(content().device, record);
  if (record->identifier() == Text{identifier}) return account;
  const std::vector<Account> children = account.children();
  const auto child = std::find_if(children.rbegin(), children.rend(),
                                  [&](const Account& each) { return each.identifier() == identifier; });
  return child == children.rend() ? std::nullopt : std::optional{*child};
}

std::optional<Account> Accounts::withSyncIdentifier(std::string_view identifier) const {
  Record record = content().store->syncableAccountWithSyncIdentifier(identifier);
  return record == nullptr ? std::nullopt : std::optional{accountOf(content().device, std::move(record))};
}

std::vector<Account> Accounts::ofType(std::string_view type) const {
  return allWith(all(), [&](const Account& account) { return account.type() == type; });
}

std::vector<Account> Accounts::withDataclass(std::string_view dataclass) const {
  return allWith(all(), [&](const Account& account) { return account.isEnabled(dataclass); });
}

}  // namespace accounts
