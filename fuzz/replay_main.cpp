// Gives every file of a corpus, which is a directory, to the fuzzer that it is linked with. A fuzzer that objects ends
// the program.
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <vector>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size);

namespace {

std::vector<std::filesystem::path> filesOf(const std::filesystem::path& corpus) {
  std::vector<std::filesystem::path> files;
  for (const auto& entry : std::filesystem::directory_iterator{corpus}) files.push_back(entry.path());
  std::ranges::sort(files);
  return files;
}

void replay(const std::filesystem::path& path) {
  std::ifstream file{path, std::ios::binary};
  const std::vector<char> bytes{std::istreambuf_iterator<char>{file}, {}};
  const std::vector<std::uint8_t> input{bytes.begin(), bytes.end()};
  std::fprintf(stderr, "%s\n", path.c_str());
  LLVMFuzzerTestOneInput(input.data(), input.size());
}

}  // namespace

int main(int count, char** arguments) {
  if (count != 2) return 2;
  const auto files = filesOf(arguments[1]);
  for (const auto& file : files) replay(file);
  std::printf("%zu inputs replayed\n", files.size());
  return files.empty() ? 1 : 0;
}
