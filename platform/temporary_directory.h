#pragma once

#include "platform/export.h"
#include "platform/platform.h"

namespace platform {

// Keeps the process's default temporary directory on the volume of the device's settings, so that a finished temporary
// file can be moved onto a settings file in one step: where TMPDIR is not set, it becomes ROOT/var/mobile/tmp, made
// when missing (mode 0700, owned by `mobile`). Every program that saves calls this at its start, before it starts
// threads. A directory that cannot be made is no error here; the save then says what went wrong.
ACCOUNT_EXPORT void keepTemporaryDirectoryOnDeviceVolume(const Platform& platform);

}  // namespace platform
