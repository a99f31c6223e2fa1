#include "host/snapshots/listing.h"

#include <nlohmann/json.hpp>

#include "commandline/table.h"
#include "host/snapshots/run_journal.h"
#include "host/snapshots/snapshot_directory.h"
#include "host/snapshots/snapshot_store.h"

namespace host::snapshots {
namespace {

using Json = nlohmann::ordered_json;
using commandline::Row;

constexpr int kSchema = 1;

struct Entry {
  std::string id;
  std::optional<Manifest> manifest = std::nullopt;  // nothing where it is damaged
  bool isRunning = false;
  std::vector<Path> damage = {};  // the files whose copies are damaged
};

std::vector<Entry> entriesIn(const Storage& storage, const Path& directory) {
  static_cast<void>(requireOwnDirectory(storage, directory, Missing::isRefused));
  const SnapshotStore store{storage, directory};
  const auto mark = RunJournal{storage, directory}.read();
  std::vector<Entry> entries;
  for (const std::string& id : store.identifiers()) {
    Entry entry{.id = id, .manifest = store.undamagedManifest(id), .isRunning = mark && id == mark->snapshot};
    if (entry.manifest) entry.damage = store.damageOf(*entry.manifest);
    entries.push_back(std::move(entry));
  }
  return entries;
}

std::string stateOf(const Entry& entry) {
  if (!entry.manifest || !entry.damage.empty()) return "damaged";
  if (entry.manifest->outcome) return "finished";
  return entry.isRunning ? "running" : "unfinished";
}

Row rowOf(const Entry& entry) {
  if (!entry.manifest) return {entry.id, "-", "-", "-", stateOf(entry), "-"};
  const Manifest& manifest = *entry.manifest;
  std::string files;
  for (const KeptFile& file : manifest.files) {
    if (file.isPresent()) files += (files.empty() ? "" : " ") + file.path.filename().string();
  }
  const std::string state = stateOf(entry) == "finished" ? *manifest.outcome : stateOf(entry);
  return {entry.id,
          manifest.taken,
          manifest.reason,
          manifest.dataVersion ? std::to_string(*manifest.dataVersion) : "-",
          state + (manifest.isKept() ? ", kept" : ""),
          files.empty() ? "none" : files};
}

}  // namespace

std::string listingForPeople(const Storage& storage, const Path& directory) {
  const std::vector<Entry> entries = entriesIn(storage, directory);
  if (entries.empty()) return "no snapshots in " + directory.string() + "\n";
  std::vector<Row> rows{{"Snapshot", "Taken", "Before", "Version", "State", "Files"}};
  for (const Entry& entry : entries) rows.push_back(rowOf(entry));
  std::string text = commandline::table(rows);
  // What the table has no room for.
  for (const Entry& entry : entries) {
    for (const Path& path : entry.damage) text += entry.id + " has a damaged copy of " + path.string() + '\n';
    if (!entry.manifest) continue;
    for (const std::string& reason : entry.manifest->keptFor) text += entry.id + " is kept: " + reason + '\n';
  }
  return text;
}

std::string listingAsJson(const Storage& storage, const Path& directory) {
  Json list = Json::array();
  for (const Entry& entry : entriesIn(storage, directory)) {
    Json json = entry.manifest ? Json::parse(textOf(*entry.manifest)).at("manifest") : Json{{"id", entry.id}};
    json["state"] = stateOf(entry);
    json["damage"] = Json::array();
    for (const Path& path : entry.damage) json["damage"].push_back(path.native());
    list.push_back(std::move(json));
  }
  return Json{{"schema", kSchema}, {"snapshots", std::move(list)}}.dump(2) + '\n';
}

}  // namespace host::snapshots
