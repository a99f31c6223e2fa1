#include <gtest/gtest.h>
#include <rapidcheck/gtest.h>

#include <array>
#include <bit>
#include <cmath>
#include <cstdlib>
#include <random>
#include <string>
#include <vector>

#include "records/description.h"
#include "tests/support/property_list_files.h"
#include "tests/support/property_value_generator.h"
#include "tests/support/scratch_directory.h"

namespace platform {
void showValue(const Dictionary& dictionary, std::ostream& stream);
void showValue(const Dictionary& dictionary, std::ostream& stream) { stream << records::description(dictionary); }
}  // namespace platform

using platform::Bytes;
using platform::Dictionary;
using platform::PropertyValue;
using tests::Palette;
using tests::PropertyListFiles;

namespace {

std::string hexadecimal(std::string_view bytes) {
  static constexpr std::string_view kDigits = "0123456789abcdef";
  std::string digits;
  for (const char byte : bytes) {
    digits += kDigits[static_cast<unsigned char>(byte) >> 4U];
    digits += kDigits[static_cast<unsigned char>(byte) & 0xFU];
  }
  return digits;
}

std::string bitsOf(double real) {
  return std::isnan(real) ? "nan" : hexadecimal(tests::bigEndian(std::bit_cast<std::uint64_t>(real), 8));
}

std::string decimal(PropertyValue::Integer integer) {
  return integer.isAboveInt64 ? std::to_string(integer.bits) : std::to_string(static_cast<std::int64_t>(integer.bits));
}

std::string dump(const Dictionary& dictionary);

// The canonical text that the Python script makes as well: kind and value, exactly.
std::string dump(const PropertyValue& value) {
  switch (value.kind()) {
    case PropertyValue::Kind::string: return "s:" + hexadecimal(*value.asText());
    case PropertyValue::Kind::integer: return "i:" + decimal(*value.asInteger());
    case PropertyValue::Kind::real: return "r:" + bitsOf(*value.asReal());
    case PropertyValue::Kind::boolean: return *value.asBoolean() ? "b:1" : "b:0";
    case PropertyValue::Kind::date: return "d:" + bitsOf(value.asDate()->secondsSince2001);
    case PropertyValue::Kind::data:
      return "x:" + hexadecimal(std::string{value.asData()->begin(), value.asData()->end()});
    case PropertyValue::Kind::uid: return "u:" + std::to_string(value.asUid()->number);
    case PropertyValue::Kind::dictionary: return dump(*value.asDictionary());
    case PropertyValue::Kind::array: break;
  }
  std::string text = "[";
  for (const PropertyValue& element : *value.asArray()) text += dump(element) + ",";
  return text + "]";
}

std::string dump(const Dictionary& dictionary) {
  std::string text = "{";
  for (const auto& [key, value] : dictionary) text += hexadecimal(key) + "=" + dump(value) + ";";
  return text + "}";
}

// Python's writer makes one object of numbers that it takes for equal.
std::string withoutSignOfZero(std::string dump) {
  const std::string negative = "r:" + bitsOf(-0.0);
  for (std::size_t at = dump.find(negative); at != std::string::npos; at = dump.find(negative)) {
    dump.replace(at, negative.size(), "r:" + bitsOf(0.0));
  }
  return dump;
}

RC_GTEST_PROP(RandomPropertyLists, SurviveAWriteAndAReadInTheirOrder, ()) {
  const Dictionary dictionary = *tests::genDictionary({}, 3);
  PropertyListFiles files;
  const auto written = files.store->serialize(dictionary);
  RC_ASSERT(written.status.isOk());
  const auto read = files.read(*written.data);
  RC_ASSERT(read == dictionary);
  RC_ASSERT(dump(*read) == dump(dictionary));
}

RC_GTEST_PROP(RandomPropertyLists, SurviveACopyThatIsEditedAndRestored, ()) {
  const Dictionary dictionary = *tests::genDictionary({}, 2);
  PropertyListFiles files;
  const auto read = files.read(*files.store->serialize(dictionary).data);
  Dictionary copy = *read;
  copy.set("one key more than \x01 any other", copy);
  RC_ASSERT(copy != dictionary);
  copy.remove("one key more than \x01 any other");
  RC_ASSERT(files.read(*files.store->serialize(copy).data) == dictionary);
}

class PlistlibTest : public testing::Test {
 protected:
  void write(const std::string& name, const Bytes& bytes) { write(name, std::string{bytes.begin(), bytes.end()}); }
  void write(const std::string& name, const std::string& text) { _scratch.put(name, text); }
  [[nodiscard]] std::string contents(const std::string& name) const { return _scratch.contents(name); }
  // Compares each N.plist with N.txt, and writes what it has read as N.binary and N.xml.
  void runPython() {
    const std::string command =
        std::string{PYTHON_EXECUTABLE} + " " + PLISTLIB_CHECK + " '" + _scratch.path().string() + "'";
    ASSERT_EQ(std::system(command.c_str()), 0);  // NOLINT(cert-env33-c)
  }

