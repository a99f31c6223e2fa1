#pragma once

#include <cerrno>
#include <functional>
#include <memory>
#include <string>
#include <string_view>

#include "platform/file_system.h"

namespace tests {

// What happens at one operation of a run, counted from 1.
struct Mishap {
  // Dying within an operation leaves what it may leave half made: a file with half of its bytes.
  enum class Kind { none, failsOnce, failsFromThenOn, diesBefore, diesWithin, diesAfter };
  Kind kind = Kind::none;
  int operation = 0;
  int errorNumber = EIO;
};

// Forwards every call to another file system, counts the calls, and lets the one mishap happen. Dying is what `die`
// does: it must not return.
class MishapFileSystem final : public platform::FileSystem {
 public:
  MishapFileSystem(std::shared_ptr<platform::FileSystem> inner, Mishap mishap, std::function<void()> die)
      : _inner{std::move(inner)}, _mishap{mishap}, _die{std::move(die)} {}

  [[nodiscard]] int operations() const { return _operations; }
  // What the mishap made fail, or died in, first: "rename /a/path".
  [[nodiscard]] const std::string& mishapAt() const { return _mishapAt; }

  // For who forwards operations that are none of a file system's: runs one, counted with the others, unless the mishap
  // takes its place; `failed` is what it answers then.
  template <typename Operation, typename Failed>
  auto counted(const Operation& operation, const Failed& failed) -> decltype(operation()) {
    ++_operations;
    const bool isHit = _operations == _mishap.operation;
    if (_mishap.kind == Mishap::Kind::failsOnce && isHit) return failed(_mishap.errorNumber);
    if (_mishap.kind == Mishap::Kind::failsFromThenOn && _operations >= _mishap.operation) {
      return failed(_mishap.errorNumber);
    }
    if (_mishap.kind == Mishap::Kind::diesBefore && isHit) _die();
    auto answer = operation();
    if (_mishap.kind != Mishap::Kind::none && isHit) _die();
    return answer;
  }

  platform::Result<platform::FileKind> kindOf(const platform::Path& path) override;
  platform::Result<platform::Bytes> read(const platform::Path& path, std::size_t sizeLimit) override;
  platform::Status create(const platform::Path& path, std::span<const std::uint8_t> bytes) override;
  platform::Status replace(const platform::Path& path, std::span<const std::uint8_t> bytes) override;
  platform::Status copy(const platform::Path& from, const platform::Path& to) override;
  platform::Status remove(const platform::Path& path) override;
  platform::Status createDirectories(const platform::Path& path, unsigned permissions) override;
  platform::Status setOwner(const platform::Path& path, std::string_view owner, std::string_view group) override;
  platform::Result<platform::Path> temporaryName() override;
  platform::Status rename(const platform::Path& from, const platform::Path& to) override;

 private:
  static constexpr auto kNothing = [] {};

  // Runs one operation, unless the mishap takes its place; `failed` is what it answers then, `halfDone` what a death
  // within it leaves.
  template <typename Operation, typename Failed, typename HalfDone = decltype(kNothing)>
  auto run(std::string_view verb, const platform::Path& path, const Operation& operation, const Failed& failed,
           const HalfDone& halfDone = kNothing) -> decltype(operation());
  template <typename Operation, typename HalfDone = decltype(kNothing)>
  auto change(std::string_view verb, const platform::Path& path, const Operation& operation,
              const HalfDone& halfDone = kNothing) -> decltype(operation());
  [[nodiscard]] bool isHit() const;

  std::shared_ptr<platform::FileSystem> _inner;
  Mishap _mishap;
  std::function<void()> _die;
  int _operations = 0;
  std::string _mishapAt;
};

}  // namespace tests
