#include "tools/account_source.h"

#include <sha2.h>

#include <algorithm>
#include <array>
#include <filesystem>
#include <nlohmann/json.hpp>

#include "platform/platform.h"

namespace tools {
namespace {

using accountsettings::Dictionary;
using platform::Path;
using Json = nlohmann::ordered_json;

constexpr std::size_t kLargestManifest = std::size_t{1} << 20U;
constexpr std::size_t kLargestCopy = std::size_t{256} << 20U;  // no larger property list can be read
constexpr const char* kManifest = "manifest";
constexpr const char* kLatest = "latest";
constexpr std::string_view kUsualSnapshots = "var/lib/account-settings/snapshots";

[[noreturn]] void fail(const std::string& message) { throw Failure{ExitStatus::failed, message}; }

bool isDirectory(const Path& path) {
  std::error_code ignored;
  return std::filesystem::is_directory(path, ignored);
}

bool stands(const Path& path) {
  std::error_code ignored;
  return std::filesystem::symlink_status(path, ignored).type() != std::filesystem::file_type::not_found;
}

// --- Files ---

FileForm formOf(const Dictionary& root, const Path& path) {
  if (root.contains("MailAccounts") || root.contains("DeliveryAccounts")) return FileForm::legacyMail;
  if (root.contains("DAAccountsKey")) return FileForm::legacyExchange;
  if (root.contains(accountsettings::kPlistAccountsKey)) return FileForm::settings;
  if (root.contains(accountsettings::kPlistVersionKey)) return FileForm::settings;
  fail("this is no file of accounts: " + path.string());
}

AccountFile fileAt(const Path& path) {
  const auto read = platform::current().propertyLists->readDictionary(path);
  if (!read.isOk()) fail("the file cannot be read: " + path.string() + ": " + read.status().reason());
  AccountFile file{.path = path, .form = formOf(read.value(), path), .root = read.value(), .accounts = {}};
  file.accounts = accountsIn(file);
  return file;
}

// --- Devices ---

// Where the device's file stands on one with another root.
Path underRoot(const Path& root, const Path& home, const Path& file) {
  const auto& directories = *platform::current().directories;
  const Path inHome = file.lexically_relative(directories.home());
  if (!inHome.empty() && *inHome.begin() != "..") return home / inHome;
  return root / file.lexically_relative(directories.systemRoot());
}

std::vector<Path> filesOfDevice() {
  return {AccountsManager::fullPathToAccountSettingsPlist(), accountsettings::daAccountPath(),
          accountsettings::mailAccountsPath()};
}

std::optional<Source> filesThatAreThere(const std::vector<Path>& paths) {
  Source source;
  for (const Path& path : paths) {
    if (stands(path)) source.files.push_back(fileAt(path));
  }
  return source.files.empty() ? std::nullopt : std::optional{std::move(source)};
}

std::optional<Source> deviceAt(const Path& root) {
  std::vector<Path> paths;
  for (const Path& file : filesOfDevice()) paths.push_back(underRoot(root, root / "var/mobile", file));
  return filesThatAreThere(paths);
}

// --- Snapshots ---

std::string checksumOf(const std::uint8_t* bytes, std::size_t size) {
  std::array<char, SHA256_DIGEST_STRING_LENGTH> digits{};
  return ::SHA256Data(bytes, size, digits.data());
}

[[noreturn]] void failDamaged(const Path& path) { fail("the snapshot is damaged: " + path.string()); }

platform::Bytes bytesOf(const Path& path, std::size_t limit) {
  auto read = platform::current().files->read(path, limit);
  if (!read.isOk()) fail("the file cannot be read: " + path.string() + ": " + read.status().reason());
  return read.take();
}

Json manifestOf(const Path& snapshot) {
  const Path path = snapshot / kManifest;
  const auto bytes = bytesOf(path, kLargestManifest);
  const auto json = Json::parse(bytes, nullptr, false);
  if (!json.is_object() || !json.contains("manifest") || !json.contains("sha256")) failDamaged(path);
  const std::string text = json["manifest"].dump(-1, ' ', false, Json::error_handler_t::replace);
  if (json["sha256"] != checksumOf(reinterpret_cast<const std::uint8_t*>(text.data()), text.size())) failDamaged(path);
  return json["manifest"];
}

// The path of a copy that is as the manifest says; nothing for a file of which there is no copy with accounts.
std::optional<Path> copyOf(const Path& snapshot, const Json& file) {
  const bool holdsAccounts = file.at("part") == "settings" || file.at("part") == "legacy";
  if (!holdsAccounts || file.at("state") != "file") return std::nullopt;
  const auto name = file.at("copy").get<std::string>();
  if (name.find_first_not_of("0123456789") != std::string::npos) failDamaged(snapshot / kManifest);
  const Path path = snapshot / name;
  const auto bytes = bytesOf(path, kLargestCopy);
  if (file.at("sha256") != checksumOf(bytes.data(), bytes.size())) failDamaged(path);
  return path;
}

Source snapshotAt(const Path& snapshot) {
  Source source;
  try {
    const Json manifest = manifestOf(snapshot);
    for (const Json& file : manifest.at("files")) {
      if (const auto path = copyOf(snapshot, file)) source.files.push_back(fileAt(*path));
    }
  } catch (const Json::exception&) {
    failDamaged(snapshot / kManifest);
  }
  if (source.files.empty()) fail("the snapshot has no file of accounts: " + snapshot.string());
  return source;
}

// The snapshots of a directory, the oldest first: the number at the front of their names counts.
std::vector<Path> snapshotsIn(const Path& directory) {
  std::vector<Path> snapshots;
  std::error_code failure;
  for (const auto& entry : std::filesystem::directory_iterator{directory, failure}) {
    if (!entry.path().filename().native().starts_with('.') && stands(entry.path() / kManifest)) {
      snapshots.push_back(entry.path());
    }
  }
  std::ranges::sort(snapshots);
  return snapshots;
}

Path snapshotNamed(const std::string& word, const Path& directory) {
  auto snapshots = snapshotsIn(directory);
  if (word == kLatest && !snapshots.empty()) return snapshots.back();
  std::erase_if(snapshots, [&](const Path& each) { return !each.filename().native().starts_with(word); });
  if (snapshots.size() == 1) return snapshots.front();
  const std::string where = "among the snapshots in " + directory.string();
  if (snapshots.empty()) {
    throw Failure{ExitStatus::wrongUse, "there is no file " + word + ", and none " + where + " is called so"};
  }
  throw Failure{ExitStatus::wrongUse, "several " + where + " begin with " + word};
}

// --- What a word means ---

std::vector<Chosen> allIn(const Source& source) {
  std::vector<Chosen> all;
  for (const AccountFile& file : source.files) {
    for (const FoundAccount& account : file.accounts) all.push_back({&file, &account});
  }
  return all;
}

template <typename Condition>
std::vector<Chosen> selected(std::vector<Chosen> all, const Condition& isMeant) {
  std::erase_if(all, [&](const Chosen& each) { return !isMeant(*each.account); });
  return all;
}

}  // namespace

Source deviceSource() {
  if (auto source = filesThatAreThere(filesOfDevice())) return *std::move(source);
  fail("the device has no file of accounts: " + AccountsManager::fullPathToAccountSettingsPlist().string());
}

Source sourceNamed(const std::string& word, const Options& options) {
  if (word.empty()) throw Failure{ExitStatus::wrongUse, "what is to be read has no name"};
  const Path path = std::filesystem::absolute(word);
  const Path usual = platform::current().directories->systemRoot() / kUsualSnapshots;
  if (!stands(path)) return snapshotAt(snapshotNamed(word, options.snapshots.value_or(usual)));
  if (!isDirectory(path)) return {{fileAt(path)}};
  if (stands(path / kManifest)) return snapshotAt(path);
  if (auto source = deviceAt(path)) return *std::move(source);
  fail("there are no accounts in " + path.string() + ": it is no snapshot, and no device's root with such files");
}

Chosen accountMeantBy(const Source& source, const std::string& word) {
  const auto all = allIn(source);
  const auto namesOfAccount = [](const FoundAccount& account) { return namesOf(account.record); };
  auto meant = selected(all, [&](const auto& each) { return each.place() == word; });
  if (meant.empty()) meant = selected(all, [&](const auto& each) { return namesOfAccount(each).identifier == word; });
  if (meant.empty()) meant = selected(all, [&](const auto& each) { return namesOfAccount(each).areMeantBy(word); });
  if (meant.empty()) throw Failure{ExitStatus::noSuchAccount, "no account is called " + word + " there"};
  if (meant.size() == 1) return meant.front();
  std::string message = "several accounts are meant by " + word + ": ";
  for (const Chosen& each : meant) message += (&each == meant.data() ? "" : "; ") + each.account->described();
  throw Failure{ExitStatus::wrongUse, message};
}

}  // namespace tools
