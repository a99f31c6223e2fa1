#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>
#include <unordered_set>
#include <vector>

namespace platform {

// What libplist spends on the keys of one XML dictionary: it searches all entries for each new key, from some 500 on
// through a table of fixed size, and walks to the place of a key that comes again. Keys can be made to fall into one
// place of that table, or to come again and again.
class XmlKeyCost {
 public:
  // The steps that this key takes, given those before it. A key with entities or sections in it counts as the dearest,
  // since its characters are not known here.
  std::uint64_t add(std::string_view key, bool isPlain);

 private:
  bool record(std::uint32_t hash);

  std::vector<std::uint32_t> _hashes;
  std::unordered_set<std::uint32_t> _known;  // the same, from where the library has its table on
  std::vector<std::uint32_t> _chains;        // how many keys share a place of the table
};

}  // namespace platform
