#include "host/trace.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <fstream>
#include <nlohmann/json.hpp>
#include <utility>

#include "platform/linux/files/file_services.h"

#include "host/fact_json.h"

namespace host {
namespace {

using Event = nlohmann::ordered_json;

// A part of a line is no line.
platform::Status writeLine(int descriptor, const std::string& line) {
  constexpr int kMaxAttempts = 100;
  int cause = EINTR;
  for (int attempt = 0; attempt < kMaxAttempts && cause == EINTR; ++attempt) {
    const auto written = ::write(descriptor, line.data(), line.size());
    if (written == static_cast<ssize_t>(line.size())) return {};
    cause = written < 0 ? errno : ENOSPC;
  }
  return platform::Status::failure(cause, "write an event");
}

// How many runs begin in a file; what is no file is no older than this run.
std::uint64_t runsIn(int descriptor) {
  struct stat status {};
  if (::fstat(descriptor, &status) != 0 || !S_ISREG(status.st_mode)) return 0;
  std::ifstream lines{"/proc/self/fd/" + std::to_string(descriptor)};
  std::uint64_t runs = 0;
  for (std::string line; std::getline(lines, line);) runs += line.starts_with(R"({"event":"start",)") ? 1U : 0U;
  return runs;
}

template <typename Service>
class Traced : public Service {
 public:
  Traced(std::shared_ptr<Service> inner, std::shared_ptr<Trace> trace)
      : _inner{std::move(inner)}, _trace{std::move(trace)} {}

 protected:
  std::shared_ptr<Service> _inner;
  std::shared_ptr<Trace> _trace;
};

class TracedSystemLog final : public Traced<platform::SystemLog> {
 public:
  using Traced::Traced;
  [[nodiscard]] bool hasReaders() const override { return true; }
  void write(const platform::LogRecord& record) override {
    _trace->log(record.subsystem, record.category, record.text);
    if (_inner->hasReaders()) _inner->write(record);
  }
};

class TracedConsoleLog final : public Traced<platform::ConsoleLog> {
 public:
  using Traced::Traced;
  void write(std::string_view message) override {
    _trace->console(message);
    _inner->write(message);
  }
};

class TracedPreferencesChangedNotice final : public Traced<platform::PreferencesChangedNotice> {
 public:
  using Traced::Traced;
  void post(std::string_view domain, std::string_view key) override {
    _trace->preferencesChanged(domain, key);
    _inner->post(domain, key);
  }
};

class TracedCloudTabsNotice final : public Traced<platform::CloudTabsNotice> {
 public:
  using Traced::Traced;
  void post(bool enabled) override {
    _trace->cloudTabs(enabled);
    _inner->post(enabled);
  }
};

template <typename Tracing, typename Service>
void wrap(std::shared_ptr<Service>& service, const std::shared_ptr<Trace>& trace) {
  service = std::make_shared<Tracing>(std::move(service), trace);
}

}  // namespace

platform::Result<std::shared_ptr<Trace>> Trace::open(const std::filesystem::path& path) {
  auto file = platform::openToAppend(path);
  if (file.isOk()) return std::shared_ptr<Trace>{new Trace{file.take()}};
  return platform::Status::failure(file.status().errorNumber(), "open the trace file " + path.string());
}

Trace::Trace(platform::Descriptor file) : _file{std::move(file)}, _run{runsIn(_file.number()) + 1} {}

template <typename MakeEvent>
void Trace::append(const MakeEvent& makeEvent) noexcept {
  try {
    const Event event = makeEvent();
    const std::string line = event.dump(-1, ' ', false, Event::error_handler_t::replace) + '\n';
    platform::Status written = writeLine(_file.number(), line);
    if (_outcome.isOk()) _outcome = std::move(written);
  } catch (...) {
    if (_outcome.isOk()) _outcome = platform::Status::failure(ENOMEM, "write an event");
  }
}

void Trace::start(std::string_view version, const std::string& root, const std::vector<std::string>& options,
                  const std::string& time) noexcept {
  append([&] {
    return Event{{"event", "start"}, {"schema", 1},        {"run", _run}, {"version", version},
                 {"root", root},     {"options", options}, {"time", time}};
  });
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

void Trace::fact(std::string_view stage, std::string_view outerStage, const records::Fact& fact) noexcept {
  append([&] {
    Event event{{"event", "fact"}, {"stage", stage}};
    if (!outerStage.empty()) event["within"] = outerStage;
    event.update(jsonOf(fact));
    return event;
  });
}

void Trace::result(std::string_view dataClass, bool success, const Verdict& verdict) noexcept {
  append([&] {
    Event event{{"event", "result"}, {"dataClass", dataClass}, {"success", success}};
    addVerdict(verdict, event);
    return event;
  });
}

void traceServices(platform::Platform& platform, const std::shared_ptr<Trace>& trace) {
  wrap<TracedSystemLog>(platform.systemLog, trace);
  wrap<TracedConsoleLog>(platform.console, trace);
  wrap<TracedPreferencesChangedNotice>(platform.preferencesChanged, trace);
  wrap<TracedCloudTabsNotice>(platform.cloudTabs, trace);
}

}  // namespace host
