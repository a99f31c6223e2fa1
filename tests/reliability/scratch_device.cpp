#include "tests/reliability/scratch_device.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <stdexcept>

#include "migrator/accounts_data_migrator.h"
#include "platform/linux/linux_platform.h"
#include "platform/linux/property_lists/libplist_property_list_store.h"
#include "tests/reliability/scarce_memory.h"

namespace tests {
namespace {

using platform::Array;
using platform::Dictionary;
using platform::PropertyValue;
using platform::Text;

constexpr int kDied = 99;
constexpr int kHeldLock = 98;
constexpr const char* kReport = "outputs";
constexpr const char* kFailed = "failed-operation";
constexpr const char* kSettings = "var/mobile/Library/Preferences/com.vorlix.accountsettings.plist";
constexpr const char* kLegacyExchange = "var/mobile/Library/Preferences/com.vorlix.DataAccess.plist";
constexpr const char* kLegacyMail = "var/mobile/Library/Mail/Accounts.plist";
constexpr const char* kMarker = "Marker";

// What a run says goes into a file beside the device's own, since the run may die of it.
class Report {
 public:
  explicit Report(const std::filesystem::path& path)
      : _file{::open(path.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0600)} {}
  void line(std::string_view text) const {
    put(text);
    put("\n");
  }

 private:
  void put(std::string_view text) const {
    if (::write(_file, text.data(), text.size()) != static_cast<ssize_t>(text.size())) std::abort();
  }

  int _file;
};

class ReportedSystemLog final : public platform::SystemLog {
 public:
  explicit ReportedSystemLog(Report report) : _report{report} {}
  [[nodiscard]] bool hasReaders() const override { return true; }
  void write(const platform::LogRecord& record) override { _report.line(record.text()); }

 private:
  Report _report;
};
class ReportedConsole final : public platform::ConsoleLog {
 public:
  explicit ReportedConsole(Report report) : _report{report} {}
  void write(std::string_view message) override { _report.line(message); }

