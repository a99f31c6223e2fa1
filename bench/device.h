#pragma once

#include <cstddef>
#include <filesystem>
#include <memory>

#include "bench/account_generator.h"
#include "platform/platform.h"

namespace bench {

// A device's file tree below an existing directory: what a run needs of it, and a settings file of the population,
// written by the product's own writer. The mobile user is the caller.
void makeDevice(const std::filesystem::path& root, const Population& population);

// A log that somebody reads but that only counts, so that no text is made.
class CountingLog final : public platform::SystemLog {
 public:
  [[nodiscard]] bool hasReaders() const override { return true; }
  void write(const platform::LogRecord& /*record*/) override { ++lines; }
  std::size_t lines = 0;
};

// The services of that device as they are, except that the log only counts and that nobody is told of changes.
[[nodiscard]] platform::Platform servicesOf(const std::filesystem::path& root);

// How often the settings file is read and replaced, and how often it then holds other values than before. Counting is
// itself work: a process that counts is not measured.
struct FileCounts {
  int reads = 0;
  int saves = 0;
  int changes = 0;
};
[[nodiscard]] std::shared_ptr<const FileCounts> countFileUse(platform::Platform& services);

}  // namespace bench
