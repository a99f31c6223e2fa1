// The real migrator on files that kill the process: right before the change to the files whose number (from 1) stands
// in DIE_BEFORE, by the signal in DIE_OF (SIGKILL where none is given). Every change is first written to the file that
// CHANGES names, so that a test knows what there is to interrupt. REAL_PLUGIN names the plug-in under test.

#include <csignal>
#include <cstdlib>
#include <fstream>
#include <memory>
#include <string>

#include "platform/data_class_migrator.h"
#include "platform/platform.h"

namespace {

using platform::Bytes;
using platform::FileKind;
using platform::Path;
using platform::Result;
using platform::Status;

std::string environment(const char* name) {
  const char* const value = std::getenv(name);
  return value == nullptr ? "" : value;
}

class MortalFileSystem final : public platform::FileSystem {
 public:
  explicit MortalFileSystem(std::shared_ptr<platform::FileSystem> files)
      : _files{std::move(files)}, _log{environment("CHANGES")} {}

  platform::Result<FileKind> kindOf(const Path& path) override { return _files->kindOf(path); }
  Result<Bytes> read(const Path& path, std::size_t limit) override { return _files->read(path, limit); }
  platform::Result<Path> temporaryName() override { return _files->temporaryName(); }

  Status create(const Path& path, std::span<const std::uint8_t> bytes) override {
    change("create", path);
    return _files->create(path, bytes);
  }
  Status replace(const Path& path, std::span<const std::uint8_t> bytes) override {
    change("replace", path);
    return _files->replace(path, bytes);
  }
  Status copy(const Path& from, const Path& to) override {
    change("copy", to);
    return _files->copy(from, to);
  }
  Status remove(const Path& path) override {
    change("remove", path);
    return _files->remove(path);
  }
  Status createDirectories(const Path& path, unsigned permissions) override {
    change("createDirectories", path);
    return _files->createDirectories(path, permissions);
  }
  Status setOwner(const Path& path, std::string_view owner, std::string_view group) override {
    change("setOwner", path);
    return _files->setOwner(path, owner, group);
  }
  Status rename(const Path& from, const Path& to) override {
    change("rename", to);
    return _files->rename(from, to);
  }

 private:
  void change(std::string_view verb, const Path& path) {
    if (++_changes == _last) std::raise(_signal == 0 ? SIGKILL : _signal);
    _log << verb << ' ' << path.native() << std::endl;
  }

  std::shared_ptr<platform::FileSystem> _files;
  int _last = std::atoi(environment("DIE_BEFORE").c_str());
  int _signal = std::atoi(environment("DIE_OF").c_str());
  int _changes = 0;
  std::ofstream _log;
};

std::unique_ptr<platform::DataClassMigrator> make() {
  platform::Platform services = platform::current();
  services.files = std::make_shared<MortalFileSystem>(services.files);
  platform::setCurrent(services);
  if (!services.modules->open(environment("REAL_PLUGIN")).isOk()) return nullptr;
  const auto* const real = services.classes->classNamed("AccountsDataMigrator");
  return dynamic_cast<const platform::DataClassMigratorClass&>(*real).make();
}

const platform::ClassRegistration registration{
    std::make_shared<platform::DataClassMigratorClass>("AccountsDataMigrator", make)};

}  // namespace
