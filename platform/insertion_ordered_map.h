#pragma once

#include <cstddef>
#include <list>
#include <string_view>
#include <unordered_map>
#include <utility>

#include "platform/export.h"
#include "platform/text.h"

namespace platform {

// A hash for texts that come from files: each process has a seed of its own, so nobody can choose texts that collide.
struct SeededHash {
  [[nodiscard]] ACCOUNT_EXPORT std::size_t operator()(std::string_view text) const;
};

// A map from text to Value that is walked in the order in which its keys were inserted; storing under a key that is
// there keeps the key's place. Look-up, insertion and removal take constant time, whatever the size and the keys.
// References and iterators stay good until their own entry is removed.
template <typename Value>
class InsertionOrderedMap {
 public:
  using Entry = std::pair<const Text, Value>;
  using const_iterator = typename std::list<Entry>::const_iterator;

  InsertionOrderedMap() = default;
  InsertionOrderedMap(const InsertionOrderedMap& other) { assignFrom(other); }
  InsertionOrderedMap(InsertionOrderedMap&&) noexcept = default;
  InsertionOrderedMap& operator=(const InsertionOrderedMap& other) {
    if (this != &other) {
      clear();
      assignFrom(other);
    }
    return *this;
  }
  InsertionOrderedMap& operator=(InsertionOrderedMap&&) noexcept = default;
  ~InsertionOrderedMap() = default;

  [[nodiscard]] std::size_t size() const { return _entries.size(); }
  [[nodiscard]] bool empty() const { return _entries.empty(); }
  [[nodiscard]] const_iterator begin() const { return _entries.begin(); }
  [[nodiscard]] const_iterator end() const { return _entries.end(); }
  [[nodiscard]] bool contains(std::string_view key) const { return _places.contains(key); }

  // The value under the key, or null.
  [[nodiscard]] const Value* find(std::string_view key) const {
    const auto place = _places.find(key);
    return place == _places.end() ? nullptr : &place->second->second;
  }
  [[nodiscard]] Value* find(std::string_view key) {
    const auto place = _places.find(key);
    return place == _places.end() ? nullptr : &place->second->second;
  }

  void set(Text key, Value value) {
    if (Value* const present = find(key)) {
      *present = std::move(value);
      return;
    }
    _entries.emplace_back(std::move(key), std::move(value));
    _places.emplace(_entries.back().first.view(), std::prev(_entries.end()));
  }

  // Answers whether the key was there.
  bool remove(std::string_view key) {
    const auto place = _places.find(key);
    if (place == _places.end()) return false;
    const auto entry = place->second;
    _places.erase(place);
    _entries.erase(entry);
    return true;
  }

  void clear() {
    _places.clear();
    _entries.clear();
  }

 private:
  void assignFrom(const InsertionOrderedMap& other) {
    for (const Entry& entry : other) set(entry.first, entry.second);
  }

  std::list<Entry> _entries;
  std::unordered_map<std::string_view, typename std::list<Entry>::iterator, SeededHash> _places;
};

}  // namespace platform
