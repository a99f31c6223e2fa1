#include "platform/linux/linux_system_log.h"

#define SD_JOURNAL_SUPPRESS_LOCATION
#include <sys/uio.h>
#include <syslog.h>
#include <systemd/sd-journal.h>
#include <unistd.h>

#include <exception>

#include "platform/linux/single_line.h"

namespace platform {
namespace {

constexpr int defaultLevel = LOG_NOTICE;

void sendFields(const std::vector<std::string>& fields) {
  std::vector<iovec> vectors;
  vectors.reserve(fields.size());
  for (const std::string& field : fields) vectors.push_back({const_cast<char*>(field.data()), field.size()});
  ::sd_journal_sendv(vectors.data(), static_cast<int>(vectors.size()));
}

std::string field(const char* name, std::string_view value) {
  std::string text{name};
  text += '=';
  text += value;
  return text;
}

std::vector<std::string> journalFields(const LogRecord& record) {
  return {field("MESSAGE", record.text()),      field("PRIORITY", std::to_string(defaultLevel)),
          field("SUBSYSTEM", record.subsystem), field("CATEGORY", record.category),
          field("CODE_FUNC", record.method),    field("CODE_LINE", std::to_string(record.line))};
}

std::string syslogLine(const LogRecord& record) {
  return singleLine("[" + std::string{record.subsystem} + ":" + std::string{record.category} + "] " + record.text());
}

class LinuxSystemLog final : public SystemLog {
 public:
  explicit LinuxSystemLog(LogSinks sinks) : _sinks{std::move(sinks)} {}

  [[nodiscard]] bool hasReaders() const override { return _sinks.hasJournal() || _sinks.hasSyslog(); }

  void write(const LogRecord& record) noexcept override {
    try {
      if (_sinks.hasJournal()) {
        _sinks.sendToJournal(journalFields(record));
      } else if (_sinks.hasSyslog()) {
        _sinks.sendToSyslog(syslogLine(record));
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
  return {.hasJournal = [] { return ::access("/run/systemd/journal/socket", F_OK) == 0; },
          .sendToJournal = &sendFields,
          .hasSyslog = [] { return ::access("/dev/log", F_OK) == 0; },
          .sendToSyslog = [](const std::string& line) { ::syslog(LOG_USER | defaultLevel, "%s", line.c_str()); }};
}

std::shared_ptr<SystemLog> makeSystemLog(LogSinks sinks) { return std::make_shared<LinuxSystemLog>(std::move(sinks)); }

}  // namespace platform
