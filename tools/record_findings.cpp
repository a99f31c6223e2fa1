#include <algorithm>
#include <cstddef>
#include <string>

#include "tools/account_view.h"
#include "tools/findings.h"

namespace tools {
namespace {

using accountsettings::AccountsManager;
using accountsettings::Array;
using accountsettings::BasicAccount;
using accountsettings::Dictionary;
using accountsettings::PropertyValue;
using accountsettings::Text;

constexpr const char* kDropsRecord = "a migration drops the record";

const Dictionary& propertiesIn(const PropertyValue& element) {
  static const Dictionary kNone;
  const Dictionary* const properties = element.asDictionary();
  return properties == nullptr ? kNone : *properties;
}

// A value as a clause: `Class is "MailAccount"`.
std::string clauseOf(const Dictionary& properties, std::string_view key) {
  const PropertyValue* const value = properties.find(key);
  if (value == nullptr) return "there is no " + std::string{key};
  return std::string{key} + " is " + (value->asText() == nullptr ? "no text: " : "") + lineOf(*value, key);
}

std::string placeIn(std::string_view array, std::size_t index) {
  return std::string{array} + "[" + std::to_string(index) + "]";
}

// One loaded record, or child of one, that others may share an identifier with.
struct Place {
  std::string place;
  bool isChild;
};
using PlacesByIdentifier = platform::InsertionOrderedMap<std::vector<Place>>;

// Goes through the records of one file, finding after finding.
class Examination {
 public:
  void examine(const PropertyValue& element, const std::string& place);
  // What records mean to each other, once each was examined.
  void compare(const Array& accounts);
  Findings takeFindings() { return std::move(_findings); }

 private:
  void add(std::string_view kind, const Dictionary& record, std::string what, std::string migration);
  bool explainNoRecord(const PropertyValue& element, const std::string& migration);
  void explainDropped(const PropertyValue& element);
  void addRepairs(const Dictionary& before, const Dictionary& after);
  void examineChildren(const Dictionary& parent);
  void examineChild(const PropertyValue& element);
  void note(const Dictionary& record, bool isChild);
  [[nodiscard]] std::string placeFoundUnder(const AccountsManager& store,
                                            const accountsettings::Text& identifier) const;

