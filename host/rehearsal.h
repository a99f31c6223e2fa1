#pragma once

#include "platform/file_keeper.h"
#include "platform/platform.h"

namespace host {

// Makes the platform one on which a run changes nothing of the device: files are read as they are and written to
// memory, signals and the journal hear nothing, the console speaks. Locks are the platform's own, which it shares as
// its options say. What modules do by themselves, without the platform's services, is not held back.
void rehearseOn(platform::Platform& platform);

// The programs that run on this machine hear nothing of what is done on this platform.
void silenceNotices(platform::Platform& platform);

// What this platform opens from now on stays open for all platforms that are made to rehearse after it, and is not
// looked at again for them.
void keepModules(platform::Platform& platform);

// Reads the product's own property lists, which are in the platform's resources and the same for every device, once for
// all platforms that are made to rehearse from now on. Whoever replaces one of them is not heeded then.
void keepResources(const platform::Platform& platform);

// Looks at the device through `inner`, and changes nothing but the rehearsed files. What it restored is as it was
// restored.
[[nodiscard]] std::shared_ptr<platform::FileKeeper> makeRehearsalKeeper(std::shared_ptr<platform::FileKeeper> inner,
                                                                        std::shared_ptr<platform::FileSystem> files);

}  // namespace host
