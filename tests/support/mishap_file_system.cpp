#include "tests/support/mishap_file_system.h"

#include <cstdint>

namespace tests {

using platform::Bytes;
using platform::FileKind;
using platform::Path;
using platform::Result;
using platform::Status;

bool MishapFileSystem::isHit() const {
  return _mishap.kind == Mishap::Kind::failsFromThenOn ? _operations >= _mishap.operation
                                                       : _operations == _mishap.operation;
}

template <typename Operation, typename Failed, typename HalfDone>
auto MishapFileSystem::run(std::string_view verb, const Path& path, const Operation& operation, const Failed& failed,
                           const HalfDone& halfDone) -> decltype(operation()) {
  ++_operations;
  if (_mishap.kind == Mishap::Kind::none || !isHit()) return operation();
  if (_mishapAt.empty()) _mishapAt = std::string{verb} + " " + path.string();
  switch (_mishap.kind) {
    case Mishap::Kind::failsOnce:
    case Mishap::Kind::failsFromThenOn: return failed();
    case Mishap::Kind::diesWithin: halfDone(); break;
    case Mishap::Kind::diesAfter: static_cast<void>(operation()); break;
    case Mishap::Kind::diesBefore:
    case Mishap::Kind::none: break;
  }
  _die();
  return failed();
}

template <typename Operation, typename HalfDone>
auto MishapFileSystem::change(std::string_view verb, const Path& path, const Operation& operation,
                              const HalfDone& halfDone) -> decltype(operation()) {
  const auto failed = [&] { return Status::failure(_mishap.errorNumber, "work on " + path.string()); };
  return run(verb, path, operation, failed, halfDone);
}

Result<FileKind> MishapFileSystem::kindOf(const Path& path) {
  return run(
      "kindOf", path, [&] { return _inner->kindOf(path); },
      [&] { return Result<FileKind>{Status::failure(_mishap.errorNumber, "look at " + path.string())}; });
}
Result<Bytes> MishapFileSystem::read(const Path& path, std::size_t sizeLimit) {
  return run(
      "read", path, [&] { return _inner->read(path, sizeLimit); },
      [&] { return Result<Bytes>{Status::failure(_mishap.errorNumber, "read " + path.string())}; });
}
Status MishapFileSystem::create(const Path& path, std::span<const std::uint8_t> bytes) {
  return change(
      "create", path, [&] { return _inner->create(path, bytes); },
      [&] { static_cast<void>(_inner->create(path, bytes.first(bytes.size() / 2))); });
}
Status MishapFileSystem::replace(const Path& path, std::span<const std::uint8_t> bytes) {
  // The half of a file stands beside the path, never at it.
  const Path beside = path.parent_path() / ".new-0123456789abcdef";
  return change(
      "replace", path, [&] { return _inner->replace(path, bytes); },
      [&] { static_cast<void>(_inner->create(beside, bytes.first(bytes.size() / 2))); });
}
Status MishapFileSystem::copy(const Path& from, const Path& to) {
  return change(
      "copy", from, [&] { return _inner->copy(from, to); },
      [&] {
        const Result<Bytes> whole = _inner->read(from, SIZE_MAX);
        if (whole.isOk())
          static_cast<void>(_inner->create(to, std::span{whole.value()}.first(whole.value().size() / 2)));
      });
}
Status MishapFileSystem::remove(const Path& path) {
  return change("remove", path, [&] { return _inner->remove(path); });
}
Status MishapFileSystem::createDirectories(const Path& path, unsigned permissions) {
  return change(
      "createDirectories", path, [&] { return _inner->createDirectories(path, permissions); },
      [&] { static_cast<void>(_inner->createDirectories(path.parent_path(), 0755)); });
}
Status MishapFileSystem::setOwner(const Path& path, std::string_view owner, std::string_view group) {
  return change("setOwner", path, [&] { return _inner->setOwner(path, owner, group); });
}
Result<Path> MishapFileSystem::temporaryName() {
  return run(
      "temporaryName", {}, [&] { return _inner->temporaryName(); },
      [&] { return Result<Path>{Status::failure(_mishap.errorNumber, "find a temporary name")}; });
}
Status MishapFileSystem::rename(const Path& from, const Path& to) {
  return change("rename", from, [&] { return _inner->rename(from, to); });
}

}  // namespace tests