  std::string _place;  // of the record that is looked at
  Findings _findings;
  std::vector<std::string> _loadedPlaces;
  PlacesByIdentifier _placesByIdentifier;
};

void Examination::add(std::string_view kind, const Dictionary& record, std::string what, std::string migration) {
  _findings.push_back(
      {kind, _place, textUnder(record, accountsettings::kAccountIdentifier), std::move(what), std::move(migration)});
}

void Examination::examine(const PropertyValue& element, const std::string& place) {
  _place = place;
  const auto loaded = AccountsManager::initWithAccounsInfoArray({element});
  if (loaded->count() == 0) {
    explainDropped(element);
    return;
  }
  _loadedPlaces.push_back(place);
  const auto& account = *loaded->allBasicAccounts().front();
  addRepairs(account.originalProperties(), account.properties());
  note(propertiesIn(element), false);
  examineChildren(propertiesIn(element));
}

// Answers whether the element can be no account of any kind.
bool Examination::explainNoRecord(const PropertyValue& element, const std::string& migration) {
  const Dictionary& record = propertiesIn(element);
  if (element.asDictionary() == nullptr) {
    add("no-record", record, "it is no dictionary", migration);
    return true;
  }
  if (BasicAccount::initWithProperties(record) != nullptr) return false;
  const bool isTypeKnown = BasicAccount::_isValidAccountType(textUnder(record, accountsettings::kAccountType));
  if (!isTypeKnown) {
    add("unknown-type", record, clauseOf(record, accountsettings::kAccountType) + ", which is no account type",
        migration);
  }
  const bool hasClass = !textUnder(record, accountsettings::kAccountClass).empty();
  if (!hasClass) add("no-class", record, clauseOf(record, accountsettings::kAccountClass), migration);
  return true;
}

void Examination::explainDropped(const PropertyValue& element) {
  const Dictionary& record = propertiesIn(element);
  if (!explainNoRecord(element, kDropsRecord)) {
    add("unknown-class", record,
        clauseOf(record, accountsettings::kAccountClass) +
            ", which the mail application does not know, and its mail directory tells no better one",
        kDropsRecord);
  }
  const Array* const children = record.array(accountsettings::kAccountChildAccounts);
  if (children == nullptr || children->empty()) return;
  add("orphaned-children", record, "it has child accounts: " + std::to_string(children->size()),
      "a migration drops them with it");
}

void Examination::addRepairs(const Dictionary& before, const Dictionary& after) {
  if (before.text(accountsettings::kAccountIdentifier) == nullptr) {
    add("no-identifier", before, clauseOf(before, accountsettings::kAccountIdentifier), "a migration gives it one");
  }
  for (const auto& [key, value] : after) {
    const PropertyValue* const given = before.find(key);
    const bool isRepair = given != nullptr && *given != value && key != accountsettings::kAccountIdentifier;
    if (!isRepair) continue;
    add("repairable-class", before, clauseOf(before, key) + ", which the mail application does not know",
        "a migration sets it to " + lineOf(value, key));
  }
}

void Examination::examineChildren(const Dictionary& parent) {
  const PropertyValue* const children = parent.find(accountsettings::kAccountChildAccounts);
  if (children == nullptr) return;
  const Array* const array = children->asArray();
  if (array == nullptr) {
    add("unreadable-children", parent, "its child accounts are no array",
        "a migration finds none and leaves the value as it is");
    return;
  }
  const std::string place = _place + "." + std::string{accountsettings::kAccountChildAccounts.view()};
  for (std::size_t index = 0; index < array->size(); ++index) {
    _place = placeIn(place, index);
    examineChild((*array)[index]);
  }
}

void Examination::examineChild(const PropertyValue& element) {
  if (explainNoRecord(element, "a migration knows no such child and leaves it in its parent's record")) return;
  const Dictionary& child = propertiesIn(element);
  if (child.text(accountsettings::kAccountIdentifier) == nullptr) {
    add("no-identifier", child, clauseOf(child, accountsettings::kAccountIdentifier),
        "a migration gives it another one at every load and keeps none");
  }
  if (child.contains(accountsettings::kAccountChildAccounts)) {
    add("orphaned-children", child, "it is a child and has child accounts of its own",
        "a migration does not look at them and leaves them where they are");
  }
  note(child, true);
}

void Examination::note(const Dictionary& record, bool isChild) {
  const Text* const identifier = record.text(accountsettings::kAccountIdentifier);
  if (identifier == nullptr) return;
  if (identifier->empty()) add("no-identifier", record, "its identifier is empty", "a migration leaves it so");
  if (auto* const places = _placesByIdentifier.find(*identifier)) {
    places->push_back({_place, isChild});
  } else {
    _placesByIdentifier.set(*identifier, {{_place, isChild}});
  }
}

// A child's identifier leads to its parent, so what is found then is a child: the last one.
std::string Examination::placeFoundUnder(const AccountsManager& store, const accountsettings::Text& identifier) const {
  const auto& order = store.allBasicAccounts();
  const auto found = store.accountWithIdentifier(identifier);
  if (found->identifier() != identifier) {
    return _placesByIdentifier.find(identifier)->back().place;
  }
  return _loadedPlaces[static_cast<std::size_t>(std::ranges::find(order, found) - order.begin())];
}

void Examination::compare(const Array& accounts) {
  const auto store = AccountsManager::initWithAccounsInfoArray(accounts);
  for (const auto& [identifier, places] : _placesByIdentifier) {
    if (places.size() == 1) continue;
    const auto found = placeFoundUnder(*store, identifier);
    for (const auto& [place, isChild] : places) {
      if (place == found) continue;
      _findings.push_back({"duplicate-identifier", place, identifier.string(), found + " has the same identifier",
                           std::string{"a migration keeps both, but finds only that one"} +
                               (isChild ? "" : ", and saves its values in place of these")});
    }
  }
}

}  // namespace

Findings findingsOfRecords(const Array& accounts) {
  Examination examination;
  for (std::size_t index = 0; index < accounts.size(); ++index) {
    examination.examine(accounts[index], placeIn(accountsettings::kPlistAccountsKey.view(), index));
  }
  examination.compare(accounts);
  return examination.takeFindings();
}

}  // namespace tools
