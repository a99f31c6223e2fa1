#pragma once

#include <memory>

#include "host/trace.h"
#include "platform/platform.h"

namespace host {

// Puts the trace in front of the platform's two logs and two notices: each event is traced, then passed on.
void traceServices(platform::Platform& platform, const std::shared_ptr<Trace>& trace);

}  // namespace host
