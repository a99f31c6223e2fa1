#include "platform/linux/logs/logs_and_notices.h"

#include <syslog.h>
#include <unistd.h>

#include <atomic>
#include <cstdint>
#include <ctime>
#include <exception>

#include "platform/characters.h"
#include "platform/linux/logs/journal.h"

namespace platform {
namespace {

constexpr int kDefaultLevel = LOG_NOTICE;

std::string field(const char* name, std::string_view value) {
  std::string text{name};
  text += '=';
  text += value;
  return text;
}

// Whether something stands at a path. Asked for every message, so what was found counts for a tenth of a second.
class Presence {
 public:
  explicit Presence(const char* path) : _path{path} {}
  bool operator()() const {
    const std::int64_t now = milliseconds();
    if (now >= _soundUntil.load(std::memory_order_relaxed)) {
      _isThere.store(::access(_path, F_OK) == 0, std::memory_order_relaxed);
      _soundUntil.store(now + kPatience, std::memory_order_relaxed);
    }
    return _isThere.load(std::memory_order_relaxed);
  }

 private:
  static constexpr std::int64_t kPatience = 100;

  static std::int64_t milliseconds() {
    timespec now{};
    ::clock_gettime(CLOCK_MONOTONIC_COARSE, &now);
    return std::int64_t{now.tv_sec} * 1000 + now.tv_nsec / 1'000'000;
  }

  const char* _path;
  mutable std::atomic<std::int64_t> _soundUntil = 0;
  mutable std::atomic<bool> _isThere = false;
};

bool hasJournal() {
  static const Presence kSocket{kJournalSocket};
  return kSocket();
}

bool hasSyslog() {
  static const Presence kSocket{"/dev/log"};
  return kSocket();
}

class LinuxSystemLog final : public SystemLog {
 public:
  explicit LinuxSystemLog(LogSinks sinks) : _sinks{std::move(sinks)} {}

  [[nodiscard]] bool hasReaders() const override { return _sinks.hasJournal() || _sinks.hasSyslog(); }

  void write(const LogRecord& record) noexcept override {
    try {
      if (_sinks.hasJournal()) {
        _sinks.sendToJournal({field("MESSAGE", record.text()), field("PRIORITY", std::to_string(kDefaultLevel)),
                              field("SUBSYSTEM", record.subsystem), field("CATEGORY", record.category),
                              field("CODE_FUNC", record.method), field("CODE_LINE", std::to_string(record.line))});
      } else if (_sinks.hasSyslog()) {
        const std::string origin = std::string{record.subsystem} + ":" + std::string{record.category};
        _sinks.sendToSyslog(singleLine("[" + origin + "] " + record.text()));
      }
    } catch (const std::exception&) {
      return;
    }
  }

 private:
  LogSinks _sinks;
};

}  // namespace

LogSinks systemLogSinks() {
  return {.hasJournal = &hasJournal,
          .sendToJournal = [](const auto& fields) { platform::sendToJournal(kJournalSocket, fields); },
          .hasSyslog = &hasSyslog,
          .sendToSyslog = [](const std::string& line) { ::syslog(LOG_USER | kDefaultLevel, "%s", line.c_str()); }};
}

std::shared_ptr<SystemLog> makeSystemLog(LogSinks sinks) { return std::make_shared<LinuxSystemLog>(std::move(sinks)); }

}  // namespace platform
