#include "host/snapshots/manifest.h"

#include <gtest/gtest.h>

#include "host/snapshots/problem.h"

namespace host::snapshots {
namespace {

Manifest sample() {
  KeptFile settings{.path = "/var/s.plist", .part = Part::settings, .contents = "0123", .attributes = {}, .copy = "1"};
  settings.attributes = {.kind = platform::FileKind::file,
                         .size = 7,
                         .owner = 501,
                         .group = 502,
                         .permissions = 0640,
                         .modifiedSeconds = -5,
                         .modifiedNanoseconds = 123'456'789};
  KeptFile mail{.path = "/var/m.plist", .part = Part::legacy, .contents = kAbsent, .attributes = {}, .copy = {}};
  return {.id = "000001-20260101T000000Z",
          .taken = "2026-01-01T00:00:00Z",
          .release = "1.2.3",
          .reason = Manifest::kRun,
          .device = {.root = "/", .home = "/var/mobile"},
          .lockName = "Lock",
          .versionKey = "Version",
          .dataVersion = 7,
          .outcome = std::nullopt,
          .keptFor = {"a reason"},
          .files = {settings, mail}};
}

TEST(AManifest, IsReadAsItWasWritten) {
  const auto read = manifestFrom(textOf(sample()));
  ASSERT_TRUE(read);
  EXPECT_EQ(textOf(*read), textOf(sample()));
  EXPECT_EQ(read->files[0].attributes, sample().files[0].attributes);
  EXPECT_EQ(read->files[0].contents, "0123");
  EXPECT_FALSE(read->files[1].isPresent());
  EXPECT_EQ(read->dataVersion, 7);
  EXPECT_EQ(read->keptFor, std::vector<std::string>{"a reason"});
}

TEST(AManifest, IsRefusedWhereASingleByteOfItsWordsIsAnother) {
  const std::string whole = textOf(sample());
  for (std::size_t at = 0; at + 1 < whole.size(); ++at) {
    std::string damaged = whole;
    damaged[at] = static_cast<char>(damaged[at] ^ 1);
    EXPECT_FALSE(manifestFrom(damaged)) << at << ": " << damaged;
  }
}

TEST(AManifest, IsRefusedWhereItIsCutOff) {
  const std::string whole = textOf(sample());
  for (std::size_t size = 0; size + 1 < whole.size(); ++size) EXPECT_FALSE(manifestFrom(whole.substr(0, size))) << size;
}

// With the checksum that makes it whole again.
std::string written(std::string text, const std::string& from, const std::string& to) {
  text.replace(text.find(from), from.size(), to);
  const std::string inner = text.substr(12, text.rfind(",\"sha256\"") - 12);
  return "{\"manifest\":" + inner + ",\"sha256\":\"" + checksum(inner) + "\"}\n";
}

TEST(AManifest, IsRefusedWhereACopyIsNoPlainName) {
  const std::string whole = textOf(sample());
  ASSERT_TRUE(manifestFrom(written(whole, R"("copy":"1")", R"("copy":"2")")));
  for (const char* const name : {"../1", "/1", "a", "", ".", "1/2"}) {
    EXPECT_FALSE(manifestFrom(written(whole, R"("copy":"1")", R"("copy":")" + std::string{name} + '"'))) << name;
  }
}

TEST(AManifest, GivesNoSpecialModeBits) {
  const auto read = manifestFrom(written(textOf(sample()), "0640", "6755"));
  ASSERT_TRUE(read);
  EXPECT_EQ(read->files[0].attributes.permissions, 0755U);
}

TEST(AManifest, CannotNameAPathThatIsNoUtf8) {
  Manifest manifest = sample();
  manifest.files[0].path = "/var/\xff";
  EXPECT_THROW(static_cast<void>(textOf(manifest)), Problem);
}

}  // namespace
}  // namespace host::snapshots
