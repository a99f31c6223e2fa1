#include "migrator/told_removal.h"

#include "platform/run_stage.h"

namespace migrator {

using platform::Path;
using platform::RunFact;
using platform::Status;

Status removeAndTell(const Path& path, RunFact::Kind kind) {
  Status status = platform::current().files->remove(path);
  if (status.isOk()) {
    platform::tellFact([&] { return RunFact{.kind = kind, .path = path.string()}; });
  }
  return status;
}

void tellUnremoved(const Path& path, const Status& status) {
  platform::tellFact([&] {
    return RunFact{.kind = RunFact::Kind::fileUnremoved, .reason = status.description(), .path = path.string()};
  });
}

}  // namespace migrator
