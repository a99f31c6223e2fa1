#include "tests/support/mishap_file_system.h"

namespace tests {

using platform::Bytes;
using platform::FileKind;
using platform::Path;
using platform::Result;
using platform::Status;

template <typename Operation, typename Failed>
auto MishapFileSystem::run(const Operation& operation, const Failed& failed) -> decltype(operation()) {
  ++_operations;
  const bool isHit = _operations == _mishap.operation;
  switch (_mishap.kind) {
    case Mishap::Kind::failsOnce:
      if (isHit) return failed();
      break;
    case Mishap::Kind::failsFromThenOn:
      if (_operations >= _mishap.operation) return failed();
      break;
    case Mishap::Kind::diesBefore:
      if (isHit) _die();
      break;
    case Mishap::Kind::diesAfter:
      if (isHit) {
        static_cast<void>(operation());
        _die();
      }
      break;
    case Mishap::Kind::none: break;
  }
  return operation();
}

template <typename Operation>
auto MishapFileSystem::change(const Operation& operation, const Path& path) -> decltype(operation()) {
  return run(operation, [&] { return Status::failure(_mishap.errorNumber, "work on " + path.string()); });
}

std::optional<FileKind> MishapFileSystem::kindOf(const Path& path) {
  return run([&] { return _inner->kindOf(path); }, [] { return std::optional<FileKind>{}; });
}
Result<Bytes> MishapFileSystem::read(const Path& path, std::size_t sizeLimit) {
  return run([&] { return _inner->read(path, sizeLimit); },
             [&] { return Result<Bytes>{Status::failure(_mishap.errorNumber, "read " + path.string())}; });
}
Status MishapFileSystem::create(const Path& path, std::span<const std::uint8_t> bytes) {
  return change([&] { return _inner->create(path, bytes); }, path);
}
Status MishapFileSystem::replace(const Path& path, std::span<const std::uint8_t> bytes) {
  return change([&] { return _inner->replace(path, bytes); }, path);
}
Status MishapFileSystem::copy(const Path& from, const Path& to) {
  return change([&] { return _inner->copy(from, to); }, from);
}
Status MishapFileSystem::remove(const Path& path) {
  return change([&] { return _inner->remove(path); }, path);
}
Status MishapFileSystem::createDirectories(const Path& path, unsigned permissions) {
  return change([&] { return _inner->createDirectories(path, permissions); }, path);
}
Status MishapFileSystem::setOwner(const Path& path, std::string_view owner, std::string_view group) {
  return change([&] { return _inner->setOwner(path, owner, group); }, path);
}
std::optional<Path> MishapFileSystem::temporaryName() {
  return run([&] { return _inner->temporaryName(); }, [] { return std::optional<Path>{}; });
}
Status MishapFileSystem::rename(const Path& from, const Path& to) {
  return change([&] { return _inner->rename(from, to); }, from);
}

}  // namespace tests
