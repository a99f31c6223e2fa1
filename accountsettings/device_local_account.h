#pragma once

#include <memory>
#include <string>
#include <string_view>

#include "accountsettings/basic_account.h"

namespace accountsettings {

// The implicit account of all data that belongs to no online account: kept only on the device, or synced with a desktop
// computer over a cable. Identifier, sync-store identifier and name are fixed, whatever its properties say. It is its
// own full account.
//
// What is made, is made of the receiving class. A class derived from this one has a `className` of its own and names
// itself: `Derived::accountWithProperties<Derived>(properties)`.
class ACCOUNT_EXPORT DeviceLocalAccount : public BasicAccount, public FullAccountObject {
 public:
  [[nodiscard]] static constexpr StringConstant className() { return "DeviceLocalAccount"; }

  // The properties of a new device-local account: type, class, both type strings and identifier, nothing else.
  template <typename Receiver = DeviceLocalAccount>
  [[nodiscard]] static Dictionary basicAccountProperties() {
    return propertiesWithClass(Receiver::className());
  }
  // The localised name of "on this device", for the device's class.
  [[nodiscard]] static std::string class_typeString();
  [[nodiscard]] static std::string_view _identifier();
  // Null as BasicAccount's are.
  template <typename Receiver = DeviceLocalAccount>
  static std::shared_ptr<Receiver> accountWithProperties(const Dictionary& properties) {
    return initWithProperties<Receiver>(properties);
  }
  template <typename Receiver = DeviceLocalAccount>
  static std::shared_ptr<Receiver> initWithProperties(const Dictionary& properties) {
    return recordOf<Receiver>(properties);
  }
  template <typename Receiver = DeviceLocalAccount>
  static std::shared_ptr<Receiver> accountWithBasicAccount(const BasicAccount& account) {
    return initWithProperties<Receiver>(account.properties());
  }

  [[nodiscard]] std::optional<Text> identifier() const override;
  [[nodiscard]] std::optional<Text> displayName() const override;
  [[nodiscard]] std::optional<Text> syncStoreIdentifier() const override;
  void setParentAccount(std::shared_ptr<BasicAccount> parent) override;

  // The operating system of the desktop computer that the data class syncs with ("Drevan" or "Windows"), or "Ferrox".
  [[nodiscard]] static std::string tetheredSourceForDataClass(std::string_view dataclass);
  [[nodiscard]] static bool isTetheredSyncingDataclass(std::string_view dataclass);
  // Localised: the name of the place that the data class's local data comes from, and a phrase that refers to it.
  [[nodiscard]] static std::string localizedSyncSourceStringForDataClass_forBeginningOfSentence(
      std::string_view dataclass, bool beginningOfSentence);
  [[nodiscard]] static std::string localizedReferenceToSyncSourceStringForDataClass(std::string_view dataclass);

 protected:
  DeviceLocalAccount();

 private:
  [[nodiscard]] static Dictionary propertiesWithClass(StringConstant className);
};

}  // namespace accountsettings
