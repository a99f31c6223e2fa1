#include "host/trace.h"

#include <unistd.h>

#include <cerrno>
#include <nlohmann/json.hpp>
#include <utility>

#include "platform/linux/files/file_to_append.h"

#include "host/fact_json.h"

namespace host {
namespace {

using Event = nlohmann::ordered_json;

// 0, or the number of the error; a part of a line is no line.
int writeLine(int descriptor, const std::string& line) {
  constexpr int attempts = 100;
  for (int attempt = 0; attempt < attempts; ++attempt) {
    const auto written = ::write(descriptor, line.data(), line.size());
    if (written >= 0) return static_cast<std::size_t>(written) == line.size() ? 0 : ENOSPC;
    if (errno != EINTR) return errno;
  }
  return EINTR;
}

}  // namespace

platform::Result<std::shared_ptr<Trace>> Trace::open(const std::filesystem::path& path) {
  auto file = platform::openToAppend(path);
  if (file.isOk()) return std::shared_ptr<Trace>{new Trace{file.take()}};
  return platform::Status::failure(file.status().errorNumber(), "open the trace file " + path.string());
}

void Trace::lose(int cause) noexcept {
  if (_outcome.isOk()) _outcome = platform::Status::failure(cause, "write an event");
}

template <typename MakeEvent>
void Trace::append(const MakeEvent& makeEvent) noexcept {
  try {
    const Event event = makeEvent();
    const int failed = writeLine(_file.number(), event.dump(-1, ' ', false, Event::error_handler_t::replace) + '\n');
    if (failed != 0) lose(failed);
  } catch (...) {
    lose(ENOMEM);
  }
}

void Trace::console(std::string_view message) noexcept {
  append([&] { return Event{{"event", "console"}, {"message", message}}; });
}

void Trace::log(std::string_view subsystem, std::string_view category,
                const std::function<std::string()>& message) noexcept {
  append([&] {
    return Event{{"event", "log"}, {"subsystem", subsystem}, {"category", category}, {"message", message()}};
  });
}

void Trace::preferencesChanged(std::string_view domain, std::string_view key) noexcept {
  append([&] { return Event{{"event", "preferences-changed"}, {"domain", domain}, {"key", key}}; });
}

void Trace::cloudTabs(bool enabled) noexcept {
  append([&] { return Event{{"event", "cloud-tabs"}, {"enabled", enabled}}; });
}

void Trace::step(std::string_view stage, std::string_view outerStage, const platform::RunFact& fact) noexcept {
  append([&] {
    Event event{{"event", "step"}, {"stage", stage}};
    if (!outerStage.empty()) event["within"] = outerStage;
    event.update(jsonOf(fact));
    return event;
  });
}

void Trace::result(std::string_view dataClass, bool success) noexcept {
  append([&] { return Event{{"event", "result"}, {"dataClass", dataClass}, {"success", success}}; });
}

}  // namespace host
