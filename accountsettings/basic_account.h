#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_set>
#include <vector>

#include "accountsettings/account_objects.h"
#include "accountsettings/vocabulary.h"
#include "platform/export.h"
#include "platform/property_value.h"

namespace accountsettings {

using platform::Array;
using platform::Dictionary;
using platform::PropertyValue;
using platform::Text;

// One account: a dictionary of properties, the same that stands in the account settings file, with typed access to the
// well-known keys, a snapshot of what it was loaded with, a link to its parent, and its data classes. Not thread-safe.
//
// When it is made, a record has a type that the configuration knows, a class and, save where none can be made, an
// identifier. Getters answer the record's own value or, where it has none, its parent's; a value of another kind
// answers nothing and does not climb.
class ACCOUNT_EXPORT BasicAccount : public std::enable_shared_from_this<BasicAccount> {
 public:
  // Making records. `initWithProperties` answers null, after a log line for each reason, where the type is unknown or
  // the class is missing; a record without "Identifier" is given a new one (and, only then, the same "Sync Identifier"
  // where that is missing). `accountWithType_class` throws AssertionFailure for an unknown type or an empty class.
  // Where a new identifier is needed and none can be made, the record stays without.
  static std::shared_ptr<BasicAccount> accountWithType_class(std::string_view type, std::string_view className);
  static std::shared_ptr<BasicAccount> accountWithProperties(const Dictionary& properties);
  // A record of the receiving class, where that is derived from this one: it names itself,
  // `Derived::accountWithProperties<Derived>(properties)`.
  template <typename Receiver>
  static std::shared_ptr<Receiver> accountWithProperties(const Dictionary& properties) {
    return recordOf<Receiver>(properties);
  }
  static std::shared_ptr<BasicAccount> initWithProperties(const Dictionary& properties);
  static std::shared_ptr<BasicAccount> _initWithType_class(std::string_view type, std::string_view className);
  // Must not be used: throws AssertionFailure "Don't use this method".
  static std::shared_ptr<BasicAccount> init();
  // A new random UUID, 36 characters, upper case; nothing where none can be made.
  [[nodiscard]] static std::optional<std::string> createNewAccountUID();

  BasicAccount(const BasicAccount&) = delete;
  BasicAccount& operator=(const BasicAccount&) = delete;
  // Lets go of parent, original properties, properties, full account and sync account, in this order.
  virtual ~BasicAccount();

  // Properties. Setting "Class" or "Type" does nothing but in the forced form; an absent value removes the key.
  // `removeAccountPropertyForKey` has no guard. `properties` is the live dictionary.
  [[nodiscard]] std::optional<PropertyValue> accountPropertyForKey(std::string_view key) const;
  void setAccountProperty_forKey(std::optional<PropertyValue> value, std::string_view key);
  void _forcedSetAccountProperty_forKey(std::optional<PropertyValue> value, std::string_view key);
  void removeAccountPropertyForKey(std::string_view key);
  [[nodiscard]] Dictionary& properties() { return _properties; }
  [[nodiscard]] const Dictionary& properties() const { return _properties; }
  // What the store writes and compares; a subclass may write something else.
  [[nodiscard]] virtual const Dictionary& propertiesToSave() const { return _properties; }
  [[nodiscard]] const Dictionary& originalProperties() const { return _originalProperties; }
  void setOriginalProperties(const Dictionary& properties);

  [[nodiscard]] std::optional<Text> type() const;
  [[nodiscard]] virtual std::optional<Text> identifier() const;
  [[nodiscard]] virtual std::optional<Text> syncStoreIdentifier() const;
  [[nodiscard]] std::optional<Text> accountClass() const;
  void setAccountClass(std::string_view className);
  [[nodiscard]] virtual std::optional<Text> displayName() const;
  // Compares with the own properties only; throws AssertionFailure for an empty name.
  void setDisplayName(std::string_view name);
  [[nodiscard]] std::optional<Text> typeString() const;
  [[nodiscard]] std::optional<Text> shortTypeString() const;

  // The parent, held strongly; null for a top-level account.
  [[nodiscard]] const std::shared_ptr<BasicAccount>& parentAccount() const { return _parentAccount; }
  void setParentAccount(std::shared_ptr<BasicAccount> parent);
  [[nodiscard]] std::optional<Text> parentAccountIdentifier() const;

  // Data classes, in the canonical order. `enabledDataclasses` answers nothing where no list is stored; a child shows
  // its parent's list whenever that is not empty. Elements that are no texts are no data classes.
  using Dataclasses = std::vector<Text>;
  [[nodiscard]] const Dataclasses& supportedDataclasses() const;
  [[nodiscard]] Dataclasses provisionedDataclasses() const;
  [[nodiscard]] std::optional<Dataclasses> enabledDataclasses() const;
  [[nodiscard]] bool isEnabledForDataclass(std::string_view dataclass) const;
  void setEnabled_forDataclass(bool enabled, std::string_view dataclass);
  void _forcedSetEnabled_forDataclass(bool enabled, std::string_view dataclass);
  void setEnabledForDataclasses(const Dataclasses& dataclasses);
  [[nodiscard]] static Dataclasses _orderedDataclasses(const Dataclasses& dataclasses);
  [[nodiscard]] static std::unordered_set<std::string_view> _profileRestrictedDataclasses();