 private:
  Report _report;
};

platform::LinuxPlatformOptions optionsFor(const std::filesystem::path& root) {
  platform::LinuxPlatformOptions options;
  options.systemRoot = root;
  options.resources = RESOURCES_DIRECTORY;
  options.lockDirectory = root / "lock";
  return options;
}

// Shared between the run and who waits for it.
struct Counts {
  int operations;
  std::size_t allocations;
};
Counts* sharedCounts() {
  void* const memory = ::mmap(nullptr, sizeof(Counts), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
  if (memory == MAP_FAILED) throw std::runtime_error{"no shared memory"};
  return static_cast<Counts*>(memory);
}

bool isLockHeld(const std::filesystem::path& root) {
  const int file = ::open((root / "lock/AccountMigrationInProgress").c_str(), O_RDONLY | O_CLOEXEC);
  return file >= 0 && ::flock(file, LOCK_EX | LOCK_NB) != 0;
}

[[noreturn]] void runMigrator(const std::filesystem::path& root, const Mishap& mishap, std::size_t failingAllocation,
                              Counts& counts) {
  platform::Platform services = platform::makeLinuxPlatform(optionsFor(root));
  const auto files = std::make_shared<MishapFileSystem>(services.files, mishap, [&counts, &mishap] {
    counts.operations = mishap.operation;
    ::_exit(kDied);
  });
  const Report report{root / kReport};
  services.files = files;
  services.propertyLists = platform::makeLibplistPropertyListStore(files);
  services.systemLog = std::make_shared<ReportedSystemLog>(report);
  services.console = std::make_shared<ReportedConsole>(report);
  platform::setCurrent(std::move(services));
  ::setenv("TMPDIR", (root / "var/mobile/tmp").c_str(), 1);
  beginScarcity(failingAllocation);
  const bool succeeded = migrator::AccountsDataMigrator{}.performMigration();
  counts.allocations = endScarcity();
  counts.operations = files->operations();
  if (!files->mishapAt().empty()) Report{root / kFailed}.line(files->mishapAt());
  ::_exit(isLockHeld(root) ? kHeldLock : succeeded ? 0 : 1);
}

std::vector<std::string> takeLines(const std::filesystem::path& path) {
  std::vector<std::string> lines;
  std::ifstream file{path};
  for (std::string line; std::getline(file, line);) lines.push_back(line);
  ::unlink(path.c_str());
  return lines;
}

void countMarkers(const PropertyValue& value, std::map<std::string, int>& counts) {
  if (const Array* const array = value.asArray()) {
    for (const PropertyValue& element : *array) countMarkers(element, counts);
  } else if (const Dictionary* const dictionary = value.asDictionary()) {
    if (const Text* const marker = dictionary->text(kMarker)) ++counts[marker->string()];
    for (const auto& entry : *dictionary) countMarkers(entry.value, counts);
  }
}

// In memory where that can be had: hundreds of runs bring each of their files to stable storage.
std::filesystem::path placeForMany() {
  const std::filesystem::path memory = "/dev/shm";
  return ::access(memory.c_str(), W_OK) == 0 ? memory : std::filesystem::temp_directory_path();
}

// Identifiers that were given stand in the input; every other one was made up by some run.
PropertyValue comparable(const PropertyValue& value, std::map<std::string, std::string>& madeUp) {
  if (const Text* const text = value.asText()) {
    const bool isIdentifier = text->size() == 36 && text->view()[8] == '-' && text->view()[23] == '-';
    if (!isIdentifier) return value;
    return madeUp.emplace(text->string(), "made up " + std::to_string(madeUp.size())).first->second;
  }
  if (const Array* const array = value.asArray()) {
    Array elements;
    for (const PropertyValue& element : *array) elements.push_back(comparable(element, madeUp));
    return elements;
  }
  if (const Dictionary* const dictionary = value.asDictionary()) {
    Dictionary entries;
    for (const auto& entry : *dictionary) entries.set(entry.key, comparable(entry.value, madeUp));
    return entries;
  }
  return value;
}

}  // namespace

ScratchDevice::ScratchDevice() {
  std::string name = (placeForMany() / "scratch-device-XXXXXX").string();
  if (::mkdtemp(name.data()) == nullptr) throw std::runtime_error{"no scratch directory"};
  _root = name;
  for (const char* const directory : {"etc", "lock", "var/mobile/tmp", "var/mobile/Library/Preferences",
                                      "var/mobile/Library/Mail", "var/mobile/Library/Logs/CrashReporter"}) {
    std::filesystem::create_directories(_root / directory);
  }
  const std::string numbers = std::to_string(::getuid()) + ":" + std::to_string(::getgid());
  std::ofstream{_root / "etc/passwd"} << "mobile:x:" << numbers << ":Mobile:/var/mobile:/bin/sh\n";
  std::ofstream{_root / "etc/group"} << "mobile:x:" << ::getgid() << ":\n";
}

ScratchDevice::~ScratchDevice() {
  std::error_code ignored;
  std::filesystem::remove_all(_root, ignored);
}

Dictionary ScratchDevice::marked(Dictionary account) {
  account.set(kMarker, "account " + std::to_string(_markers++));
  return account;
}

void ScratchDevice::putSettings(std::optional<std::uint64_t> version) {
  Array accounts;
  accounts.emplace_back(marked({{"Type", "Mail"},
                                {"Class", "IMAPAccount"},
                                {"Identifier", "imap"},
                                {"Enabled Dataclasses", Array{"com.vorlix.Dataclass.Mail"}}}));
  accounts.emplace_back(
      marked({{"Type", "Nimbra"}, {"Class", "NimbraAccount"}, {"Identifier", "hosted"}, {"Username", "jane"}}));
  accounts.emplace_back(marked({{"Type", "Exchange"}, {"Class", "ASAccount"}, {"Identifier", "exchange"}}));
  accounts.emplace_back(marked(
      {{"Type", "VorlixAccount"},
       {"Class", "KQAccount"},
       {"Identifier", "cloud"},
       {"hostedServiceStatus", 2},
       {"ChildAccounts", Array{marked({{"Type", "CalDAV"}, {"Class", "CalDAVChild"}, {"Identifier", "child"}})}}}));
  Dictionary root{{"Accounts", std::move(accounts)}};
  if (version) root.set("Version", *version);
  write(kSettings, root);
}

void ScratchDevice::putLegacyMail() {
  const Array delivery{marked({{"AccountType", "SMTPAccount"}, {"uniqueId", "legacy-smtp"}})};
  const Array incoming{marked({{"AccountType", "GmailAccount"}, {"uniqueId", "legacy-gmail"}, {"Username", "joe"}}),
                       marked({{"AccountType", "IMAPAccount"}, {"uniqueId", "legacy-imap"}})};
  write(kLegacyMail, {{"DeliveryAccounts", delivery}, {"MailAccounts", incoming}});
}

void ScratchDevice::putLegacyExchange() {
  const Array accounts{
      marked({{"DAAccountConfigurationClass", "ASAccount"}, {"DAAccountConfigurationAccountID", "legacy-exchange"}})};
  write(kLegacyExchange, {{"DAAccountsKey", accounts}});
}

RunOutcome ScratchDevice::run(const Mishap& mishap, std::size_t failingAllocation) const {
  Counts* const counts = sharedCounts();
  const pid_t child = ::fork();
  if (child == 0) runMigrator(_root, mishap, failingAllocation, *counts);
  int status = 0;
  ::waitpid(child, &status, 0);
  RunOutcome outcome;
  outcome.operations = counts->operations;
  outcome.allocations = counts->allocations;
  ::munmap(counts, sizeof(Counts));
  const int code = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
  outcome.died = code == kDied;
  outcome.succeeded = code == 0;
  outcome.heldLock = code == kHeldLock;
  outcome.crashed = code != kDied && code != kHeldLock && code != 0 && code != 1;
  outcome.outputs = takeLines(_root / kReport);
  const std::vector<std::string> failed = takeLines(_root / kFailed);
  if (!failed.empty()) outcome.failedOperation = failed.front();
  return outcome;
}

void ScratchDevice::write(const std::filesystem::path& path, const Dictionary& contents) const {
  const platform::Platform services = platform::makeLinuxPlatform(optionsFor(_root));
  const auto list = services.propertyLists->serialize(contents);
  if (list.data == nullptr || !services.files->replace(_root / path, *list.data).isOk()) {
    throw std::runtime_error{"cannot write " + path.string()};
  }
}

std::optional<Dictionary> ScratchDevice::read(const std::filesystem::path& path) const {
  return platform::makeLinuxPlatform(optionsFor(_root)).propertyLists->readDictionary(_root / path).optional();
}

std::map<std::string, int> ScratchDevice::markersInSettings() const {
  std::map<std::string, int> counts;
  countMarkers(read(kSettings).value_or(Dictionary{}), counts);
  return counts;
}

std::map<std::string, int> ScratchDevice::markersAnywhere() const {
  std::map<std::string, int> counts = markersInSettings();
  countMarkers(read(kLegacyMail).value_or(Dictionary{}), counts);
  countMarkers(read(kLegacyExchange).value_or(Dictionary{}), counts);
  return counts;
}

std::optional<std::string> ScratchDevice::settingsBytes() const {
  std::ifstream file{_root / kSettings, std::ios::binary};
  if (!file) return std::nullopt;
  return std::string{std::istreambuf_iterator<char>{file}, {}};
}

std::optional<Dictionary> ScratchDevice::comparableSettings() const { return comparableAt(kSettings); }

std::optional<Dictionary> ScratchDevice::comparableAt(const std::filesystem::path& path) const {
  const std::optional<Dictionary> contents = read(path);
  if (!contents) return std::nullopt;
  std::map<std::string, std::string> madeUp;
  return *comparable(*contents, madeUp).asDictionary();
}

std::vector<std::string> ScratchDevice::files() const {
  std::vector<std::string> names;
  for (const auto& entry : std::filesystem::recursive_directory_iterator{_root}) {
    if (!entry.is_directory()) names.push_back(entry.path().lexically_relative(_root).string());
  }
  std::sort(names.begin(), names.end());
  return names;
}

std::vector<std::string> ScratchDevice::temporaryFiles() const {
  std::vector<std::string> names = files();
  std::erase_if(names, [](const std::string& name) { return !name.starts_with("var/mobile/tmp/"); });
  return names;
}

}  // namespace tests
