#include "migrator/told_removal.h"

#include "records/fact_observer.h"

namespace migrator {

using platform::Path;
using platform::Status;
using records::RunFact;

Status removeAndTell(const Path& path, RunFact::Kind kind) {
  Status status = platform::current().files->remove(path);
  if (status.isOk()) {
    records::tellFact([&] { return RunFact{.kind = kind, .path = path.string()}; });
  }
  return status;
}

void tellUnremoved(const Path& path, const Status& status) {
  records::tellFact([&] {
    return RunFact{.kind = RunFact::Kind::fileUnremoved, .reason = status.description(), .path = path.string()};
  });
}

}  // namespace migrator
