#include <algorithm>
#include <unordered_set>

#include "accountsettings/basic_account.h"
#include "accountsettings/dataclass_lists.h"
#include "platform/platform.h"

namespace accountsettings {
namespace {

using Dataclasses = BasicAccount::Dataclasses;
using platform::ManagedFeature;

Dataclasses intersection(Dataclasses list, const Dataclasses& other) {
  std::erase_if(list, [&other](const Text& dataclass) { return !containsText(other, dataclass); });
  return list;
}

// The elements of a stored list as a set, in the order in which they stand; what is no text is kept as it is.
Array setOfElements(const Array* stored) {
  if (stored == nullptr) return {};
  std::unordered_set<std::string_view> seen;
  Array elements;
  elements.reserve(stored->size() + 1);
  std::copy_if(stored->begin(), stored->end(), std::back_inserter(elements), [&seen](const PropertyValue& element) {
    return element.asText() == nullptr || seen.insert(element.asText()->view()).second;
  });
  return elements;
}

bool isDataclass(const PropertyValue& element, std::string_view dataclass) {
  return element.asText() != nullptr && *element.asText() == dataclass;
}

void add(Array& set, std::string_view dataclass) {
  const auto isThere = [dataclass](const PropertyValue& element) { return isDataclass(element, dataclass); };
  if (std::none_of(set.begin(), set.end(), isThere)) set.emplace_back(dataclass);
}

void remove(Array& set, std::string_view dataclass) {
  std::erase_if(set, [dataclass](const PropertyValue& element) { return isDataclass(element, dataclass); });
}

}  // namespace

const Dataclasses& BasicAccount::supportedDataclasses() const {
  return _orderedSupportedDataclassesForAccountType(type().value_or(Text{}));
}

Dataclasses BasicAccount::provisionedDataclasses() const {
  const Dataclasses& supported = supportedDataclasses();
  const std::optional<PropertyValue> stored = accountPropertyForKey(kAccountProvisionedDataclasses);
  const Array* const list = stored ? stored->asArray() : nullptr;
  Dataclasses provisioned = list == nullptr ? supported : intersection(textsIn(*list), supported);
  const auto restricted = _profileRestrictedDataclasses();
  std::erase_if(provisioned, [&restricted](const Text& dataclass) { return restricted.contains(dataclass); });
  return _orderedDataclasses(provisioned);
}

std::optional<Dataclasses> BasicAccount::enabledDataclasses() const {
  if (_parentAccount != nullptr) {
    std::optional<Dataclasses> inherited = _parentAccount->enabledDataclasses();
    if (inherited && !inherited->empty()) return inherited;
  }
  const std::optional<PropertyValue> stored = accountPropertyForKey(kAccountEnabledDataclasses);
  const Array* const list = stored ? stored->asArray() : nullptr;
  if (list == nullptr) return std::nullopt;
  return _orderedDataclasses(intersection(textsIn(*list), provisionedDataclasses()));
}

bool BasicAccount::isEnabledForDataclass(std::string_view dataclass) const {
  const std::optional<Dataclasses> enabled = enabledDataclasses();
  return enabled && containsText(*enabled, dataclass);
}

void BasicAccount::setEnabled_forDataclass(bool enabled, std::string_view dataclass) {
  if (!containsText(supportedDataclasses(), dataclass)) return;
  _forcedSetEnabled_forDataclass(enabled, dataclass);
}

void BasicAccount::_forcedSetEnabled_forDataclass(bool enabled, std::string_view dataclass) {
  Array elements = setOfElements(_properties.array(kAccountEnabledDataclasses));
  if (enabled) {
    add(elements, dataclass);
  } else {
    remove(elements, dataclass);
  }
  setAccountProperty_forKey(std::move(elements), kAccountEnabledDataclasses);
}

void BasicAccount::setEnabledForDataclasses(const Dataclasses& dataclasses) {
  _properties.remove(kAccountEnabledDataclasses);
  for (const Text& dataclass : dataclasses) setEnabled_forDataclass(true, dataclass);
}

Dataclasses BasicAccount::_orderedDataclasses(const Dataclasses& dataclasses) {
  Dataclasses rest = dataclasses;
  Dataclasses ordered;
  ordered.reserve(rest.size());
  for (const Text& known : allSupportedDataclasses()) {
    if (std::erase(rest, known) > 0) ordered.push_back(known);
  }
  std::move(rest.begin(), rest.end(), std::back_inserter(ordered));
  return ordered;
}

std::unordered_set<std::string_view> BasicAccount::_profileRestrictedDataclasses() {
  std::unordered_set<std::string_view> restricted;
  const auto ask = [&restricted, &service = *platform::current().restrictions](
                       ManagedFeature feature, std::initializer_list<std::string_view> dataclasses) {
    if (service.restriction(feature) == platform::Restriction::notAllowed) restricted.insert(dataclasses);
  };
  ask(ManagedFeature::cloudDocumentSync, {kAccountDataclassQuorvel, kAccountDataclassKeyValue});
  ask(ManagedFeature::mediaStream, {kAccountDataclassMediaStream});
  ask(ManagedFeature::sharedStreams, {kAccountDataclassSharedStreams});
  ask(ManagedFeature::cloudBackup, {kAccountDataclassBackup});
  ask(ManagedFeature::cardsWhileLocked, {kAccountDataclassTickora});
  return restricted;
}

}  // namespace accountsettings
