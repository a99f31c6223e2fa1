#pragma once

#include <memory>
#include <utility>

#include "platform/file_system.h"

namespace host::snapshots {

// Passes every call on to other files; whoever derives from it changes what some of the calls do.
class ForwardingFiles : public platform::FileSystem {
 public:
  explicit ForwardingFiles(std::shared_ptr<platform::FileSystem> inner) : _inner{std::move(inner)} {}

  platform::Result<platform::FileKind> kindOf(const platform::Path& path) override { return _inner->kindOf(path); }
  platform::Result<platform::Bytes> read(const platform::Path& path, std::size_t sizeLimit) override {
    return _inner->read(path, sizeLimit);
  }
  platform::Status create(const platform::Path& path, std::span<const std::uint8_t> bytes) override {
    return _inner->create(path, bytes);
  }
  platform::Status replace(const platform::Path& path, std::span<const std::uint8_t> bytes) override {
    return _inner->replace(path, bytes);
  }
  platform::Status copy(const platform::Path& from, const platform::Path& to) override {
    return _inner->copy(from, to);
  }
  platform::Status remove(const platform::Path& path) override { return _inner->remove(path); }
  platform::Status createDirectories(const platform::Path& path, unsigned permissions) override {
    return _inner->createDirectories(path, permissions);
  }
  platform::Status setOwner(const platform::Path& path, std::string_view owner, std::string_view group) override {
    return _inner->setOwner(path, owner, group);
  }
  platform::Result<platform::Path> temporaryName() override { return _inner->temporaryName(); }
  platform::Status rename(const platform::Path& from, const platform::Path& to) override {
    return _inner->rename(from, to);
  }

 private:
  std::shared_ptr<platform::FileSystem> _inner;
};

}  // namespace host::snapshots
