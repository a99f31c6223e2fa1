#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "accounts/account.h"

namespace accounts {

// An account to be.
struct NewAccount {
  std::string type;          // one that the device knows, such as "Mail"; empty where the properties tell it
  std::string accountClass;  // the class of its full account, such as "IMAPAccount"; empty likewise
  // The rest, in their order. A text under "Identifier" is kept; else a new identifier is made.
  Value::Dictionary properties;
  std::string parentIdentifier;  // of the top-level account that it becomes a child of; empty for a top-level account
};

// What a change brought into the file.
struct Saved {
  std::vector<Change> changes;        // none where everything was so already; the file was not touched then
  std::optional<Error> notAnnounced;  // where those who listen for changes could not be told
};

// The accounts as the file has them now, to be changed, while nobody else who takes the lock changes them. Nothing
// reaches the file before `save`; an edit that goes without it leaves the file as it is.
//
// It is used by one thread at a time. While it lives, no migration starts and no other client changes the accounts, so
// it asks nobody a question and waits for nothing. The process must not fork before it is gone.
class ACCOUNTS_API Edit {
 public:
  // Can be moved, and not copied; what was moved from is over.
  Edit(Edit&&) noexcept;
  Edit& operator=(Edit&&) noexcept;
  ~Edit();  // lets go of the lock

  // With what was changed so far.
  [[nodiscard]] std::vector<Account> accounts() const;
  [[nodiscard]] std::optional<Account> account(std::string_view identifier) const;

  // Each names a top-level account or a child, and leaves everything as it is where it fails. "Identifier" and
  // "ChildAccounts" cannot be set or erased (unsuitable). A type or class that cannot be is found by `save`.
  Result<Account> add(const NewAccount& account);
  Outcome remove(std::string_view identifier);  // with its children; of several of this identifier, all
  Outcome set(std::string_view identifier, std::string_view key, const Value& value);
  Outcome erase(std::string_view identifier, std::string_view key);
  // One that accounts of this type cannot have is unsuitable.
  Outcome setEnabled(std::string_view identifier, std::string_view dataclass, bool enabled);

  // The first of these steps that failed; nothing where all were done.
  [[nodiscard]] std::optional<Error> failure() const;

  // Has `save` write the file even where nothing was changed here: what loading repaired stands in it then, though not
  // among the changes that are answered.
  void rewrite();

  // Replaces the file, lets go of the lock, then tells those who listen. Where somebody who takes no lock replaced the
  // file since it was read, what was changed here is brought into that file. Whatever it answers, the edit is over; a
  // failure leaves the file as it is.
  Result<Saved> save();

  struct Content;  // internal
  explicit Edit(std::unique_ptr<Content> content);

 private:
  std::unique_ptr<Content> _content;
};

}  // namespace accounts
