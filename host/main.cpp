#include <csignal>
#include <cstdio>
#include <exception>
#include <span>
#include <string>
#include <utility>

#include "host/options.h"
#include "host/plugin.h"
#include "host/trace.h"
#include "host/traced_services.h"
#include "platform/temporary_directory.h"

namespace {

enum ExitStatus { migrated = 0, notMigrated = 1, wrongUse = 2, noPlugin = 3 };

// A reader that went away and a file that may not grow are failed writes, not the end of a half-done migration.
void surviveFailedWrites() {
  std::signal(SIGPIPE, SIG_IGN);
  std::signal(SIGXFSZ, SIG_IGN);
}

void say(const std::string& line) noexcept {
  try {
    const auto text = "migration-host: " + line + "\n";
    std::fwrite(text.data(), 1, text.size(), stderr);
  } catch (...) {
    std::fputs("migration-host: out of memory\n", stderr);
  }
}

ExitStatus print(const host::Answer& answer) {
  if (answer.isWrongUse) {
    say(answer.text);
    return wrongUse;
  }
  std::fputs(answer.text.c_str(), stdout);
  return migrated;
}

ExitStatus perform(platform::DataClassMigrator& migrator, host::Trace* trace) {
  const bool success = migrator.performMigration();
  if (trace != nullptr) trace->result(migrator.dataClassName(), success);
  if (trace != nullptr && !trace->complete()) say("the trace is incomplete: not every event could be written");
  return success ? migrated : notMigrated;
}

ExitStatus migrate(const host::Options& options) {
  auto platform = platform::makeLinuxPlatform(options.device);
  std::shared_ptr<host::Trace> trace;
  if (options.trace) {
    auto opened = host::Trace::open(*options.trace);
    if (!opened.isOk()) {
      say(opened.status().description());
      return wrongUse;
    }
    trace = opened.take();
    host::traceServices(platform, trace);
  }
  platform::setCurrent(std::move(platform));
  platform::keepTemporaryDirectoryOnDeviceVolume(platform::current());
  const auto plugin = options.plugin ? *options.plugin : host::installedPlugin();
  auto loaded = host::loadMigrator(platform::current(), plugin);
  if (const auto* const error = std::get_if<std::string>(&loaded)) {
    say(*error);
    return noPlugin;
  }
  return perform(*std::get<std::unique_ptr<platform::DataClassMigrator>>(loaded), trace.get());
}

ExitStatus run(std::span<const char* const> arguments) {
  const auto asked = host::parseArguments(arguments);
  if (const auto* const answer = std::get_if<host::Answer>(&asked)) return print(*answer);
  return migrate(std::get<host::Options>(asked));
}

}  // namespace

int main(int count, char** arguments) {
  surviveFailedWrites();
  try {
    const std::span<const char* const> all{arguments, static_cast<std::size_t>(count)};
    return run(all.subspan(all.empty() ? 0 : 1));
  } catch (const std::exception& thrown) {
    say(thrown.what());
  } catch (...) {
    say("the run ended in an unknown failure");
  }
  return notMigrated;
}
