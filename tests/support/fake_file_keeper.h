#pragma once

#include <map>
#include <string>
#include <vector>

#include "platform/file_keeper.h"
#include "tests/support/fake_file_system.h"

namespace tests {

// Keeps the files of a fake file system. A file that was not restored has no owner but 0 and was changed at the epoch.
// Its calls fail like the file system's, by verb, or by verb and path.
class FakeFileKeeper final : public platform::FileKeeper {
 public:
  explicit FakeFileKeeper(FakeFileSystem& files) : _files{files} {}

  platform::Result<platform::FileAttributes> attributesOf(const platform::Path& path) override;
  platform::Result<platform::FileCopy> read(const platform::Path& path, std::size_t sizeLimit) override;
  platform::Result<platform::FileCopy> readTarget(const platform::Path& path, std::size_t sizeLimit) override;
  platform::Result<std::vector<std::string>> entriesOf(const platform::Path& directory) override;
  platform::Status append(const platform::Path& path, std::span<const std::uint8_t> bytes) override;
  platform::Status restore(const platform::Path& path, std::span<const std::uint8_t> bytes,
                           const platform::FileAttributes& attributes) override;
  platform::Status removeFile(const platform::Path& path) override;

 private:
  [[nodiscard]] platform::Status begin(const std::string& verb, const platform::Path& path) const;

  FakeFileSystem& _files;
  std::map<platform::Path, platform::FileAttributes> _restored;
};

}  // namespace tests
