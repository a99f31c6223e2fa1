#pragma once

#include "platform/file_system.h"
#include "records/fact.h"

namespace migrator {

// Removes what stands at the path and tells the run's observer that it is gone. That it is still there is for the
// caller to tell, who knows whether it matters.
platform::Status removeAndTell(const platform::Path& path,
                               records::RunFact::Kind kind = records::RunFact::Kind::fileRemoved);

// Tells the run's observer that what was to go is still there.
void tellUnremoved(const platform::Path& path, const platform::Status& status);

}  // namespace migrator
