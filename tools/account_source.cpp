#include "tools/account_source.h"

#include <sha2.h>

#include <algorithm>
#include <array>
#include <filesystem>
#include <nlohmann/json.hpp>

#include "platform/platform.h"

namespace tools {
namespace {

using platform::Path;
using Json = nlohmann::ordered_json;

constexpr std::size_t kMaxManifestSize = std::size_t{1} << 20U;
constexpr std::size_t kMaxCopySize = std::size_t{256} << 20U;  // no larger property list can be read
constexpr const char* kManifest = "manifest";
constexpr const char* kLatest = "latest";
constexpr std::string_view kUsualSnapshots = "var/lib/account-settings/snapshots";

[[noreturn]] void fail(const std::string& message) { throw Failure{ExitStatus::failed, message}; }

bool stands(const Path& path) {
  std::error_code ignored;
  return std::filesystem::symlink_status(path, ignored).type() != std::filesystem::file_type::not_found;
}

// --- Files ---

AccountFile fileAt(const Path& path) {
  const auto read = platform::current().propertyLists->readDictionary(path);
  if (!read.isOk()) fail("the file cannot be read: " + path.string() + ": " + read.status().reason());
  AccountFile file{.path = path, .form = FileForm::settings, .root = read.value(), .accounts = {}};
  const auto has = [&file](std::string_view key) { return file.root.contains(key); };
  if (has("MailAccounts") || has("DeliveryAccounts")) {
    file.form = FileForm::legacyMail;
  } else if (has("DAAccountsKey")) {
    file.form = FileForm::legacyExchange;
  } else if (!has(accountsettings::kPlistAccountsKey) && !has(accountsettings::kPlistVersionKey)) {
    fail("this is no file of accounts: " + path.string());
  }
  file.accounts = accountsIn(file);
  return file;
}

// --- Devices ---

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

// The files stand below its root, or its home, as the device's own do.
std::optional<Source> deviceAt(const Path& root) {
  const auto& directories = *platform::current().directories;
  std::vector<Path> paths;
  for (const Path& file : filesOfDevice()) {
    const Path inHome = file.lexically_relative(directories.home());
    const bool isInHome = !inHome.empty() && *inHome.begin() != "..";
    paths.push_back(isInHome ? root / "var/mobile" / inHome : root / file.lexically_relative(directories.systemRoot()));
  }
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

// The path of a copy that is as the manifest says; nothing for a file of which there is no copy with accounts.
std::optional<Path> copyOf(const Path& snapshot, const Json& file) {
  const bool holdsAccounts = file.at("part") == "settings" || file.at("part") == "legacy";
  if (!holdsAccounts || file.at("state") != "file") return std::nullopt;
  const auto name = file.at("copy").get<std::string>();
  if (name.find_first_not_of("0123456789") != std::string::npos) failDamaged(snapshot / kManifest);
  const Path path = snapshot / name;
  const auto bytes = bytesOf(path, kMaxCopySize);
  if (file.at("sha256") != checksumOf(bytes.data(), bytes.size())) failDamaged(path);
  return path;
}

Source snapshotAt(const Path& snapshot) {
  Source source;
  const Path path = snapshot / kManifest;
  try {
    const Json parsed = Json::parse(bytesOf(path, kMaxManifestSize));
    const Json& manifest = parsed.at("manifest");
    const std::string text = manifest.dump(-1, ' ', false, Json::error_handler_t::replace);
    const std::string sum = checksumOf(reinterpret_cast<const std::uint8_t*>(text.data()), text.size());
    if (parsed.at("sha256") != sum) failDamaged(path);
    for (const Json& file : manifest.at("files")) {
      if (const auto copy = copyOf(snapshot, file)) source.files.push_back(fileAt(*copy));
    }
  } catch (const Json::exception&) {
    failDamaged(path);
  }
  if (source.files.empty()) fail("the snapshot has no file of accounts: " + snapshot.string());
  return source;
}

Path snapshotNamed(const std::string& word, const Path& directory) {
  std::vector<Path> snapshots;
  std::error_code failure;
  for (const auto& entry : std::filesystem::directory_iterator{directory, failure}) {
    const std::string name = entry.path().filename().native();
    const bool isMeant = word == kLatest || name.starts_with(word);
    if (isMeant && !name.starts_with('.') && stands(entry.path() / kManifest)) snapshots.push_back(entry.path());
  }
  // The last one is the latest: the number at the front of their names counts.
  std::ranges::sort(snapshots);
  if (!snapshots.empty() && (word == kLatest || snapshots.size() == 1)) return snapshots.back();
  const std::string where = "among the snapshots in " + directory.string();
  if (snapshots.empty()) {
    throw Failure{ExitStatus::wrongUse, "there is no file " + word + ", and none " + where + " is called so"};
  }
  throw Failure{ExitStatus::wrongUse, "several " + where + " begin with " + word};
}

// --- What a word means ---

template <typename Condition>
std::vector<Chosen> selected(const Source& source, const Condition& isMeant) {
  std::vector<Chosen> meant;
  for (const AccountFile& file : source.files) {
    for (const FoundAccount& account : file.accounts) {
      if (isMeant(account)) meant.push_back({&file, &account});
    }
  }
  return meant;
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
  std::error_code ignored;
  if (!std::filesystem::is_directory(path, ignored)) return {{fileAt(path)}};
  if (stands(path / kManifest)) return snapshotAt(path);
  if (auto source = deviceAt(path)) return *std::move(source);
  fail("there are no accounts in " + path.string() + ": it is no snapshot, and no device's root with such files");
}

Chosen accountMeantBy(const Source& source, const std::string& word) {
  const auto namesOfAccount = [](const FoundAccount& account) { return namesOf(account.record); };
  auto meant = selected(source, [&](const auto& each) { return each.place() == word; });
  if (meant.empty())
    meant = selected(source, [&](const auto& each) { return namesOfAccount(each).identifier == word; });
  if (meant.empty()) meant = selected(source, [&](const auto& each) { return namesOfAccount(each).areMeantBy(word); });
  if (meant.empty()) throw Failure{ExitStatus::noSuchAccount, "no account is called " + word + " there"};
  if (meant.size() == 1) return meant.front();
  std::string message = "several accounts are meant by " + word + ": ";
  for (const Chosen& each : meant) message += (&each == meant.data() ? "" : "; ") + each.account->described();
  throw Failure{ExitStatus::wrongUse, message};
}

}  // namespace tools
