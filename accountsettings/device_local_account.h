#pragma once

#include <memory>
#include <string>
#include <string_view>

#include "accountsettings/basic_account.h"

namespace accountsettings {

// The implicit account of all data that belongs to no online account: kept only on the device, or synced with a desktop
// computer over a cable. Identifier, sync-store identifier and name are fixed, whatever its properties say.
class ACCOUNT_EXPORT DeviceLocalAccount : public BasicAccount {
 public:
  // The properties of a new device-local account: type, class, both type strings and identifier, nothing else.
  [[nodiscard]] static Dictionary basicAccountProperties();
  // The localised name of "on this device", for the device's class.
  [[nodiscard]] static std::string class_typeString();
  [[nodiscard]] static std::string_view _identifier();
  static std::shared_ptr<DeviceLocalAccount> accountWithProperties(const Dictionary& properties);
  static std::shared_ptr<DeviceLocalAccount> initWithProperties(const Dictionary& properties);
  static std::shared_ptr<DeviceLocalAccount> accountWithBasicAccount(const BasicAccount& account);

  [[nodiscard]] std::optional<Text> identifier() const override;
  [[nodiscard]] std::optional<Text> displayName() const override;
  [[nodiscard]] std::optional<Text> syncStoreIdentifier() const override;

  // The operating system of the desktop computer that the data class syncs with ("Drevan" or "Windows"), or "Ferrox".
  [[nodiscard]] static std::string tetheredSourceForDataClass(std::string_view dataclass);
  [[nodiscard]] static bool isTetheredSyncingDataclass(std::string_view dataclass);
  // Localised: the name of the place that the data class's local data comes from, and a phrase that refers to it.
  [[nodiscard]] static std::string localizedSyncSourceStringForDataClass_forBeginningOfSentence(
      std::string_view dataclass, bool beginningOfSentence);
  [[nodiscard]] static std::string localizedReferenceToSyncSourceStringForDataClass(std::string_view dataclass);

 protected:
  DeviceLocalAccount();
};

}  // namespace accountsettings
