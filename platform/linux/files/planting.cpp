#include "platform/linux/files/planting.h"

#include <unistd.h>

namespace platform {
namespace {

void add(uid_t user, Planters& planters) {
  if (isOurs(user) || planters.user == user) return;
  if (planters.user) planters.mayBeAnybody = true;
  planters.user = user;
}

}  // namespace

bool isOurs(uid_t user) { return user == 0 || user == ::geteuid(); }

bool isClosed(const struct stat& directory) { return (directory.st_mode & (S_IWGRP | S_IWOTH)) == 0; }

Planters plantersOf(const struct stat& thing, const struct stat& directory) {
  constexpr Planters kAnybody{.mayBeAnybody = true};
  const bool isSticky = (directory.st_mode & S_ISVTX) != 0;
  const bool hasSecondName = !S_ISDIR(thing.st_mode) && thing.st_nlink > 1;
  if (!isClosed(directory) && (!isSticky || hasSecondName)) return kAnybody;
  Planters planters;
  add(directory.st_uid, planters);
  if (S_ISLNK(thing.st_mode)) add(thing.st_uid, planters);
  return planters.mayBeAnybody ? kAnybody : planters;
}

bool isReadableFor(uid_t user, const struct stat& file) { return file.st_uid == user || (file.st_mode & S_IROTH) != 0; }

bool mayBeRead(const struct stat& file, const struct stat& directory) {
  if (file.st_nlink < 2) return true;
  const Planters planters = plantersOf(file, directory);
  if (planters.mayBeAnybody) return false;
  return !planters.user || isReadableFor(*planters.user, file);
}

}  // namespace platform
