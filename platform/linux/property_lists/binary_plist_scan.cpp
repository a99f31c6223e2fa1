#include "platform/linux/property_lists/binary_plist_scan.h"

#include <algorithm>
#include <vector>

#include "platform/linux/property_lists/binary_plist_layout.h"
#include "platform/linux/property_lists/binary_plist_repair.h"
#include "platform/property_list_store.h"

namespace platform {
namespace {

using Object = BinaryPlistLayout::Object;
using Type = BinaryPlistLayout::Type;

// What an object unfolds to, in bytes of memory: libplist's nodes and the values made of them together.
constexpr std::uint64_t kNodeBytes = 128;
constexpr std::uint64_t kDateBytes = 1000;  // not memory but time: a fraction of a second is slow to read exactly
constexpr std::uint64_t kTextBytes = 160;
constexpr std::uint64_t kFirstTextBytes = 112;  // once for a text, however often it is used
constexpr std::uint64_t kDataBytes = 208;
constexpr std::uint64_t kArrayBytes = 224;
constexpr std::uint64_t kDictionaryBytes = 320;
constexpr std::uint64_t kEntryBytes = 136;  // beyond its key and its value

struct Limits {
  std::uint64_t nodes;
  std::uint64_t bytes;
  std::uint64_t levels;  // libplist looks for cycles by comparing each node with all above it

  explicit Limits(std::uint64_t fileSize)
      : nodes{std::min<std::uint64_t>(fileSize, kMaxValues)},
        bytes{120 * fileSize + (4U << 20U)},
        levels{64 * fileSize + (4U << 20U)} {}
};

struct Weight {
  std::uint64_t bytes = 0;
  std::uint64_t levels = 0;  // the levels of all nodes, counted from this one
  std::uint32_t nodes = 1;
  std::uint16_t height = 0;  // containers on the longest way down, this one included
  enum class State : std::uint8_t { unseen, open, known } state = State::unseen;
};

std::uint64_t leafBytes(const Object& leaf) {
  switch (leaf.type) {
    case Type::date: return kDateBytes;
    case Type::other: return kTextBytes;
    case Type::ascii: return kTextBytes + 2 * leaf.size;
    case Type::utf16: return kTextBytes + 6 * leaf.size;
    case Type::data: return kDataBytes + 2 * leaf.size;
    default: return kNodeBytes;
  }
}

class Scan {
 public:
  Scan(Bytes& file, const BinaryPlistLayout& layout)
      : _layout{layout}, _repair{file, layout}, _limits{file.size()}, _weights(layout.objectCount()) {}

  // Why it ended where it failed.
  [[nodiscard]] Cause refusal() const { return _refusal; }
  [[nodiscard]] bool hasRepaired() const { return _repair.hasRepaired(); }

  [[nodiscard]] std::uint64_t unfoldedBytes() const { return _weights[_layout.root()].bytes + _once; }

  // Whether the file holds what the root reaches, as it would be written, and nothing else.
  [[nodiscard]] bool isFaithful() const {
    return !_repair.hasRepaired() && !_repair.hasFoundOddities() && _reached == _weights.size() &&
           _reachedBytes == _layout.objectArea() && _layout.endsWithTable();
  }

  [[nodiscard]] bool run() {
    if (!enter(_layout.root())) return false;
    while (!_open.empty()) {
      Frame& frame = _open.back();
      const bool goesOn =
          frame.next < frame.references ? visit(_layout.reference(frame.container, frame.next++)) : leave();
      if (!goesOn) return false;
    }
    return true;
  }

 private:
  struct Frame {
    std::size_t index;
    Object container;
    std::size_t references;
    std::size_t next = 0;
  };

  [[nodiscard]] bool visit(std::uint64_t index) {
    if (index >= _weights.size()) return false;
    if (_weights[index].state == Weight::State::open) return exceed();
    return _weights[index].state == Weight::State::known ? addToOpen(_weights[index]) : enter(index);
  }

  [[nodiscard]] bool enter(std::size_t index) {
    const auto object = _layout.object(index);
    if (!object) return false;
    ++_reached;
    _reachedBytes += _layout.extent(*object);
    const bool isContainer = object->type == Type::array || object->type == Type::dictionary;
    return isContainer ? open(index, *object) : weigh(index, *object);
  }

  [[nodiscard]] bool weigh(std::size_t index, const Object& leaf) {
    _repair.repairLeaf(leaf);
    Weight& weight = _weights[index];
    weight.bytes = leafBytes(leaf);
    weight.state = Weight::State::known;
    if (leaf.type == Type::ascii || leaf.type == Type::utf16) _once += kFirstTextBytes + leaf.size;
    return addToOpen(weight);
  }

  [[nodiscard]] bool open(std::size_t index, Object container) {
    if (_open.size() == kMaxNesting) return exceed();
    _references += referencesOf(container);
    if (_references > _limits.nodes) return exceed();
    if (!_repair.repairContainer(container)) return false;
    const bool isArray = container.type == Type::array;
    Weight& weight = _weights[index];
    weight.bytes = isArray ? kArrayBytes : kDictionaryBytes + container.size * kEntryBytes;
    weight.height = 1;
    weight.state = Weight::State::open;
    _open.push_back({index, container, referencesOf(container)});
    return true;
  }

  static std::size_t referencesOf(const Object& container) {
    return container.type == Type::array ? container.size : 2 * container.size;
  }

  [[nodiscard]] bool leave() {
    Weight& weight = _weights[_open.back().index];
    weight.state = Weight::State::known;
    _open.pop_back();
    return addToOpen(weight);
  }

  [[nodiscard]] bool addToOpen(const Weight& child) {
    if (_open.empty()) return true;
    Weight& sum = _weights[_open.back().index];
    sum.nodes += child.nodes;
    sum.bytes += child.bytes;
    sum.levels += child.levels + child.nodes;
    if (child.height >= sum.height) sum.height = static_cast<std::uint16_t>(child.height + 1);
    const bool isWithinLimits = sum.nodes <= _limits.nodes && sum.bytes + _once <= _limits.bytes &&
                                sum.levels <= _limits.levels && _open.size() + child.height <= kMaxNesting;
    return isWithinLimits || exceed();
  }

  [[nodiscard]] bool exceed() {
    _refusal = Cause::excessive;
    return false;
  }

  const BinaryPlistLayout& _layout;
  BinaryPlistRepair _repair;
  Limits _limits;
  std::vector<Weight> _weights;  // by object
  std::vector<Frame> _open;      // the containers from the root to here
  std::uint64_t _references = 0;
  std::uint64_t _once = 0;
  std::size_t _reached = 0;
  std::size_t _reachedBytes = 0;
  Cause _refusal = Cause::malformed;
};

}  // namespace

BinaryPlistFinding repairBinaryPlist(Bytes& file) {
  const auto layout = BinaryPlistLayout::of(file);
  if (!layout) return {Cause::malformed};
  // One pass repairs a file whose objects lie apart; the next finds it sound. Where objects overlap, a repair may have
  // broken another one, and a few more passes settle it or nothing does.
  constexpr int kPasses = 4;
  for (int pass = 0; pass < kPasses; ++pass) {
    Scan scan{file, *layout};
    if (!scan.run()) return {scan.refusal()};
    if (scan.hasRepaired()) continue;
    return {.isFaithful = pass == 0 && scan.isFaithful(), .unfoldedBytes = scan.unfoldedBytes()};
  }
  return {Cause::malformed};
}

}  // namespace platform
