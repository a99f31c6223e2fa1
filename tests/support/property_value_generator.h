#pragma once

#include <rapidcheck.h>

#include <bit>
#include <string>
#include <vector>

#include "platform/property_value.h"

// Random property lists: every kind, with the values at which something changes made frequent.
namespace tests {

// What a generated property list may hold. XML cannot carry everything, and other readers cut dates to microseconds.
struct Palette {
  bool hasControlCharacters = true;
  bool hasUids = true;
  bool hasAnyDate = true;
};

inline void appendUtf8(std::string& text, char32_t character) {
  const auto byte = [&text](char32_t bits) { text.push_back(static_cast<char>(bits)); };
  if (character < 0x80) return byte(character);
  if (character < 0x800) {
    byte(0xC0U | character >> 6U);
  } else if (character < 0x10000) {
    byte(0xE0U | character >> 12U);
    byte(0x80U | (character >> 6U & 0x3FU));
  } else {
    byte(0xF0U | character >> 18U);
    byte(0x80U | (character >> 12U & 0x3FU));
    byte(0x80U | (character >> 6U & 0x3FU));
  }
  byte(0x80U | (character & 0x3FU));
}

inline rc::Gen<char32_t> genCharacter(const Palette& palette) {
  using rc::gen::inRange;
  return rc::gen::weightedOneOf<char32_t>({
      {12, inRange<char32_t>(0x20, 0x7F)},
      {palette.hasControlCharacters ? 2U : 0U, inRange<char32_t>(0x01, 0x20)},
      {2, inRange<char32_t>(0xA0, 0x800)},
      {2, inRange<char32_t>(0x800, 0xD800)},
      {1, inRange<char32_t>(0xE000, 0xFFFE)},
      {2, inRange<char32_t>(0x10000, 0x110000)},
  });
}

inline rc::Gen<std::string> genText(const Palette& palette) {
  return rc::gen::map(rc::gen::container<std::u32string>(genCharacter(palette)), [](const std::u32string& characters) {
    std::string text;
    for (const char32_t character : characters) appendUtf8(text, character);
    return text;
  });
}

inline rc::Gen<std::uint64_t> genBits() {
  return rc::gen::oneOf(rc::gen::arbitrary<std::uint64_t>(), rc::gen::inRange<std::uint64_t>(0, 300),
                        rc::gen::map(rc::gen::pair(rc::gen::inRange(0U, 64U), rc::gen::inRange(-1, 2)),
                                     [](const std::pair<unsigned, int>& edge) {
                                       return (std::uint64_t{1} << edge.first) +
                                              static_cast<std::uint64_t>(edge.second);
                                     }));
}

inline rc::Gen<double> genReal() {
  return rc::gen::oneOf(rc::gen::map(genBits(), [](std::uint64_t bits) { return std::bit_cast<double>(bits); }),
                        rc::gen::arbitrary<double>(), rc::gen::element(0.0, -0.0, 1.0, 0.5));
}

// Whole seconds from about the year 70 to about 3900.
inline rc::Gen<double> genWholeSeconds() {
  return rc::gen::map(rc::gen::inRange<std::int64_t>(-60'900'000'000, 60'000'000'000),
                      [](std::int64_t seconds) { return static_cast<double>(seconds); });
}

inline rc::Gen<platform::PropertyValue> genScalar(const Palette& palette) {
  using platform::PropertyValue;
  const auto asValue = [](const auto& value) { return PropertyValue{value}; };
  const auto dates = palette.hasAnyDate ? genReal() : genWholeSeconds();
  return rc::gen::weightedOneOf<PropertyValue>({
      {4, rc::gen::map(genText(palette), asValue)},
      {2, rc::gen::map(rc::gen::arbitrary<bool>(), asValue)},
      {2, rc::gen::map(genBits(), asValue)},
      {2, rc::gen::map(genBits(), [](std::uint64_t bits) { return PropertyValue{static_cast<std::int64_t>(bits)}; })},
      {2, rc::gen::map(genReal(), asValue)},
      {2, rc::gen::map(dates, [](double seconds) { return PropertyValue{platform::Date{seconds}}; })},
      {2, rc::gen::map(rc::gen::arbitrary<platform::Bytes>(), asValue)},
      {palette.hasUids ? 1U : 0U,
       rc::gen::map(rc::gen::arbitrary<std::uint32_t>(),
                    [](std::uint32_t number) { return PropertyValue{platform::Uid{number}}; })},
  });
}

rc::Gen<platform::Dictionary> genDictionary(const Palette& palette, int depth);

inline rc::Gen<platform::PropertyValue> genValue(const Palette& palette, int depth) {
  using platform::PropertyValue;
  if (depth == 0) return genScalar(palette);
  return rc::gen::weightedOneOf<PropertyValue>({
      {4, genScalar(palette)},
      {1, rc::gen::map(rc::gen::resize(8, rc::gen::container<platform::Array>(genValue(palette, depth - 1))),
                       [](const platform::Array& array) { return PropertyValue{array}; })},
      {1, rc::gen::map(genDictionary(palette, depth - 1),
                       [](const platform::Dictionary& dictionary) { return PropertyValue{dictionary}; })},
  });
}

inline rc::Gen<platform::Dictionary> genDictionary(const Palette& palette, int depth) {
  using Entry = std::pair<std::string, platform::PropertyValue>;
  const auto entries =
      rc::gen::container<std::vector<Entry>>(rc::gen::pair(genText(palette), genValue(palette, depth)));
  return rc::gen::map(rc::gen::resize(12, entries), [](const std::vector<Entry>& pairs) {
    platform::Dictionary dictionary;
    for (const auto& [key, value] : pairs) dictionary.set(key, value);
    return dictionary;
  });
}

}  // namespace tests
