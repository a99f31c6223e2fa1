#include "tests/reliability/undoable_runs.h"

#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cstdlib>
#include <fstream>
#include <functional>
#include <iterator>
#include <stdexcept>

#include "host/snapshots/problem.h"
#include "host/snapshots/snapshot_session.h"
#include "migrator/accounts_data_migrator.h"
#include "platform/linux/files/file_services.h"
#include "platform/linux/linux_platform.h"
#include "platform/linux/property_lists/libplist_property_list_store.h"
#include "records/fact_observer.h"
#include "tests/support/fake_platform.h"
#include "tests/support/mishap_file_keeper.h"

namespace tests {
namespace {

using host::snapshots::Missing;
using host::snapshots::Problem;
using host::snapshots::SnapshotSession;

constexpr int kRefused = 5;
constexpr int kRolledBack = 6;
constexpr int kDied = 99;
constexpr std::size_t kCount = 3;
constexpr const char* kCopyAside = "var/mobile/Library/Logs/CrashReporter/com.vorlix.accountsettings.plist";
constexpr const char* kSettings = "var/mobile/Library/Preferences/com.vorlix.accountsettings.plist";

// What the child is, and what it tells of itself.
struct Child {
  std::shared_ptr<MishapFileSystem> files;
  host::snapshots::SessionPlace place;
  std::array<int, 2> operations{};  // ahead of the plug-in, and all
};

Outputs& unheard() {
  static Outputs outputs;
  return outputs;
}

Child childOn(const std::filesystem::path& root, const Mishap& mishap) {
  platform::LinuxPlatformOptions options;
  options.systemRoot = root;
  options.resources = RESOURCES_DIRECTORY;
  options.lockDirectory = root / "lock";
  platform::Platform services = platform::makeLinuxPlatform(options);
  const auto files = std::make_shared<MishapFileSystem>(services.files, mishap, [] { ::_exit(kDied); });
  const auto log = std::make_shared<FakeSystemLog>(unheard());
  log->readers = false;
  services.files = files;
  services.propertyLists = platform::makeLibplistPropertyListStore(files);
  services.systemLog = log;
  services.console = std::make_shared<FakeConsoleLog>(unheard());
  ::setenv("TMPDIR", (root / "var/mobile/tmp").c_str(), 1);
  return {
      .files = files,
      .place = {.services = services,
                .keeper = std::make_shared<MishapFileKeeper>(platform::makeFileKeeper(*services.directories), files),
                .locks = platform::makeFileLocks({.directory = root / "snapshots"}),
                .directory = root / "snapshots",
                .footprint = {},
                .release = "1",
                .warn = [](const std::string&) {},
                .putAside = {}}};
}

// Remembers how the last save ended.
class LastSave final : public records::FactObserver {
 public:
  void stageBegan(std::string_view /*stage*/, std::string_view /*words*/) override {}
  void stageEnded(std::string_view /*stage*/) override {}
  void told(const records::Fact& fact) override {
    if (std::holds_alternative<records::Saved>(fact)) isSaved = true;
    if (std::holds_alternative<records::SaveFailed>(fact)) isSaved = false;
  }
  void lostTrack() noexcept override {}

