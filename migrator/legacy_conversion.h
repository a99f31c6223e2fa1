#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <set>
#include <span>
#include <string>
#include <string_view>

#include "accountsettings/accounts_manager.h"

// What the conversions of legacy mail and of legacy Exchange accounts have in common.
namespace migrator {

// A key of a legacy account description and the key under which an account record keeps its value.
struct Rename {
  platform::StringConstant legacyKey;
  platform::StringConstant key;
};

// The description with its legacy keys renamed, in the given order. A value is moved whatever its kind and takes the
// place of one that the new key already had.
[[nodiscard]] platform::Dictionary renamed(const platform::Dictionary& description, std::span<const Rename> renames);

// The legacy file; empty where it cannot be read.
[[nodiscard]] platform::Dictionary readLegacyFile(const std::string& path);

using Conversion = std::function<std::shared_ptr<accountsettings::BasicAccount>(const platform::Dictionary&)>;

// An array of account descriptions in a legacy file.
struct LegacySource {
  const std::string& path;
  const platform::Dictionary& contents;
  std::string_view key;
  std::span<const Rename> renames;
  std::string_view otherKey{};  // of the file's other array, where there is one
};

// The accounts that the legacy file describes in the array, in order: all of them, or nothing where the
// conversion refuses one, after a console line of the given format with that element's description. A missing array is
// an empty one, an element that is no dictionary an empty dictionary.
[[nodiscard]] std::optional<accountsettings::AccountsManager::Accounts> convertedAccounts(
    const LegacySource& source, const Conversion& convert, std::string_view method, std::string_view failureFormat);

// Lets the run's observer know which description each of the converted accounts was made of.
void noteOrigins(accountsettings::AccountsManager& store, const LegacySource& source,
                 const accountsettings::AccountsManager::Accounts& accounts);

// Ahead of a deletion that an earlier run began, for the run's observer: each description in the legacy file of whose
// identifier the settings have no account, since that run had not saved it; or that the file cannot be read.
void tellUnsavedMail();
void tellUnsavedExchange();
// The same of one array of a file. `saved` has the identifiers by which the accounts of the settings are synced, which
// are those of their descriptions; each speaks for one description, and is taken out.
void tellUnsaved(const LegacySource& source, std::multiset<std::string>& saved);
[[nodiscard]] std::multiset<std::string> savedSyncIdentifiers();

// What earlier releases left beside a legacy file: its copy under the same name with ".original" appended.
[[nodiscard]] std::string originalCompanionOf(const std::string& legacyPath);
// Deletes it.
void removeOriginalCompanion(const std::string& legacyPath);

}  // namespace migrator
