#pragma once

#include <algorithm>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "platform/property_value.h"

// The account store as a reader of its contract would write it down: lists, walked from end to end, one step after the
// other, and no index but the ones that the contract names. It knows nothing of the library; records are its own.
namespace tests::model {

using platform::Array;
using platform::Dictionary;
using platform::PropertyValue;

struct Record;
using RecordPtr = std::shared_ptr<Record>;
using Records = std::vector<RecordPtr>;

struct Record {
  Dictionary properties;
  RecordPtr parent;

  [[nodiscard]] std::optional<PropertyValue> value(const char* key) const {
    if (const PropertyValue* const own = properties.find(key)) return *own;
    return parent == nullptr ? std::nullopt : parent->value(key);
  }
  [[nodiscard]] std::optional<std::string> text(const char* key) const {
    const std::optional<PropertyValue> found = value(key);
    if (!found || found->asText() == nullptr) return std::nullopt;
    return found->asText()->string();
  }
  [[nodiscard]] std::string identifier() const { return text("Identifier").value(); }
};

// Null where the properties make no account. Every dictionary of these tests that has a class makes one.
inline RecordPtr recordFrom(const Dictionary& properties) {
  if (!properties.contains("Class")) return nullptr;
  return std::make_shared<Record>(Record{properties, nullptr});
}

// A map as a list of pairs; new keys come last.
template <typename Value>
struct Map {
  std::vector<std::pair<std::string, Value>> pairs;

  [[nodiscard]] std::optional<Value> at(const std::string& key) const {
    for (const auto& pair : pairs) {
      if (pair.first == key) return pair.second;
    }
    return std::nullopt;
  }
  void set(const std::string& key, const Value& value) {
    for (auto& pair : pairs) {
      if (pair.first == key) {
        pair.second = value;
        return;
      }
    }
    pairs.emplace_back(key, value);
  }
  void remove(const std::string& key) {
    std::erase_if(pairs, [&key](const auto& pair) { return pair.first == key; });
  }
};

struct Store {
  Map<RecordPtr> topLevelByID;
  Records ordered;
  Map<RecordPtr> childrenByID;
  Map<std::string> childIDToParentID;

  // --- Look-up ---

  [[nodiscard]] RecordPtr accountWithIdentifier(const std::string& identifier) const {
    if (const auto account = topLevelByID.at(identifier)) return *account;
    const auto child = childrenByID.at(identifier);
    if (!child) return nullptr;
    const auto parentID = childIDToParentID.at((*child)->identifier());
    if (!parentID) return nullptr;
    return topLevelByID.at(*parentID).value_or(nullptr);
  }

  [[nodiscard]] RecordPtr syncableAccountWithSyncIdentifier(const std::string& identifier) const {
    for (const Map<RecordPtr>* const map : {&topLevelByID, &childrenByID}) {
      for (const auto& [key, account] : map->pairs) {
        if (account->text("Sync Identifier") == identifier) return account;
      }
    }
    return nullptr;
  }

  [[nodiscard]] Records allBasicSyncableAccounts() const {
    Records accounts = ordered;
    for (const auto& [key, child] : childrenByID.pairs) accounts.push_back(child);
    return accounts;
  }

  [[nodiscard]] static bool isAmong(const std::vector<std::string>& types, const RecordPtr& account) {
    return std::find(types.begin(), types.end(), account->text("Type").value()) != types.end();
  }

  [[nodiscard]] Records basicAccountsWithTypes(const std::vector<std::string>& types) const {
    Records accounts;
    for (const RecordPtr& account : ordered) {
      if (isAmong(types, account)) accounts.push_back(account);
    }
    return accounts;
  }

  // --- Children ---

  void loadChildren(const RecordPtr& account) {
    removeChildren(account->identifier());
    const auto children = account->value("ChildAccounts");
    if (!children) return;
    for (const PropertyValue& properties : *children->asArray()) {
      const RecordPtr child = recordFrom(*properties.asDictionary());
      if (child == nullptr) continue;
      child->parent = account;
      childrenByID.set(child->identifier(), child);
      childIDToParentID.set(child->identifier(), account->identifier());
    }
  }

