#include "platform/linux/property_lists/known_property_lists.h"

#include <algorithm>
#include <functional>
#include <numeric>

namespace platform {
namespace {

constexpr std::size_t kMaxLists = 4;
constexpr std::size_t kMaxBytes = std::size_t{256} << 20U;

bool isWrittenAlike(const PropertyValue& left, const PropertyValue& right);

// Unlike equality this tells orders apart.
bool isWrittenAlike(const Dictionary& left, const Dictionary& right) {
  if (left.isIdenticalTo(right)) return true;
  return std::equal(left.begin(), left.end(), right.begin(), right.end(),
                    [](const Dictionary::Entry& one, const Dictionary::Entry& other) {
                      return one.key == other.key && isWrittenAlike(one.value, other.value);
                    });
}

bool isWrittenAlike(const Array& left, const Array& right) {
  if (&left == &right) return true;
  return std::equal(left.begin(), left.end(), right.begin(), right.end(),
                    [](const PropertyValue& one, const PropertyValue& other) { return isWrittenAlike(one, other); });
}

bool isWrittenAlike(const PropertyValue& left, const PropertyValue& right) {
  if (left.kind() != right.kind()) return false;
  if (const Dictionary* const dictionary = left.asDictionary())
    return isWrittenAlike(*dictionary, *right.asDictionary());
  if (const Array* const array = left.asArray()) return isWrittenAlike(*array, *right.asArray());
  return left == right;
}

}  // namespace

std::optional<Dictionary> KnownPropertyLists::valuesOf(std::span<const std::uint8_t> bytes) {
  const std::scoped_lock lock{_guard};
  const auto known = std::ranges::find_if(
      _lists.rbegin(), _lists.rend(), [bytes](const Known& each) { return std::ranges::equal(*each.bytes, bytes); });
  if (known == _lists.rend()) return std::nullopt;
  makeLatest(std::prev(known.base()));
  return _lists.back().values;
}

std::shared_ptr<const Bytes> KnownPropertyLists::bytesOf(const Dictionary& values) {
  const std::scoped_lock lock{_guard};
  const auto known = std::ranges::find_if(_lists.rbegin(), _lists.rend(), [&values](const Known& each) {
    return each.isFaithful && isWrittenAlike(each.values, values);
  });
  if (known == _lists.rend()) return nullptr;
  makeLatest(std::prev(known.base()));
  return _lists.back().bytes;
}

void KnownPropertyLists::keep(std::shared_ptr<const Bytes> bytes, Dictionary values, bool isFaithful) {
  const std::scoped_lock lock{_guard};
  _lists.push_back({std::move(bytes), std::move(values), isFaithful});
  while (_lists.size() > kMaxLists || size() > kMaxBytes) _lists.erase(_lists.begin());
}

std::size_t KnownPropertyLists::size() const {
  return std::transform_reduce(_lists.begin(), _lists.end(), std::size_t{0}, std::plus{},
                               [](const Known& each) { return each.bytes->size(); });
}

void KnownPropertyLists::makeLatest(std::vector<Known>::iterator known) {
  std::rotate(known, std::next(known), _lists.end());
}

}  // namespace platform
