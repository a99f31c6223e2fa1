#pragma once

#include <memory>
#include <mutex>
#include <optional>
#include <span>
#include <vector>

#include "platform/property_value.h"

namespace platform {

// The property lists that were last read and written, as bytes and as values. Who has read a file and finds bytes that
// are known need not parse them again, and who writes values of which the bytes are known need not make them again; the
// file itself is read and written all the same. What is known is known by the whole of its bytes, not by a name, a size
// or a time, so no change of a file goes unseen.
//
// Only a few lists are kept, of no more than 256 MiB together; the one that was not needed for the longest time goes.
// May be used from several threads.
class KnownPropertyLists {
 public:
  [[nodiscard]] std::optional<Dictionary> valuesOf(std::span<const std::uint8_t> bytes);
  // Bytes that hold exactly these values, in their order, and nothing else; null where none are known.
  [[nodiscard]] std::shared_ptr<const Bytes> bytesOf(const Dictionary& values);

  // `isFaithful`: whether the bytes hold nothing but the values, so that they may be written for them.
  void keep(std::shared_ptr<const Bytes> bytes, Dictionary values, bool isFaithful);

 private:
  struct Known {
    std::shared_ptr<const Bytes> bytes;
    Dictionary values;
    bool isFaithful;
  };
  void makeLatest(std::vector<Known>::iterator known);
  [[nodiscard]] std::size_t size() const;  // of all their bytes

  std::mutex _guard;
  std::vector<Known> _lists;  // the latest is the last one
};

}  // namespace platform
