#include "host/snapshots/run_journal.h"

#include <cerrno>
#include <nlohmann/json.hpp>

#include "host/snapshots/problem.h"

namespace host::snapshots {
namespace {

using Json = nlohmann::ordered_json;

constexpr std::size_t kMaxSize = std::size_t{1} << 26U;

std::string lineOf(const Json& json) {
  try {
    return json.dump() + '\n';
  } catch (const Json::exception& thrown) {
    fail(std::string{"the mark cannot be written: "} + thrown.what());
  }
}

// A line that was being added when the power went may be there in part. What it was to note had not begun, so it is
// left out; a head is never in part.
RunMark markFrom(const std::string& text) {
  RunMark mark;
  std::size_t start = 0;
  for (std::size_t end = 0; (end = text.find('\n', start)) != std::string::npos; start = end + 1) {
    const bool mayBeInPart = start > 0 && end + 1 == text.size();
    const Json line = Json::parse(text.substr(start, end - start), nullptr, !mayBeInPart);
    if (line.is_discarded()) break;
    if (start == 0) {
      mark.snapshot = line.at("snapshot");
      if (line.contains("restores")) mark.restores = line.at("restores").get<std::string>();
    } else if (line.contains("edited")) {
      mark.edited.insert(line.at("edited").get<std::string>());
    } else {
      const Path path = line.at("path").get<std::string>();
      mark.left[path].insert(line.at("state"));
      if (line.contains("made")) mark.made.insert(path);
    }
  }
  if (start == 0) fail("it is empty");
  return mark;
}

}  // namespace

void RunJournal::begin(const std::string& snapshot, const std::optional<std::string>& restores) const {
  Json head{{"snapshot", snapshot}};
  if (restores) head["restores"] = *restores;
  const std::string line = lineOf(head);
  require(_storage.files->replace(_mark, bytesOf(line)));
}

void RunJournal::append(const std::string& line) const { require(_storage.keeper->append(_mark, bytesOf(line))); }

void RunJournal::noteChange(const Path& path, const std::string& contents, bool isMadeNew) const {
  Json entry{{"path", path.native()}, {"state", contents}};
  if (isMadeNew) entry["made"] = true;
  append(lineOf(entry));
}

void RunJournal::noteEdit(const Path& path) const { append(lineOf({{"edited", path.native()}})); }

std::optional<RunMark> RunJournal::read() const {
  const platform::Result<platform::Bytes> bytes = _storage.files->read(_mark, kMaxSize);
  if (bytes.status().errorNumber() == ENOENT) return std::nullopt;
  require(bytes.status());
  try {
    return markFrom(textIn(bytes.value()));
  } catch (const std::exception& thrown) {
    fail("the mark " + _mark.string() + " is damaged: " + thrown.what());
  }
}

void RunJournal::clear() const { require(_storage.files->remove(_mark)); }

}  // namespace host::snapshots
