#pragma once

#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "platform/file_keeper.h"
#include "tests/support/mishap_file_system.h"

namespace tests {

// What a call that the mishap makes fail answers.
inline auto failedKeeping(const platform::Path& path) {
  return [&path](int error) { return platform::Status::failure(error, "work on " + path.string()); };
}

// Forwards every call to another keeper; its calls are operations of the file system's run, counted with the others and
// open to the same mishap.
class MishapFileKeeper final : public platform::FileKeeper {
 public:
  MishapFileKeeper(std::shared_ptr<platform::FileKeeper> inner, std::shared_ptr<MishapFileSystem> mishaps)
      : _inner{std::move(inner)}, _mishaps{std::move(mishaps)} {}

  platform::Result<platform::FileAttributes> attributesOf(const platform::Path& path) override {
    return _mishaps->counted(
        [&] { return _inner->attributesOf(path); },
        [&path](int error) -> platform::Result<platform::FileAttributes> { return failedKeeping(path)(error); });
  }
  platform::Result<platform::FileCopy> read(const platform::Path& path, std::size_t sizeLimit) override {
    return _mishaps->counted(
        [&] { return _inner->read(path, sizeLimit); },
        [&path](int error) -> platform::Result<platform::FileCopy> { return failedKeeping(path)(error); });
  }
  platform::Result<platform::FileCopy> readTarget(const platform::Path& path, std::size_t sizeLimit) override {
    return _mishaps->counted(
        [&] { return _inner->readTarget(path, sizeLimit); },
        [&path](int error) -> platform::Result<platform::FileCopy> { return failedKeeping(path)(error); });
  }
  platform::Result<std::vector<std::string>> entriesOf(const platform::Path& directory) override {
    return _mishaps->counted([&] { return _inner->entriesOf(directory); },
                             [&directory](int error) -> platform::Result<std::vector<std::string>> {
                               return failedKeeping(directory)(error);
                             });
  }
  platform::Status append(const platform::Path& path, std::span<const std::uint8_t> bytes) override {
    return _mishaps->counted([&] { return _inner->append(path, bytes); }, failedKeeping(path));
  }
  platform::Status restore(const platform::Path& path, std::span<const std::uint8_t> bytes,
                           const platform::FileAttributes& attributes) override {
    return _mishaps->counted([&] { return _inner->restore(path, bytes, attributes); }, failedKeeping(path));
  }
  platform::Status removeFile(const platform::Path& path) override {
    return _mishaps->counted([&] { return _inner->removeFile(path); }, failedKeeping(path));
  }

 private:
  std::shared_ptr<platform::FileKeeper> _inner;
  std::shared_ptr<MishapFileSystem> _mishaps;
};

}  // namespace tests