  // Configuration of account types and data classes (process-wide, loaded once). Anything that needs the account-type
  // table throws AssertionFailure while the file is missing or unreadable. Nothing is answered for unknown types. What
  // is of another kind than the configuration needs counts as absent, and elements of its lists that are no texts are
  // left out.
  static void initialize();
  [[nodiscard]] static const Dataclasses& allSupportedDataclasses();
  // Null for an unknown type and for one without a list; lives as long as the process.
  [[nodiscard]] static const Dataclasses* supportedDataclassesForAccountType(std::string_view type);
  using Actions = std::vector<Text>;
  [[nodiscard]] static std::optional<Actions> userActionsToEnableDataclass_forAccountType(std::string_view dataclass,
                                                                                          std::string_view type);
  [[nodiscard]] static std::optional<Actions> userActionsToDisableDataclass_forAccountType(std::string_view dataclass,
                                                                                           std::string_view type);
  [[nodiscard]] static Actions removeActionsIncompatibleWithSingleStoreDataclass(const Actions& actions);
  [[nodiscard]] static std::optional<Actions> deleteAccountActionsForAccountType(std::string_view type);
  [[nodiscard]] static bool showRemindersSeparatelyForAccountType(std::string_view type);
  [[nodiscard]] static bool multipleStoresSupportedByDataclass(std::string_view dataclass);
  [[nodiscard]] static bool displayToggleForDataclass(std::string_view dataclass);
  [[nodiscard]] static bool userConfirmationIsRequiredByDataclass(std::string_view dataclass);
  [[nodiscard]] static bool isMultitaskingEnabled();
  [[nodiscard]] static bool _isValidAccountType(std::string_view type);
  // The types that the configuration knows, in its order.
  [[nodiscard]] static std::vector<Text> accountTypes();
  [[nodiscard]] static std::optional<Dictionary> _dataclassesProperties();
  [[nodiscard]] static std::optional<Dictionary> _creatorsInfo();
  // Null while the creator file cannot be read.
  [[nodiscard]] static const Dictionary* _accountCreationMap();

  // Full and sync accounts, made by classes of loadable modules (see account_objects.h). The full account is made once
  // and kept; whatever hinders it throws AssertionFailure. A sync account that cannot be made is logged and null. An
  // absent type, which a record may come to have, is known to no configuration.
  [[nodiscard]] std::optional<std::string> _creatorClassNameForAccountType_creatorType_loader(
      std::optional<std::string_view> type, std::string_view creatorType, const AccountClassInfo* loader) const;
  [[nodiscard]] std::optional<std::string> fullAccountCreatorClassNameForAccountType_loader(
      std::optional<std::string_view> type, const AccountClassInfo* loader) const;
  [[nodiscard]] std::optional<std::string> syncAccountCreatorClassNameForAccountType(
      std::optional<std::string_view> type) const;
  std::shared_ptr<FullAccountObject> fullAccountUsingLoader(const AccountClassInfo* loader);
  void setFullAccount(std::shared_ptr<FullAccountObject> account);
  std::shared_ptr<SyncAccountObject> _cachedSyncAccount();
  bool refreshContainerWithIdentifier_forDataclass_isUserRequested(std::string_view identifier,
                                                                   std::string_view dataclass, bool isUserRequested);
  bool refreshContainerListForDataclass_isUserRequested(std::string_view dataclass, bool isUserRequested);
  bool refreshContainersForDataclass_isUserRequested(std::string_view dataclass, bool isUserRequested);
  bool refreshContainerWithIdentifier_forDataclass(std::string_view identifier, std::string_view dataclass);
  bool refreshContainerListForDataclass(std::string_view dataclass);
  bool refreshContainersForDataclass(std::string_view dataclass);
  // Calls the handler at once, on this thread, with 3: a basic record cannot renew credentials.
  void renewAccountCredentialsWithHandler(const std::function<void(int)>& handler);

 protected:
  BasicAccount();
  // What `initWithProperties` does, for a record of the class `Receiver`.
  template <typename Receiver>
  static std::shared_ptr<Receiver> recordOf(const Dictionary& properties) {
    struct [[gnu::visibility("hidden")]] Record final : Receiver {};
    const auto record = std::make_shared<Record>();
    return record->acceptProperties(properties) ? record : nullptr;
  }

 private:
  // Answers whether the record may be used.
  [[nodiscard]] ACCOUNT_EXPORT bool acceptProperties(const Dictionary& properties);
  [[nodiscard]] ACCOUNT_HIDDEN std::optional<Text> textForKey(std::string_view key) const;
  // The supported data classes of a type in the canonical order; an empty list for an unknown type.
  [[nodiscard]] ACCOUNT_HIDDEN static const Dataclasses& orderedSupportedDataclassesForAccountType(
      std::string_view type);

  Dictionary _originalProperties;
  Dictionary _properties;
  std::shared_ptr<FullAccountObject> _fullAccount;
  std::shared_ptr<SyncAccountObject> _syncAccount;
  std::shared_ptr<BasicAccount> _parentAccount;
};

}  // namespace accountsettings
