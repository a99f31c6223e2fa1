#include "platform/linux/property_lists/xml_key_cost.h"

namespace platform {
namespace {

constexpr std::size_t kTableFrom = 250;  // libplist counts keys and values
constexpr std::size_t kTableSize = 4096;

std::uint32_t tableHash(std::string_view key) {
  std::uint32_t hash = 5381;
  for (const char character : key) hash = hash * 33 + static_cast<std::uint32_t>(character);
  return hash;
}

}  // namespace

std::uint64_t XmlKeyCost::add(std::string_view key, bool isPlain) {
  const std::uint32_t hash = tableHash(key);
  _hashes.push_back(hash);
  if (_hashes.size() <= kTableFrom) return _hashes.size();
  if (_chains.empty()) {
    _chains.resize(kTableSize);
    for (const std::uint32_t earlier : _hashes) record(earlier);
    return _hashes.size();
  }
  const bool isNew = record(hash);
  return isNew && isPlain ? _chains[hash % kTableSize] : _hashes.size();
}

bool XmlKeyCost::record(std::uint32_t hash) {
  ++_chains[hash % kTableSize];
  return _known.insert(hash).second;
}

}  // namespace platform
