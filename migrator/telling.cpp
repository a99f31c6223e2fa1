#include "migrator/telling.h"

#include "records/fact_observer.h"

namespace migrator {

using platform::Path;
using platform::Status;

Status removeAndTell(const Path& path, Removal removal) {
  Status status = platform::current().files->remove(path);
  if (status.isOk()) {
    records::tellFact([&] { return records::FileRemoved{path.string(), removal == Removal::ofSource}; });
  }
  return status;
}

void tellNotRemoved(const Path& path, const Status& status) {
  records::tellFact([&] { return records::FileNotRemoved{path.string(), status.description()}; });
}

void tellFailedStep(std::string_view name, const std::string& words) {
  records::tellFact(
      [&] { return records::Lost{.code = records::LossCode::failedStep, .detail = std::string{name} + " " + words}; });
}

}  // namespace migrator
