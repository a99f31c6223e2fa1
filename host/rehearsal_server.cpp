#include "host/rehearsal_server.h"

#include <unistd.h>

#include <array>
#include <iostream>
#include <nlohmann/json.hpp>
#include <string>
#include <utility>

#include "commandline/ending.h"
#include "commandline/program.h"
#include "host/forked_run.h"
#include "host/plugin.h"
#include "host/rehearsal.h"
#include "host/say.h"

namespace host {
namespace {

using commandline::Ending;
using Json = nlohmann::ordered_json;

constexpr int kProtocol = 1;

struct Request {
  std::string root;
  RunLimits limits;
};

template <typename Number>
std::optional<Number> limitIn(const Json& request, const char* name) {
  const auto found = request.find(name);
  if (found == request.end()) return std::nullopt;
  const Number limit = found->get<Number>();
  if (*found > 0) return limit;
  throw Ending{ExitStatus::wrongUse, "no limit: " + found->dump()};
}

Request requestIn(const std::string& line) try {
  const Json json = Json::parse(line);
  Request request{.root = json.at("root").get<std::string>(),
                  .limits = {.seconds = limitIn<double>(json, "seconds"),
                             .memory = limitIn<std::uint64_t>(json, "memory"),
                             .output = limitIn<std::size_t>(json, "output")}};
  if (request.root.empty()) throw Ending{ExitStatus::wrongUse, "no root: " + line};
  return request;
} catch (const Json::exception&) {
  throw Ending{ExitStatus::wrongUse, "no request: " + line};
}

std::string greeting() {
  return Json{{"serves", "rehearsals"}, {"protocol", kProtocol}, {"host", HOST_VERSION}}.dump() + "\n";
}

std::string answerOf(const ForkedRun& run) {
  static constexpr std::array kStopped{"", "timeout", "too-much-output"};
  const Json head{{"status", run.status},         {"stopped", kStopped[static_cast<std::size_t>(run.stopped)]},
                  {"seconds", run.seconds},       {"processorSeconds", run.processorSeconds},
                  {"peakMemory", run.peakMemory}, {"output", run.output.size()},
                  {"errors", run.errors.size()}};
  return head.dump() + "\n" + run.output + run.errors;
}

// Everything of one device is made in its child, and ends with it.
int rehearse(const std::string& root, const Options& options) {
  return commandline::runProgram(kProgram, {}, static_cast<int>(ExitStatus::notMigrated),
                                 [&](auto) { return static_cast<int>(run(rehearsalBelow(root, options))); });
}

platform::Result<ForkedRun> answered(const Request& request, const Options& options) {
  return runForked([&] { return rehearse(request.root, options); }, request.limits, STDOUT_FILENO);
}

// What no device has a say in.
void loadForAll(Options& options) {
  platform::Platform platform = platform::makeLinuxPlatform(options.device);
  options.device.resources = platform.directories->resources();
  keepModules(platform);
  platform::setCurrent(std::move(platform));
  const auto loaded = loadMigrator(platform::current(), options.plugin);
  if (!loaded.isOk()) throw Ending{ExitStatus::noPlugin, loaded.status().reason()};
  keepResources(platform::current());
  platform::setCurrent({});  // given back here once, and not in each child, which has its own
}

}  // namespace

ExitStatus serveRehearsals(const Options& given) {
  Options options = given;
  loadForAll(options);
  std::string line;
  for (bool isHeard = commandline::print(greeting()); isHeard && std::getline(std::cin, line);) {
    const platform::Result<ForkedRun> run = answered(requestIn(line), options);
    if (!run.isOk()) throw Ending{ExitStatus::notMigrated, run.status().description()};
    isHeard = commandline::print(answerOf(run.value()));
  }
  return ExitStatus::migrated;
}

}  // namespace host
