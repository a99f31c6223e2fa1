#include "tests/support/fake_file_system.h"

#include <algorithm>
#include <cerrno>

namespace tests {

using platform::Bytes;
using platform::FileKind;
using platform::Path;
using platform::Status;

namespace {

bool hasLinks(const FakeFileSystem::Nodes& nodes) {
  return std::ranges::any_of(nodes, [](const auto& node) { return !node.second.target.empty(); });
}

}  // namespace

void FakeFileSystem::put(const Path& path, Bytes bytes) {
  putDirectory(path.parent_path());
  nodes[path] = Node{
      .isDirectory = false, .bytes = std::move(bytes), .owner = {}, .group = {}, .permissions = 0600, .target = {}};
}

void FakeFileSystem::put(const Path& path, std::string_view bytes) { put(path, Bytes{bytes.begin(), bytes.end()}); }

void FakeFileSystem::putDirectory(const Path& path) {
  if (nodes.contains(path)) return;
  Path built;
  for (const Path& part : path) {
    built /= part;
    if (!nodes.contains(built)) {
      nodes[built] =
          Node{.isDirectory = true, .bytes = {}, .owner = {}, .group = {}, .permissions = 0755, .target = {}};
    }
  }
}

std::string FakeFileSystem::contents(const Path& path) const {
  const auto node = nodes.find(path);
  return node == nodes.end() ? std::string{} : std::string{node->second.bytes.begin(), node->second.bytes.end()};
}

void FakeFileSystem::putLink(const Path& path, const Path& target) {
  put(path, Bytes{});
  nodes[path].target = target;
}

Path FakeFileSystem::followed(const Path& path, bool followsLast, int& links) const {
  constexpr int kMaxLinks = 40;
  if (!path.has_relative_path()) return path;
  Path place = followed(path.parent_path(), true, links) / path.filename();
  const auto node = nodes.find(place);
  if (!followsLast || node == nodes.end() || node->second.target.empty() || ++links > kMaxLinks) return place;
  const Path& target = node->second.target;
  Path next = target.is_absolute() ? root / target.relative_path() : place.parent_path() / target;
  next = next.lexically_normal();
  return followed(next.has_filename() ? next : next.parent_path(), true, links);
}

Path FakeFileSystem::placeOf(const Path& path) const {
  if (!hasLinks(nodes)) return path;
  int links = 0;
  return followed(path, false, links);
}

Path FakeFileSystem::targetOf(const Path& path) const {
  if (!hasLinks(nodes)) return path;
  int links = 0;
  return followed(path, true, links);
}

Status FakeFileSystem::begin(const std::string& verb, const Path& path, const std::string& rest) {
  const std::string call = verb + " " + path.string();
  calls.push_back(call + rest);
  return failing.contains(verb) || failing.contains(call) ? Status::failure(EIO, call) : Status{};
}

platform::Result<FileKind> FakeFileSystem::kindOf(const Path& path) {
  const auto node = nodes.find(targetOf(path));
  if (node == nodes.end()) return Status::failure(ENOENT, "look at " + path.string());
  if (!node->second.target.empty()) return FileKind::other;
  return node->second.isDirectory ? FileKind::directory : FileKind::file;
}

int FakeFileSystem::obstacleToReading(const Path& path) const {
  const auto node = nodes.find(path);
  if (node == nodes.end()) return obstacleAbove(path) == 0 ? ENOENT : obstacleAbove(path);
  if (node->second.isDirectory) return EISDIR;
  return node->second.target.empty() ? 0 : ELOOP;
}

platform::Result<Bytes> FakeFileSystem::read(const Path& path, std::size_t sizeLimit) {
  const Status begun = begin("read", path);
  if (!begun.isOk()) return begun;
  const Path place = targetOf(path);
  if (const int cause = obstacleToReading(place)) return Status::failure(cause, "read " + path.string());
  const Bytes& bytes = nodes.at(place).bytes;
  return bytes.size() > sizeLimit ? platform::Result<Bytes>{Status::failure(EFBIG, "read " + path.string())} : bytes;
}

int FakeFileSystem::obstacleAbove(const Path& path) const {
  const auto above = nodes.find(path.parent_path());
  if (above == nodes.end()) return ENOENT;
  if (!above->second.target.empty()) return ELOOP;
  return above->second.isDirectory ? 0 : ENOTDIR;
}

int FakeFileSystem::obstacleToMaking(const Path& path) const {
  return nodes.contains(path) ? EEXIST : obstacleAbove(path);
}

int FakeFileSystem::obstacleToReplacing(const Path& path) const {
  const auto node = nodes.find(path);
  return node != nodes.end() && node->second.isDirectory ? EISDIR : obstacleAbove(path);
}

Status FakeFileSystem::create(const Path& path, std::span<const std::uint8_t> bytes) {
  const Status begun = begin("create", path);
  if (!begun.isOk()) return begun;
  const Path place = placeOf(path);
  if (const int cause = obstacleToMaking(place)) return Status::failure(cause, "create " + path.string());
  put(place, Bytes{bytes.begin(), bytes.end()});
  return {};
}

Status FakeFileSystem::replace(const Path& path, std::span<const std::uint8_t> bytes) {
  const Status begun = begin("replace", path);
  if (!begun.isOk()) return begun;
  const Path place = placeOf(path);
  if (const int cause = obstacleToReplacing(place)) return Status::failure(cause, "replace " + path.string());
  put(place, Bytes{bytes.begin(), bytes.end()});
  return {};
}

Status FakeFileSystem::copy(const Path& from, const Path& to) {
  const Status begun = begin("copy", from, " " + to.string());
  if (!begun.isOk()) return begun;
  const Path source = targetOf(from);
  const Path place = placeOf(to);
  if (const int cause = obstacleToReading(source)) return Status::failure(cause, "copy " + from.string());
  if (const int cause = obstacleToMaking(place)) return Status::failure(cause, "copy to " + to.string());
  put(place, Bytes{nodes.at(source).bytes});
  return {};
}

Status FakeFileSystem::remove(const Path& path) {
  const Status begun = begin("remove", path);
  if (!begun.isOk()) return begun;
  const Path place = placeOf(path);
  if (!nodes.contains(place)) return Status::failure(ENOENT, "remove " + path.string());
  nodes.erase(place);
  const std::string below = place.native() + "/";
  std::erase_if(nodes, [&below](const auto& node) { return node.first.native().starts_with(below); });
  return {};
}

Status FakeFileSystem::createDirectories(const Path& path, unsigned permissions) {
  const Status begun = begin("createDirectories", path);
  if (!begun.isOk()) return begun;
  const Path place = placeOf(path);
  for (Path above = place; above.has_relative_path(); above = above.parent_path()) {
    if (nodes.contains(above) && !nodes[above].isDirectory) {
      return Status::failure(ENOTDIR, "create the directory " + path.string());
    }
  }
  if (nodes.contains(place)) return {};
  putDirectory(place);
  nodes[place].permissions = permissions;
  return {};
}

Status FakeFileSystem::setOwner(const Path& path, std::string_view owner, std::string_view group) {
  const Status begun = begin("setOwner", path);
  if (!begun.isOk()) return begun;
  const Path place = placeOf(path);
  for (const std::string_view name : {owner, group}) {
    if (accounts.contains(std::string{name})) continue;
    return Status::failure(ENOENT, "find the account " + std::string{name} + " for " + path.string());
  }
  if (!nodes.contains(place)) return Status::failure(ENOENT, "set the owner of " + path.string());
  Node& node = nodes[place];
  if (!node.target.empty()) return Status::failure(ELOOP, "set the owner of " + path.string());
  node.owner = owner;
  node.group = group;
  return {};
}

platform::Result<Path> FakeFileSystem::temporaryName() {
  calls.emplace_back("temporaryName");
  if (!hasTemporaryNames) return Status::failure(EEXIST, "find a temporary name");
  return Path{"/var/mobile/tmp/file" + std::to_string(++_temporaryNames)};
}

Status FakeFileSystem::rename(const Path& from, const Path& to) {
  const Status begun = begin("rename", from, " " + to.string());
  if (!begun.isOk()) return begun;
  const auto node = nodes.find(placeOf(from));
  const Path place = placeOf(to);
  if (node == nodes.end()) return Status::failure(ENOENT, "rename " + from.string());
  if (const int cause = obstacleToReplacing(place)) return Status::failure(cause, "rename to " + to.string());
  Node moved = std::move(node->second);
  nodes.erase(node);
  nodes[place] = std::move(moved);
  return {};
}

}  // namespace tests
