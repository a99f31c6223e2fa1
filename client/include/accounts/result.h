#pragma once

#include <cstdint>
#include <string>
#include <utility>
#include <variant>

// The mark of what the library exports.
#define ACCOUNTS_API __attribute__((visibility("default")))

namespace accounts {

// Why something was not done. The numbers never change their meaning; later releases may add some.
enum class Code : std::int32_t {
  missing = 1,             // the device has no accounts file
  notMigrated = 2,         // the accounts are an earlier release's, and a migration has yet to upgrade them
  newer = 3,               // the accounts are a later release's
  unreadable = 4,          // the file is there, but it is no accounts file, or damaged
  refused = 5,             // somebody may have planted the accounts file or the lock file
  noPermission = 6,        // whoever runs the program may not do this
  busy = 7,                // a migration, or another program's change, did not end within the time limit
  nested = 8,              // this thread is changing the accounts already, and would wait for itself
  noSpace = 9,             // the disk or the user's share of it is full
  notSaved = 10,           // the file could not be replaced for another reason
  wouldBeDropped = 11,     // an account is not such that it could be loaded again: unknown type, no class
  wouldDropOthers = 12,    // the file has records that this release cannot load, and a save would remove them
  unknownAccount = 13,     // there is no account of this identifier
  alreadyThere = 14,       // there is an account of this identifier already
  unsuitable = 15,         // a value that cannot be, such as another identifier for an account
  conflict = 16,           // a program that takes no lock removed or added the same account meanwhile
  cancelled = 17,          // the change was given up by whoever asked for it
  finished = 18,           // the edit was saved already, or its saving failed
  notAnnounced = 19,       // saved, but those who listen could not be told
  notWatched = 20,         // the file's directory cannot be watched
  brokenInstallation = 21  // the library's own configuration or modules are missing or damaged
};

// Why something was not done, for programs and for people.
struct Error {
  Code code;             // what a program decides by
  std::string sentence;  // for people, in English, without a full stop
};

// A value, or the error that stands in its place. One thread at a time uses it, or several that only read; so with the
// error in it.
template <typename Value>
class [[nodiscard]] Result {
 public:
  // Holds the one or the other.
  Result(Value value) : _outcome{std::in_place_index<0>, std::move(value)} {}
  Result(Error error) : _outcome{std::in_place_index<1>, std::move(error)} {}

  // Whether there is a value.
  [[nodiscard]] bool isOk() const noexcept { return _outcome.index() == 0; }
  explicit operator bool() const noexcept { return isOk(); }

  // Only where there is one; asking for the other ends the program. A result that has no name gives away what it holds,
  // so a loop over it, or over a part of it, goes over what lives as long as the loop.
  [[nodiscard]] const Value& value() const& noexcept { return std::get<0>(_outcome); }
  [[nodiscard]] Value& value() & noexcept { return std::get<0>(_outcome); }
  [[nodiscard]] Value value() && noexcept { return std::get<0>(std::move(_outcome)); }
  [[nodiscard]] const Error& error() const& noexcept { return std::get<1>(_outcome); }
  [[nodiscard]] Error error() && noexcept { return std::get<1>(std::move(_outcome)); }

  // As `value`. An arrow would lead into a result that is gone at the end of its line, so that one has none.
  const Value& operator*() const& noexcept { return value(); }
  Value& operator*() & noexcept { return value(); }
  Value operator*() && noexcept { return std::move(*this).value(); }
  const Value* operator->() const& noexcept { return &value(); }
  Value* operator->() & noexcept { return &value(); }
  Value* operator->() && = delete;

 private:
  std::variant<Value, Error> _outcome;
};

// Whether it was done, and why not.
using Outcome = Result<std::monostate>;

}  // namespace accounts
