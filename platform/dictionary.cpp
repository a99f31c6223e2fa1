#include <algorithm>
#include <atomic>
#include <map>
#include <memory>

#include "platform/property_value.h"

namespace platform {
namespace {

// Up to this many keys a walk is at least as quick as an index.
constexpr std::size_t kMaxWithoutIndex = 32;

// In order: no choice of keys makes it slow.
using Index = std::map<std::string_view, std::size_t>;

Index indexOf(const std::vector<Dictionary::Entry>& entries) {
  Index index;
  for (std::size_t position = 0; position < entries.size(); ++position) {
    index.emplace(entries[position].key.view(), position);
  }
  return index;
}

}  // namespace

struct Dictionary::Contents {
  // The dictionaries that share these. The standard library's pointers count theirs, too, but promise nothing of what
  // has happened in other threads before a count is read.
  std::atomic<std::size_t> holders = 1;
  std::vector<Entry> entries;

  Contents() = default;
  Contents(const Contents& other) : entries{other.entries} {}
  Contents& operator=(const Contents&) = delete;
  ~Contents() { dropIndex(); }

  [[nodiscard]] const Entry* find(std::string_view key) const {
    if (entries.size() > kMaxWithoutIndex) return findIndexed(key);
    for (const Entry& entry : entries) {
      if (entry.key == key) return &entry;
    }
    return nullptr;
  }
  void append(Text key, PropertyValue value) {
    entries.push_back({std::move(key), std::move(value)});
    if (Index* const index = _index.load()) index->emplace(entries.back().key.view(), entries.size() - 1);
  }
  void erase(const Entry& entry) {
    dropIndex();
    entries.erase(entries.begin() + (&entry - entries.data()));
  }

 private:
  [[nodiscard]] const Entry* findIndexed(std::string_view key) const {
    const Index& index = madeIndex();
    const auto found = index.find(key);
    return found == index.end() ? nullptr : &entries[found->second];
  }

  // Shared contents may be searched by several threads: whoever is first to have made the index gives it to the others.
  [[nodiscard]] const Index& madeIndex() const {
    if (const Index* const index = _index.load()) return *index;
    auto made = std::make_unique<Index>(indexOf(entries));
    Index* present = nullptr;
    return _index.compare_exchange_strong(present, made.get()) ? *made.release() : *present;
  }

  void dropIndex() {
    if (_index.load(std::memory_order_relaxed) != nullptr) delete _index.exchange(nullptr);
  }

  mutable std::atomic<Index*> _index = nullptr;
};

Dictionary::Dictionary(const Dictionary& other) noexcept : _contents{other._contents} {
  if (_contents != nullptr) _contents->holders.fetch_add(1, std::memory_order_relaxed);
}

Dictionary::~Dictionary() {
  if (_contents != nullptr && _contents->holders.fetch_sub(1, std::memory_order_acq_rel) == 1) delete _contents;
}

// What is begun after the default constructor is given back where an exception ends it.
Dictionary::Dictionary(std::initializer_list<Entry> entries) : Dictionary() {
  for (const Entry& entry : entries) set(entry.key, entry.value);
}

Dictionary::Dictionary(std::vector<Entry> entries) : Dictionary() {
  if (!entries.empty()) editable().entries = std::move(entries);
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
  if (_contents == nullptr) {
    _contents = new Contents;
  } else if (_contents->holders.load(std::memory_order_acquire) > 1) {
    // Who is alone by now comes after all that the others did before they let go.
    Dictionary own;
    own._contents = new Contents{*_contents};
    std::swap(_contents, own._contents);
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
  if (left.size() != right.size()) return false;
  // Equal dictionaries mostly have one order, too.
  const Dictionary::Entry* likely = right.begin();
  return std::all_of(left.begin(), left.end(), [&](const Dictionary::Entry& entry) {
    const PropertyValue* const other = likely->key == entry.key ? &likely->value : right.find(entry.key);
    ++likely;
    return other != nullptr && *other == entry.value;
  });
}

}  // namespace platform
