#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>
#include <vector>

#include "tools/session.h"

namespace tools {

// A data class as people write it ("Mail"), and back. The long form stands for itself.
[[nodiscard]] std::string shortDataclass(std::string_view dataclass);
[[nodiscard]] std::string fullDataclass(std::string_view name);
// "Mail, Notes".
[[nodiscard]] std::string joinedDataclasses(const Dataclasses& dataclasses);

// The key under which accounts of most types have the name of their server.
constexpr std::string_view kAccountHost = "Hostname";

// Values of the interface for programs as those of a file, and back; exactly.
[[nodiscard]] accountsettings::PropertyValue fileValueOf(const accounts::Value& value);
[[nodiscard]] accounts::Value valueOf(const accountsettings::PropertyValue& value);
[[nodiscard]] accounts::Value::Dictionary entriesOf(const accountsettings::Dictionary& properties);
// What the account has by itself, as the record of a file.
[[nodiscard]] accountsettings::Dictionary recordOf(const Account& account);

// What a person may mean an account by; whatever it does not have itself is empty.
struct Names {
  std::string identifier;
  std::string name;
  std::string user;
  std::string host;

  // Whether the word is the beginning of the identifier, the name, the user name, or user@host, in any case.
  [[nodiscard]] bool areMeantBy(const std::string& word) const;
  // "M1 (Home)", for messages.
  [[nodiscard]] std::string described() const;
};
[[nodiscard]] Names namesOf(const Account& account);
[[nodiscard]] Names namesOf(const accountsettings::Dictionary& properties);
// A text among the properties; empty where there is none.
[[nodiscard]] std::string textUnder(const accountsettings::Dictionary& properties, std::string_view key);

// What the properties are an account of, as a key to compare: its user name with its host, or where none is told with
// its name. Empty where there is no user name.
[[nodiscard]] std::string serviceOf(const accountsettings::Dictionary& properties);

// Values and accounts for machines. No credential is in them, only that it is there, and of data only its size.
[[nodiscard]] nlohmann::ordered_json jsonOf(const accountsettings::PropertyValue& value);
[[nodiscard]] nlohmann::ordered_json jsonOf(const accountsettings::Dictionary& properties);
// The well-known values of one account, without its properties.
[[nodiscard]] nlohmann::ordered_json jsonOf(const Account& account);

// The value under a key for people, on one line, held back in the same way.
[[nodiscard]] std::string lineOf(const accountsettings::PropertyValue& value, std::string_view key);

}  // namespace tools
