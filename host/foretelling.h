#pragma once

#include <string>
#include <vector>

#include "host/options.h"

namespace host {

// Rehearses the run that the options ask for in a child of this process, which has loaded the plug-in, before the run
// begins; waits first for whoever holds the migration lock, which may be empty. Answers what speaks against the run, a
// line each: an account that would be lost, accounts that would not be saved, a rehearsal that broke; and says it.
// Empty where nothing does, and where the run will be refused and say so itself. Throws commandline::Ending where the
// options let nothing be lost and something would be, and where the lock cannot be had.
[[nodiscard]] std::vector<std::string> foretell(const Options& options, const std::string& lockName);

}  // namespace host
