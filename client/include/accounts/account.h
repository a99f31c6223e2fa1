#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "accounts/value.h"

namespace accounts {

// Where the service behind an account is reached.
struct Service {
  std::string host;        // a name or an address
  std::uint16_t port = 0;  // 0 where the module tells none
  bool isSecure = true;    // whether it is reached through TLS
};

// An account as it was when it was looked at. It never changes, copies share what they hold, it outlives whatever it
// came from, and any thread may read it.
//
// What a child account does not have itself it has of its parent, in all reads but `keys` and those of its own.
class ACCOUNTS_API Account {
 public:
  // Empty, or nothing, where the account has none.
  [[nodiscard]] std::string identifier() const;  // empty while the file gives it none; its next save does
  [[nodiscard]] std::string type() const;        // such as "Mail"
  [[nodiscard]] std::string accountClass() const;
  // The name that the user gave it; of the account of what is on the device alone, the name that the device gives it.
  [[nodiscard]] std::optional<std::string> displayName() const;
  [[nodiscard]] std::optional<std::string> username() const;        // at the service
  [[nodiscard]] std::optional<std::string> syncIdentifier() const;  // by which those who sync it know it

  // Empty for a top-level account.
  [[nodiscard]] std::string parentIdentifier() const;
  [[nodiscard]] bool isChild() const;
  // In the file's order; what cannot be an account is none. Empty for a child.
  [[nodiscard]] std::vector<Account> children() const;

  // The data classes that accounts of this type can have, and those that are switched on and not forbidden on this
  // device. A child has its parent's where that has any.
  [[nodiscard]] std::vector<std::string> supportedDataclasses() const;
  [[nodiscard]] std::vector<std::string> enabledDataclasses() const;
  [[nodiscard]] bool isEnabled(std::string_view dataclass) const;
  // Whether there is a list of those that are switched on, be it an empty one.
  [[nodiscard]] bool listsDataclasses() const;

  // What the account's module knows of its service; nothing where none may be opened, or none can tell.
  [[nodiscard]] std::optional<Service> service() const;

  // Nothing where there is none. The typed ones also read a number from a text that begins with one, and a boolean from
  // a number or from "yes" and "true"; nothing for a value of a kind that gives none.
  [[nodiscard]] std::optional<Value> property(std::string_view key) const;
  [[nodiscard]] std::optional<std::string> text(std::string_view key) const;
  [[nodiscard]] std::optional<std::int64_t> integer(std::string_view key) const;
  [[nodiscard]] std::optional<bool> boolean(std::string_view key) const;
  [[nodiscard]] std::vector<std::string> keys() const;
  [[nodiscard]] std::optional<std::string> ownText(std::string_view key) const;
  [[nodiscard]] Value::Dictionary ownProperties() const;

  struct Content;  // internal
  explicit Account(std::shared_ptr<const Content> content);
  [[nodiscard]] const Content& content() const { return *_content; }

 private:
  std::shared_ptr<const Content> _content;
};

// The accounts of a device as they were when they were looked at. Like an account, it is a value.
class ACCOUNTS_API Accounts {
 public:
  // The top-level accounts, in the file's order. Those of a list without a name are copied, and it has no iterators.
  [[nodiscard]] const std::vector<Account>& all() const&;
  [[nodiscard]] std::vector<Account> all() && { return all(); }
  [[nodiscard]] std::vector<Account>::const_iterator begin() const& { return all().begin(); }
  [[nodiscard]] std::vector<Account>::const_iterator end() const& { return all().end(); }
  std::vector<Account>::const_iterator begin() && = delete;
  std::vector<Account>::const_iterator end() && = delete;
  [[nodiscard]] std::size_t size() const { return all().size(); }
  [[nodiscard]] bool empty() const { return all().empty(); }
  // The data version of the file; 0 where there is none.
  [[nodiscard]] std::uint64_t dataVersion() const;
  // How many top-level records of the file this release cannot load, and so are not among these.
  [[nodiscard]] std::size_t unreadable() const;

  // Children are found, too, and stand behind their parent in the lists. Of several accounts with one identifier the
  // last is found.
  [[nodiscard]] std::optional<Account> withIdentifier(std::string_view identifier) const;
  [[nodiscard]] std::optional<Account> withSyncIdentifier(std::string_view identifier) const;
  [[nodiscard]] std::vector<Account> ofType(std::string_view type) const;
  [[nodiscard]] std::vector<Account> withDataclass(std::string_view dataclass) const;  // for which it is switched on

  struct Content;  // internal
  explicit Accounts(std::shared_ptr<const Content> content);
  [[nodiscard]] const Content& content() const { return *_content; }

 private:
  std::shared_ptr<const Content> _content;
};

// What became of one account.
struct Change {
  // Whether it came, changed or went.
  enum class Kind : std::int32_t { added, changed, removed };
  Kind kind;                      // which of these
  Account account;                // as it is afterwards; one that was removed, as it was before
  std::vector<std::string> keys;  // of one that was changed: its own properties that came, changed or went
};

}  // namespace accounts
