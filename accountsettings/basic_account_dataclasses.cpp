#include <algorithm>
#include <array>
#include <set>
#include <string>
#include <unordered_set>

#include "accountsettings/basic_account.h"
#include "accountsettings/dataclass_lists.h"
#include "accountsettings/equality_key.h"
#include "platform/kept_for_life.h"
#include "platform/platform.h"

namespace accountsettings {
namespace {

using Dataclasses = BasicAccount::Dataclasses;
using platform::ManagedFeature;

// What both lists hold, each once however often it stands there, in the order of the first.
Dataclasses intersection(const Dataclasses& list, const Dataclasses& other) {
  Dataclasses common;
  common.reserve(list.size());
  for (const Text& dataclass : list) {
    if (containsText(other, dataclass) && !containsText(common, dataclass)) common.push_back(dataclass);
  }
  return common;
}

// The elements of a stored list as a set: each once, of whatever kind, in the order in which they first stand.
Array setOfElements(const Array* stored) {
  if (stored == nullptr) return {};
  std::set<std::string> seen;  // ordered: no list of a file can make it slow
  Array elements;
  elements.reserve(stored->size() + 1);
  std::ranges::copy_if(*stored, std::back_inserter(elements),
                       [&seen](const PropertyValue& element) { return seen.insert(equalityKey(element)).second; });
  return elements;
}

struct ManagedDataclass {
  ManagedFeature feature;
  StringConstant dataclass;
};

constexpr std::array<ManagedDataclass, 6> kManagedDataclasses{{
    {ManagedFeature::cloudDocumentSync, kAccountDataclassQuorvel},
    {ManagedFeature::cloudDocumentSync, kAccountDataclassKeyValue},
    {ManagedFeature::mediaStream, kAccountDataclassMediaStream},
    {ManagedFeature::sharedStreams, kAccountDataclassSharedStreams},
    {ManagedFeature::cloudBackup, kAccountDataclassBackup},
    {ManagedFeature::cardsWhileLocked, kAccountDataclassTickora},
}};

constexpr std::array kManagedFeatures{ManagedFeature::cloudDocumentSync, ManagedFeature::mediaStream,
                                      ManagedFeature::sharedStreams, ManagedFeature::cloudBackup,
                                      ManagedFeature::cardsWhileLocked};

// The device is asked only where its answer can matter.
Dataclasses withoutRestricted(Dataclasses list) {
  const auto isManaged = [](const Text& dataclass) {
    return std::ranges::find(kManagedDataclasses, dataclass.view(), &ManagedDataclass::dataclass) !=
           kManagedDataclasses.end();
  };
  if (std::ranges::none_of(list, isManaged)) return list;
  const auto restricted = BasicAccount::_profileRestrictedDataclasses();
  std::erase_if(list, [&restricted](const Text& dataclass) { return restricted.contains(dataclass); });
  return list;
}

// What the service grants, before any restriction of the device.
Dataclasses grantedDataclasses(const BasicAccount& account) {
  const Dataclasses& supported = account.supportedDataclasses();
  const std::optional<PropertyValue> stored = account.accountPropertyForKey(kAccountProvisionedDataclasses);
  const Array* const list = stored ? stored->asArray() : nullptr;
  return intersection(list == nullptr ? supported : textsIn(*list), supported);
}

}  // namespace

const Dataclasses& BasicAccount::supportedDataclasses() const {
  static const Dataclasses& none = platform::keptForLife<Dataclasses>();
  const std::optional<Text> ofType = type();
  return ofType ? orderedSupportedDataclassesForAccountType(*ofType) : none;
}

Dataclasses BasicAccount::provisionedDataclasses() const {
  return _orderedDataclasses(withoutRestricted(grantedDataclasses(*this)));
}

std::optional<Dataclasses> BasicAccount::enabledDataclasses() const {
  if (_parentAccount != nullptr) {
    std::optional<Dataclasses> inherited = _parentAccount->enabledDataclasses();
    if (inherited && !inherited->empty()) return inherited;
  }
  const std::optional<PropertyValue> stored = accountPropertyForKey(kAccountEnabledDataclasses);
  const Array* const list = stored ? stored->asArray() : nullptr;
  if (list == nullptr) return std::nullopt;
  return _orderedDataclasses(withoutRestricted(intersection(textsIn(*list), grantedDataclasses(*this))));
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
  const PropertyValue member{dataclass};
  Array elements = setOfElements(_properties.array(kAccountEnabledDataclasses));
  if (!enabled) std::erase(elements, member);
  if (enabled && std::ranges::find(elements, member) == elements.end()) elements.push_back(member);
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
  const std::vector<platform::Restriction> answers = platform::current().restrictions->restrictions(kManagedFeatures);
  std::unordered_set<std::string_view> restricted;
  for (const ManagedDataclass& each : kManagedDataclasses) {
    const auto asked = std::ranges::find(kManagedFeatures, each.feature) - kManagedFeatures.begin();
    if (answers[static_cast<std::size_t>(asked)] == platform::Restriction::notAllowed)
      restricted.insert(each.dataclass);
  }
  return restricted;
}

}  // namespace accountsettings
