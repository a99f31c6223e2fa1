#include "host/snapshot_steps.h"

#include <cstdio>
#include <utility>

#include "commandline/progress_line.h"
#include "commandline/text.h"
#include "host/explanation_page.h"
#include "host/keeping_files.h"
#include "host/rehearsal.h"
#include "host/say.h"
#include "host/snapshots/listing.h"
#include "host/snapshots/problem.h"
#include "platform/linux/files/file_services.h"

namespace host {
namespace {

using Listing = SnapshotOptions::Listing;
using platform::Path;
using snapshots::Missing;
using snapshots::SnapshotSession;

snapshots::Storage storage() {
  return {platform::current().files, platform::makeFileKeeper(*platform::current().directories)};
}

snapshots::SessionPlace placeFor(const Options& options, platform::MigrationFootprint footprint) {
  const Path& directory = *options.snapshots.directory;
  return {.services = platform::current(),
          .keeper = storageFor(options).keeper,
          .locks = platform::makeFileLocks({.directory = directory,
                                            .manner = options.device.locks,
                                            .say = [](std::string_view line) { say(std::string{line}); }}),
          .directory = directory,
          .footprint = std::move(footprint),
          .release = HOST_VERSION,
          .warn = [](const std::string& line) { say(line); },
          .putAside = [isRehearsal = options.isRehearsal](
                          const snapshots::Storage& of, const platform::MigrationFile& file,
                          const std::string& why) { return putAside(of, file, why, isRehearsal); },
          .progressed =
              [](const char* what, double share, double upTo) {
                commandline::progressLine().show({what, share, upTo});
              }};
}

std::string explanationOf(const SnapshotOptions& options, Explain explain) {
  static_cast<void>(requireOwnDirectory(storage(), *options.directory, Missing::isRefused));
  const snapshots::SnapshotStore store{storage(), *options.directory};
  const std::string id = store.identifierMeantBy(*options.explained);
  const auto text =
      store.record(id, explain == Explain::text ? snapshots::kExplanation : snapshots::kExplanationAsJson);
  if (!text) snapshots::failWrongUse("snapshot " + id + " has no explanation");
  switch (explain) {
    case Explain::json: return *text;
    case Explain::html: return pageOf(*text, {});
    default: return commandline::printableLines(*text);
  }
}

}  // namespace

snapshots::Storage storageFor(const Options& options) {
  snapshots::Storage of = storage();
  if (options.isRehearsal) of.keeper = makeRehearsalKeeper(std::move(of.keeper), of.files);
  return of;
}

std::unique_ptr<SnapshotSession> beginRunWithSnapshots(const Options& options,
                                                       const platform::DataClassMigrator& migrator) {
  if (!options.snapshots.directory) return nullptr;
  snapshots::SessionPlace place = placeFor(options, migrator.footprint());
  if (options.isRehearsal) {
    SnapshotSession{std::move(place), Missing::isAccepted}.rehearse();
    return nullptr;
  }
  auto session = std::make_unique<SnapshotSession>(std::move(place), Missing::isMade);
  platform::Platform watched = platform::current();
  watched.files = session->begin();
  platform::setCurrent(std::move(watched));
  return session;
}

bool isRunNeeded(const SnapshotOptions& options, const platform::DataClassMigrator& migrator) {
  return snapshots::isRunNeeded(storage(), *options.directory, platform::current(), migrator.footprint(), HOST_VERSION);
}

bool isToBePrinted(const SnapshotOptions& options) { return options.explained || options.listing != Listing::none; }

bool printFromSnapshots(const SnapshotOptions& options, Explain explain) {
  const std::string text = options.explained ? explanationOf(options, explain)
                           : options.listing == Listing::json
                               ? listingAsJson(storage(), *options.directory)
                               : commandline::printableLines(listingForPeople(storage(), *options.directory));
  if (commandline::print(text)) return true;
  say("what is asked for could not be written to standard output");
  return false;
}

bool isToBeChanged(const SnapshotOptions& options) { return options.restore || options.isUndo || options.release; }

void changeBySnapshots(const Options& options, const platform::DataClassMigrator& migrator) {
  const SnapshotOptions& asked = options.snapshots;
  SnapshotSession session{placeFor(options, migrator.footprint()), Missing::isRefused};
  const std::string id = session.identifierMeantBy(asked.release ? asked.release : asked.restore);
  if (asked.release) {
    session.release(id);
    std::printf("snapshot %s is kept no longer than the others\n", id.c_str());
  } else {
    const std::string before = session.restore(id);
    commandline::progressLine().end();
    std::printf("restored snapshot %s; the state before it is snapshot %s\n", id.c_str(), before.c_str());
  }
}

}  // namespace host