  bool isSaved = true;
};

int migrate(Child& child) {
  const auto watch = std::make_shared<LastSave>();
  child.place.services.observer = watch;
  platform::setCurrent(child.place.services);
  migrator::AccountsDataMigrator migrator;
  child.place.footprint = migrator.footprint();
  SnapshotSession session{child.place, Missing::isMade};
  platform::Platform watched = child.place.services;
  watched.files = session.begin();
  platform::setCurrent(watched);
  child.operations[0] = child.files->operations();
  const bool isMigrated = migrator.performMigration();
  const host::snapshots::RunEnd end{.isMigrated = isMigrated,
                                    .isSaved = watch->isSaved,
                                    .onlyInSnapshot = {},
                                    .explanation = "what it did",
                                    .explanationAsJson = "{}"};
  const auto ended = session.end(end, kCount);
  if (ended == host::snapshots::Ended::rolledBack) return kRolledBack;
  return isMigrated ? 0 : 1;
}

int restore(Child& child) {
  platform::setCurrent(child.place.services);
  child.place.footprint = migrator::AccountsDataMigrator{}.footprint();
  SnapshotSession session{child.place, Missing::isRefused};
  std::vector<std::string> names;
  for (const auto& entry : std::filesystem::directory_iterator{child.place.directory}) {
    if (entry.path().filename().string().starts_with("0")) names.push_back(entry.path().filename());
  }
  return session.restore(*std::min_element(names.begin(), names.end())).empty() ? 1 : 0;
}

[[noreturn]] void beChild(const std::filesystem::path& root, const Mishap& mishap, int (*task)(Child&), int out) {
  Child child = childOn(root, mishap);
  int status = kRefused;
  try {
    status = task(child);
  } catch (const Problem&) {
    status = kRefused;
  }
  child.operations[1] = child.files->operations();
  constexpr auto size = static_cast<ssize_t>(sizeof child.operations);
  if (::write(out, child.operations.data(), sizeof child.operations) != size) std::abort();
  ::_exit(status);
}

UndoOutcome inChild(const std::filesystem::path& root, const Mishap& mishap, int (*task)(Child&)) {
  std::array<int, 2> pipe{};
  if (::pipe(pipe.data()) != 0) throw std::runtime_error{"no pipe"};
  const pid_t child = ::fork();
  if (child == 0) beChild(root, mishap, task, pipe[1]);
  int status = 0;
  ::waitpid(child, &status, 0);
  ::close(pipe[1]);
  std::array<int, 2> operations{};
  // A child that died has said nothing.
  if (::read(pipe[0], operations.data(), sizeof operations) < 0) throw std::runtime_error{"no answer from a child"};
  ::close(pipe[0]);
  const int code = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
  return {.died = code == kDied,
          .crashed = code != 0 && code != 1 && code != kRefused && code != kRolledBack && code != kDied,
          .refused = code == kRefused,
          .rolledBack = code == kRolledBack,
          .succeeded = code == 0,
          .operations = operations[1],
          .operationsAhead = operations[0]};
}

bool isOfTheDevice(const std::string& path) { return path.starts_with("var/"); }

std::string contentsOf(const std::filesystem::path& path) {
  std::ifstream file{path, std::ios::binary};
  return {std::istreambuf_iterator<char>{file}, {}};
}

}  // namespace

UndoOutcome runUndoable(const ScratchDevice& device, const Mishap& mishap) {
  return inChild(device.root(), mishap, &migrate);
}

UndoOutcome restoreFirst(const ScratchDevice& device, const Mishap& mishap) {
  return inChild(device.root(), mishap, &restore);
}

EndState endStateOf(const ScratchDevice& device) {
  EndState state{
      .settings = device.comparableSettings(), .copyAside = device.comparableAt(kCopyAside), .otherFiles = {}};
  for (const std::string& path : device.files()) {
    if (isOfTheDevice(path) && path != kSettings && path != kCopyAside)
      state.otherFiles[path] = contentsOf(device.root() / path);
  }
  return state;
}

std::map<std::string, std::string> exactStateOf(const ScratchDevice& device) {
  std::map<std::string, std::string> state;
  for (const std::string& path : device.files()) {
    struct stat status {};
    if (!isOfTheDevice(path) || ::lstat((device.root() / path).c_str(), &status) != 0) continue;
    state[path] = std::to_string(status.st_mode) + " " + std::to_string(status.st_mtim.tv_sec) + "." +
                  std::to_string(status.st_mtim.tv_nsec) + " " + contentsOf(device.root() / path);
  }
  return state;
}

std::vector<std::string> leftoversIn(const ScratchDevice& device) {
  std::vector<std::string> left;
  for (const std::string& path : device.files()) {
    if (path.starts_with("snapshots/.") || path.find("/.restoring-") != std::string::npos) left.push_back(path);
  }
  return left;
}

}  // namespace tests
