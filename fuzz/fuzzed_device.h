#pragma once

#include <optional>
#include <string>

#include "fuzz/input.h"
#include "fuzz/values_in_memory.h"
#include "tests/support/migration_device.h"

namespace fuzz {

// A device in memory, filled from an input: a settings file of any version, legacy mail and Exchange accounts, the
// removal sentinel, files that are no property lists, operations that fail. Of eight inputs one has its files written
// and read with the device's own property lists, and one a log that is read: either takes as long as all else together.
// Making a device takes long and filling it again does not; there is one in a process, since the library keeps the log
// of the first.
class FuzzedDevice : public tests::MigrationDevice {
 public:
  FuzzedDevice();

  // Makes it what the input says, with nothing left of what it was.
  void fill(Input& input);
  // The same with a settings file of some accounts, all of them up to 250 times, in the device's own property lists.
  void fillWithCopies(Input& input);

  static constexpr std::string_view kSecret = "S3CR3T";  // in every credential and every blob, and nowhere else
  static constexpr std::string_view kMarker = "Marker";  // an integer of its own in each account

  [[nodiscard]] std::optional<tests::Dictionary> settings() const;
  [[nodiscard]] std::optional<tests::Bytes> settingsBytes() const;

  bool areIdentifiersUnique = false;
  bool hasSentinel = false;
  bool hasLegacyMail = false;
  bool hasLegacyExchange = false;
  bool hasFaults = false;

 private:
  tests::PropertyValue anything(int depth);
  tests::PropertyValue usual(std::string_view key, int depth);
  tests::PropertyValue identifier();
  tests::Array accounts(int depth);
  tests::Dictionary account(int depth);
  tests::Dictionary described(Words keys);
  void putReal(const tests::Path& path, const tests::Dictionary& contents) const;
  void putFile(const tests::Path& path, const tests::Dictionary& contents);
  void putFiles();
  void addFaults();
  void begin(Input& input);  // with nothing left of what it was
  void forget();             // what the fakes recorded

  Input* _input = nullptr;  // while it is filled
  std::shared_ptr<ValuesInMemory> _store;
  tests::FakeFileSystem::Nodes _ownFiles;  // before it is filled
  int _identifiers = 0;
  int _markers = 0;
};

}  // namespace fuzz
