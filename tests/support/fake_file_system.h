#pragma once

#include <map>
#include <set>
#include <string>
#include <vector>

#include "platform/file_system.h"

namespace tests {

// A device's files in memory; directories are moved by no call here. Every link is followed. Every call is recorded as
// "verb path" (or "verb from to"), and any call can be made to fail: by verb, or by verb and path.
class FakeFileSystem final : public platform::FileSystem {
 public:
  struct Node {
    bool isDirectory = false;
    platform::Bytes bytes;
    std::string owner;
    std::string group;
    unsigned permissions = 0;
    platform::Path target = {};  // where a link leads; empty for what is none
  };
  // By the characters: an order by parts, which paths have of their own, takes many times as long.
  struct Order {
    bool operator()(const platform::Path& one, const platform::Path& other) const {
      return one.native() < other.native();
    }
  };
  using Nodes = std::map<platform::Path, Node, Order>;

  Nodes nodes;
  std::vector<std::string> calls;                    // in order
  std::set<std::string> failing;                     // "rename", or "remove /a/path"; fails with EIO
  std::set<std::string> accounts{"root", "mobile"};  // names that setOwner knows
  bool hasTemporaryNames = true;
  platform::Path root = "/";  // where absolute links begin

  // Puts a file there, with the directories above it.
  void put(const platform::Path& path, platform::Bytes bytes);
  void put(const platform::Path& path, std::string_view bytes);
  void putDirectory(const platform::Path& path);
  void putLink(const platform::Path& path, const platform::Path& target);
  [[nodiscard]] bool exists(const platform::Path& path) const { return nodes.contains(path); }
  [[nodiscard]] std::string contents(const platform::Path& path) const;

  platform::Result<platform::FileKind> kindOf(const platform::Path& path) override;
  platform::Result<platform::Bytes> read(const platform::Path& path, std::size_t sizeLimit) override;
  platform::Status create(const platform::Path& path, std::span<const std::uint8_t> bytes) override;
  platform::Status replace(const platform::Path& path, std::span<const std::uint8_t> bytes) override;
  platform::Status copy(const platform::Path& from, const platform::Path& to) override;
  platform::Status remove(const platform::Path& path) override;
  platform::Status createDirectories(const platform::Path& path, unsigned permissions) override;
  platform::Status setOwner(const platform::Path& path, std::string_view owner, std::string_view group) override;
  platform::Result<platform::Path> temporaryName() override;
  platform::Status rename(const platform::Path& from, const platform::Path& to) override;

 private:
  // The path with the links above it followed, or also one at it; a link that leads nowhere else but in a circle stays.
  [[nodiscard]] platform::Path placeOf(const platform::Path& path) const;
  [[nodiscard]] platform::Path targetOf(const platform::Path& path) const;
  [[nodiscard]] platform::Path followed(const platform::Path& path, bool followsLast, int& links) const;
  // The failure of a call that a switch makes fail or for which the precondition does not hold.
  platform::Status begin(const std::string& verb, const platform::Path& path, const std::string& rest = {});
  // What keeps a file from standing at the place, or from being read there, as an error number; 0 where nothing does.
  [[nodiscard]] int obstacleToReading(const platform::Path& path) const;
  [[nodiscard]] int obstacleAbove(const platform::Path& path) const;
  [[nodiscard]] int obstacleToMaking(const platform::Path& path) const;
  [[nodiscard]] int obstacleToReplacing(const platform::Path& path) const;

  int _temporaryNames = 0;
};

}  // namespace tests
