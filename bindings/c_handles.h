#pragma once

#include <algorithm>
#include <exception>
#include <initializer_list>
#include <map>
#include <memory>
#include <mutex>
#include <new>
#include <optional>
#include <string>
#include <unordered_map>
#include <utility>
#include <vector>

#include "account-settings.h"
#include "accounts/account_settings.h"

// What the handles of the C interface are. Strings are kept beside what they are of, since a handle lends them.

struct account_settings {
  accounts::AccountSettings settings;
};

struct account_settings_error {
  std::int32_t code;
  std::string sentence;
};

struct account_settings_value {
  explicit account_settings_value(accounts::Value given)
      : value{std::move(given)}, text{value.text()}, data{value.data()} {
    if (auto list = value.list()) elements = *std::move(list);
    if (auto dictionary = value.dictionary()) entries = *std::move(dictionary);
  }

  // With what it was filled with since it was made.
  [[nodiscard]] accounts::Value whole() const {
    if (!isFilled) return value;
    return value.kind() == accounts::Value::Kind::list ? accounts::Value{elements} : accounts::Value{entries};
  }

  void append(const accounts::Value& element) {
    elements.push_back(element);
    isFilled = true;
  }

  void set(const char* key, const accounts::Value& element) {
    for (auto place = places.size(); place < entries.size(); ++place) places.emplace(entries[place].first, place);
    const std::string name = *accounts::Value{key}.text();  // as a file has it
    const auto known = places.find(name);
    if (known == places.end()) entries.emplace_back(name, element);
    if (known != places.end()) entries[known->second].second = element;
    isFilled = true;
  }

  accounts::Value value;
  std::optional<std::string> text;
  std::optional<accounts::Value::Data> data;
  accounts::Value::List elements = {};                       // of a list
  accounts::Value::Dictionary entries = {};                  // of a dictionary
  std::unordered_map<std::string, std::size_t> places = {};  // of the first entries, by their keys
  bool isFilled = false;
};

struct account_settings_account {
  explicit account_settings_account(accounts::Account given)
      : account{std::move(given)},
        identifier{account.identifier()},
        type{account.type()},
        accountClass{account.accountClass()},
        displayName{account.displayName()},
        username{account.username()},
        syncIdentifier{account.syncIdentifier()},
        parent{account.parentIdentifier()} {}

  accounts::Account account;
  std::string identifier;
  std::string type;
  std::string accountClass;
  std::optional<std::string> displayName;
  std::optional<std::string> username;
  std::optional<std::string> syncIdentifier;
  std::string parent;
  mutable std::once_flag serviceAsked = {};  // which opens a module
  mutable std::optional<accounts::Service> service = std::nullopt;
  mutable std::mutex textsMutex = {};
  mutable std::map<std::string, std::string> texts = {};  // that were asked for, by their keys
};

struct account_settings_accounts {
  std::vector<accounts::Account> list;
  std::optional<accounts::Accounts> whole;  // where they are all accounts of a device
};

struct account_settings_edit {
  accounts::Edit edit;
};

struct account_settings_changes {
  std::vector<accounts::Change> changes;
  std::optional<accounts::Error> notAnnounced;
};

struct account_settings_watch {
  accounts::Watch watch;
};

namespace accounts::c {

// What the function answers; where it cannot for want of memory, the other value.
template <typename Function, typename Otherwise>
auto orElse(Otherwise otherwise, const Function& function) noexcept -> decltype(function()) {
  try {
    return function();
  } catch (const std::exception&) {
    return otherwise;
  }
}

inline void tell(account_settings_error** error, std::int32_t code, const std::string& sentence) noexcept {
  if (error == nullptr) return;
  *error = orElse(static_cast<account_settings_error*>(nullptr), [&] {
    return new account_settings_error{code, sentence};
  });
}

// The handle that the function makes of what it is answered, or null and the error.
template <typename Function>
auto made(account_settings_error** error, const Function& function) noexcept -> decltype(function()) {
  if (error != nullptr) *error = nullptr;
  try {
    return function();
  } catch (const std::exception&) {
    tell(error, ACCOUNT_SETTINGS_NO_MEMORY, "no memory");  // short enough to need none
    return {};
  }
}

template <typename Answer>
bool isDone(const accounts::Result<Answer>& result, account_settings_error** error) {
  if (!result.isOk()) tell(error, static_cast<std::int32_t>(result.error().code), result.error().sentence);
  return result.isOk();
}

// Whether nothing of what a call needs is NULL.
inline bool areGiven(std::initializer_list<const void*> arguments, account_settings_error** error) {
  const bool areAll = std::find(arguments.begin(), arguments.end(), nullptr) == arguments.end();
  if (!areAll) tell(error, ACCOUNT_SETTINGS_UNSUITABLE, "a text or a value is NULL");
  return areAll;
}

template <typename Handle, typename Content>
Handle* handle(std::optional<Content> content) {
  return content ? new Handle{*std::move(content)} : nullptr;
}

inline std::string orEmpty(const char* text) { return text == nullptr ? std::string{} : std::string{text}; }

template <typename Content>
bool put(const std::optional<Content>& content, Content* place) {
  if (content && place != nullptr) *place = *content;
  return content.has_value();
}

}  // namespace accounts::c
