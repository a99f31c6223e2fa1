// A migrator plug-in that does what TEST_PLUGIN says, or else the device's etc/direction: what the host does with a
// plug-in is tried on it.

#include <unistd.h>

#include <chrono>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <functional>
#include <memory>
#include <stdexcept>
#include <string>
#include <thread>

#include "platform/data_class_migrator.h"
#include "platform/platform.h"
#include "platform/run_observer.h"

namespace {

std::string direction() {
  if (const char* const given = std::getenv("TEST_PLUGIN")) return given;
  std::string line;
  std::ifstream file{platform::current().directories->systemRoot() / "etc/direction"};
  std::getline(file, line);
  return line;
}

[[noreturn]] void waitForEver() {
  while (true) ::pause();
}

[[noreturn]] void eatMemory() {
  while (true) new std::string(std::size_t{1} << 24, 'x');
}

[[noreturn]] void talkForEver() {
  while (true) platform::current().console->write(std::string(1000, 'x'));
}

[[noreturn]] void printForEver() {
  while (true) std::puts("x");
}

// What a device that breaks its run might bring about.
void doHarm(const std::string& direction) {
  if (direction == "hang") waitForEver();
  if (direction == "spin") {
    for (volatile bool isOn = true; isOn;) continue;
  }
  if (direction == "crash") ::raise(SIGSEGV);
  if (direction == "eat") eatMemory();
  if (direction == "talk") talkForEver();
  if (direction == "print") printForEver();
  if (direction == "leave" && ::fork() == 0) waitForEver();
  if (direction == "murder") ::kill(::getppid(), SIGKILL);
}

void tellEverything() {
  const auto& platform = platform::current();
  const std::function<std::string()> text = [] { return std::string{"-[Test tell] (7) \"told\""}; };
  platform.console->write("first");
  if (direction() == "tell slowly") std::this_thread::sleep_for(std::chrono::milliseconds{500});
  if (platform.systemLog->hasReaders()) platform.systemLog->write({"com.example.test", "log", "-[Test tell]", 7, text});
  platform.preferencesChanged->post("com.example.domain", "Key");
  platform.cloudTabs->post(true);
  platform.cloudTabs->post(false);
  platform.console->write("no UTF-8: \xff\xfe\n\"quoted\"");
}

// Two stages, of which only the second goes on for so long that somebody wants to see it move.
void workSlowly() {
  const auto observer = platform::current().observer;
  if (!observer) return;
  for (const std::string_view stage : {"quick", "slow"}) {
    observer->stageBegan(stage, {});
    if (stage == "slow") std::this_thread::sleep_for(std::chrono::milliseconds{1600});
    observer->progressed(256, 1000);
    observer->stageEnded(stage);
  }
  platform::current().console->write("done");
}

class DirectedMigrator final : public platform::DataClassMigrator {
 public:
  [[nodiscard]] std::string_view dataClassName() const override { return "directed"; }
  bool performMigration() override {
    doHarm(direction());
    if (direction() == "throw") throw std::runtime_error{"thrown on purpose"};
    if (direction() == "directories")
      platform::current().console->write(platform::current().directories->home().c_str());
    if (direction().starts_with("tell")) tellEverything();
    if (direction() == "work slowly") workSlowly();
    return direction() != "fail";
  }
};

std::unique_ptr<platform::DataClassMigrator> make() {
  if (direction() == "make nothing") return nullptr;
  return std::make_unique<DirectedMigrator>();
}

const platform::ClassRegistration registration{
    std::make_shared<platform::DataClassMigratorClass>("AccountsDataMigrator", make)};

}  // namespace
