#include "host/traced_services.h"

#include <utility>

namespace host {
namespace {

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

void traceServices(platform::Platform& platform, const std::shared_ptr<Trace>& trace) {
  wrap<TracedSystemLog>(platform.systemLog, trace);
  wrap<TracedConsoleLog>(platform.console, trace);
  wrap<TracedPreferencesChangedNotice>(platform.preferencesChanged, trace);
  wrap<TracedCloudTabsNotice>(platform.cloudTabs, trace);
}

}  // namespace host
