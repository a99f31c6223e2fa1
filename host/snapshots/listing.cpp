#include "host/snapshots/listing.h"

#include <algorithm>
#include <array>
#include <nlohmann/json.hpp>

#include "host/snapshots/run_journal.h"
#include "host/snapshots/snapshot_directory.h"
#include "host/snapshots/snapshot_store.h"

namespace host::snapshots {
namespace {

using Json = nlohmann::ordered_json;
using Row = std::array<std::string, 6>;

constexpr int kSchema = 1;

struct Entry {
  std::string id;
  std::optional<Manifest> manifest = std::nullopt;  // nothing where it is damaged
  bool isRunning = false;
  std::vector<Path> damage = {};  // the files whose copies are damaged
};

std::string markedSnapshot(const Storage& storage, const Path& directory) {
  const auto mark = RunJournal{storage, directory}.read();
  return mark ? mark->snapshot : std::string{};
}

std::vector<Entry> entriesIn(const Storage& storage, const Path& directory) {
  static_cast<void>(requireOwnDirectory(storage, directory, Missing::isRefused));
  const SnapshotStore store{storage, directory};
  const std::string marked = markedSnapshot(storage, directory);
  std::vector<Entry> entries;
  for (const std::string& id : store.identifiers()) {
    Entry entry{.id = id, .manifest = store.undamagedManifest(id), .isRunning = id == marked};
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

std::string filesIn(const Manifest& manifest) {
  std::string text;
  for (const KeptFile& file : manifest.files) {
    if (file.isPresent()) text += (text.empty() ? "" : " ") + file.path.filename().string();
  }
  return text.empty() ? "none" : text;
}

Row rowOf(const Entry& entry) {
  if (!entry.manifest) return {entry.id, "-", "-", "-", stateOf(entry), "-"};
  const Manifest& manifest = *entry.manifest;
  const std::string state = stateOf(entry) == "finished" ? *manifest.outcome : stateOf(entry);
  return {entry.id,
          manifest.taken,
          manifest.reason,
          manifest.dataVersion ? std::to_string(*manifest.dataVersion) : "-",
          state + (manifest.isKept() ? ", kept" : ""),
          filesIn(manifest)};
}

std::string lineOf(const Row& row, const std::array<std::size_t, 6>& widths) {
  std::string line;
  for (std::size_t column = 0; column < row.size(); ++column) {
    line += row[column];
    if (column + 1 < row.size()) line.append(widths[column] - row[column].size() + 2, ' ');
  }
  return line + '\n';
}

std::string tableOf(const std::vector<Row>& rows) {
  std::array<std::size_t, 6> widths{};
  for (const Row& row : rows) {
    for (std::size_t column = 0; column < row.size(); ++column) {
      widths[column] = std::max(widths[column], row[column].size());
    }
  }
  std::string table;
  for (const Row& row : rows) table += lineOf(row, widths);
  return table;
}

Json jsonOf(const Entry& entry) {
  Json json = entry.manifest ? Json::parse(textOf(*entry.manifest)).at("manifest") : Json{{"id", entry.id}};
  json["state"] = stateOf(entry);
  json["damage"] = Json::array();
  for (const Path& path : entry.damage) json["damage"].push_back(path.native());
  return json;
}

// What the table has no room for.
std::string remarksOn(const Entry& entry) {
  std::string text;
  for (const Path& path : entry.damage) text += entry.id + " has a damaged copy of " + path.string() + '\n';
  if (!entry.manifest) return text;
  for (const std::string& reason : entry.manifest->keptFor) text += entry.id + " is kept: " + reason + '\n';
  return text;
}

}  // namespace

std::string listingForPeople(const Storage& storage, const Path& directory) {
  const std::vector<Entry> entries = entriesIn(storage, directory);
  if (entries.empty()) return "no snapshots in " + directory.string() + "\n";
  std::vector<Row> rows{{"Snapshot", "Taken", "Before", "Version", "State", "Files"}};
  for (const Entry& entry : entries) rows.push_back(rowOf(entry));
  std::string text = tableOf(rows);
  for (const Entry& entry : entries) text += remarksOn(entry);
  return text;
}

std::string listingAsJson(const Storage& storage, const Path& directory) {
  Json list = Json::array();
  for (const Entry& entry : entriesIn(storage, directory)) list.push_back(jsonOf(entry));
  return Json{{"schema", kSchema}, {"snapshots", std::move(list)}}.dump(2) + '\n';
}

}  // namespace host::snapshots
