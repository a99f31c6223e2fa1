#include <algorithm>
#include <array>
#include <bit>
#include <map>
#include <set>
#include <string>
#include <unordered_set>

#include "accountsettings/basic_account.h"
#include "accountsettings/dataclass_lists.h"
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

void write(std::string& key, const PropertyValue& value);

template <typename Number>
void writeNumber(std::string& key, Number number) {
  const auto bytes = std::bit_cast<std::array<char, sizeof number>>(number);
  key.append(bytes.data(), bytes.size());
}

void writeSized(std::string& key, std::string_view bytes) {
  writeNumber(key, bytes.size());
  key += bytes;
}

void writeEach(std::string& key, const Array& array) {
  writeNumber(key, array.size());
  for (const PropertyValue& element : array) write(key, element);
}

// Dictionaries are equal whatever their order.
void writeEach(std::string& key, const Dictionary& dictionary) {
  std::map<std::string_view, const PropertyValue*> sorted;
  for (const auto& [name, held] : dictionary) sorted.emplace(name.view(), &held);
  writeNumber(key, sorted.size());
  for (const auto& [name, held] : sorted) {
    writeSized(key, name);
    write(key, *held);
  }
}

// Equal values, and only they, write the same bytes.
void write(std::string& key, const PropertyValue& value) {
  key.push_back(static_cast<char>(value.kind()));
  if (const Text* const text = value.asText()) return writeSized(key, text->view());
  if (const auto integer = value.asInteger()) {
    writeNumber(key, integer->isAboveInt64);
    return writeNumber(key, integer->bits);
  }
  if (const double* const real = value.asReal()) return writeNumber(key, *real);
  if (const bool* const boolean = value.asBoolean()) return writeNumber(key, *boolean);
  if (const platform::Date* const date = value.asDate()) return writeNumber(key, date->secondsSince2001);
  if (const platform::Uid* const uid = value.asUid()) return writeNumber(key, uid->number);
  if (const platform::Bytes* const data = value.asData()) {
    return writeSized(key, {reinterpret_cast<const char*>(data->data()), data->size()});
  }
  if (const Array* const array = value.asArray()) return writeEach(key, *array);
  if (const Dictionary* const dictionary = value.asDictionary()) writeEach(key, *dictionary);
}

std::string keyOf(const PropertyValue& value) {
  std::string key;
  write(key, value);
  return key;
}

// The elements of a stored list as a set: each once, of whatever kind, in the order in which they first stand.
Array setOfElements(const Array* stored) {
  if (stored == nullptr) return {};
  std::set<std::string> seen;  // ordered: no list of a file can make it slow
  Array elements;
  elements.reserve(stored->size() + 1);
  std::ranges::copy_if(*stored, std::back_inserter(elements),
                       [&seen](const PropertyValue& element) { return seen.insert(keyOf(element)).second; });
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
