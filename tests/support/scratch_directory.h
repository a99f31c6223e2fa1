#pragma once

#include <filesystem>
#include <string>
#include <string_view>

namespace tests {

// A directory of a test's own, made new and removed again with all below it. Its path cannot be changed, so nothing
// else is ever removed.
class ScratchDirectory {
 public:
  ScratchDirectory();
  ScratchDirectory(const ScratchDirectory&) = delete;
  ScratchDirectory& operator=(const ScratchDirectory&) = delete;
  ~ScratchDirectory();

  [[nodiscard]] const std::filesystem::path& path() const { return _path; }
  [[nodiscard]] std::filesystem::path operator/(std::string_view below) const { return _path / below; }

  // Writes a file, with the directories above it; the text of one, empty where there is none.
  std::filesystem::path put(std::string_view below, std::string_view text) const;
  [[nodiscard]] std::string contents(std::string_view below) const;

 private:
  const std::filesystem::path _path;
};

// The permission bits of what stands at the path, links unfollowed.
[[nodiscard]] unsigned permissionsOf(const std::filesystem::path& path);

}  // namespace tests
