#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>

namespace platform {

// Where the objects of a binary property list lie. Nothing in the file is trusted: what is answered lies within the
// file's object area, or there is no answer.
class BinaryPlistLayout {
 public:
  enum class Type : std::uint8_t { other, boolean, integer, real, date, data, ascii, utf16, uid, array, dictionary };

  struct Object {
    Type type;            // `other`: no object that libplist reads, whatever its size is
    std::size_t marker;   // where the object begins
    std::size_t payload;  // where its contents begin
    std::size_t size;     // of the contents: bytes, UTF-16 units, references or entries
  };

  // Nothing where there is no sound header, trailer or offset table.
  [[nodiscard]] static std::optional<BinaryPlistLayout> of(std::span<const std::uint8_t> file);

  [[nodiscard]] std::size_t objectCount() const { return _objectCount; }
  [[nodiscard]] std::size_t root() const { return _root; }
  [[nodiscard]] std::size_t referenceSize() const { return _referenceSize; }

  // How many bytes the object takes, and how many there are for all objects together.
  [[nodiscard]] std::size_t extent(const Object& object) const;
  [[nodiscard]] std::size_t objectArea() const;
  // Whether nothing stands between the offset table and the trailer.
  [[nodiscard]] bool endsWithTable() const;

  // Nothing where the object is not wholly inside the object area.
  [[nodiscard]] std::optional<Object> object(std::size_t index) const;
  // The index that the n-th reference of a container holds; it may be beyond the table.
  [[nodiscard]] std::uint64_t reference(const Object& container, std::size_t position) const;

 private:
  BinaryPlistLayout() = default;

  [[nodiscard]] std::optional<Object> fixed(Type type, std::size_t marker, std::size_t size) const;
  [[nodiscard]] std::optional<Object> counted(Type type, std::size_t marker, std::size_t unit) const;

  std::span<const std::uint8_t> _file;
  std::size_t _offsetSize = 0;
  std::size_t _referenceSize = 0;
  std::size_t _objectCount = 0;
  std::size_t _root = 0;
  std::size_t _table = 0;  // where the offset table begins and the object area ends
};

// A big-endian number of any width; of a wide one its low 64 bits.
[[nodiscard]] std::uint64_t bigEndian(std::span<const std::uint8_t> bytes);

}  // namespace platform
