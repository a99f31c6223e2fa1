#include "host/snapshot_steps.h"

#include <cstdio>
#include <utility>

#include "commandline/text.h"
#include "host/say.h"
#include "host/snapshots/listing.h"
#include "platform/linux/files/linux_file_keeper.h"

namespace host {
namespace {

using Listing = SnapshotOptions::Listing;
using snapshots::Missing;

snapshots::UndoPlace placeFor(const SnapshotOptions& options) {
  return {.services = platform::current(),
          .keeper = platform::makeFileKeeper(*platform::current().directories),
          .directory = *options.directory,
          .release = HOST_VERSION,
          .warn = [](const std::string& line) { say(line); }};
}

void list(const SnapshotOptions& options) {
  const snapshots::Storage storage{platform::current().files,
                                   platform::makeFileKeeper(*platform::current().directories)};
  const std::string text = options.listing == Listing::json
                               ? listingAsJson(storage, *options.directory)
                               : commandline::printableLines(listingForPeople(storage, *options.directory));
  static_cast<void>(commandline::print(text));
}

void restore(const SnapshotOptions& options) {
  snapshots::Undo undo{placeFor(options), Missing::isRefused};
  const std::string before = undo.restore(*options.restore);
  std::printf("restored snapshot %s; the state before it is snapshot %s\n", options.restore->c_str(), before.c_str());
}

}  // namespace

std::unique_ptr<snapshots::Undo> beginUndoableRun(const SnapshotOptions& options,
                                                  const platform::DataClassMigrator& migrator) {
  if (!options.directory) return nullptr;
  auto undo = std::make_unique<snapshots::Undo>(placeFor(options), Missing::isMade);
  platform::Platform watched = platform::current();
  watched.files = undo->begin(migrator.footprint());
  platform::setCurrent(std::move(watched));
  return undo;
}

bool isForSnapshots(const SnapshotOptions& options) { return options.restore || options.listing != Listing::none; }

ExitStatus workOnSnapshots(const SnapshotOptions& options) {
  if (options.restore) {
    restore(options);
  } else {
    list(options);
  }
  return ExitStatus::migrated;
}

}  // namespace host