 private:
  tests::ScratchDirectory _scratch;
};

// Both ways: what is written here is what Python reads, and what Python writes is what is read here.
TEST_F(PlistlibTest, AgreesOnRandomPropertyLists) {
  constexpr int kLists = 300;
  const Palette palette{.hasControlCharacters = false, .hasUids = false, .hasAnyDate = false};
  const std::uint64_t seed = std::random_device{}();
  SCOPED_TRACE("seed " + std::to_string(seed));
  rc::Random random{seed};
  PropertyListFiles files;
  std::vector<Dictionary> lists;
  for (int list = 0; list < kLists; ++list) {
    // Every other list has all that XML cannot carry, too.
    const Palette mine = list % 2 == 0 ? palette : Palette{.hasAnyDate = false};
    lists.push_back(tests::genDictionary(mine, 3)(random.split(), list % 60).value());
    const std::string name = std::to_string(list);
    write(name + ".txt", dump(lists.back()));
    write(name + ".plist", *files.store->serialize(lists.back()).data);
  }
  runPython();
  for (std::size_t list = 0; list < lists.size(); ++list) {
    const std::string name = std::to_string(list);
    const auto binary = files.read(contents(name + ".binary"));
    ASSERT_TRUE(binary) << list;
    EXPECT_EQ(withoutSignOfZero(dump(*binary)), withoutSignOfZero(dump(lists[list])));
    if (list % 2 != 0) continue;
    const auto xml = files.read(contents(name + ".xml"));
    ASSERT_TRUE(xml) << list;
    EXPECT_EQ(dump(*xml), dump(lists[list]));
  }
}

// Whatever a damaged file is accepted as can be written and read again.
TEST(DamagedPropertyLists, AreRefusedOrSurviveAWriteAndARead) {
  constexpr int kMutants = 3000;
  PropertyListFiles files;
  const std::uint64_t seed = std::random_device{}();
  SCOPED_TRACE("seed " + std::to_string(seed));
  std::mt19937_64 random{seed};
  const auto below = [&random](std::size_t limit) { return static_cast<std::size_t>(random() % limit); };
  const std::string xml = tests::xmlWith(
      "<key>k</key><array><string>a &amp; b<!-- c --></string><integer>-12</integer><real>1.5</real><data>AAEC</data>"
      "<date>2011-10-12T09:10:05Z</date><dict><key>n</key><true/></dict></array>");
  rc::Random generator{seed};
  int accepted = 0;
  for (int mutant = 0; mutant < kMutants; ++mutant) {
    std::string file = xml;
    if (mutant % 4 != 0) {
      const Dictionary dictionary = tests::genDictionary({}, 2)(generator.split(), mutant % 30).value();
      const Bytes bytes = *files.store->serialize(dictionary).data;
      file.assign(bytes.begin(), bytes.end());
    }
    for (std::size_t edits = 1 + below(3); edits > 0; --edits) {
      file[below(file.size())] = below(2) == 0 ? static_cast<char>(random()) : file[below(file.size())];
    }
    const auto read = files.read(file);
    if (!read) continue;
    ++accepted;
    const auto written = files.store->serialize(*read);
    ASSERT_TRUE(written.status.isOk()) << "mutant " << mutant << ": " << written.status.description();
    ASSERT_EQ(files.read(*written.data), read) << "mutant " << mutant;
  }
  EXPECT_GT(accepted, kMutants / 20);
}

}  // namespace
