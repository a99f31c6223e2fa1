#include "tests/support/fake_file_system.h"

#include <cerrno>

namespace tests {

using platform::Bytes;
using platform::FileKind;
using platform::Path;
using platform::Status;

void FakeFileSystem::put(const Path& path, Bytes bytes) {
  putDirectory(path.parent_path());
  nodes[path] = Node{.isDirectory = false, .bytes = std::move(bytes), .owner = {}, .group = {}, .permissions = 0600};
}

void FakeFileSystem::put(const Path& path, std::string_view bytes) { put(path, Bytes{bytes.begin(), bytes.end()}); }

void FakeFileSystem::putDirectory(const Path& path) {
  Path built;
  for (const Path& part : path) {
    built /= part;
    if (!nodes.contains(built)) {
      nodes[built] = Node{.isDirectory = true, .bytes = {}, .owner = {}, .group = {}, .permissions = 0755};
    }
  }
}

std::string FakeFileSystem::contents(const Path& path) const {
  const auto node = nodes.find(path);
  return node == nodes.end() ? std::string{} : std::string{node->second.bytes.begin(), node->second.bytes.end()};
}

Status FakeFileSystem::begin(const std::string& verb, const Path& path, const std::string& rest) {
  calls.push_back(verb + " " + path.string() + rest);
  if (failing.contains(verb) || failing.contains(verb + " " + path.string())) {
    return Status::failure(EIO, verb + " " + path.string());
  }
  return {};
}

platform::Result<FileKind> FakeFileSystem::kindOf(const Path& path) {
  const auto node = nodes.find(path);
  if (node == nodes.end()) return Status::failure(ENOENT, "look at " + path.string());
  return node->second.isDirectory ? FileKind::directory : FileKind::file;
}

platform::Result<Bytes> FakeFileSystem::read(const Path& path, std::size_t sizeLimit) {
  const Status begun = begin("read", path);
  if (!begun.isOk()) return begun;
  const auto node = nodes.find(path);
  if (node == nodes.end()) return Status::failure(ENOENT, "read " + path.string());
  if (node->second.isDirectory) return Status::failure(EISDIR, "read " + path.string());
  if (node->second.bytes.size() > sizeLimit) return Status::failure(EFBIG, "read " + path.string());
  return node->second.bytes;
}

int FakeFileSystem::obstacleAbove(const Path& path) const {
  const auto above = nodes.find(path.parent_path());
  if (above == nodes.end()) return ENOENT;
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
  if (const int cause = obstacleToMaking(path)) return Status::failure(cause, "create " + path.string());
  put(path, Bytes{bytes.begin(), bytes.end()});
  return {};
}

Status FakeFileSystem::replace(const Path& path, std::span<const std::uint8_t> bytes) {
  const Status begun = begin("replace", path);
  if (!begun.isOk()) return begun;
  if (const int cause = obstacleToReplacing(path)) return Status::failure(cause, "replace " + path.string());
  put(path, Bytes{bytes.begin(), bytes.end()});
  return {};
}

Status FakeFileSystem::copy(const Path& from, const Path& to) {
  const Status begun = begin("copy", from, " " + to.string());
  if (!begun.isOk()) return begun;
  const auto node = nodes.find(from);
  if (node == nodes.end()) return Status::failure(ENOENT, "copy " + from.string());
  if (node->second.isDirectory) return Status::failure(EISDIR, "copy " + from.string());
  if (const int cause = obstacleToMaking(to)) return Status::failure(cause, "copy to " + to.string());
  put(to, node->second.bytes);
  return {};
}

Status FakeFileSystem::remove(const Path& path) {
  const Status begun = begin("remove", path);
  if (!begun.isOk()) return begun;
  if (!nodes.contains(path)) return Status::failure(ENOENT, "remove " + path.string());
  const std::string below = path.string() + "/";
  std::erase_if(nodes, [&](const auto& node) { return node.first == path || node.first.string().starts_with(below); });
  return {};
}

Status FakeFileSystem::createDirectories(const Path& path, unsigned permissions) {
  const Status begun = begin("createDirectories", path);
  if (!begun.isOk()) return begun;
  for (Path above = path; above.has_relative_path(); above = above.parent_path()) {
    if (nodes.contains(above) && !nodes[above].isDirectory) {
      return Status::failure(ENOTDIR, "create the directory " + path.string());
    }
  }
  if (nodes.contains(path)) return {};
  putDirectory(path);
  nodes[path].permissions = permissions;
  return {};
}

Status FakeFileSystem::setOwner(const Path& path, std::string_view owner, std::string_view group) {
  const Status begun = begin("setOwner", path);
  if (!begun.isOk()) return begun;
  if (!accounts.contains(std::string{owner}) || !accounts.contains(std::string{group}) || !nodes.contains(path)) {
    return Status::failure(ENOENT, "set the owner of " + path.string());
  }
  nodes[path].owner = owner;
  nodes[path].group = group;
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
  const auto node = nodes.find(from);
  if (node == nodes.end()) return Status::failure(ENOENT, "rename " + from.string());
  if (const int cause = obstacleToReplacing(to)) return Status::failure(cause, "rename to " + to.string());
  nodes[to] = node->second;
  nodes.erase(from);
  return {};
}

}  // namespace tests
