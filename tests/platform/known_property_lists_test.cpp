#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <string>

#include "tests/support/property_list_files.h"
#include "tests/support/real_device.h"

using platform::Array;
using platform::Bytes;
using platform::Dictionary;
using platform::PropertyValue;
using tests::BinaryFile;
using tests::fileWith;
using tests::PropertyListFiles;
using namespace std::string_literals;

namespace {

Bytes bytesOf(const std::string& text) { return {text.begin(), text.end()}; }

bool contain(const Bytes& bytes, std::string_view text) {
  return std::search(bytes.begin(), bytes.end(), text.begin(), text.end()) != bytes.end();
}

const Dictionary kAccount{{"Identifier", "one"}, {"Port", 993}, {"Names", Array{"a", "b"}}};

TEST(KnownPropertyLists, GiveTheValuesThatWereReadBefore) {
  PropertyListFiles lists;
  const Bytes bytes = *lists.store->serialize(kAccount).data;
  const Dictionary first = *lists.read(bytes);
  EXPECT_TRUE(lists.read(bytes)->isIdenticalTo(first));
}

TEST(KnownPropertyLists, AreReadFromTheFileEachTime) {
  PropertyListFiles lists;
  const Bytes bytes = *lists.store->serialize(kAccount).data;
  EXPECT_TRUE(lists.read(bytes).has_value());
  static_cast<void>(lists.files->remove("/file.plist"));
  EXPECT_FALSE(lists.store->readDictionary("/file.plist").isOk());
}

TEST(KnownPropertyLists, DoNotHideAChangeThatKeepsSizeAndTime) {
  const tests::RealDevice device;
  const auto read = [&device] {
    return device.services.propertyLists->readDictionary(device.root / "list.plist").take();
  };
  device.put("list.plist", "<key>Name</key><string>before</string>");
  const auto time = std::filesystem::last_write_time(device.root / "list.plist");
  EXPECT_EQ(read().text("Name")->view(), "before");
  device.put("list.plist", "<key>Name</key><string>behind</string>");
  std::filesystem::last_write_time(device.root / "list.plist", time);
  EXPECT_EQ(read().text("Name")->view(), "behind");
}

TEST(KnownPropertyLists, AreNotChangedByWhoeverEditsTheirValues) {
  PropertyListFiles lists;
  const Bytes bytes = *lists.store->serialize(kAccount).data;
  Dictionary edited = *lists.read(bytes);
  edited.set("Port", 143);
  EXPECT_EQ(*lists.read(bytes), kAccount);
}

TEST(KnownPropertyLists, GiveTheirBytesForTheSameValues) {
  PropertyListFiles lists;
  const Bytes bytes = *lists.store->serialize(kAccount).data;
  PropertyListFiles others;
  EXPECT_EQ(*others.store->serialize(*others.read(bytes)).data, bytes);
}

TEST(KnownPropertyLists, DoNotHideAnEdit) {
  PropertyListFiles lists;
  Dictionary edited = *lists.read(*lists.store->serialize(kAccount).data);
  edited.set("Names", Array{"a", "c"});
  EXPECT_EQ(*lists.read(*lists.store->serialize(edited).data), edited);
}

TEST(KnownPropertyLists, DoNotHideAnEditThatIsTakenBack) {
  PropertyListFiles lists;
  const Bytes before = *lists.store->serialize(kAccount).data;
  Dictionary edited = kAccount;
  edited.set("Port", 143);
  const Bytes between = *lists.store->serialize(edited).data;
  edited.set("Port", 993);
  EXPECT_EQ(*lists.store->serialize(edited).data, before);
  EXPECT_NE(before, between);
}

TEST(KnownPropertyLists, TellKindsOfOneValueApart) {
  PropertyListFiles lists;
  static_cast<void>(lists.store->serialize(Dictionary{{"IsActive", true}}));
  EXPECT_EQ(*lists.read(*lists.store->serialize(Dictionary{{"IsActive", 1}}).data)->find("IsActive"), PropertyValue{1});
}

TEST(KnownPropertyLists, TellOrdersOfKeysApart) {
  PropertyListFiles lists;
  const Dictionary ordered{{"Inner", Dictionary{{"a", 1}, {"b", 2}}}};
  const Dictionary reversed{{"Inner", Dictionary{{"b", 2}, {"a", 1}}}};
  static_cast<void>(lists.store->serialize(ordered));
  const Dictionary read = *lists.read(*lists.store->serialize(reversed).data);
  EXPECT_EQ(read.dictionary("Inner")->begin()->key.view(), "b");
}

// What a save writes for a file that was read, unchanged.
Bytes rewritten(const std::string& file) {
  PropertyListFiles lists;
  return *lists.store->serialize(*lists.read(file)).data;
}

TEST(KnownPropertyLists, AreNotWrittenAgainWithWhatNobodyReaches) {
  BinaryFile file = fileWith("\x53yes"s);
  file.add("\x56secret"s);
  EXPECT_FALSE(contain(rewritten(file.bytes()), "secret"));
}

TEST(KnownPropertyLists, AreNotWrittenAgainWithWhatStandsBetweenTheObjects) {
  BinaryFile file = fileWith("\x53yessecret"s);
  EXPECT_FALSE(contain(rewritten(file.bytes()), "secret"));
}

TEST(KnownPropertyLists, AreNotWrittenAgainWithAKeyThatIsRepeated) {
  const BinaryFile file{.objects = {"\xD2\x01\x01\x02\x03"s, "\x51k"s, "\x56hidden"s, "\x53yes"s}};
  EXPECT_FALSE(contain(rewritten(file.bytes()), "hidden"));
}

TEST(KnownPropertyLists, AreNotWrittenAgainAsTheyWereBeforeARepair) {
  const Bytes bytes = rewritten(fileWith("\x00"s).bytes());
  PropertyListFiles lists;
  EXPECT_EQ(*lists.read(bytes)->find("k"), PropertyValue{""});
  EXPECT_NE(bytes, bytesOf(fileWith("\x00"s).bytes()));
}

TEST(KnownPropertyLists, AreNotWrittenAgainInAFormThatIsOdd) {
  const std::string file = fileWith("\x52\xC3\xA9"s).bytes();  // UTF-8 where ASCII is due
  EXPECT_NE(rewritten(file), bytesOf(file));
}

TEST(KnownPropertyLists, AreWrittenInTheBinaryFormWhereTheyWereXml) {
  EXPECT_TRUE(contain(rewritten(tests::xmlWith("<key>k</key><string>v</string>")), "bplist00"));
}

TEST(KnownPropertyLists, MayBeAsLargeAsTensOfThousandsOfAccountsAre) {
  PropertyListFiles lists;
  const Bytes bytes = *lists.store->serialize({{"data", Bytes(std::size_t{40} << 20U, 7)}}).data;
  const Dictionary first = *lists.read(bytes);
  EXPECT_TRUE(lists.read(bytes)->isIdenticalTo(first));
}

TEST(KnownPropertyLists, AreFew) {
  PropertyListFiles lists;
  const Bytes bytes = *lists.store->serialize(kAccount).data;
  const Dictionary first = *lists.read(bytes);
  for (int number = 0; number < 10; ++number) {
    static_cast<void>(lists.read(*lists.store->serialize(Dictionary{{"Number", number}}).data));
  }
  const Dictionary again = *lists.read(bytes);
  EXPECT_FALSE(again.isIdenticalTo(first));
  EXPECT_EQ(again, first);
}

}  // namespace
