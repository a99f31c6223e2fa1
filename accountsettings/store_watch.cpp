#include "accountsettings/store_watch.h"

#include <algorithm>
#include <atomic>
#include <utility>

#include "accountsettings/accounts_manager.h"
#include "accountsettings/vocabulary.h"
#include "platform/description.h"
#include "platform/run_stage.h"

namespace accountsettings {
namespace {

using platform::RunFact;
using Kind = platform::RunFact::Kind;

std::atomic<std::size_t>& stateCount() {
  static std::atomic<std::size_t> count;
  return count;
}

StoreState stateOf(const StoreWatch::Accounts& accounts) {
  ++stateCount();
  StoreState state;
  state.reserve(accounts.size());
  for (const auto& account : accounts) state.push_back({account, account->properties()});
  return state;
}

Dictionary propertiesIn(const PropertyValue& element) {
  const Dictionary* const properties = element.asDictionary();
  return properties == nullptr ? Dictionary{} : *properties;
}

// Why no account can be made of a file's element.
std::string faultOf(const LeftOutRecord& record) {
  switch (record.why) {
    case WhyLeftOut::noRecord: return "it is no account record";
    case WhyLeftOut::noType: return "it has no type";
    case WhyLeftOut::unknownType:
      return "its type is unknown: " + platform::description(*record.element.asDictionary()->find(kAccountType));
    case WhyLeftOut::noClass: return "it has no class";
    case WhyLeftOut::givenUp: return "it is beyond repair";
  }
  return {};
}

}  // namespace

std::unique_ptr<StoreWatch> StoreWatch::ofRun() {
  auto observer = platform::observerOfFacts();
  return observer == nullptr ? nullptr : std::unique_ptr<StoreWatch>{new StoreWatch{std::move(observer)}};
}

std::size_t StoreWatch::statesTaken() { return stateCount(); }

template <typename Action>
void StoreWatch::attempt(const Action& action) noexcept {
  try {
    if (_observer != nullptr) action();
  } catch (...) {
    _observer.reset();
  }
}

// --- Loading ---

void StoreWatch::leftOut(const LeftOutRecord& record) {
  attempt([&] { givenUp(record.element, faultOf(record)); });
}

void StoreWatch::givenUp(const PropertyValue& element, std::string_view rule) {
  attempt([&] {
    _observer->told({.kind = Kind::dropped, .subject = nameOf(propertiesIn(element)), .reason = std::string{rule}});
  });
}

void StoreWatch::loaded(const PropertyValue& element, const BasicAccount& account) {
  attempt([&] {
    auto changes = changesOf(propertiesIn(element), account.properties());
    if (changes.empty()) return;
    _observer->told({.kind = Kind::changed, .subject = nameOf(account.properties()), .changes = std::move(changes)});
  });
}

void StoreWatch::loadedAll(const Accounts& accounts, const LoadOutcome& outcome) {
  attempt([&] {
    _known = stateOf(accounts);
    if (outcome.hasUnreadFile()) {
      const std::string path = AccountsManager::fullPathToAccountSettingsPlist();
      _observer->told({.kind = Kind::unread, .reason = outcome.reading.reason(), .path = path});
    }
    const auto version = static_cast<std::uint64_t>(outcome.storedVersion.value_or(0));
    _observer->told({.kind = Kind::loaded, .count = accounts.size(), .version = version});
  });
}

// --- What is known beforehand ---

void StoreWatch::willGo(const BasicAccount& account, std::string_view rule) {
  attempt([&] { _departures.try_emplace(&account, Departure{std::string{rule}, {}}); });
}

void StoreWatch::willBeFolded(const BasicAccount& account, const BasicAccount& into, std::string_view rule) {
  attempt([&] {
    Departure& departure = _departures.try_emplace(&account, Departure{std::string{rule}, {}}).first->second;
    departure.into.push_back(nameOf(into.properties()));
  });
}

void StoreWatch::comesFrom(const BasicAccount& account, const Dictionary& description, std::string origin) {
  attempt([&] { _origins.insert_or_assign(&account, Origin{std::move(origin), description}); });
}

// --- Changes ---

void StoreWatch::look(const Accounts& accounts) {
  attempt([&] {
    StoreState present = stateOf(accounts);
    for (const Difference& difference : differencesBetween(_known, present)) tell(difference);
    _known = std::move(present);
    _departures.clear();
    _origins.clear();
  });
}

void StoreWatch::tell(const Difference& difference) {
  const auto origin = _origins.find(difference.account);
  const bool isFresh = difference.fact.kind == Kind::added || difference.isReplacement;
  if (isFresh && origin != _origins.end()) return tellConverted(difference, origin->second);
  if (difference.fact.kind == Kind::dropped) return tellGone(difference.fact, difference.account);
  if (difference.isReplacement && difference.fact.changes.empty()) return;
  _observer->told(difference.fact);
}

void StoreWatch::tellConverted(const Difference& difference, const Origin& origin) {
  RunFact fact = difference.fact;
  fact.kind = Kind::converted;
  fact.reason = origin.place;
  if (difference.isReplacement) {
    fact.reason += ", in place of the account with this identifier";
  } else {
    fact.changes = changesOf(origin.description, difference.account->properties());
  }
  _observer->told(fact);
}

void StoreWatch::tellGone(RunFact fact, const BasicAccount* account) {
  const auto departure = account == nullptr ? _departures.end() : _departures.find(account);
  if (departure == _departures.end()) {
    fact.reason = account == nullptr ? "it no longer stands in its parent" : "it was taken out";
  } else {
    fact.kind = departure->second.into.empty() ? Kind::dropped : Kind::folded;
    fact.reason = departure->second.rule;
    fact.others = departure->second.into;
  }
  _observer->told(fact);
}

// --- Saving ---

void StoreWatch::unrepaired(const BasicAccount& account, std::string_view rule) {
  attempt([&] {
    _atThisSave.push_back(
        {.kind = Kind::unrepaired, .subject = nameOf(account.properties()), .reason = std::string{rule}});
  });
}

void StoreWatch::written(const Accounts& accounts, const Array& records) {
  attempt([&] {
    for (std::size_t place = 0; place < accounts.size(); ++place) {
      const Dictionary record = propertiesIn(records[place]);
      auto changes = changesOf(accounts[place]->properties(), record);
      if (changes.empty()) continue;
      _atThisSave.push_back({.kind = Kind::changed, .subject = nameOf(record), .changes = std::move(changes)});
    }
  });
}

void StoreWatch::savedAll(std::size_t count, std::uint64_t version, const std::string& path,
                          const SaveOutcome& outcome) {
  attempt([&] {
    for (std::size_t place = 0; place < _atThisSave.size(); ++place) {
      if (!wasToldAtLastSave(place)) _observer->told(_atThisSave[place]);
    }
    _atLastSave = std::exchange(_atThisSave, {});
    const Kind kind = outcome.isSaved() ? Kind::saved : Kind::saveFailed;
    _observer->told(
        {.kind = kind, .reason = outcome.status.description(), .path = path, .count = count, .version = version});
  });
}

// Mostly a save tells what the last one told, fact by fact.
bool StoreWatch::wasToldAtLastSave(std::size_t place) const {
  const RunFact& fact = _atThisSave[place];
  if (place < _atLastSave.size() && _atLastSave[place] == fact) return true;
  return std::ranges::find(_atLastSave, fact) != _atLastSave.end();
}

}  // namespace accountsettings
