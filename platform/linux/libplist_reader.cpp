#include "platform/linux/libplist_reader.h"

#include <clocale>
#include <cstdlib>
#include <memory>
#include <string_view>
#include <unordered_map>

#include <plist/plist.h>

#include "platform/linux/binary_plist_scan.h"
#include "platform/linux/libplist_node.h"
#include "platform/linux/xml_plist_scan.h"

namespace platform {
namespace {

struct Freeing {
  void operator()(void* memory) const { std::free(memory); }
};
using Iterator = std::unique_ptr<void, Freeing>;
using Characters = std::unique_ptr<char, Freeing>;

// Turns a tree of libplist into values. Texts that a file repeats, its keys above all, become one Text.
class Conversion {
 public:
  Dictionary dictionary(plist_t node) {
    Dictionary dictionary;
    dictionary.reserve(plist_dict_get_size(node));
    plist_dict_iter rawIterator = nullptr;
    plist_dict_new_iter(node, &rawIterator);
    const Iterator iterator{rawIterator};
    while (true) {
      char* rawKey = nullptr;
      plist_t item = nullptr;
      plist_dict_next_item(node, iterator.get(), &rawKey, &item);
      const Characters key{rawKey};
      if (item == nullptr) return dictionary;
      dictionary.set(interned(key.get()), value(item));
    }
  }

 private:
  PropertyValue value(plist_t node) {
    switch (plist_get_node_type(node)) {
      case PLIST_BOOLEAN: return boolean(node);
      case PLIST_UINT: return integer(node);
      case PLIST_REAL: return real(node);
      case PLIST_STRING: return text(node);
      case PLIST_ARRAY: return array(node);
      case PLIST_DICT: return dictionary(node);
      case PLIST_DATE: return Date{secondsOfLibplistDate(node)};
      case PLIST_DATA: return data(node);
      case PLIST_UID: return uid(node);
      default: return Text{};
    }
  }

  static PropertyValue boolean(plist_t node) {
    std::uint8_t truth = 0;
    plist_get_bool_val(node, &truth);
    return truth != 0;
  }
  static PropertyValue integer(plist_t node) {
    std::uint64_t bits = 0;
    plist_get_uint_val(node, &bits);
    if (isAboveInt64(node, bits)) return bits;
    return static_cast<std::int64_t>(bits);
  }
  static PropertyValue real(plist_t node) {
    double real = 0;
    plist_get_real_val(node, &real);
    return real;
  }
  static PropertyValue uid(plist_t node) {
    Uid uid;
    plist_get_uid_val(node, &uid.number);
    return uid;
  }
  static PropertyValue data(plist_t node) {
    std::uint64_t size = 0;
    const char* const bytes = plist_get_data_ptr(node, &size);
    return bytes == nullptr ? Bytes{} : Bytes{bytes, bytes + size};
  }
  PropertyValue text(plist_t node) {
    std::uint64_t size = 0;
    const char* const characters = plist_get_string_ptr(node, &size);
    return characters == nullptr ? Text{} : interned({characters, size});
  }
  PropertyValue array(plist_t node) {
    Array array;
    array.reserve(plist_array_get_size(node));
    plist_array_iter rawIterator = nullptr;
    plist_array_new_iter(node, &rawIterator);
    const Iterator iterator{rawIterator};
    while (true) {
      plist_t item = nullptr;
      plist_array_next_item(node, iterator.get(), &item);
      if (item == nullptr) return array;
      array.push_back(value(item));
    }
  }

  Text interned(std::string_view characters) {
    constexpr std::size_t kLongestInterned = 64;
    if (characters.size() > kLongestInterned) return characters;
    const auto known = _texts.find(characters);
    if (known != _texts.end()) return known->second;
    const Text text{characters};
    if (text == characters) _texts.emplace(text.view(), text);
    return text;
  }

  std::unordered_map<std::string_view, Text> _texts;  // keys are views of the values
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

const char* charactersOf(const Bytes& bytes) { return reinterpret_cast<const char*>(bytes.data()); }

LibplistNode parseBinary(Bytes& bytes) {
  if (!repairBinaryPlist(bytes)) return nullptr;
  plist_t root = nullptr;
  plist_from_bin(charactersOf(bytes), static_cast<std::uint32_t>(bytes.size()), &root);
  return LibplistNode{root};
}

LibplistNode parseXml(Bytes& bytes) {
  if (bytes.size() > kLargestXmlPropertyList || !repairXmlPlist(bytes)) return nullptr;
  const PlainNumbers plainNumbers;
  plist_t root = nullptr;
  plist_from_xml(charactersOf(bytes), static_cast<std::uint32_t>(bytes.size()), &root);
  return LibplistNode{root};
}

}  // namespace

std::optional<Dictionary> parsePropertyList(Bytes bytes) {
  if (bytes.size() > kLargestPropertyList) return std::nullopt;
  const bool isBinary = std::string_view{charactersOf(bytes), bytes.size()}.starts_with("bplist");
  const LibplistNode root = isBinary ? parseBinary(bytes) : parseXml(bytes);
  bytes = {};
  if (plist_get_node_type(root.get()) != PLIST_DICT) return std::nullopt;
  return Conversion{}.dictionary(root.get());
}

}  // namespace platform
