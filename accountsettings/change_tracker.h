#pragma once

#include <cstddef>
#include <memory>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "accountsettings/record_changes.h"
#include "accountsettings/store_outcomes.h"
#include "platform/export.h"
#include "platform/status.h"
#include "records/fact_observer.h"

namespace accountsettings {

// Follows what becomes of one store's accounts in a run, for the run's observer: compares the store with what it was
// when it was last looked at, so that whatever changes accounts is told of without doing anything for it. Who knows
// more than can be seen (why an account goes, where one comes from) says it here before it happens.
//
// A store has a tracker only where an observer wants facts; without one nothing is copied, compared or kept. Nothing
// that goes wrong here reaches the store: the tracker falls silent instead.
class ChangeTracker {
 public:
  using Accounts = std::vector<std::shared_ptr<BasicAccount>>;

  // Null where nobody wants to know.
  [[nodiscard]] static std::unique_ptr<ChangeTracker> ofRun();
  // How many states of stores were ever copied in this process.
  [[nodiscard]] ACCOUNT_EXPORT static std::size_t statesTaken();

  // --- Loading: each element of the file, then the store ---
  void leftOut(const LeftOutRecord& record);
  void loaded(const PropertyValue& element, const BasicAccount& account);
  void loadedAll(const Accounts& accounts, const LoadOutcome& outcome);

  // --- What is known of an account beforehand; what is said first counts ---
  void willGo(const BasicAccount& account, records::LossCode code);
  ACCOUNT_EXPORT void willBeFolded(const BasicAccount& account, const BasicAccount& into, std::string_view rule);
  // It is made of this description in the legacy file; `place` says to people where in it.
  ACCOUNT_EXPORT void comesFrom(const BasicAccount& account, const Dictionary& description, std::string place,
                                std::string file);

  // Tells what became of the accounts since the last call.
  void look(const Accounts& accounts);

  // --- Saving: what could not be repaired, what was written in place of the accounts, and how that ended. What is as
  // it was at the last save is not told again. ---
  void unrepaired(const BasicAccount& account);
  void written(const Accounts& accounts, const Array& records);
  void savedAll(std::size_t count, std::uint64_t version, const std::string& path, const platform::Status& status);

 private:
  struct Departure {
    records::LossCode code{};
    std::string reason{};  // of one that is folded
    std::vector<records::Name> into{};
  };
  struct Origin {
    records::Name name;
    std::string place;
    std::string file;
    Dictionary description;
  };

  explicit ChangeTracker(std::shared_ptr<records::FactObserver> observer) : _observer{std::move(observer)} {}
  template <typename Action>
  void attempt(const Action& action) noexcept;
  void tell(const Difference& difference);
  void tellGone(const records::Lost& lost, const BasicAccount* account);
  void tellPassed(const StoreState& present);
  void tellConverted(const Difference& difference, const Origin& origin);

  std::shared_ptr<records::FactObserver> _observer;  // null once something went wrong
  StoreState _known;
  std::unordered_map<const BasicAccount*, Departure> _departures;
  std::unordered_map<const BasicAccount*, Origin> _origins;
  std::vector<records::Fact> _atLastSave;
  std::vector<records::Fact> _atThisSave;
};

}  // namespace accountsettings
