#include "accountsettings/change_tracker.h"

#include <algorithm>
#include <atomic>
#include <map>
#include <optional>
#include <tuple>
#include <utility>
#include <variant>

#include "accountsettings/accounts_manager.h"
#include "accountsettings/vocabulary.h"
#include "platform/run_observer.h"
#include "records/description.h"

namespace accountsettings {
namespace {

using records::LossCode;
using records::Lost;

std::atomic<std::size_t>& stateCount() {
  static std::atomic<std::size_t> count;
  return count;
}

StoreState stateOf(const ChangeTracker::Accounts& accounts) {
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

Lost lossOf(const LeftOutRecord& record) {
  const Dictionary properties = propertiesIn(record.element);
  Lost lost{.code = lossCodeOf(record.why), .account = nameOf(properties)};
  if (record.why == WhyLeftOut::unknownType) lost.detail = records::description(*properties.find(kAccountType));
  return lost;
}

// The places of accounts in whose stead another account's record was written, since that one has their identifier, too.
class Overwritten {
 public:
  Overwritten(const ChangeTracker::Accounts& accounts, const Array& records) : _accounts{accounts}, _records{records} {
    for (const auto& account : accounts) _lastOf[identifierIn(account->properties())] = account.get();
  }
  [[nodiscard]] bool contains(std::size_t place) const {
    const Dictionary& own = _accounts[place]->properties();
    const std::string_view identifier = identifierIn(own);
    if (identifierIn(*_records[place].asDictionary()) != identifier) return true;
    return !identifier.empty() && _lastOf.at(identifier)->properties() != own;
  }

 private:
  static std::string_view identifierIn(const Dictionary& properties) {
    const Text* const identifier = properties.text(kAccountIdentifier);
    return identifier == nullptr ? std::string_view{} : identifier->view();
  }

  const ChangeTracker::Accounts& _accounts;
  const Array& _records;
  std::map<std::string_view, const BasicAccount*> _lastOf;
};

using AccountKey = std::tuple<std::string_view, std::string_view, std::string_view>;

AccountKey accountOf(const records::Fact& fact) {
  return std::visit(
      [](const auto& each) -> AccountKey {
        if constexpr (requires { each.account; }) {
          return {each.account.identifier, each.account.name, each.account.type};
        } else {
          return {};
        }
      },
      fact);
}

// The facts that are not among those that are known, which mostly are the same, one by one. Hardly any account has more
// than one.
std::vector<const records::Fact*> missingIn(const std::vector<records::Fact>& known,
                                            const std::vector<records::Fact>& facts) {
  std::vector<const records::Fact*> missing;
  if (facts == known) return missing;
  std::multimap<AccountKey, const records::Fact*> byAccount;
  for (const records::Fact& fact : known) byAccount.emplace(accountOf(fact), &fact);
  for (const records::Fact& fact : facts) {
    const auto [begin, end] = byAccount.equal_range(accountOf(fact));
    if (std::none_of(begin, end, [&fact](const auto& each) { return *each.second == fact; })) missing.push_back(&fact);
  }
  return missing;
}

}  // namespace

std::unique_ptr<ChangeTracker> ChangeTracker::ofRun() {
  auto observer = records::factObserver();
  return observer == nullptr ? nullptr : std::unique_ptr<ChangeTracker>{new ChangeTracker{std::move(observer)}};
}

std::size_t ChangeTracker::statesTaken() { return stateCount(); }

template <typename Action>
void ChangeTracker::attempt(const Action& action) noexcept {
  try {
    if (_observer != nullptr) action();
  } catch (...) {
    _observer->lostTrack();
    _observer.reset();
  }
}

// --- Loading ---

void ChangeTracker::leftOut(const LeftOutRecord& record) {
  attempt([&] { _observer->told(lossOf(record)); });
}

void ChangeTracker::loaded(const PropertyValue& element, const BasicAccount& account) {
  attempt([&] {
    auto changes = changesOf(propertiesIn(element), account.properties());
    if (!changes.empty()) _observer->told(records::Changed{nameOf(account.properties()), std::move(changes)});
  });
}

void ChangeTracker::loadedAll(const Accounts& accounts, const LoadOutcome& outcome) {
  attempt([&] {
    if (outcome.hasUnreadFile()) {
      _observer->told(Lost{.code = LossCode::unreadableSettingsFile, .detail = outcome.reading.reason()});
    }
    _known = stateOf(accounts);
    const std::int64_t version = outcome.storedVersion.value_or(0);
    _observer->told(records::Loaded{accounts.size(), static_cast<std::uint64_t>(version)});
    if (version <= static_cast<std::int64_t>(AccountsManager::currentVersion())) return;
    _observer->told(Lost{.code = LossCode::newerSettingsFile, .detail = "version " + std::to_string(version)});
  });
}

// --- What is known beforehand ---

void ChangeTracker::willGo(const BasicAccount& account, LossCode code) {
  attempt([&] { _departures.try_emplace(&account, Departure{.code = code}); });
}

void ChangeTracker::willBeFolded(const BasicAccount& account, const BasicAccount& into, std::string_view rule) {
  attempt([&] {
    Departure& departure = _departures.try_emplace(&account, Departure{.reason = std::string{rule}}).first->second;
    departure.into.push_back(nameOf(into.properties()));
  });
}

void ChangeTracker::comesFrom(const BasicAccount& account, const Dictionary& description, std::string place,
                              std::string file) {
  attempt([&] {
    _origins.insert_or_assign(&account,
                              Origin{nameOf(account.properties()), std::move(place), std::move(file), description});
  });
}

// --- Changes ---

void ChangeTracker::look(const Accounts& accounts) {
  attempt([&] {
    StoreState present = stateOf(accounts);
    for (const Difference& difference : differencesBetween(_known, present)) tell(difference);
    tellPassed(present);
    _known = std::move(present);
    _departures.clear();
    _origins.clear();
  });
}

// Accounts that were converted and made room again before anybody looked: no state has them, but a file had.
void ChangeTracker::tellPassed(const StoreState& present) {
  for (const RecordState& each : present) _origins.erase(each.account.get());
  std::map<std::string, Lost> passed;
  for (const auto& [account, origin] : _origins) {
    const auto departure = _departures.find(account);
    const LossCode code = departure == _departures.end() ? LossCode::removed : departure->second.code;
    passed[origin.place] = {.code = code, .account = origin.name, .detail = origin.place, .file = origin.file};
  }
  for (const auto& [place, lost] : passed) _observer->told(lost);
}

void ChangeTracker::tell(const Difference& difference) {
  const auto* const changed = std::get_if<records::Changed>(&difference.fact);
  const bool isFresh = difference.isReplacement || std::holds_alternative<records::Added>(difference.fact);
  const auto origin = _origins.find(difference.account);
  if (isFresh && origin != _origins.end()) return tellConverted(difference, origin->second);
  if (const auto* const lost = std::get_if<Lost>(&difference.fact)) return tellGone(*lost, difference.account);
  if (changed == nullptr || !changed->changes.empty()) _observer->told(difference.fact);
}

void ChangeTracker::tellConverted(const Difference& difference, const Origin& origin) {
  const auto* const replacing = std::get_if<records::Changed>(&difference.fact);
  _observer->told(records::Converted{
      .account = replacing != nullptr ? replacing->account : std::get<records::Added>(difference.fact).account,
      .from = origin.place,
      .file = origin.file,
      .isReplacement = replacing != nullptr,
      .changes =
          replacing != nullptr ? replacing->changes : changesOf(origin.description, difference.account->properties())});
}

void ChangeTracker::tellGone(const Lost& lost, const BasicAccount* account) {
  const auto departure = account == nullptr ? _departures.end() : _departures.find(account);
  if (departure == _departures.end()) return _observer->told(lost);
  const Departure& known = departure->second;
  if (!known.into.empty()) return _observer->told(records::Folded{lost.account, known.into, known.reason});
  _observer->told(Lost{.code = known.code, .account = lost.account});
}

// --- Saving ---

void ChangeTracker::unrepaired(const BasicAccount& account) {
  attempt([&] {
    const records::LossMeaning& fault = records::meaningOf(lossCodeOf(WhyLeftOut::givenUp));
    _atThisSave.push_back(records::Unrepaired{nameOf(account.properties()), std::string{fault.text}});
  });
}

void ChangeTracker::written(const Accounts& accounts, const Array& records) {
  attempt([&] {
    std::optional<Overwritten> overwritten;
    for (std::size_t place = 0; place < accounts.size(); ++place) {
      const Dictionary record = propertiesIn(records[place]);
      auto changes = changesOf(accounts[place]->properties(), record);
      if (changes.empty()) continue;
      if (!overwritten) overwritten.emplace(accounts, records);
      if (overwritten->contains(place)) {
        _atThisSave.push_back(
            Lost{.code = LossCode::replacedDuplicate, .account = nameOf(accounts[place]->properties())});
      } else {
        _atThisSave.push_back(records::Changed{nameOf(record), std::move(changes)});
      }
    }
  });
}

void ChangeTracker::savedAll(std::size_t count, std::uint64_t version, const std::string& path,
                             const platform::Status& status) {
  attempt([&] {
    for (const records::Fact* const fact : missingIn(_atLastSave, _atThisSave)) _observer->told(*fact);
    _atLastSave = std::exchange(_atThisSave, {});
    if (status.isOk()) return _observer->told(records::Saved{path, count, version});
    _observer->told(records::SaveFailed{path, status.description(), count, version});
  });
}

}  // namespace accountsettings
