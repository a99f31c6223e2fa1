#include "platform/linux/property_lists/libplist_conversion.h"

#include <plist/plist.h>

#include <array>
#include <clocale>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "platform/insertion_ordered_map.h"
#include "platform/linux/property_lists/binary_plist_scan.h"
#include "platform/linux/property_lists/libplist_node.h"
#include "platform/linux/property_lists/writing_cost.h"
#include "platform/linux/property_lists/xml_plist_scan.h"

namespace platform {
namespace {

// Texts that files repeat (types, classes, data classes) become one Text; identifiers, which they do not repeat, are
// longer. Only the latest of those that fall on one place is known, so nothing is kept of texts that all differ.
class RecentTexts {
 public:
  Text text(std::string_view characters) {
    if (characters.size() > kMaxSize) return characters;
    Text& recent = _texts[place(characters)];
    if (recent != characters) recent = characters;
    return recent;
  }

 private:
  static constexpr std::size_t kMaxSize = 35;
  static constexpr std::size_t kPlaces = 512;

  static std::size_t place(std::string_view characters) {
    std::uint64_t hash = characters.size();
    for (const char character : characters) hash = hash * 31 + static_cast<unsigned char>(character);
    return (hash ^ (hash >> 9U)) % kPlaces;
  }

  std::array<Text, kPlaces> _texts;
};

// Turns a tree of libplist into values. The keys of all its dictionaries become one Text each.
class Conversion {
 public:
  Dictionary dictionary(plist_t node) {
    const std::vector<Item> items = itemsOf(node);
    std::vector<Dictionary::Entry> entries;
    entries.reserve(items.size());
    for (const Item& item : items) entries.push_back({item.key, value(item.node)});
    return Dictionary{std::move(entries)};
  }

  [[nodiscard]] bool hasFoundRepeatedKeys() const { return _hasFoundRepeatedKeys; }
  // How many keys and values there were.
  [[nodiscard]] std::size_t size() const { return _size; }

 private:
  struct Item {
    Text key;
    plist_t node;
  };
  struct Key {
    Text text;
    std::size_t dictionary = 0;  // the last one in which it was found, and its place there
    std::size_t place = 0;
    Key* follower = nullptr;  // the key that came after it the last time
  };

  // A dictionary's items, of each key the last one at the first one's place.
  std::vector<Item> itemsOf(plist_t node) {
    ++_dictionaries;
    std::vector<Item> items;
    const std::size_t count = plist_dict_get_size(node);
    items.reserve(count);
    _size += count;
    LibplistEntries entries{node};
    while (entries.advance()) {
      Key& key = keyOf(entries);
      if (key.dictionary == _dictionaries) {
        items[key.place].node = entries.item();
        _hasFoundRepeatedKeys = true;
        continue;
      }
      key.dictionary = _dictionaries;
      key.place = items.size();
      items.push_back({key.text, entries.item()});
    }
    return items;
  }

  // Records name the same keys in the same order, so mostly it is the one that came after the key before it the last
  // time, and need not be copied to be looked up.
  Key& keyOf(const LibplistEntries& entries) {
    Key* const expected = _previous->follower;
    const bool isExpected = expected != nullptr && entries.hasKey(expected->text.cString());
    Key& key = isExpected ? *expected : known(entries.key().get());
    _previous->follower = &key;
    _previous = &key;
    return key;
  }

  // Bytes that are not UTF-8 change as they become a text, so two keys of the file may be one; the text tells.
  Key& known(std::string_view characters) {
    const auto found = _keys.find(characters);
    if (found != _keys.end()) return found->second;
    const Text text{characters};
    return _keys.try_emplace(text.view(), Key{text}).first->second;
  }

  PropertyValue value(plist_t node) {
    ++_size;
    switch (plist_get_node_type(node)) {
      case PLIST_STRING: return _texts.text(textOfLibplist(node));
      case PLIST_ARRAY: return array(node);
      case PLIST_DICT: return dictionary(node);
      case PLIST_DATA: return data(node);
      default: return scalarOfLibplist(node);
    }
  }

  static PropertyValue data(plist_t node) {
    const std::span<const std::uint8_t> bytes = dataOfLibplist(node);
    return Bytes{bytes.begin(), bytes.end()};
  }

