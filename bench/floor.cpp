// The floor of a run's work, on plain libplist: what cannot be avoided to read the settings file once and to save it a
// number of times. Usage: bench-floor FILE SAVES [sync]
#include <fcntl.h>
#include <plist/plist.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "bench/measurement.h"
#include "bench/sync_meter.h"

namespace {

struct FreeTree {
  void operator()(void* tree) const { plist_free(tree); }
};
struct FreeMemory {
  void operator()(void* memory) const { std::free(memory); }
};
using Tree = std::unique_ptr<void, FreeTree>;
using Memory = std::unique_ptr<void, FreeMemory>;
using Bytes = std::vector<char>;

[[noreturn]] void giveUp(const char* what) {
  std::perror(what);
  std::exit(1);
}

Bytes readFile(const std::string& path) {
  const int file = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
  struct stat status {};
  if (file < 0 || ::fstat(file, &status) != 0) giveUp("open");
  Bytes bytes(static_cast<std::size_t>(status.st_size));
  if (::read(file, bytes.data(), bytes.size()) != status.st_size) giveUp("read");
  ::close(file);
  return bytes;
}

void writeFile(const std::string& path, const char* bytes, std::uint32_t size) {
  const int file = ::open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600);
  if (file < 0 || ::write(file, bytes, size) != static_cast<ssize_t>(size)) giveUp("write");
  if (::fsync(file) != 0) giveUp("fsync");
  ::close(file);
}

void syncDirectory(const std::string& path) {
  const int directory = ::open(path.substr(0, path.rfind('/')).c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  if (directory < 0 || ::fsync(directory) != 0) giveUp("fsync");
  ::close(directory);
}

Tree parsed(const char* bytes, std::uint32_t size) {
  plist_t tree = nullptr;
  plist_from_bin(bytes, size, &tree);
  if (tree == nullptr) giveUp("parse");
  return Tree{tree};
}

Memory iteratorOver(plist_t from, void (*make)(plist_t, void**)) {
  void* iterator = nullptr;
  make(from, &iterator);
  return Memory{iterator};
}

plist_t built(plist_t from);

plist_t builtDictionary(plist_t from) {
  const plist_t dictionary = plist_new_dict();
  const Memory iterator = iteratorOver(from, &plist_dict_new_iter);
  while (true) {
    char* key = nullptr;
    plist_t item = nullptr;
    plist_dict_next_item(from, iterator.get(), &key, &item);
    if (item == nullptr) return dictionary;
    plist_dict_set_item(dictionary, key, built(item));
    std::free(key);
  }
}

plist_t builtArray(plist_t from) {
  const plist_t array = plist_new_array();
  const Memory iterator = iteratorOver(from, &plist_array_new_iter);
  while (true) {
    plist_t item = nullptr;
    plist_array_next_item(from, iterator.get(), &item);
    if (item == nullptr) return array;
    plist_array_append_item(array, built(item));
  }
}

plist_t builtData(plist_t from) {
  std::uint64_t size = 0;
  const char* const bytes = plist_get_data_ptr(from, &size);
  return plist_new_data(bytes, size);
}

// The tree of a program that has the values and wants to write them; other kinds the library copies as cheaply.
plist_t built(plist_t from) {
  switch (plist_get_node_type(from)) {
    case PLIST_DICT: return builtDictionary(from);
    case PLIST_ARRAY: return builtArray(from);
    case PLIST_STRING: return plist_new_string(plist_get_string_ptr(from, nullptr));
    case PLIST_DATA: return builtData(from);
    default: return plist_copy(from);
  }
}

void save(const Tree& values, const std::string& path) {
  char* bytes = nullptr;
  std::uint32_t size = 0;
  plist_to_bin(Tree{built(values.get())}.get(), &bytes, &size);
  if (bytes == nullptr) giveUp("serialise");
  if (plist_get_node_type(parsed(bytes, size).get()) != PLIST_DICT) giveUp("read back");
  const std::string temporary = path + ".new";
  writeFile(temporary, bytes, size);
  plist_to_bin_free(bytes);
  if (std::rename(temporary.c_str(), path.c_str()) != 0) giveUp("rename");
  syncDirectory(path);
}

}  // namespace

int main(int count, char** arguments) {
  if (count < 3) return 2;
  const std::string path = arguments[1];
  bench::setSyncing(count > 3 && std::string_view{arguments[3]} == "sync");
  const bench::Measurement measurement;
  {
    const Bytes bytes = readFile(path);
    const Tree values = parsed(bytes.data(), static_cast<std::uint32_t>(bytes.size()));
    for (int saves = std::atoi(arguments[2]); saves > 0; --saves) save(values, path);
  }
  measurement.print();
}
