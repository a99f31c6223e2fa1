#pragma once

#include <string>
#include <string_view>

#include "platform/linux/linux_platform.h"
#include "tests/support/scratch_directory.h"

namespace tests {

// A device whose files lie in a directory of the test's own, with the services it really has.
class RealDevice {
 public:
  ScratchDirectory root;
  platform::Platform services = platform::makeLinuxPlatform({.systemRoot = root.path()});

  // Writes an XML property list: a dictionary with these entries.
  void put(std::string_view file, std::string_view entries) const { root.put(file, xml(entries)); }

  [[nodiscard]] static std::string xml(std::string_view entries) {
    return "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<plist version=\"1.0\"><dict>" + std::string{entries} +
           "</dict></plist>\n";
  }
};

}  // namespace tests
