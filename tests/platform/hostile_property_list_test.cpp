#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <fstream>
#include <functional>
#include <new>
#include <optional>
#include <string>
#include <tuple>
#include <vector>

#include "tests/support/colliding_keys.h"
#include "tests/support/property_list_files.h"

using platform::Dictionary;
using tests::bigEndian;
using tests::BinaryFile;
using tests::countedMarker;
using tests::fileWith;
using tests::PropertyListFiles;
using tests::xmlWith;
using namespace std::string_literals;

namespace {

constexpr std::size_t kMebibyte = std::size_t{1} << 20U;
constexpr unsigned kGenerousSeconds = 60;  // a hang, not a slow machine

// The sanitizers keep freed memory and pad what is not freed.
#if defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
#define SANITIZED
#endif
#endif
#if defined(SANITIZED) || defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr bool kCanMeasure = false;
#else
constexpr bool kCanMeasure = true;
#endif

// Of the processor, whatever else the machine does; promised of a build for other machines.
#if defined(__OPTIMIZE__)
constexpr double kMostSeconds = kCanMeasure ? 1 : kGenerousSeconds;
#else
constexpr double kMostSeconds = kGenerousSeconds;
#endif

enum class Outcome : int { accepted, refused, grew, late };

// Tells apart whether reading grew this process by more than 128 times the file, or took too long.
Outcome outcomeOfReading(const std::string& file) {
  PropertyListFiles files;
  files.files->put("/file.plist", file);
  rusage before{};
  getrusage(RUSAGE_SELF, &before);
  bool isAccepted = false;
  const double seconds = tests::secondsFor([&] { isAccepted = files.store->readDictionary("/file.plist").isOk(); });
  rusage after{};
  getrusage(RUSAGE_SELF, &after);
  const auto grownBytes = static_cast<std::size_t>(after.ru_maxrss - before.ru_maxrss) * 1024;
  if (kCanMeasure && grownBytes > 128 * file.size() + 8 * kMebibyte) return Outcome::grew;
  if (seconds >= kMostSeconds) return Outcome::late;
  return isAccepted ? Outcome::accepted : Outcome::refused;
}

// Reads the file in a process of its own, since reading it wrongly would take the test along: a stack overflow, an
// abort or the alarm ends that process by a signal.
void expectSettled(const std::string& file, Outcome expected) {
  SCOPED_TRACE(file.substr(0, 24) + " and " + std::to_string(file.size()) + " bytes in all");
  const pid_t child = fork();
  ASSERT_GE(child, 0);
  if (child == 0) {
    alarm(kGenerousSeconds);
    _exit(static_cast<int>(outcomeOfReading(file)));
  }
  int status = 0;
  ASSERT_EQ(waitpid(child, &status, 0), child);
  ASSERT_TRUE(WIFEXITED(status)) << "ended by signal " << WTERMSIG(status);
  EXPECT_EQ(WEXITSTATUS(status), static_cast<int>(expected));
}

std::string repeated(std::string_view text, std::size_t times) {
  std::string all;
  all.reserve(text.size() * times);
  for (std::size_t time = 0; time < times; ++time) all += text;
  return all;
}

// {k = ((( … true … )))}, each container a single reference to the next.
BinaryFile nestedArrays(std::size_t levels) {
  BinaryFile file{.objects = {"", "\x51k"}, .referenceSize = 3};
  file.objects[0] = "\xD1" + file.reference(1) + file.reference(2);
  for (std::size_t level = 0; level < levels; ++level) file.add("\xA1" + file.reference(level + 3));
  file.add("\x09");
  return file;
}

// {k = ((( … (leaf, leaf, …) … )))}
std::string sharedLeaf(const std::string& leaf, std::size_t levels, std::size_t references) {
  BinaryFile file{.objects = {"\xD1\x01\x02"s, "\x51k"}};
  for (std::size_t level = 1; level < levels; ++level) file.add("\xA1" + file.reference(file.objects.size() + 1));
  file.add(countedMarker(0xA, references) + std::string(references, static_cast<char>(file.objects.size() + 1)));
  file.add(leaf);
  return file.bytes();
}

TEST(HostileFiles, NestedAMillionDeepAreRefused) {
  expectSettled(nestedArrays(1'000'000).bytes(), Outcome::refused);
  expectSettled(xmlWith("<key>k</key>" + repeated("<array>", 1'000'000) + repeated("</array>", 1'000'000)),
                Outcome::refused);
  expectSettled(repeated("<dict><key>k</key>", 1'000'000), Outcome::refused);
}

TEST(HostileFiles, MayNest256ContainersDeepAndNoDeeper) {
  PropertyListFiles files;
  EXPECT_TRUE(files.read(nestedArrays(255).bytes()));
  EXPECT_FALSE(files.read(nestedArrays(256).bytes()));
  const auto xml = [](std::size_t levels) {
    return xmlWith("<key>k</key>" + repeated("<array>", levels) + repeated("</array>", levels));
  };
  EXPECT_TRUE(files.read(xml(255)));
  EXPECT_FALSE(files.read(xml(256)));
}

TEST(HostileFiles, CannotHideTheirNestingFromTheScan) {
  const std::string deep = repeated("<array>", 300'000);
  for (const std::string& start :
       {"<dict/>"s, "<plist><dict/>"s, "<dict><key>k</key><string>a</string><!-- </array> --><key>k</key>"s,
        "<dict><key>k</key><string><![CDATA[</array>]]></string><key>k</key>"s}) {
    SCOPED_TRACE(start);
    expectSettled(start + "<key>k</key>" + deep,
                  start.find("/>") != std::string::npos ? Outcome::accepted : Outcome::refused);
  }
  const std::string hidden = repeated("<array a=\"</array>\"><!--</array>--><?x </array>?>", 300'000);
  expectSettled("<dict><key>k</key>" + hidden, Outcome::refused);
}

TEST(HostileFiles, ThatShareReferencesAThousandMillionFoldAreRefused) {
  BinaryFile file{.objects = {"\xD1\x01\x02"s, "\x51k"}, .offsetSize = 1};
  for (int level = 0; level < 30; ++level) {
    const std::string next = file.reference(file.objects.size() + 1);
    file.add("\xA2" + next + next);
  }
  file.add("\x09");
  EXPECT_LT(file.bytes().size(), 180U);
  expectSettled(file.bytes(), Outcome::refused);
}

TEST(HostileFiles, ThatShareALargeValueManyTimesAreRefused) {
  for (const char* const kind : {"\x4F", "\x5F", "\x6F"}) {
    const std::string leaf = kind + "\x12"s + bigEndian(kMebibyte / 4, 4) + std::string(kMebibyte / 2, 'a');
    expectSettled(sharedLeaf(leaf, 1, kMebibyte / 2), Outcome::refused);
  }
}

TEST(HostileFiles, StayWithinTheirMemoryWhenTheyAreAccepted) {
  expectSettled(sharedLeaf("\x09", 1, kMebibyte / 2), Outcome::accepted);
  expectSettled(sharedLeaf("\x13" + std::string(8, '\xFF'), 1, kMebibyte / 2), Outcome::accepted);
  expectSettled(sharedLeaf("\x51s", 1, kMebibyte / 16), Outcome::accepted);
  expectSettled(sharedLeaf("\xA0", 1, kMebibyte / 32), Outcome::accepted);
  expectSettled(sharedLeaf("\xD0", 1, kMebibyte / 64), Outcome::accepted);
  expectSettled(sharedLeaf("\x33" + bigEndian(0x3FF123456789ABCD, 8), 1, 4000), Outcome::accepted);
  expectSettled(xmlWith("<key>k</key><array>" + repeated("<string>a</string>", 50'000) + "</array>"),
                Outcome::accepted);
  expectSettled(xmlWith("<key>k</key><array>" + repeated("<dict><key>k</key><true/></dict>", 30'000) + "</array>"),
                Outcome::accepted);
}

TEST(HostileFiles, ThatShareASmallContainerTooOftenAreRefused) {
  for (const char* const container : {"\xA0", "\xD0", "\xD1\x01\x01"}) {
    expectSettled(sharedLeaf(container, 1, kMebibyte), Outcome::refused);
  }
}

TEST(HostileFiles, ThatMakeEveryNodeDeepAreRefused) {
  expectSettled(sharedLeaf("\x09", 250, kMebibyte), Outcome::refused);
  expectSettled(sharedLeaf("\x09", 250, 10'000), Outcome::accepted);
}

TEST(HostileFiles, WithCyclesAreRefused) {
  PropertyListFiles files;
  EXPECT_FALSE(files.read(BinaryFile{.objects = {"\xD1\x01\x00"s, "\x51k"}}.bytes()));
  EXPECT_FALSE(files.read(BinaryFile{.objects = {"\xD1\x01\x02"s, "\x51k", "\xA1\x03", "\xA1\x02"}}.bytes()));
}

TEST(HostileFiles, WithOverlappingContainersAreRefused) {
  // Tens of thousands of arrays of tens of thousands of references each, all made of the same bytes.
  std::string file = "bplist00" + repeated("\xAF\x11\x7F\xFF", 40'000);
  const std::size_t count = 30'000;
  std::string table;
  for (std::size_t object = 0; object < count; ++object) table += bigEndian(8 + 4 * object, 3);
  const std::size_t tableOffset = file.size();
  file += table + std::string(6, '\0') + "\x03\x02" + bigEndian(count, 8) + bigEndian(0, 8) + bigEndian(tableOffset, 8);
  expectSettled(file, Outcome::refused);
}

TEST(HostileFiles, ThatLieAboutOffsetsAndCountsAreRefused) {
  PropertyListFiles files;
  const std::string sound = fileWith("\x09").bytes();
  ASSERT_TRUE(files.read(sound));
  const std::size_t trailer = sound.size() - 32;
  for (const std::size_t field :
       {trailer + 6, trailer + 7, trailer + 8, trailer + 15, trailer + 16, trailer + 23, trailer + 24, trailer + 31}) {
    for (const char lie : {'\x00', '\x7F', '\xFF'}) {
      std::string file = sound;
      if (file[field] == lie) continue;
      file[field] = lie;
      EXPECT_FALSE(files.read(file)) << field - trailer << " " << int{lie};
    }
  }
  for (const std::string& object :
       {"\x13\x00"s, "\x5E"s, "\x4F\x12\xFF\xFF\xFF\xFF"s, "\xAF\x13\x7F\xFF\xFF\xFF\xFF\xFF\xFF\xFF"s,
        "\x6F\x13\x80\x00\x00\x00\x00\x00\x00\x00"s, "\xDF\x13\xFF\xFF\xFF\xFF\xFF\xFF\xFF\xFF"s, "\x4F\x51"s,
        "\x4F\x1F"s, "\xA1\xFF"s, "\xD1\xFF\x04"s}) {
    EXPECT_FALSE(files.read(fileWith(object).bytes())) << object;
  }
}

TEST(HostileFiles, TruncatedAnywhereAreRefused) {
  PropertyListFiles files;
  const std::string binary = fileWith("\xA2\x04\x01").bytes();
  const std::string xml = xmlWith("<key>k</key><array><string>a &amp; b</string></array>");
  ASSERT_TRUE(files.read(binary));
  ASSERT_TRUE(files.read(xml));
  for (std::size_t size = 0; size < binary.size(); ++size) EXPECT_FALSE(files.read(binary.substr(0, size))) << size;
  for (std::size_t size = 0; size < xml.find("</plist>"); ++size) {
    EXPECT_EQ(files.read(xml.substr(0, size)).has_value(), size >= xml.find("</plist>")) << size;
  }
}

TEST(HostileFiles, WithAFloodOfEntitiesAreRefusedButManyAreRead) {
  const auto entities = [](std::size_t count) {
    return xmlWith("<key>k</key><string>" + repeated("&amp;", count) + "</string>");
  };
  expectSettled(entities(200'000), Outcome::refused);
  expectSettled(entities(10'000), Outcome::accepted);
}

// "Ez" and "FY" have one hash in the library's tables, and so has every chain of them.
TEST(HostileFiles, WithCollidingOrRepeatedKeysInXmlAreRefusedButManyKeysAreRead) {
  std::string colliding;
  std::string repeatedKeys;
  std::string distinct;
  for (unsigned key = 0; key < 30'000; ++key) {
    std::string name;
    for (unsigned bit = 0; bit < 15; ++bit) name += (key >> bit & 1U) != 0 ? "Ez" : "FY";
    colliding += "<key>" + name + "</key><true/>";
    repeatedKeys += "<key>" + std::to_string(key % 10'000) + "</key><true/>";
    distinct += "<key>" + std::to_string(key) + "</key><true/>";
  }
  expectSettled(xmlWith(colliding), Outcome::refused);
  expectSettled(xmlWith(repeatedKeys), Outcome::refused);
  expectSettled(xmlWith(distinct), Outcome::accepted);
}

// A list of texts, of which one of two may stand for every bit of a number.
std::string textsOfBits(std::size_t count, const std::string& zero, const std::string& one) {
  BinaryFile file{.objects = {"", "\x51k", ""}, .referenceSize = 3};
  file.objects[0] = "\xD1" + file.reference(1) + file.reference(2);
  file.objects[2] = countedMarker(0xA, count);
  for (std::size_t number = 0; number < count; ++number) {
    std::string text;
    for (unsigned bit = 0; bit < 15; ++bit) text += (number >> bit & 1U) != 0 ? one : zero;
    file.objects[2] += file.reference(file.add(countedMarker(5, text.size()) + text));
  }
  return file.bytes();
}

TEST(HostileFiles, WithTextsThatCollideAsTheyAreWrittenAreRefusedButManyTextsAreRead) {
  expectSettled(textsOfBits(20'000, "FY", "Ez"), Outcome::refused);
  expectSettled(textsOfBits(20'000, "FY", "FZ"), Outcome::accepted);
  expectSettled(textsOfBits(2'000, "FY", "Ez"), Outcome::accepted);
}

// A number of which the library's table makes the same as of every other such number; nothing for most seeds. The
// lowest byte weighs most in the table, and the highest, which weighs least, brings all to one remainder.
std::optional<std::uint64_t> collidingNumber(std::uint64_t seed) {
  std::uint64_t number = 0;
  std::uint32_t hash = 0;
  for (unsigned byte = 0; byte < 7; ++byte) {
    const std::uint64_t digit = seed >> (5 * byte) & 31U;
    number |= digit << (8 * byte);
    hash = hash * 33 + static_cast<std::uint32_t>(digit);
  }
  const std::uint32_t last = (0 - hash * 33) % 4096;
  return last < 128 ? std::optional{number | std::uint64_t{last} << 56U} : std::nullopt;
}

TEST(HostileFiles, WithNumbersThatCollideAsTheyAreWrittenAreRefusedButManyNumbersAreRead) {
  const auto listOf = [](const std::vector<std::uint64_t>& numbers) {
    BinaryFile file{.objects = {"", "\x51k", ""}, .referenceSize = 3};
    file.objects[0] = "\xD1" + file.reference(1) + file.reference(2);
    file.objects[2] = countedMarker(0xA, numbers.size());
    for (const std::uint64_t number : numbers) {
      file.objects[2] += file.reference(file.add("\x13" + bigEndian(number, 8)));
    }
    return file.bytes();
  };
  std::vector<std::uint64_t> colliding;
  std::vector<std::uint64_t> others;
  for (std::uint64_t seed = 0; colliding.size() < 20'000; ++seed) {
    if (const auto number = collidingNumber(seed)) colliding.push_back(*number);
    if (others.size() < colliding.size()) others.push_back(seed);
  }
  expectSettled(listOf(colliding), Outcome::refused);
  expectSettled(listOf(others), Outcome::accepted);
}

TEST(HostileFiles, WithKeysThatCollideInATableOfHashesAreReadAsQuicklyAsOthers) {
  const auto seconds = [](const std::vector<std::string>& keys) {
    BinaryFile file{.objects = {"", "\x09"}, .referenceSize = 3};
    std::string values;
    file.objects[0] = countedMarker(0xD, keys.size());
    for (const std::string& key : keys) {
      file.objects[0] += file.reference(file.add(countedMarker(5, key.size()) + key));
      values += file.reference(1);
    }
    file.objects[0] += values;
    PropertyListFiles files;
    return tests::secondsFor([&] { EXPECT_EQ(files.read(file.bytes()).value().size(), keys.size()); });
  };
  constexpr std::size_t kCount = 30'000;
  EXPECT_LT(seconds(tests::CollidingKeys::make(kCount)), 4 * seconds(tests::harmlessKeys(kCount)) + 0.2);
}

TEST(HostileFiles, OfMoreValuesThanCanBeWrittenAreRefused) {
  expectSettled(sharedLeaf("\x09", 1, platform::kMaxValues + 1), Outcome::refused);
}

// In a process of its own that may take little more memory than it has.
Outcome withLittleMemory(const std::function<void()>& action) {
  const pid_t child = fork();
  if (child == 0) {
    rlimit limit{};
    getrlimit(RLIMIT_AS, &limit);
    std::size_t pages = 0;
    std::ifstream{"/proc/self/statm"} >> pages;
    limit.rlim_cur = pages * static_cast<std::size_t>(sysconf(_SC_PAGESIZE)) + 4 * kMebibyte;
    setrlimit(RLIMIT_AS, &limit);
    try {
      action();
      _exit(static_cast<int>(Outcome::accepted));
    } catch (const std::bad_alloc&) {
      _exit(static_cast<int>(Outcome::refused));
    }
  }
  int status = 0;
  EXPECT_EQ(waitpid(child, &status, 0), child);
  EXPECT_TRUE(WIFEXITED(status)) << "ended by signal " << WTERMSIG(status);
  return Outcome{WEXITSTATUS(status)};
}

TEST(HostileFiles, AreNeitherLostNorTheEndOfTheProcessForWantOfMemory) {
  if (!kCanMeasure) GTEST_SKIP() << "the sanitizers take more memory than that";
  PropertyListFiles files;
  files.files->put("/file.plist", textsOfBits(20'000, "FY", "FZ"));
  const Dictionary values = files.store->readDictionary("/file.plist").take();
  PropertyListFiles others;  // which know neither the bytes nor the values
  others.files = files.files;
  others.store = platform::makeLibplistPropertyListStore(files.files);
  EXPECT_EQ(withLittleMemory([&] { std::ignore = others.store->serialize(values); }), Outcome::refused);
  EXPECT_EQ(withLittleMemory([&] { std::ignore = others.store->readDictionary("/file.plist"); }), Outcome::refused);
}

TEST(HostileFiles, LargerThanTheLimitForXmlAreRefused) {
  EXPECT_FALSE(PropertyListFiles{}.read(xmlWith("<!--" + std::string(17 * kMebibyte, ' ') + "-->")));
}

}  // namespace
