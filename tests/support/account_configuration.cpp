#include "tests/support/account_configuration.h"

#include <initializer_list>
#include <string>
#include <string_view>

namespace tests {
namespace {

Array dataclasses(std::initializer_list<std::string_view> names) {
  Array array;
  for (const std::string_view name : names) {
    array.emplace_back("com.vorlix.Dataclass." + std::string{name});
  }
  return array;
}

Dictionary type(std::initializer_list<std::string_view> supported) {
  return {{"Supported Dataclasses", dataclasses(supported)},
          {"Enable Actions", Array{"Merge Local Data", "Keep Local Data", "Delete Local Data"}},
          {"Disable Actions", Array{"Keep Local Data", "Delete Local Data"}},
          {"Delete Account Actions", Array{"Delete Data"}}};
}

}  // namespace

Dictionary accountTypesProperties() {
  return {{"Subscribed Calendar", type({"Calendars"})},
          {"CalDAV", type({"Calendars", "Reminders"})},
          {"CardDAV", type({"Contacts"})},
          {"BookmarkDAV", type({"Bookmarks"})},
          {"SMTP", type({})},
          {"Exchange", type({"Mail", "Contacts", "Calendars", "Reminders", "Notes", "ContactsSearch"})},
          {"LDAP", type({"ContactsSearch"})},
          {"Mail", type({"Mail", "Notes"})},
          {"Nimbra", type({"Mail", "Contacts", "Calendars", "Reminders", "Bookmarks", "Notes", "DeviceLocator",
                           "Quorvel", "KeyValue"})},
          {"Gmail", type({"Mail", "Contacts", "Calendars", "Notes"})},
          {"Yahoo", type({"Mail", "Contacts", "Calendars", "Notes"})},
          {"OnMyDevice", type({"Contacts", "Calendars", "Reminders", "Bookmarks", "Notes"})},
          {"IMAPNotes", type({"Notes"})},
          {"VorlixAccount", type({"Mail", "Contacts", "Calendars", "Reminders", "Bookmarks", "Notes", "MediaStream",
                                  "DeviceLocator", "Backup", "Quorvel", "KeyValue", "Tickora", "SharedStreams"})},
          {"KeldorIMAP", type({"Mail", "Notes"})}};
}

void removeAccountType(FakeDevice& device, std::string_view type) {
  Dictionary types = accountTypesProperties();
  types.remove(type);
  device.put("/resources/AccountTypesProperties.plist", types);
}

void putAccountConfiguration(FakeDevice& device) {
  device.put("/resources/AccountTypesProperties.plist", accountTypesProperties());
  Dictionary properties;
  for (const PropertyValue& name : dataclasses({"Contacts", "Calendars", "Reminders", "Notes"})) {
    properties.set(*name.asText(), Dictionary{{"Supports Multiple Stores", true}, {"Display Dataclass Switch", true}});
  }
  properties.set("com.vorlix.Dataclass.Bookmarks", Dictionary{{"Display Dataclass Switch", true}});
  device.put("/resources/DataclassesProperties.plist", properties);
  device.put("/resources/AccountCreators.plist", Dictionary{});
}

}  // namespace tests
