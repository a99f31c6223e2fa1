#include "platform/linux/property_lists/libplist_conversion.h"

#include <limits>
#include <string>

#include <plist/plist.h>

#include "platform/linux/property_lists/binary_plist_comparison.h"
#include "platform/linux/property_lists/binary_plist_scan.h"
#include "platform/linux/property_lists/libplist_node.h"

namespace platform {
namespace {

constexpr std::size_t kBytesForValue = 400;
constexpr std::uint64_t kMaxUid = std::numeric_limits<std::uint32_t>::max();

Status failure(Cause cause, const char* reason) {
  return Status::failure(cause, "serialize the property list", reason);
}

SerializedPropertyList nothing(const Status& why) { return {nullptr, why}; }

// Finds out, before anything is built, why a value cannot be written. Values may share their parts, so a small one may
// unfold to more than there is memory: counting ends where the limit is reached.
class Inspection {
 public:
  void inspect(const Dictionary& dictionary, std::size_t depth = 1) {
    if (!goesOn(depth)) return;
    for (const auto& [key, value] : dictionary) {
      add(key.size());
      inspect(value, depth);
    }
  }

  [[nodiscard]] const Status& objection() const { return _objection; }
  // That libplist takes for its tree, its table and the bytes, about.
  [[nodiscard]] std::size_t memoryNeeded() const { return kBytesForValue * _values + 6 * _bytes; }

 private:
  void inspect(const PropertyValue& value, std::size_t depth) {
    if (!_objection.isOk()) return;
    add(0);
    if (const Text* const text = value.asText()) add(text->size());
    if (const Bytes* const data = value.asData()) add(data->size());
    if (const Uid* const uid = value.asUid(); uid != nullptr && uid->number > kMaxUid) {
      object(Cause::unsuitable, "A UID is larger than 32 bits");
    }
    if (const Dictionary* const dictionary = value.asDictionary()) inspect(*dictionary, depth + 1);
    if (const Array* const array = value.asArray(); array != nullptr && goesOn(depth + 1)) {
      for (const PropertyValue& element : *array) inspect(element, depth + 1);
    }
  }

  void add(std::size_t bytes) {
    ++_values;
    _bytes += bytes;
    if (_values > kMaxValues || _bytes > kMaxPropertyListSize)
      object(Cause::excessive, "The property list is too large");
  }

  bool goesOn(std::size_t depth) {
    if (depth > kMaxNesting) object(Cause::excessive, "The property list has more than 256 nested containers");
    return _objection.isOk();
  }

  void object(Cause cause, const char* reason) { _objection = failure(cause, reason); }

  std::size_t _values = 0;
  std::size_t _bytes = 0;
  Status _objection;
};

LibplistNode nodeOf(const PropertyValue& value);

LibplistNode nodeOf(const Dictionary& dictionary) {
  LibplistNode node{plist_new_dict()};
  for (const auto& [key, value] : dictionary) {
    plist_dict_set_item(node.get(), key.cString(), nodeOf(value).release());
  }
  return node;
}

LibplistNode nodeOf(const Array& array) {
  LibplistNode node{plist_new_array()};
  for (const PropertyValue& element : array) plist_array_append_item(node.get(), nodeOf(element).release());
  return node;
}

LibplistNode nodeOf(PropertyValue::Integer integer) {
  return integer.isAboveInt64 ? makeLibplistInteger(integer.bits) : LibplistNode{plist_new_uint(integer.bits)};
}

LibplistNode nodeOf(const Bytes& data) {
  return LibplistNode{plist_new_data(reinterpret_cast<const char*>(data.data()), data.size())};
}

// No deeper than the nesting that inspection has let pass.
LibplistNode nodeOf(const PropertyValue& value) {
  switch (value.kind()) {
    case PropertyValue::Kind::string: return LibplistNode{plist_new_string(value.asText()->cString())};
    case PropertyValue::Kind::integer: return nodeOf(*value.asInteger());
    case PropertyValue::Kind::real: return LibplistNode{plist_new_real(*value.asReal())};
    case PropertyValue::Kind::boolean: return LibplistNode{plist_new_bool(*value.asBoolean() ? 1 : 0)};
    case PropertyValue::Kind::date: return makeLibplistDate(value.asDate()->secondsSince2001);
    case PropertyValue::Kind::data: return nodeOf(*value.asData());
    case PropertyValue::Kind::array: return nodeOf(*value.asArray());
    case PropertyValue::Kind::dictionary: return nodeOf(*value.asDictionary());
    case PropertyValue::Kind::uid: return LibplistNode{plist_new_uid(value.asUid()->number)};
  }
  return nullptr;
}

// No bytes where libplist refuses.
Bytes binaryOf(plist_t tree) {
  char* written = nullptr;
  std::uint32_t size = 0;
  plist_to_bin(tree, &written, &size);
  const std::unique_ptr<char, decltype(&plist_to_bin_free)> owned{written, &plist_to_bin_free};
  return written == nullptr ? Bytes{} : Bytes{written, written + size};
}

}  // namespace

SerializedPropertyList writePropertyList(const Dictionary& dictionary) {
  Inspection inspection;
  inspection.inspect(dictionary);
  if (!inspection.objection().isOk()) return nothing(inspection.objection());
  requireMemory(inspection.memoryNeeded());
  LibplistNode tree = nodeOf(dictionary);
  Bytes bytes = binaryOf(tree.get());
  if (bytes.empty()) return nothing(failure(Cause::other, "The property list could not be written"));
  // Before the tree goes: a large block that is asked for when thousands of small ones have just been given back makes
  // the C library sort them all.
  const bool isSafe = repairBinaryPlist(bytes).refusal == Cause::none;
  tree.reset();
  if (!isSafe || !holdsExactly(bytes, dictionary)) {
    return nothing(failure(Cause::other, "What was written does not read back the same"));
  }
  return {std::make_shared<const Bytes>(std::move(bytes)), {}};
}

}  // namespace platform
