#pragma once

#include <sys/stat.h>

#include <optional>

namespace platform {

// Which links are followed, and which files with a second name are read: the one rule, over plain data.
//
// A run may be root in directories that belong to others. Who writes in a directory can put a link there, or a second
// name of a file, and have root read or write for him what is not his. So it is asked who, beside root and the
// process's user (who both need nobody's help), can have planted what stands at a name:
// - in a directory in which only its owner writes: its owner, who may also have moved there what somebody else made;
// - in a sticky directory in which others write: its owner too, but of a second name anybody, whoever's the file is;
// - in any other directory in which its group or others write: anybody;
// - of a link, also who made it, since he chose where it leads.
//
// What nobody can have planted is followed and read wherever it leads. What one user can have planted is followed and
// read as far as it gives him nothing: to what he owns, and to a regular file that everybody may read, through
// directories that he owns or everybody may pass; below a link to a directory, that must be his own. What more than one
// user can have planted is refused: a link with ELOOP, a second name with EMLINK.
//
// So a backup tool's second name of a file in its own owner's directory, or in root's, does not keep the file from
// being read; root's link in a user's directory to that user's files is followed; and neither a link nor a second name
// makes root read /etc/shadow for the user who planted it.

// Root and the process's user.
[[nodiscard]] bool isOurs(uid_t user);

// Whether its group and others are kept from writing in the directory. A sticky one is not closed.
[[nodiscard]] bool isClosed(const struct stat& directory);

// Who, beside root and the process's user, can have planted something.
struct Planters {
  bool mayBeAnybody = false;
  std::optional<uid_t> user = std::nullopt;  // else only this one; nobody where there is none

  bool operator==(const Planters&) const = default;
};

// Of what stands at a name in the directory.
[[nodiscard]] Planters plantersOf(const struct stat& thing, const struct stat& directory);

// Whether the user gains nothing when the regular file is read for him.
[[nodiscard]] bool isReadableFor(uid_t user, const struct stat& file);

// Whether a regular file may be read by its name in the directory.
[[nodiscard]] bool mayBeRead(const struct stat& file, const struct stat& directory);

}  // namespace platform
