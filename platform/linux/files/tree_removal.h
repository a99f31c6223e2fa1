#pragma once

#include "platform/linux/files/file_access.h"

namespace platform {

// Removes what stands at the place: a directory with all below it, anything else as itself, links unfollowed. Takes two
// descriptors and no stack, however deep the tree is. A directory that somebody moves away meanwhile is left (EAGAIN),
// and so is another volume that is mounted in it (EXDEV). Answers false, with errno set, where something remains.
[[nodiscard]] bool removeTree(const Place& place);

// Whether the directory, opened for reading, has no entries.
[[nodiscard]] bool isEmpty(const Descriptor& directory);

}  // namespace platform
