#include "accountsettings/basic_account.h"

#include "accountsettings/assertion_failure.h"
#include "accountsettings/log_handle.h"
#include "platform/platform.h"

namespace accountsettings {
namespace {

constexpr std::string_view kSourceFile = "BasicAccount";

// The record's own value, else the value of the nearest record above it that has one.
const PropertyValue* valueInChain(const BasicAccount& account, std::string_view key) {
  for (const BasicAccount* link = &account; link != nullptr; link = link->parentAccount().get()) {
    if (const PropertyValue* const value = link->properties().find(key)) return value;
  }
  return nullptr;
}

// A text that is no identifier would leave the account unreachable, so another kind counts as missing.
void identify(Dictionary& properties) {
  if (properties.text(kAccountIdentifier) != nullptr) return;
  const std::optional<std::string> identifier = BasicAccount::createNewAccountUID();
  if (!identifier) return;
  properties.set(kAccountIdentifier, *identifier);
  // Only a record that is given its identifier here is given a sync identifier, too.
  if (!properties.contains(kAccountSyncIdentifier)) properties.set(kAccountSyncIdentifier, *identifier);
}

}  // namespace

BasicAccount::BasicAccount() = default;

BasicAccount::~BasicAccount() {
  _parentAccount.reset();
  _originalProperties.clear();
  _properties.clear();
  _fullAccount.reset();
  _syncAccount.reset();
}

std::shared_ptr<BasicAccount> BasicAccount::accountWithType_class(std::string_view type, std::string_view className) {
  return _initWithType_class(type, className);
}

std::shared_ptr<BasicAccount> BasicAccount::accountWithProperties(const Dictionary& properties) {
  return initWithProperties(properties);
}

std::shared_ptr<BasicAccount> BasicAccount::initWithProperties(const Dictionary& properties) {
  return recordOf<BasicAccount>(properties);
}

std::shared_ptr<BasicAccount> BasicAccount::_initWithType_class(std::string_view type, std::string_view className) {
  static constexpr std::string_view kMethod = "-[BasicAccount _initWithType:class:]";
  if (className.empty()) failAssertion(kMethod, kSourceFile, "The account class is required.");
  if (!_isValidAccountType(type)) {
    failAssertion(kMethod, kSourceFile, "The account type (%@) is not supported", {type});
  }
  Dictionary properties{{kAccountType, type}};
  if (const std::optional<std::string> identifier = createNewAccountUID()) {
    const Text text{*identifier};
    properties.set(kAccountIdentifier, text);
    properties.set(kAccountSyncIdentifier, text);
  }
  properties.set(kAccountClass, className);
  return initWithProperties(properties);
}

std::shared_ptr<BasicAccount> BasicAccount::init() {
  failAssertion("-[BasicAccount init]", kSourceFile, "Don't use this method");
}

std::optional<std::string> BasicAccount::createNewAccountUID() {
  return platform::current().identifiers->makeUuid().optional();
}

bool BasicAccount::acceptProperties(const Dictionary& properties) {
  static constexpr const char* kMethod = "-[BasicAccount initWithProperties:]";
  const Text* const type = properties.text(kAccountType);
  const Text* const className = properties.text(kAccountClass);
  const bool isTypeKnown = _isValidAccountType(type == nullptr ? std::string_view{} : type->view());
  if (!isTypeKnown) {
    const PropertyValue* const found = properties.find(kAccountType);
    _ASLogSystem().log(kMethod, "Invalid account type: %@", found == nullptr ? std::nullopt : std::optional{*found});
  }
  const bool hasClass = className != nullptr && !className->empty();
  if (!hasClass) _ASLogSystem().log(kMethod, "Missing account class.");
  if (!isTypeKnown || !hasClass) return false;

  setOriginalProperties(properties);
  _properties = properties;
  identify(_properties);
  _parentAccount = nullptr;
  return true;
}

std::optional<PropertyValue> BasicAccount::accountPropertyForKey(std::string_view key) const {
  const PropertyValue* const value = valueInChain(*this, key);
  return value == nullptr ? std::nullopt : std::optional{*value};
}

void BasicAccount::setAccountProperty_forKey(std::optional<PropertyValue> value, std::string_view key) {
  if (key == kAccountClass || key == kAccountType) return;
  _forcedSetAccountProperty_forKey(std::move(value), key);
}

void BasicAccount::_forcedSetAccountProperty_forKey(std::optional<PropertyValue> value, std::string_view key) {
  if (value) {
    _properties.set(key, *std::move(value));
  } else {
    _properties.remove(key);
  }
}

void BasicAccount::removeAccountPropertyForKey(std::string_view key) { _properties.remove(key); }

void BasicAccount::setOriginalProperties(const Dictionary& properties) { _originalProperties = properties; }

std::optional<Text> BasicAccount::textForKey(std::string_view key) const {
  const PropertyValue* const value = valueInChain(*this, key);
  const Text* const text = value == nullptr ? nullptr : value->asText();
  return text == nullptr ? std::nullopt : std::optional{*text};
}

std::optional<Text> BasicAccount::type() const { return textForKey(kAccountType); }
std::optional<Text> BasicAccount::identifier() const { return textForKey(kAccountIdentifier); }
std::optional<Text> BasicAccount::syncStoreIdentifier() const { return textForKey(kAccountSyncIdentifier); }
std::optional<Text> BasicAccount::accountClass() const { return textForKey(kAccountClass); }
std::optional<Text> BasicAccount::displayName() const { return textForKey(kAccountDisplayName); }
std::optional<Text> BasicAccount::typeString() const { return textForKey(kAccountTypeString); }
std::optional<Text> BasicAccount::shortTypeString() const { return textForKey(kAccountShortTypeString); }

void BasicAccount::setAccountClass(std::string_view className) {
  const std::optional<Text> present = accountClass();
  if (present && *present == className) return;
  _forcedSetAccountProperty_forKey(className, kAccountClass);
}

void BasicAccount::setDisplayName(std::string_view name) {
  if (name.empty()) {
    failAssertion("-[BasicAccount setDisplayName:]", kSourceFile, "The display name must not be empty");
  }
  const Text* const present = _properties.text(kAccountDisplayName);
  if (present != nullptr && *present == name) return;
  _properties.set(kAccountDisplayName, name);
}

void BasicAccount::setParentAccount(std::shared_ptr<BasicAccount> parent) { _parentAccount.swap(parent); }

std::optional<Text> BasicAccount::parentAccountIdentifier() const {
  return _parentAccount == nullptr ? std::nullopt : _parentAccount->identifier();
}

}  // namespace accountsettings
