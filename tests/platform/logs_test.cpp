#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <array>
#include <csignal>
#include <new>

#include "platform/linux/linux_platform.h"
#include "platform/linux/logs/logs_and_notices.h"
#include "tests/support/fake_platform.h"

namespace tests {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

// Records what a system log sends where; both places can be missing.
class Sinks {
 public:
  bool hasJournal = false;
  bool hasSyslog = false;
  std::vector<std::string> journal;
  std::vector<std::string> syslog;
  std::shared_ptr<platform::SystemLog> log = platform::makeSystemLog({
      .hasJournal = [this] { return hasJournal; },
      .sendToJournal = [this](const std::vector<std::string>& fields) { journal = fields; },
      .hasSyslog = [this] { return hasSyslog; },
      .sendToSyslog = [this](const std::string& line) { syslog.push_back(line); },
  });

  void write(const std::string& text) const {
    log->write({"com.vorlix.accountsettings", "log", "-[Some method]", 42, [text] { return text; }});
  }
};

TEST(SystemLog, SendsTheJournalEachPartAsAField) {
  Sinks sinks;
  sinks.hasJournal = sinks.hasSyslog = true;
  sinks.write("-[Some method] (42) \"Two\nlines\"");
  EXPECT_THAT(sinks.journal, ElementsAre("MESSAGE=-[Some method] (42) \"Two\nlines\"", "PRIORITY=5",
                                         "SUBSYSTEM=com.vorlix.accountsettings", "CATEGORY=log",
                                         "CODE_FUNC=-[Some method]", "CODE_LINE=42"));
  EXPECT_THAT(sinks.syslog, IsEmpty());
}

TEST(SystemLog, SendsSyslogOneLineWhereThereIsNoJournal) {
  Sinks sinks;
  sinks.hasSyslog = true;
  sinks.write("Two\nlines");
  EXPECT_THAT(sinks.syslog, ElementsAre("[com.vorlix.accountsettings:log] Two\\nlines"));
  EXPECT_THAT(sinks.journal, IsEmpty());
}

TEST(SystemLog, FindsAJournalThatAppearsLater) {
  Sinks sinks;
  EXPECT_FALSE(sinks.log->hasReaders());
  sinks.hasJournal = true;
  EXPECT_TRUE(sinks.log->hasReaders());
  sinks.write("text");
  EXPECT_FALSE(sinks.journal.empty());
}

TEST(SystemLog, MakesNoTextThatNobodyReads) {
  Sinks sinks;
  bool isMade = false;
  sinks.log->write({"s", "c", "m", 1, [&isMade] {
                      isMade = true;
                      return std::string{};
                    }});
  EXPECT_FALSE(isMade);
}

TEST(SystemLog, LosesARecordThatCannotBeMade) {
  Sinks sinks;
  sinks.hasJournal = true;
  EXPECT_NO_THROW(sinks.log->write({"s", "c", "m", 1, []() -> std::string { throw std::bad_alloc{}; }}));
  EXPECT_THAT(sinks.journal, IsEmpty());
}

TEST(SystemLog, OfTheDeviceTakesRecordsWhoeverReadsThem) {
  const auto log = platform::makeLinuxPlatform().systemLog;
  EXPECT_NO_THROW(log->write({"com.vorlix.accountsettings", "log", "-[Test]", 1, [] { return std::string{"test"}; }}));
}

// Standard error as a pipe, until this goes.
class StandardError {
 public:
  StandardError() : _before{::dup(STDERR_FILENO)} {
    static_cast<void>(::pipe(_ends.data()) == 0);
    ::dup2(_ends[1], STDERR_FILENO);
    ::close(_ends[1]);
  }
  StandardError(const StandardError&) = delete;
  StandardError& operator=(const StandardError&) = delete;
  ~StandardError() { finish(); }

  void stopReading() { ::close(std::exchange(_ends[0], -1)); }
  std::string finish() {
    if (_before < 0) return {};
    ::dup2(_before, STDERR_FILENO);
    ::close(std::exchange(_before, -1));
    std::array<char, 4096> text{};
    const ssize_t size = ::read(_ends[0], text.data(), text.size());
    if (_ends[0] >= 0) ::close(_ends[0]);
    return {text.data(), static_cast<std::size_t>(std::max<ssize_t>(size, 0))};
  }

 private:
  int _before;
  std::array<int, 2> _ends{};
};

TEST(ConsoleLog, WritesALineAMessage) {
  StandardError standardError;
  const auto console = platform::makeLinuxPlatform().console;
  console->write("Migrating accounts");
  console->write("");
  console->write("Zw\xc3\xb6lf\tDinge");
  EXPECT_EQ(standardError.finish(), "Migrating accounts\n\nZw\xc3\xb6lf\tDinge\n");
}

TEST(ConsoleLog, KeepsAMessageOfSeveralLinesOnOne) {
  StandardError standardError;
  platform::makeLinuxPlatform().console->write("one\ntwo\r\nthree");
  EXPECT_EQ(standardError.finish(), "one\\ntwo\\r\\nthree\n");
}

TEST(ConsoleLog, OutlivesItsReader) {
  StandardError standardError;
  const auto console = platform::makeLinuxPlatform().console;
  standardError.stopReading();
  console->write("nobody reads this");
  sigset_t pending{};
  ::sigpending(&pending);
  EXPECT_EQ(::sigismember(&pending, SIGPIPE), 0);
}

TEST(ConsoleLog, OutlivesItsChannel) {
  StandardError standardError;
  ::close(STDERR_FILENO);
  platform::makeLinuxPlatform().console->write("nowhere to write this");
  standardError.finish();
}

TEST(ConsoleLog, OfTheTestsKeepsTheMessages) {
  Outputs outputs;
  FakeConsoleLog console{outputs};
  console.write("Migrating accounts");
  EXPECT_THAT(console.lines, ElementsAre("Migrating accounts"));
}

}  // namespace
}  // namespace tests
