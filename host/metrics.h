#pragma once

#include <filesystem>
#include <string>

#include "host/explanation.h"
#include "host/verdict.h"
#include "platform/base_directories.h"
#include "platform/status.h"

namespace host {

// A run in numbers, as OpenMetrics text for whoever watches a fleet: verdict, counts, losses by code, duration. No
// account is named. `endTime` in seconds since the epoch.
[[nodiscard]] std::string metricsOf(const Explanation& explanation, const Verdict& verdict, const ExplainedRun& run,
                                    double endTime);

// Puts the text in the file's place in one step, readable by everybody. On failure the file is as it was.
[[nodiscard]] platform::Status writeMetrics(const std::filesystem::path& file, const std::string& text,
                                            const platform::BaseDirectories& directories);

}  // namespace host
