#include "host/rehearsal.h"

#include <cerrno>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <utility>

#include "platform/linux/files/file_services.h"
#include "platform/linux/property_lists/libplist_property_list_store.h"
#include "platform/logs_and_notices.h"

namespace host {
namespace {

using platform::FileAttributes;
using platform::Path;
using platform::Result;
using platform::Status;

class RehearsalKeeper final : public platform::FileKeeper {
 public:
  RehearsalKeeper(std::shared_ptr<FileKeeper> inner, std::shared_ptr<platform::FileSystem> files)
      : _inner{std::move(inner)}, _files{std::move(files)} {}

  Result<FileAttributes> attributesOf(const Path& path) override {
    const auto found = _changed.find(path);
    if (found == _changed.end()) return _inner->attributesOf(path);
    if (!found->second) return Status::failure(ENOENT, "look at " + path.string());
    return *found->second;
  }

  Result<platform::FileCopy> read(const Path& path, std::size_t sizeLimit) override {
    if (!_changed.contains(path)) return _inner->read(path, sizeLimit);
    const Result<FileAttributes> attributes = attributesOf(path);
    Result<platform::Bytes> bytes = _files->read(path, sizeLimit);
    if (!attributes.isOk() || !bytes.isOk()) return attributes.isOk() ? bytes.status() : attributes.status();
    return platform::FileCopy{attributes.value(), bytes.take()};
  }

  Result<platform::FileCopy> readTarget(const Path& path, std::size_t sizeLimit) override {
    return _changed.contains(path) ? read(path, sizeLimit) : _inner->readTarget(path, sizeLimit);
  }

  Result<std::vector<std::string>> entriesOf(const Path& directory) override { return _inner->entriesOf(directory); }

  Status append(const Path& path, std::span<const std::uint8_t> /*bytes*/) override {
    return Status::failure(EROFS, "add to " + path.string());
  }

  Status restore(const Path& path, std::span<const std::uint8_t> bytes, const FileAttributes& attributes) override {
    Status replaced = _files->replace(path, bytes);
    if (replaced.isOk()) _changed[path] = attributes;
    return replaced;
  }

  Status removeFile(const Path& path) override {
    const Status removed = _files->remove(path);
    if (!removed.isOk() && removed.errorNumber() != ENOENT) return removed;
    _changed[path] = std::nullopt;
    return {};
  }

 private:
  std::shared_ptr<FileKeeper> _inner;
  std::shared_ptr<platform::FileSystem> _files;
  std::map<Path, std::optional<FileAttributes>> _changed;  // nothing where nothing stands any more
};

using KeptLists = std::map<Path, platform::Dictionary>;

// Null where nothing is kept.
std::shared_ptr<const KeptLists> keptLists;

class KeepingPropertyListStore final : public platform::PropertyListStore {
 public:
  explicit KeepingPropertyListStore(std::shared_ptr<platform::PropertyListStore> others) : _others{std::move(others)} {}

  Result<platform::Dictionary> readDictionary(const Path& path) override {
    const auto kept = keptLists->find(path);
    return kept == keptLists->end() ? _others->readDictionary(path) : kept->second;
  }

  platform::SerializedPropertyList serialize(const platform::Dictionary& dictionary) override {
    return _others->serialize(dictionary);
  }

 private:
  std::shared_ptr<platform::PropertyListStore> _others;
};

// What is open is not looked for again.
class KeepingModuleLoader final : public platform::ModuleLoader {
 public:
  explicit KeepingModuleLoader(std::shared_ptr<ModuleLoader> inner) : _inner{std::move(inner)} {}

  Status open(const std::string& path) override {
    if (_open.contains(path)) return {};
    Status opened = _inner->open(path);
    if (opened.isOk()) _open.insert(path);
    return opened;
  }

 private:
  std::shared_ptr<ModuleLoader> _inner;
  std::set<std::string> _open;
};

// Null where nothing is kept.
std::shared_ptr<platform::ModuleLoader> keptModules;

}  // namespace

std::shared_ptr<platform::FileKeeper> makeRehearsalKeeper(std::shared_ptr<platform::FileKeeper> inner,
                                                          std::shared_ptr<platform::FileSystem> files) {
  return std::make_shared<RehearsalKeeper>(std::move(inner), std::move(files));
}

void rehearseOn(platform::Platform& platform) {
  platform.files = platform::makeRehearsalFileSystem(*platform.directories);
  platform.propertyLists = platform::makeLibplistPropertyListStore(platform.files);
  if (keptLists) platform.propertyLists = std::make_shared<KeepingPropertyListStore>(platform.propertyLists);
  if (keptModules) platform.modules = keptModules;
  platform.systemLog = std::make_shared<platform::SilentSystemLog>();
  silenceNotices(platform);
}

void silenceNotices(platform::Platform& platform) {
  platform.preferencesChanged = std::make_shared<platform::SilentPreferencesChangedNotice>();
  platform.cloudTabs = std::make_shared<platform::SilentCloudTabsNotice>();
}

void keepModules(platform::Platform& platform) {
  keptModules = std::make_shared<KeepingModuleLoader>(platform.modules);
  platform.modules = keptModules;
}

void keepResources(const platform::Platform& platform) {
  auto lists = std::make_shared<KeptLists>();
  std::error_code none;
  for (const auto& entry : std::filesystem::directory_iterator{platform.directories->resources(), none}) {
    if (entry.path().extension() != ".plist") continue;
    auto read = platform.propertyLists->readDictionary(entry.path());
    if (!read.isOk()) continue;
    // What libplist calls to write is looked up here once, and not in each child.
    static_cast<void>(platform.propertyLists->serialize(read.value()));
    lists->emplace(entry.path(), read.take());
  }
  keptLists = std::move(lists);
}

}  // namespace host
