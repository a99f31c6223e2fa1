#pragma once

#include "host/options.h"
#include "host/run.h"

namespace host {

// Rehearses device after device, as they are asked for on standard input, until that ends: each in a child of this
// process, which has loaded the plug-in, with what `--root DIR --dry-run --explain=json` and the options of this call
// make of it. docs/FLEET.md describes requests and answers. Throws commandline::Ending where the plug-in cannot be
// loaded, for what is no request, and where no child can be made.
[[nodiscard]] ExitStatus serveRehearsals(const Options& given);

}  // namespace host