  void removeChildren(const std::string& parentID) {
    const Map<std::string> walked = childIDToParentID;
    for (const auto& [childID, recordedParentID] : walked.pairs) {
      if (recordedParentID != parentID) continue;
      childIDToParentID.remove(childID);
      childrenByID.remove(childID);
    }
  }

  // --- Mutations ---

  void registerAccount(const RecordPtr& account) {
    topLevelByID.set(account->identifier(), account);
    ordered.push_back(account);
    loadChildren(account);
  }

  void insert(const RecordPtr& account) {
    if (!topLevelByID.at(account->identifier())) registerAccount(account);
  }

  void update(const RecordPtr& account) {
    for (std::size_t position = ordered.size(); position-- > 0;) {
      if (ordered[position]->identifier() != account->identifier()) continue;
      ordered[position] = account;
      topLevelByID.set(account->identifier(), account);
      loadChildren(account);
    }
  }

  void remove(const RecordPtr& account) {
    removeChildren(account->identifier());
    topLevelByID.remove(account->identifier());
    for (std::size_t position = ordered.size(); position-- > 0;) {
      if (ordered[position]->identifier() != account->identifier()) continue;
      const RecordPtr found = ordered[position];
      std::erase(ordered, found);
      return;
    }
  }

  void replace(const RecordPtr& oldAccount, const RecordPtr& newAccount) {
    Records copy = ordered;
    removeChildren(oldAccount->identifier());
    topLevelByID.remove(oldAccount->identifier());
    *std::find(copy.begin(), copy.end(), oldAccount) = newAccount;
    loadChildren(newAccount);
    ordered = copy;
  }

  void replaceWithTypes(const std::vector<std::string>& types, const Records& given) {
    Records copy = ordered;
    Map<RecordPtr> newByID;
    Map<RecordPtr> givenByID;
    for (const RecordPtr& account : given) givenByID.set(account->identifier(), account);
    Records toPlace = given;
    for (std::size_t position = copy.size(); position-- > 0;) {
      const RecordPtr old = copy[position];
      const std::string identifier = old->identifier();
      if (const auto replacing = givenByID.at(identifier)) {
        copy[position] = *replacing;
        newByID.set(identifier, *replacing);
        std::erase(toPlace, *replacing);
        loadChildren(*replacing);
      } else if (!isAmong(types, old)) {
        newByID.set(identifier, old);
      } else {
        removeChildren(identifier);
        copy.erase(copy.begin() + static_cast<std::ptrdiff_t>(position));
      }
    }
    for (const RecordPtr& account : toPlace) {
      if (account->parent == nullptr) {
        copy.push_back(account);
        newByID.set(account->identifier(), account);
        loadChildren(account);
      } else {
        moveChild(account, newByID);
      }
    }
    ordered = copy;
    topLevelByID = newByID;
  }

  void moveChild(const RecordPtr& child, const Map<RecordPtr>& newByID) {
    const auto newParent = newByID.at(child->parent->identifier());
    const auto recorded = childIDToParentID.at(child->identifier());
    if (recorded && newParent && *recorded == (*newParent)->identifier()) {
      removeChild(child->identifier(), *newParent);
    } else if (recorded) {
      const RecordPtr oldParent = accountWithIdentifier(*recorded);
      if (oldParent != nullptr) removeChild(child->identifier(), oldParent);
    }
    if (newParent) addChild(child, *newParent);
  }

  void addChild(const RecordPtr& child, const RecordPtr& parent) {
    const auto present = parent->value("ChildAccounts");
    Array children = present ? *present->asArray() : Array{};
    children.emplace_back(child->properties);
    parent->properties.set("ChildAccounts", children);
    loadChildren(parent);
  }

  void removeChild(const std::string& identifier, const RecordPtr& parent) {
    if (const auto present = parent->value("ChildAccounts")) {
      Array children = *present->asArray();
      for (const PropertyValue& properties : *present->asArray()) {
        const RecordPtr child = recordFrom(*properties.asDictionary());
        if (child != nullptr && child->identifier() == identifier) std::erase(children, properties);
      }
      parent->properties.set("ChildAccounts", children);
    }
    loadChildren(parent);
  }
};

}  // namespace tests::model
