#include "tests/support/scratch_directory.h"

#include <cstdlib>
#include <fstream>
#include <iterator>
#include <stdexcept>

namespace tests {
namespace {

std::filesystem::path newDirectory() {
  std::string name = (std::filesystem::temp_directory_path() / "account-tests-XXXXXX").string();
  if (::mkdtemp(name.data()) == nullptr) throw std::runtime_error{"no scratch directory"};
  return std::filesystem::canonical(name);
}

}  // namespace

ScratchDirectory::ScratchDirectory() : _path{newDirectory()} {}

ScratchDirectory::~ScratchDirectory() {
  std::error_code unused;
  std::filesystem::remove_all(_path, unused);
}

std::filesystem::path ScratchDirectory::put(std::string_view below, std::string_view text) const {
  const std::filesystem::path file = _path / below;
  std::filesystem::create_directories(file.parent_path());
  std::ofstream{file, std::ios::binary} << text;
  return file;
}

std::string ScratchDirectory::contents(std::string_view below) const {
  std::ifstream file{_path / below, std::ios::binary};
  return {std::istreambuf_iterator<char>{file}, {}};
}

unsigned permissionsOf(const std::filesystem::path& path) {
  return static_cast<unsigned>(std::filesystem::symlink_status(path).permissions());
}

}  // namespace tests
