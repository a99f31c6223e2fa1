#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "accountsettings/accounts_manager.h"
#include "tools/account_view.h"
#include "tools/commands.h"

// Accounts that stand elsewhere than in the device's store: in a copy, a snapshot, a file of the first releases,
// another device. They are read as the files have them, and nobody is told of it. Nothing here changes a file.
namespace tools {

// What a file of accounts is, which the keys of its root tell.
enum class FileForm : std::uint8_t { settings, legacyMail, legacyExchange };
// For people, "mail file of the first releases", and for machines: "settings", "legacy-mail", "legacy-exchange".
[[nodiscard]] std::string_view nameOf(FileForm form);
[[nodiscard]] std::string_view codeOf(FileForm form);

// One account as a file has it, whether it can be loaded or not.
struct FoundAccount {
  std::string list;                  // the key of the list that it stands in: "Accounts", "MailAccounts"
  std::size_t index = 0;             // in that list
  std::optional<std::size_t> child;  // of a child: its place among the children of the account at `index`
  // As it stands there; empty where it is no dictionary.
  accountsettings::Dictionary properties;
  // The same under the names that a settings file has for them: what a description of the first releases is about.
  accountsettings::Dictionary record;
  std::string fault;  // a clause that says why it is no account, or not to be found; empty where it is one

  // "Accounts[2]", "Accounts[2].ChildAccounts[0]".
  [[nodiscard]] std::string place() const;
  // "Accounts[2], M1 (Home)".
  [[nodiscard]] std::string described() const;
};

struct AccountFile {
  platform::Path path;
  FileForm form = FileForm::settings;
  accountsettings::Dictionary root;
  std::vector<FoundAccount> accounts;  // in the file's order, children behind their parents

  // The data version of a settings file; nothing where it tells none.
  [[nodiscard]] std::optional<std::int64_t> version() const;
  // Whether it is a settings file of an earlier release.
  [[nodiscard]] bool isOlder() const;
};

// The accounts that the root of such a file holds.
[[nodiscard]] std::vector<FoundAccount> accountsIn(const AccountFile& file);

// A description of the first releases in their own words, where some of it is in those of a settings file: `Class`
// becomes "AccountType".
[[nodiscard]] accountsettings::Dictionary inLegacyWords(const FoundAccount& account,
                                                        const accountsettings::Dictionary& description);

struct Source {
  std::vector<AccountFile> files;  // never empty
};

// Reads what the word means: a file; a directory that is the root of a device, or a snapshot; or where nothing stands
// at such a path, a snapshot in the directory of snapshots by its identifier, a beginning that no other has, or
// "latest". Throws Failure where it means nothing, where a file cannot be read or is none of accounts, and where a copy
// in a snapshot is not as the snapshot says.
[[nodiscard]] Source sourceNamed(const std::string& word, const Options& options);
// The device's own files, as far as they are there; throws Failure where none is.
[[nodiscard]] Source deviceSource();

// One account of a source.
struct Chosen {
  const AccountFile* file;
  const FoundAccount* account;
};
// Those that the word means: the account at that place or of that identifier, else all that a person may mean by it.
// Throws Failure where there is none, or where several are meant.
[[nodiscard]] Chosen accountMeantBy(const Source& source, const std::string& word);

}  // namespace tools