  PropertyValue array(plist_t node) {
    Array array;
    array.reserve(plist_array_get_size(node));
    LibplistArrayItems items{node};
    while (const plist_t item = items.next()) array.push_back(value(item));
    return array;
  }

  std::unordered_map<std::string_view, Key, SeededHash> _keys;  // by views of their texts
  Key _beforeTheFirst;
  Key* _previous = &_beforeTheFirst;
  RecentTexts _texts;
  std::size_t _dictionaries = 0;
  std::size_t _size = 0;
  bool _hasFoundRepeatedKeys = false;
};

// libplist reads numbers by the process's locale, in which a decimal point may be a comma.
class PlainNumbers {
 public:
  PlainNumbers() : _plain{newlocale(LC_NUMERIC_MASK, "C", nullptr)}, _previous{uselocale(_plain)} {}
  PlainNumbers(const PlainNumbers&) = delete;
  PlainNumbers& operator=(const PlainNumbers&) = delete;
  ~PlainNumbers() {
    uselocale(_previous);
    if (_plain != nullptr) freelocale(_plain);
  }

 private:
  locale_t _plain;
  locale_t _previous;
};

constexpr std::size_t kXmlGrowth = 24;  // what most lists take in memory for each byte of XML

const char* charactersOf(const Bytes& bytes) { return reinterpret_cast<const char*>(bytes.data()); }

struct Tree {
  LibplistNode root = {};
  bool isFaithful = false;      // see BinaryPlistFinding
  Cause refusal = Cause::none;  // why there is no root
};

LibplistNode treeOf(const Bytes& binary) {
  plist_t root = nullptr;
  plist_from_bin(charactersOf(binary), static_cast<std::uint32_t>(binary.size()), &root);
  return LibplistNode{root};
}

Tree parseXml(Bytes& bytes) {
  if (bytes.size() > kMaxXmlPropertyListSize) return {.refusal = Cause::excessive};
  if (const Cause refusal = repairXmlPlist(bytes); refusal != Cause::none) return {.refusal = refusal};
  requireMemory(kXmlGrowth * bytes.size());
  const PlainNumbers plainNumbers;
  plist_t root = nullptr;
  plist_from_xml(charactersOf(bytes), static_cast<std::uint32_t>(bytes.size()), &root);
  return {LibplistNode{root}};
}

// A tree whose root is a dictionary, or the refusal.
Tree parse(Bytes bytes) {
  if (bytes.size() > kMaxPropertyListSize) return {.refusal = Cause::excessive};
  const bool isBinary = std::string_view{charactersOf(bytes), bytes.size()}.starts_with("bplist");
  const BinaryPlistFinding finding = isBinary ? repairBinaryPlist(bytes) : BinaryPlistFinding{};
  if (finding.refusal != Cause::none) return {.refusal = finding.refusal};
  requireMemory(finding.unfoldedBytes);
  Tree tree = isBinary ? Tree{treeOf(bytes), finding.isFaithful} : parseXml(bytes);
  if (tree.refusal != Cause::none) return tree;
  if (tree.root == nullptr) return {.refusal = Cause::malformed};
  if (plist_get_node_type(tree.root.get()) != PLIST_DICT) return {.refusal = Cause::unsuitable};
  return tree;
}

const char* reasonFor(Cause refusal) {
  switch (refusal) {
    case Cause::excessive: return "it is too large, or would take too much memory or time";
    case Cause::unsuitable: return "its root is no dictionary";
    default: return "it is no property list, or not a whole one";
  }
}

}  // namespace

Result<ParsedPropertyList> parsePropertyList(Bytes bytes, std::string attempt) {
  const Tree tree = parse(std::move(bytes));
  if (tree.refusal != Cause::none) return Status::failure(tree.refusal, std::move(attempt), reasonFor(tree.refusal));
  Conversion conversion;
  Dictionary values = conversion.dictionary(tree.root.get());
  if (isDearToWrite(values, conversion.size()))
    return Status::failure(Cause::excessive, std::move(attempt), reasonFor(Cause::excessive));
  return ParsedPropertyList{std::move(values), tree.isFaithful && !conversion.hasFoundRepeatedKeys()};
}

}  // namespace platform
