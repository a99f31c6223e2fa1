#pragma once

#include <algorithm>
#include <filesystem>
#include <string_view>

namespace platform {

// Where on a device, below its root, programs that save leave what a death keeps them from removing.
[[nodiscard]] inline std::filesystem::path temporaryDirectoryOf(const std::filesystem::path& systemRoot) {
  return systemRoot / "var/mobile/tmp";
}

// Whether a file in that directory is named as those of saves that are under way: as in fileA1b2C3.
[[nodiscard]] inline bool isNameOfSave(std::string_view name) {
  constexpr std::string_view kBeginning = "file";
  constexpr std::size_t kLetters = 6;
  const auto isLetterOrDigit = [](char letter) {
    return (letter >= '0' && letter <= '9') || (letter >= 'A' && letter <= 'Z') || (letter >= 'a' && letter <= 'z');
  };
  return name.size() == kBeginning.size() + kLetters && name.starts_with(kBeginning) &&
         std::ranges::all_of(name.substr(kBeginning.size()), isLetterOrDigit);
}

// An empty file that stands while a migration of several version steps is under way, unless snapshots are taken: where
// it does and nobody holds the migration lock, a run was killed. Only the migration host makes and removes it.
[[nodiscard]] inline std::filesystem::path runMarkOf(const std::filesystem::path& systemRoot) {
  return temporaryDirectoryOf(systemRoot) / "account-migration-under-way";
}

}  // namespace platform
