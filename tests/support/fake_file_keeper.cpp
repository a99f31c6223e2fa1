#include "tests/support/fake_file_keeper.h"

#include <cerrno>

namespace tests {

using platform::FileAttributes;
using platform::FileKind;
using platform::Path;
using platform::Status;

Status FakeFileKeeper::begin(const std::string& verb, const Path& path) const {
  const bool isFailing = _files.failing.contains(verb) || _files.failing.contains(verb + " " + path.string());
  return isFailing ? Status::failure(EIO, verb + " " + path.string()) : Status{};
}

platform::Result<FileAttributes> FakeFileKeeper::attributesOf(const Path& path) {
  const Status begun = begin("attributesOf", path);
  if (!begun.isOk()) return begun;
  const auto node = _files.nodes.find(path);
  if (node == _files.nodes.end()) return Status::failure(ENOENT, "look at " + path.string());
  FileAttributes attributes = _restored.contains(path) ? _restored.at(path) : FileAttributes{};
  attributes.kind = node->second.isDirectory ? FileKind::directory : FileKind::file;
  attributes.size = node->second.bytes.size();
  attributes.permissions = node->second.permissions;
  return attributes;
}

platform::Result<platform::FileCopy> FakeFileKeeper::read(const Path& path, std::size_t sizeLimit) {
  const platform::Result<FileAttributes> attributes = attributesOf(path);
  if (!attributes.isOk()) return attributes.status();
  if (attributes.value().size > sizeLimit) return Status::failure(EFBIG, "read " + path.string());
  return platform::FileCopy{attributes.value(), _files.nodes.at(path).bytes};
}

platform::Result<platform::FileCopy> FakeFileKeeper::readTarget(const Path& path, std::size_t sizeLimit) {
  platform::Result<platform::FileCopy> file = read(path, sizeLimit);
  const bool isDirectory = file.isOk() && file.value().attributes.kind == FileKind::directory;
  return isDirectory ? Status::failure(EISDIR, "read " + path.string()) : file;
}

platform::Result<std::vector<std::string>> FakeFileKeeper::entriesOf(const Path& directory) {
  const auto node = _files.nodes.find(directory);
  if (node == _files.nodes.end()) return Status::failure(ENOENT, "list " + directory.string());
  if (!node->second.isDirectory) return Status::failure(ENOTDIR, "list " + directory.string());
  std::vector<std::string> names;
  for (const auto& [path, entry] : _files.nodes) {
    if (path.parent_path() == directory && path != directory) names.push_back(path.filename());
  }
  return names;
}

Status FakeFileKeeper::append(const Path& path, std::span<const std::uint8_t> bytes) {
  const Status begun = begin("append", path);
  if (!begun.isOk()) return begun;
  const auto node = _files.nodes.find(path);
  if (node == _files.nodes.end()) return Status::failure(ENOENT, "add to " + path.string());
  if (node->second.isDirectory) return Status::failure(EISDIR, "add to " + path.string());
  node->second.bytes.insert(node->second.bytes.end(), bytes.begin(), bytes.end());
  return {};
}

Status FakeFileKeeper::restore(const Path& path, std::span<const std::uint8_t> bytes,
                               const FileAttributes& attributes) {
  const Status begun = begin("restore", path);
  if (!begun.isOk()) return begun;
  const auto node = _files.nodes.find(path);
  if (node != _files.nodes.end() && node->second.isDirectory)
    return Status::failure(EISDIR, "restore " + path.string());
  if (!_files.nodes.contains(path.parent_path())) return Status::failure(ENOENT, "restore " + path.string());
  _files.put(path, platform::Bytes{bytes.begin(), bytes.end()});
  _files.nodes[path].permissions = attributes.permissions & 0777U;
  _restored[path] = attributes;
  return {};
}

Status FakeFileKeeper::removeFile(const Path& path) {
  const Status begun = begin("removeFile", path);
  if (!begun.isOk()) return begun;
  const auto node = _files.nodes.find(path);
  if (node == _files.nodes.end()) return {};
  if (node->second.isDirectory) return Status::failure(EISDIR, "remove " + path.string());
  _files.nodes.erase(node);
  return {};
}

}  // namespace tests
