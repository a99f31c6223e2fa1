// What the host reads from its command line, and what it writes into its trace: options that are taken say the same
// when they are written out and read again; a trace is one JSON object a line and gives every event back.
#include <unistd.h>

#include <fstream>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "commandline/ending.h"
#include "fuzz/input.h"
#include "fuzz/require.h"
#include "host/options.h"
#include "host/trace.h"
#include "platform/text.h"
#include "tests/support/scratch_directory.h"

namespace {

using fuzz::Input;
using fuzz::require;
using Json = nlohmann::json;

constexpr std::string_view kWords[] = {"--root",
                                       "--home",
                                       "--shared-resources",
                                       "--resources",
                                       "--plugin",
                                       "--trace",
                                       "--help",
                                       "--version",
                                       "--",
                                       "-",
                                       "=",
                                       "--root=",
                                       "/",
                                       "here",
                                       "--trace=x",
                                       "--snapshots",
                                       "--keep",
                                       "--explain",
                                       "--explain=json",
                                       "--dry-run",
                                       "3",
                                       "--list-snapshots",
                                       "--restore",
                                       "--home=/",
                                       "",
                                       "/nowhere"};

std::variant<host::Options, host::Answer> parsed(const std::vector<std::string>& arguments) {
  std::vector<const char*> pointers;
  for (const std::string& argument : arguments) pointers.push_back(argument.c_str());
  return host::parseArguments(pointers);
}

using Place = std::optional<std::filesystem::path>;

std::vector<std::pair<std::string, Place>> placesOf(const host::Options& options) {
  return {{"--root", options.device.systemRoot},
          {"--home", options.device.home},
          {"--shared-resources", options.device.sharedResources},
          {"--resources", options.device.resources},
          {"--plugin", options.plugin},
          {"--trace", options.trace},
          {"--snapshots", options.snapshots.directory}};
}

void checkOptions(const std::vector<std::string>& arguments) {
  std::variant<host::Options, host::Answer> read;
  try {
    read = parsed(arguments);
  } catch (const commandline::WrongUse&) {
    return;
  }
  if (const auto* const answer = std::get_if<host::Answer>(&read)) {
    require(!answer->text.empty(), "an answer that says nothing");
    return;
  }
  std::vector<std::string> written;
  const auto& options = std::get<host::Options>(read);
  for (const auto& [name, place] : placesOf(options)) {
    require(!place || place->is_absolute(), name + " is no whole path");
    if (place) written.push_back(name + "=" + place->string());
  }
  const auto again = parsed(written);
  require(std::holds_alternative<host::Options>(again), "options that are not taken again");
  require(placesOf(std::get<host::Options>(again)) == placesOf(options), "other options");
}

std::vector<std::string> linesOf(const std::filesystem::path& path) {
  std::ifstream file{path};
  std::vector<std::string> lines;
  for (std::string line; std::getline(file, line);) lines.push_back(line);
  return lines;
}

// Well-formed text comes back as it is; anything else at least as JSON.
void checkText(const Json& event, const char* member, const std::string& text) {
  const bool isWellFormed = platform::isWellFormedText(text) || text.empty();
  require(!isWellFormed || event.at(member) == text, "the trace has another text");
  require(event.at(member).is_string(), "no text");
}

void checkTrace(const std::string& first, const std::string& second, bool flag) {
  static const tests::ScratchDirectory scratch;
  const std::filesystem::path path = scratch.path() / "trace";
  ::unlink(path.c_str());
  {
    const auto trace = host::Trace::open(path).take();
    trace->console(first);
    trace->log("s", second, [&] { return first; });
    trace->preferencesChanged(first, second);
    trace->cloudTabs(flag);
    trace->result(second, flag, {});
    require(trace->outcome().isOk(), "an incomplete trace");
  }
  const auto lines = linesOf(path);
  require(lines.size() == 5, "not one line an event");
  std::vector<Json> events;
  for (const std::string& line : lines) events.push_back(Json::parse(line));
  checkText(events[0], "message", first);
  checkText(events[1], "message", first);
  checkText(events[1], "category", second);
  checkText(events[2], "domain", first);
  checkText(events[2], "key", second);
  require(events[3].at("enabled") == flag && events[4].at("success") == flag, "another answer");
  checkText(events[4], "dataClass", second);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  Input input{data, size};
  if (input.yes()) {
    const bool flag = input.yes();
    const std::string first = input.bytes(40);
    checkTrace(first, input.rest(), flag);
    return 0;
  }
  std::vector<std::string> arguments;
  for (std::size_t count = input.below(10); count > 0; --count) {
    std::string argument{input.oneOf(kWords)};
    if (input.yes()) argument += input.bytes(12);
    arguments.emplace_back(argument.c_str());  // as a command line has it: up to the first NUL
  }
  checkOptions(arguments);
  return 0;
}
