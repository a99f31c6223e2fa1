#include "tests/modules/sample_journal.h"

namespace samples {

std::vector<std::string>& journal() {
  static std::vector<std::string> entries;
  return entries;
}

}  // namespace samples
