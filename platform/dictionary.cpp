#include <algorithm>
#include <mutex>
#include <unordered_map>

#include "platform/property_value.h"

namespace platform {
namespace {

// Up to this many keys a walk is at least as quick as an index.
constexpr std::size_t kLargestWithoutIndex = 32;

using Index = std::unordered_map<std::string_view, std::size_t>;

Index indexOf(const std::vector<Dictionary::Entry>& entries) {
  Index index;
  index.reserve(entries.size());
  for (std::size_t position = 0; position < entries.size(); ++position) {
    index.emplace(entries[position].key.view(), position);
  }
  return index;
}

}  // namespace

struct Dictionary::Contents {
  std::vector<Entry> entries;

  Contents() = default;
  Contents(const Contents& other) : entries{other.entries} {}

  [[nodiscard]] const Entry* find(std::string_view key) const {
    if (entries.size() > kLargestWithoutIndex) return findIndexed(key);
    for (const Entry& entry : entries) {
      if (entry.key == key) return &entry;
    }
    return nullptr;
  }
  void append(Text key, PropertyValue value) {
    entries.push_back({std::move(key), std::move(value)});
    if (!_index.empty()) _index.emplace(entries.back().key.view(), entries.size() - 1);
  }
  void erase(const Entry& entry) {
    _index.clear();
    entries.erase(entries.begin() + (&entry - entries.data()));
  }

 private:
  // Shared contents may be searched by several threads; whoever needs the index first makes it.
  [[nodiscard]] const Entry* findIndexed(std::string_view key) const {
    const std::scoped_lock lock{_indexing};
    if (_index.empty()) _index = indexOf(entries);
    const auto found = _index.find(key);
    return found == _index.end() ? nullptr : &entries[found->second];
  }

  mutable std::mutex _indexing;
  mutable Index _index;
};

Dictionary::Dictionary(std::initializer_list<Entry> entries) {
  for (const Entry& entry : entries) set(entry.key, entry.value);
}

std::size_t Dictionary::size() const { return _contents == nullptr ? 0 : _contents->entries.size(); }

Dictionary::const_iterator Dictionary::begin() const {
  return _contents == nullptr ? nullptr : _contents->entries.data();
}
Dictionary::const_iterator Dictionary::end() const {
  return _contents == nullptr ? nullptr : _contents->entries.data() + _contents->entries.size();
}

const PropertyValue* Dictionary::find(std::string_view key) const {
  const Entry* const entry = _contents == nullptr ? nullptr : _contents->find(key);
  return entry == nullptr ? nullptr : &entry->value;
}
const Text* Dictionary::text(std::string_view key) const {
  const PropertyValue* const value = find(key);
  return value == nullptr ? nullptr : value->asText();
}
const Array* Dictionary::array(std::string_view key) const {
  const PropertyValue* const value = find(key);
  return value == nullptr ? nullptr : value->asArray();
}
const Dictionary* Dictionary::dictionary(std::string_view key) const {
  const PropertyValue* const value = find(key);
  return value == nullptr ? nullptr : value->asDictionary();
}

Dictionary::Contents& Dictionary::editable() {
  // Counting one more holder orders this thread after every reader that has let go of the contents by now.
  const std::shared_ptr<Contents> held = _contents;
  if (held == nullptr) {
    _contents = std::make_shared<Contents>();
  } else if (held.use_count() > 2) {
    _contents = std::make_shared<Contents>(*held);
  }
  return *_contents;
}

void Dictionary::reserve(std::size_t count) { editable().entries.reserve(count); }

void Dictionary::set(Text key, PropertyValue value) {
  Contents& contents = editable();
  if (const Entry* const entry = contents.find(key)) {
    contents.entries[static_cast<std::size_t>(entry - contents.entries.data())].value = std::move(value);
  } else {
    contents.append(std::move(key), std::move(value));
  }
}

std::optional<PropertyValue> Dictionary::remove(std::string_view key) {
  if (!contains(key)) return std::nullopt;
  Contents& contents = editable();
  const Entry* const entry = contents.find(key);
  std::optional<PropertyValue> value{entry->value};
  contents.erase(*entry);
  return value;
}

bool operator==(const Dictionary& left, const Dictionary& right) {
  if (left.isIdenticalTo(right)) return true;
  return left.size() == right.size() && std::all_of(left.begin(), left.end(), [&right](const Dictionary::Entry& entry) {
           const PropertyValue* const other = right.find(entry.key);
           return other != nullptr && *other == entry.value;
         });
}

}  // namespace platform
