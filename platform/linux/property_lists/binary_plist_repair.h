#pragma once

#include <cstddef>

#include "platform/linux/property_lists/binary_plist_layout.h"
#include "platform/property_value.h"

namespace platform {

// Overwrites what libplist would choke on or change silently by something that it reads, never moving an object.
class BinaryPlistRepair {
 public:
  using Object = BinaryPlistLayout::Object;

  BinaryPlistRepair(Bytes& file, const BinaryPlistLayout& layout) : _file{file}, _layout{layout} {}

  // Whether anything was overwritten. What was read of the file before may then be wrong where objects overlap.
  [[nodiscard]] bool hasRepaired() const { return _hasRepaired; }

  // Whether anything was found that libplist reads as it should but would write differently.
  [[nodiscard]] bool hasFoundOddities() const { return _hasFoundOddities; }

  void repairLeaf(const Object& leaf);
  // Makes an array of a set, and leaves out a dictionary's entries whose keys are no texts. False where a key is not to
  // be found. The container's size changes with it.
  [[nodiscard]] bool repairContainer(Object& container);

 private:
  void overwrite(std::size_t offset, std::uint8_t byte);
  void overwrite(std::size_t offset, std::size_t width, std::uint64_t number);
  void makeEmptyText(const Object& leaf);
  void repairInteger(const Object& integer);
  void repairUid(const Object& uid);
  void repairAscii(const Object& text);
  void repairUtf16(const Object& text);
  [[nodiscard]] std::uint64_t unit(const Object& text, std::size_t index) const;
  [[nodiscard]] bool isSoundUnit(const Object& text, std::size_t index) const;
  [[nodiscard]] bool keepTextKeys(Object& dictionary);
  void dropOtherEntries(Object& dictionary);
  void setSize(Object& container, std::size_t size);

  Bytes& _file;
  const BinaryPlistLayout& _layout;
  bool _hasRepaired = false;
  bool _hasFoundOddities = false;
};

}  // namespace platform
