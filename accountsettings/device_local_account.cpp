#include "accountsettings/device_local_account.h"

#include <algorithm>
#include <array>

#include "platform/characters.h"
#include "platform/modules.h"
#include "platform/platform.h"

namespace accountsettings {
namespace {

constexpr StringConstant kIdentifier{"DeviceLocalAccount"};
constexpr StringConstant kTable{"DeviceLocalAccount"};
constexpr StringConstant kTetheredSyncDomain{"com.vorlix.mobile.tethered_sync"};
constexpr StringConstant kThisDevice{"Ferrox"};

struct TetheredSyncKey {
  StringConstant dataclass;
  StringConstant key;
};

constexpr std::array<TetheredSyncKey, 6> kTetheredSyncKeys{{
    {kAccountDataclassMail, "Mail Accounts"},
    {kAccountDataclassContacts, "Contacts"},
    {kAccountDataclassCalendars, "Calendars"},
    {kAccountDataclassReminders, "Calendars"},
    {kAccountDataclassBookmarks, "Bookmarks"},
    {kAccountDataclassNotes, "Notes"},
}};

std::string localized(std::string_view key) {
  return platform::current().strings->text(kTable, key).value_or(std::string{key});
}

std::string localizedForDeviceClass(std::string_view base) {
  const std::optional<PropertyValue> answer = platform::current().deviceInfo->answer("DeviceClass");
  const Text* const deviceClass = answer ? answer->asText() : nullptr;
  std::string suffix = platform::upperCased(deviceClass == nullptr ? Text{kThisDevice} : *deviceClass);
  std::ranges::replace(suffix, ' ', '_');
  return localized(std::string{base} + "_" + suffix);
}

std::shared_ptr<const AccountClassInfo> classInfo() {
  auto info = std::make_shared<AccountClassInfo>(std::string{DeviceLocalAccount::className().view()});
  info->initWithProperties = &DeviceLocalAccount::initWithProperties<>;
  info->accountWithBasicAccount = [](const std::shared_ptr<BasicAccount>& account) {
    return DeviceLocalAccount::accountWithBasicAccount(*account);
  };
  return info;
}

const platform::ClassRegistration kRegistration{classInfo()};

}  // namespace

DeviceLocalAccount::DeviceLocalAccount() = default;

Dictionary DeviceLocalAccount::propertiesWithClass(StringConstant className) {
  const Text typeString{class_typeString()};
  return {{kAccountType, kOnMyDeviceAccountType},
          {kAccountClass, className},
          {kAccountTypeString, typeString},
          {kAccountShortTypeString, typeString},
          {kAccountIdentifier, kIdentifier}};
}

std::string DeviceLocalAccount::class_typeString() { return localizedForDeviceClass("ON_MY_DEVICE_TYPE"); }

std::string_view DeviceLocalAccount::_identifier() { return kIdentifier; }

void DeviceLocalAccount::setParentAccount(std::shared_ptr<BasicAccount> parent) {
  BasicAccount::setParentAccount(std::move(parent));
}

std::optional<Text> DeviceLocalAccount::identifier() const { return Text{kIdentifier}; }
std::optional<Text> DeviceLocalAccount::displayName() const { return Text{class_typeString()}; }
std::optional<Text> DeviceLocalAccount::syncStoreIdentifier() const { return identifier(); }

std::string DeviceLocalAccount::tetheredSourceForDataClass(std::string_view dataclass) {
  const auto connection = platform::current().tetheredSync->connect();
  if (!connection.isOk()) return std::string{kThisDevice.view()};
  const auto* const row = std::ranges::find(kTetheredSyncKeys, dataclass, &TetheredSyncKey::dataclass);
  const auto key = row == kTetheredSyncKeys.end() ? std::nullopt : std::optional<std::string_view>{row->key};
  const std::optional<PropertyValue> value = connection.value()->value(kTetheredSyncDomain, key);
  const Dictionary* const dictionary = value ? value->asDictionary() : nullptr;
  const Text* const system = dictionary == nullptr ? nullptr : dictionary->text("SyncingOS");
  return system == nullptr ? std::string{kThisDevice.view()} : system->string();
}

bool DeviceLocalAccount::isTetheredSyncingDataclass(std::string_view dataclass) {
  const std::string source = tetheredSourceForDataClass(dataclass);
  return source == "Drevan" || source == "Windows";
}

std::string DeviceLocalAccount::localizedSyncSourceStringForDataClass_forBeginningOfSentence(std::string_view dataclass,
                                                                                             bool beginningOfSentence) {
  const std::string source = tetheredSourceForDataClass(dataclass);
  const std::string position = beginningOfSentence ? "" : "_MID_SENTENCE";
  if (source == "Drevan") return localized("FROM_MY_COMPUTER_TYPE_LUMO" + position);
  if (source == "Windows") return localized("FROM_MY_COMPUTER_TYPE_PC" + position);
  return localizedForDeviceClass("ON_MY_DEVICE_TYPE" + position);
}

std::string DeviceLocalAccount::localizedReferenceToSyncSourceStringForDataClass(std::string_view dataclass) {
  const std::string source = tetheredSourceForDataClass(dataclass);
  if (source == "Drevan") return localized("SYNCED_WITH_YOUR_COMPUTER_TYPE_LUMO_MID_SENTENCE");
  if (source == "Windows") return localized("SYNCED_WITH_YOUR_COMPUTER_TYPE_PC_MID_SENTENCE");
  return localizedForDeviceClass("ON_YOUR_DEVICE_TYPE_MID_SENTENCE");
}

}  // namespace accountsettings
