#pragma once

#include <filesystem>
#include <optional>

#include "platform/linux/files/path_resolution.h"

namespace platform {

// Makes the directory and those above it that are missing; the directory itself gets exactly the permission bits if it
// is made here, those above it mode 0755; their entries are on stable storage when it succeeds. Answers the directory
// if it was made here, opened where its bits allow that; a descriptor that is not open where it was there already and
// stays as it is; nothing, with errno set, where it fails. What was made until then is removed again.
[[nodiscard]] std::optional<Descriptor> makeDirectories(const PathResolver& paths, const std::filesystem::path& path,
                                                        unsigned permissions);

// Removes what stands at the place: a directory with all below it, anything else as itself, links unfollowed. Takes two
// descriptors and no stack, however deep the tree is. A directory that somebody moves away meanwhile is left (EAGAIN),
// and so is another volume that is mounted in it (EXDEV). Answers false, with errno set, where something remains.
[[nodiscard]] bool removeTree(const Place& place);

}  // namespace platform
