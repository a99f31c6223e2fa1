#include "host/foretelling.h"

#include <nlohmann/json.hpp>

#include "commandline/ending.h"
#include "commandline/program.h"
#include "host/forked_run.h"
#include "host/run.h"
#include "host/say.h"

namespace host {
namespace {

using commandline::Ending;
using Json = nlohmann::json;
using Reasons = std::vector<std::string>;

// A run takes a second or two; one that hangs is to be found hanging before the boot unit's patience is over.
constexpr RunLimits kLimits{.seconds = 40, .memory = std::nullopt, .output = std::size_t{64} << 20};

// Nothing is made for that, and the lock is not kept: the rehearsal and the run take it themselves.
void waitForOthers(platform::LinuxPlatformOptions device, const std::string& lockName) {
  if (lockName.empty()) return;
  device.locks.isShared = true;
  auto made = platform::makeLinuxPlatform(device).locks->lockNamed(lockName);
  const platform::Status had = made.isOk() ? made.value()->lock() : made.status();
  if (!had.isOk()) throw Ending{ExitStatus::refused, had.description() + "; the device was not touched"};
}

std::string memberOf(const Json& object, const char* name) { return object.value(name, std::string{}); }

Reasons reasonsIn(const std::string& explanation) try {
  const Json result = Json::parse(explanation).at("result");
  Reasons reasons;
  if (memberOf(result, "verdict") == "not saved") {
    reasons.push_back("a rehearsal foretold that the accounts are not saved: " + memberOf(result, "cause"));
  }
  for (const Json& lost : result.value("lost", Json::array())) {
    const std::string type = memberOf(lost, "type");
    const std::string identifier = memberOf(lost, "identifier");
    std::string subject = type.empty() && identifier.empty() ? memberOf(lost, "file") : type;
    if (!identifier.empty()) subject += (subject.empty() ? "account (" : " (") + identifier + ")";
    reasons.push_back("a rehearsal foretold a loss: " + subject + " [" + memberOf(lost, "code") + "]");
  }
  return reasons;
} catch (const Json::exception&) {
  return {"the rehearsal ended without an explanation"};
}

Reasons reasonsOf(const ForkedRun& rehearsal) {
  using Stopped = ForkedRun::Stopped;
  if (rehearsal.stopped == Stopped::timeout) return {"the rehearsal did not end in time"};
  if (rehearsal.stopped == Stopped::tooMuchOutput) return {"the rehearsal told more than can be heard"};
  if (rehearsal.status < 0) return {"the rehearsal was ended by signal " + std::to_string(-rehearsal.status)};
  switch (static_cast<ExitStatus>(rehearsal.status)) {
    case ExitStatus::wrongUse:
    case ExitStatus::noSnapshot:
    case ExitStatus::refused: return {};  // the run says it
    default: return reasonsIn(rehearsal.output);
  }
}

}  // namespace

std::vector<std::string> foretell(const Options& options, const std::string& lockName) {
  waitForOthers(options.device, lockName);
  const auto rehearse = [&options](auto) { return static_cast<int>(run(rehearsalOf(options))); };
  const platform::Result<ForkedRun> rehearsal = runForked(
      [&] { return commandline::runProgram(kProgram, {}, static_cast<int>(ExitStatus::notMigrated), rehearse); },
      kLimits);
  Reasons reasons = rehearsal.isOk() ? reasonsOf(rehearsal.value())
                                     : Reasons{"there was no rehearsal: " + rehearsal.status().description()};
  for (const std::string& reason : reasons) say(reason);
  if (reasons.empty() || !options.refusesLoss) return reasons;
  throw Ending{ExitStatus::accountsLost, "the run is refused, since something may be lost; the device was not touched"};
}

}  // namespace host
