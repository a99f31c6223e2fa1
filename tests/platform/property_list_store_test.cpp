#include <gtest/gtest.h>

#include <bit>
#include <cmath>
#include <limits>
#include <string>
#include <vector>

#include "tests/support/property_list_files.h"

using platform::Array;
using platform::Bytes;
using platform::Cause;
using platform::Date;
using platform::Dictionary;
using platform::PropertyValue;
using platform::Uid;
using tests::PropertyListFiles;
using tests::xmlWith;
using namespace std::string_literals;

namespace {

constexpr std::uint64_t kMaxUnsigned = std::numeric_limits<std::uint64_t>::max();

Dictionary everyKind() {
  return {{"string", "h\u00E9 \U0001F600"},
          {"empty string", ""},
          {"", "under an empty key"},
          {"integer", -1},
          {"smallest", std::numeric_limits<std::int64_t>::min()},
          {"2^63", std::uint64_t{1} << 63U},
          {"2^64-1", kMaxUnsigned},
          {"real", 0.1},
          {"negative zero", -0.0},
          {"infinity", std::numeric_limits<double>::infinity()},
          {"boolean", true},
          {"date", Date{329253872.25}},
          {"early date", Date{-1e11}},
          {"exact date", Date{std::bit_cast<double>(0x41B39F6F2A000001)}},
          {"data", Bytes{0, 1, 255}},
          {"no data", Bytes{}},
          {"array", Array{1, Array{}, Dictionary{}}},
          {"dictionary", Dictionary{{"nested", Dictionary{{"deep", false}}}}},
          {"uid", Uid{4294967295}}};
}

std::vector<std::string> keysOf(const Dictionary& dictionary) {
  std::vector<std::string> keys;
  for (const auto& [key, value] : dictionary) keys.push_back(key.string());
  return keys;
}

Dictionary nested(int containers) {
  Dictionary dictionary;
  for (int level = 1; level < containers; ++level) dictionary = Dictionary{{"k", dictionary}};
  return dictionary;
}

TEST(PropertyListStore, KeepsEveryKindThroughAWriteAndARead) {
  PropertyListFiles files;
  const auto written = files.store->serialize(everyKind());
  ASSERT_TRUE(written.status.isOk()) << written.status.description();
  const auto read = files.read(*written.data);
  ASSERT_TRUE(read);
  EXPECT_EQ(*read, everyKind());
  EXPECT_EQ(keysOf(*read), keysOf(everyKind()));
}

TEST(PropertyListStore, WritesVersionOneOfTheBinaryForm) {
  const auto written = PropertyListFiles{}.store->serialize({});
  ASSERT_TRUE(written.status.isOk());
  EXPECT_EQ(std::string(written.data->begin(), written.data->begin() + 8), "bplist00");
}

TEST(PropertyListStore, ReadsThroughTheFileSystemAlone) {
  PropertyListFiles files;
  EXPECT_EQ(files.store->readDictionary("/absent.plist").cause(), Cause::missing);
  EXPECT_EQ(files.files->calls, std::vector<std::string>{"read /absent.plist"});
  files.files->failing.insert("read");
  EXPECT_FALSE(files.read(xmlWith("")));
}

struct Refusal {
  std::string file;
  Cause cause;
};

TEST(PropertyListStore, TellsWhyItReadsNothing) {
  const std::string sound = xmlWith("<key>k</key><true/>");
  const Refusal cases[] = {
      {"", Cause::malformed},
      {sound.substr(0, sound.size() * 6 / 10), Cause::malformed},
      {"bplist00", Cause::malformed},
      {"<plist><array/></plist>", Cause::unsuitable},
      {tests::BinaryFile{.objects = {"\xA0"}}.bytes(), Cause::unsuitable},
      {tests::BinaryFile{.objects = {std::string{"\xD1\x01\x00", 3}, "\x51k"}}.bytes(), Cause::excessive}};
  for (const auto& [file, cause] : cases) {
    PropertyListFiles files;
    files.files->put("/file.plist", file);
    EXPECT_EQ(files.store->readDictionary("/file.plist").cause(), cause) << file;
  }
}

TEST(PropertyListStore, PassesOnWhyAFileCannotBeRead) {
  PropertyListFiles files;
  files.files->failing.insert("read");
  EXPECT_EQ(files.store->readDictionary("/file.plist").status().errorNumber(), EIO);
  files.files->failing.clear();
  files.files->putDirectory("/file.plist");
  EXPECT_EQ(files.store->readDictionary("/file.plist").cause(), Cause::other);
}

TEST(PropertyListStore, ReadsTheXmlForm) {
  const auto read =
      PropertyListFiles{}.read(xmlWith("<key>s</key><string>a &amp; <![CDATA[<b>]]></string>"
                                       "<key>e</key><string/>"
                                       "<key>i</key><integer>-12</integer>"
                                       "<key>u</key><integer>18446744073709551615</integer>"
                                       "<key>h</key><integer>0x1F</integer>"
                                       "<key>r</key><real>1.5</real>"
                                       "<key>t</key><true/><key>f</key><false/>"
                                       "<key>d</key><date>2001-01-01T00:01:00Z</date>"
                                       "<key>b</key><data>\n AAH/\n</data>"
                                       "<key>a</key><array><dict/><array/></array><!-- done -->"));
  const Dictionary expected{{"s", "a & <b>"},
                            {"e", ""},
                            {"i", -12},
                            {"u", kMaxUnsigned},
                            {"h", 31},
                            {"r", 1.5},
                            {"t", true},
                            {"f", false},
                            {"d", Date{60}},
                            {"b", Bytes{0, 1, 255}},
                            {"a", Array{Dictionary{}, Array{}}}};
  ASSERT_TRUE(read);
  EXPECT_EQ(*read, expected);
  EXPECT_EQ(keysOf(*read), keysOf(expected));
}

TEST(PropertyListStore, ReadsXmlRealsWhateverTheLocale) {
  ASSERT_NE(std::setlocale(LC_ALL, "C"), nullptr);
  std::setlocale(LC_NUMERIC, "de_DE.UTF-8");  // where it is installed, "1.5" would be 1
  EXPECT_EQ(PropertyListFiles{}.read(xmlWith("<key>r</key><real>1.5</real>")), (Dictionary{{"r", 1.5}}));
}

TEST(PropertyListStore, RefusesWhatIsNoDictionary) {
  for (const std::string& file :
       {""s, "x"s, "bplist00"s, "bplist00"s + std::string(32, '\0'), "<plist>"s, "<plist><array/></plist>"s,
        "<plist><string>a</string></plist>"s, "<plist></plist>"s, "<dict><key>a</key>"s, "<dict></array>"s,
        "{ a = 1; }"s, tests::BinaryFile{.objects = {"\xA0"}}.bytes(), tests::BinaryFile{.objects = {"\x51k"}}.bytes(),
        tests::BinaryFile{.objects = {"\x09"}}.bytes()}) {
    EXPECT_FALSE(PropertyListFiles{}.read(file)) << file;
  }
}

TEST(PropertyListStore, SharesTheKeysOfAFile) {
  const auto read = PropertyListFiles{}.read(
      xmlWith("<key>a</key><dict><key>name</key><true/></dict><key>b</key><dict><key>name</key><true/></dict>"));
  ASSERT_TRUE(read);
  const auto key = [&read](std::string_view name) { return read->dictionary(name)->begin()->key.view().data(); };
  EXPECT_EQ(key("a"), key("b"));
}

TEST(PropertyListStore, WritesAndReads256NestedContainersButNotOneMore) {
  PropertyListFiles files;
  const auto written = files.store->serialize(nested(256));
  ASSERT_TRUE(written.status.isOk()) << written.status.description();
  EXPECT_EQ(files.read(*written.data), nested(256));
  EXPECT_EQ(files.store->serialize(nested(257)).status.cause(), Cause::excessive);
}

TEST(PropertyListStore, RefusesToWriteWhatUnfoldsBeyondAllMemory) {
  PropertyValue doubled{"leaf"};
  for (int level = 0; level < 40; ++level) doubled = Array{doubled, doubled};
  const auto written = PropertyListFiles{}.store->serialize({{"k", doubled}});
  EXPECT_EQ(written.status.cause(), Cause::excessive);
  EXPECT_EQ(written.status.reason(), "The property list is too large");
}

TEST(PropertyListStore, RefusesToWriteAUidThatItCouldNotReadBack) {
  const auto written = PropertyListFiles{}.store->serialize({{"k", Uid{std::uint64_t{1} << 32U}}});
  EXPECT_EQ(written.status.cause(), Cause::unsuitable);
  EXPECT_EQ(written.status.reason(), "A UID is larger than 32 bits");
}

TEST(PropertyListStore, WritesWhatSharesItsPartsInFull) {
  const PropertyValue part{Dictionary{{"data", Bytes{1, 2, 3}}, {"text", "t"}}};
  const Dictionary dictionary{{"a", part}, {"b", Array{part, part}}};
  PropertyListFiles files;
  const auto written = files.store->serialize(dictionary);
  ASSERT_TRUE(written.status.isOk());
  EXPECT_EQ(files.read(*written.data), dictionary);
}

}  // namespace
