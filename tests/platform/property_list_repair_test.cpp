#include <gtest/gtest.h>

#include <limits>
#include <string>
#include <utility>
#include <vector>

#include "records/description.h"
#include "tests/support/property_list_files.h"

using platform::Array;
using platform::Bytes;
using platform::Date;
using platform::Dictionary;
using platform::PropertyValue;
using platform::Uid;
using records::description;
using tests::BinaryFile;
using tests::fileWith;
using tests::PropertyListFiles;
using tests::xmlWith;
using namespace std::string_literals;

namespace {

constexpr std::uint64_t kMaxUnsigned = std::numeric_limits<std::uint64_t>::max();

// What malformed objects become; the key beside them always stays.
TEST(MalformedValues, DoNotCostTheRestOfABinaryFile) {
  const std::string ones(8, '\xFF');
  const std::string zeros(8, '\0');
  const std::vector<std::pair<std::string, PropertyValue>> rows{
      {"\x00"s, ""},                                          // null
      {"\x0F"s, ""},                                          // fill
      {"\x15"s, ""},                                          // an integer of 32 bytes
      {"\x21\x00\x00"s, ""},                                  // a real of two bytes
      {"\x32\x00\x00\x00\x00"s, ""},                          // a date of four bytes
      {"\x70"s, ""},                                          // no known object
      {"\xF0"s, ""},                                          //
      {"\x60"s, ""},                                          // an empty UTF-16 text
      {"\x6F\x10\x00"s, ""},                                  // the same, its count spelt out
      {"\x62\x00\x41\x00\x00"s, "A\uFFFD"},                   // NUL in UTF-16
      {"\x61\xD8\x00"s, "\uFFFD"},                            // half a surrogate pair
      {"\x61\xDC\x00"s, "\uFFFD"},                            //
      {"\x63\xD8\x00\xD8\x00\xDC\x00"s, "\uFFFD\U00010000"},  //
      {"\x62\xDC\x00\xD8\x00"s, "\uFFFD\uFFFD"},              //
      {"\x62\xD8\x3D\xDE\x00"s, "\U0001F600"},                // a sound pair
      {"\x53"
       "a\0b"s,
       "a\uFFFDb"},                            // NUL in 8-bit text
      {"\x52\xC3\xA9"s, "\u00E9"},             // UTF-8 where ASCII is due
      {"\x52\xE9!"s, "\uFFFD!"},               // neither
      {"\x14"s + zeros + ones, kMaxUnsigned},  // 16-byte integers
      {"\x14"s + zeros + zeros, 0},            //
      {"\x14"s + ones + ones, -1},             //
      {"\x14"s + ones + zeros, std::numeric_limits<std::int64_t>::min()},
      {"\x14\x80"s + std::string(15, '\0'), std::numeric_limits<std::int64_t>::min()},
      {"\x14\x01"s + std::string(15, '\0'), kMaxUnsigned},
      {"\x83\xFF\xFF\xFF\xFF"s, Uid{4294967295}},         //
      {"\x87"s + std::string(7, '\0') + "\x05", Uid{5}},  //
      {"\x87"s + ones, -1},                               // UIDs above 32 bits
      {"\x87\x01"s + std::string(7, '\0'), std::int64_t{1} << 56U},
      {"\x8F"s + zeros + "\x01" + std::string(7, '\0'), std::int64_t{1} << 56U},
      {"\x84\x01\x00\x00\x00\x00"s, ""},                             //
      {"\xC1\x04"s, Array{true}},                                    // a set
      {"\xB1\x04"s, Array{true}},                                    // an ordered set
      {"\xC0"s, Array{}},                                            //
      {"\x22\x3F\xC0\x00\x00"s, 1.5},                                // a real of four bytes
      {"\x13"s + ones, -1},                                          // integers of eight bytes are signed
      {"\x12"s + std::string(4, '\xFF'), std::int64_t{4294967295}},  // shorter ones are not
      {"\x33"s + ones, Date{std::numeric_limits<double>::quiet_NaN()}},
  };
  for (std::size_t row = 0; row < rows.size(); ++row) {
    const auto read = PropertyListFiles{}.read(fileWith(rows[row].first).bytes());
    ASSERT_TRUE(read) << "row " << row;
    EXPECT_EQ(*read, (Dictionary{{"k", rows[row].second}, {"z", true}})) << "row " << row << ": " << description(*read);
  }
}

TEST(MalformedKeys, AreRepairedOrCostTheirEntryAlone) {
  const std::vector<std::pair<std::string, Dictionary>> rows{
      {"\x61\x00\x00"s, {{"\uFFFD", true}, {"z", true}}},
      {"\x60"s, {{"", true}, {"z", true}}},
      {"\x51\xFF"s, {{"\uFFFD", true}, {"z", true}}},
      {"\x52"
       "a\0"s,
       {{"a\uFFFD", true}, {"z", true}}},
      {"\x00"s, {{"", true}, {"z", true}}},
      {"\x10\x05"s, {{"z", true}}},
      {"\xA0"s, {{"z", true}}},
      {"\x09"s, {{"z", true}}},
  };
  for (std::size_t row = 0; row < rows.size(); ++row) {
    BinaryFile file{.objects = {"\xD2\x01\x02\x03\x03"s, rows[row].first, "\x51z", "\x09"}};
    const auto read = PropertyListFiles{}.read(file.bytes());
    ASSERT_TRUE(read) << "row " << row;
    EXPECT_EQ(*read, rows[row].second) << "row " << row << ": " << description(*read);
  }
}

TEST(MalformedKeys, CostTheirEntriesAloneInALargeDictionaryToo) {
  BinaryFile file{.objects = {""}, .referenceSize = 2};
  Dictionary expected;
  std::string keys;
  std::string values;
  for (int entry = 0; entry < 300; ++entry) {
    const std::string name = std::to_string(1000 + entry);
    keys += file.reference(file.add(entry % 3 == 0 ? "\x10\x07"s : "\x54" + name));
    values += file.reference(file.add("\x11" + tests::bigEndian(static_cast<std::uint64_t>(entry), 2)));
    if (entry % 3 != 0) expected.set(name, entry);
  }
  file.objects[0] = tests::countedMarker(0xD, 300) + keys + values;
  EXPECT_EQ(PropertyListFiles{}.read(file.bytes()), expected);
}

TEST(DuplicateKeys, CountByTheirLastValueAtTheirFirstPlace) {
  const BinaryFile file{.objects = {"\xD3\x01\x02\x01\x03\x03\x04"s, "\x51k", "\x51z", "\x10\x01", "\x10\x02"}};
  PropertyListFiles files;
  for (const auto& read :
       {files.read(file.bytes()), files.read(xmlWith("<key>k</key><integer>1</integer><key>z</key><integer>1</integer>"
                                                     "<key>k</key><integer>2</integer>"))}) {
    ASSERT_TRUE(read);
    EXPECT_EQ(*read, (Dictionary{{"k", 2}, {"z", 1}}));
    EXPECT_EQ(read->begin()->key.view(), "k");
  }
}

TEST(MalformedValues, DoNotCostTheRestOfAnXmlFile) {
  const std::vector<std::pair<std::string, PropertyValue>> rows{
      {"<string>AT&T</string>", "AT\uFFFDT"},
      {"<string>&</string>", "\uFFFD"},
      {"<string>a &nbsp; b</string>", "a \uFFFDnbsp; b"},
      {"<string>&#0;</string>", "\uFFFD#0;"},
      {"<string>&#x110000;</string>", "\uFFFD#x110000;"},
      {"<string>&#xD800;</string>", "\uFFFD\uFFFD\uFFFD"},
      {"<string>&#65;&#x41;&lt;&gt;&quot;&apos;&amp;</string>", "AA<>\"'&"},
      {"<string>a\0b</string>"s, "a\uFFFDb"},
      {"<string>\xFF</string>", "\uFFFD"},
      {"<string>a<!-- & -->b</string>", "ab"},
      {"<integer>010</integer>", 10},
      {"<integer>-00010</integer>", -10},
      {"<integer>+5</integer>", 5},
      {"<integer> 7 </integer>", 7},
      {"<integer>0</integer>", 0},
      {"<integer>00</integer>", 0},
      {"<integer/>", 0},
      {"<integer></integer>", 0},
      {"<integer>seven</integer>", 0},
      {"<integer>--5</integer>", 0},
      {"<integer>+-5</integer>", 0},
      {"<integer>-9223372036854775808</integer>", std::numeric_limits<std::int64_t>::min()},
      {"<integer>-9223372036854775809</integer>", std::numeric_limits<std::int64_t>::min()},
      {"<integer>-99999999999999999999999</integer>", std::numeric_limits<std::int64_t>::min()},
      {"<integer>9223372036854775808</integer>", std::uint64_t{1} << 63U},
      {"<integer>99999999999999999999999</integer>", kMaxUnsigned},
      {"<integer><![CDATA[12]]></integer>", 12},
      {"<real>1e3</real>", 1000.0},
      {"<real>-inf</real>", -std::numeric_limits<double>::infinity()},
      {"<real>nothing</real>", 0.0},
      {"<data>AAAA<!-- in between -->AAAA</data>", Bytes(6)},
      {"<data/>", Bytes{}},
      {"<data>*</data>", Bytes{}},
      {"<true></true>", true},
      {"<array><key>in an array</key></array>", Array{"in an array"}},
      {"<dict><key>left over</key></dict>", Dictionary{}},
  };
  for (const auto& [element, expected] : rows) {
    const auto read = PropertyListFiles{}.read(xmlWith("<key>k</key>" + element + "<key>z</key><true/>"));
    ASSERT_TRUE(read) << element;
    EXPECT_EQ(*read, (Dictionary{{"k", expected}, {"z", true}})) << element << ": " << description(*read);
  }
}

TEST(MalformedKeys, AreRepairedInXml) {
  const auto read = PropertyListFiles{}.read(xmlWith("<key>a\0b</key><true/><key>R&D</key><true/><key></key><true/>"s));
  EXPECT_EQ(read, (Dictionary{{"a\uFFFDb", true}, {"R\uFFFDD", true}, {"", true}}));
}

TEST(XmlFiles, MayBeginWithAByteOrderMark) {
  EXPECT_EQ(PropertyListFiles{}.read("\xEF\xBB\xBF" + xmlWith("<key>k</key><true/>")), (Dictionary{{"k", true}}));
}

TEST(XmlFiles, AreReadWhateverStandsAroundTheElements) {
  const Dictionary expected{{"k", "v"}};
  PropertyListFiles files;
  for (const std::string& file :
       {"<dict><key>k</key><string>v</string></dict>"s,
        "<!DOCTYPE plist PUBLIC \"-//x//DTD >\" \"y\"><plist><dict><key>k</key><string>v</string></dict></plist>"s,
        "<!DOCTYPE plist [ <!ENTITY a \"]>\"> ]><plist><dict><key>k</key><string>v</string></dict></plist>"s,
        "<?x \"?>\" ?><!-- <dict> --><plist a=\"<b>\"><dict a=\">\" ><key >k</key ><string>v</string\n></dict>"s,
        "<plist><plist><dict><plist><key>k</key></plist><string>v</string></dict></plist></plist>"s,
        "<dict><key>k</key><string>v</string></dict></array>what comes after the root does not matter"s}) {
    EXPECT_EQ(files.read(file), expected) << file;
  }
}

}  // namespace
