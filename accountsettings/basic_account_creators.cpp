#include <algorithm>

#include "accountsettings/assertion_failure.h"
#include "accountsettings/basic_account.h"
#include "accountsettings/file_paths.h"
#include "accountsettings/log_handle.h"
#include "accountsettings/service_objects.h"
#include "platform/platform.h"

namespace accountsettings {
namespace {

constexpr std::string_view kFullAccount = "FullAccount";
constexpr std::string_view kSyncAccount = "SyncAccount";
constexpr int kCredentialsNotRenewed = 3;

constexpr std::string_view kNoDescription =
    "Malformed AccountCreators information. Could not find the description for the %@ with type %@";
constexpr std::string_view kNoFramework =
    "Malformed AccountCreators information. Could not find the path to the framework for the %@ with type %@";
constexpr std::string_view kNoClass =
    "Malformed AccountCreators information. Could not find the name of the class that creates %@ with the type %@";

// What is looked for: the creator of one kind for one account type.
struct Search {
  std::optional<std::string_view> type;
  std::string_view creatorType;
};

template <typename... Arguments>
[[noreturn]] void failLookup(std::string_view format, const Arguments&... arguments) {
  failAssertion("-[BasicAccount _creatorClassNameForAccountType:creatorType:loader:]", "BasicAccount", format,
                {records::MessageArgument{arguments}...});
}

template <typename Found>
const Found& required(const Found* found, std::string_view whatIsMissing, const Search& search) {
  if (found == nullptr) failLookup(whatIsMissing, search.creatorType, search.type);
  return *found;
}

void openModule(const std::string& path) {
  // The loader is handed an ASCII path; one that has no such form cannot be opened.
  const bool isASCII = std::ranges::all_of(path, [](char byte) { return static_cast<unsigned char>(byte) < 0x80; });
  const platform::Status opened =
      isASCII ? platform::current().modules->open(path)
              : platform::Status::failure(platform::Cause::unsuitable, "open a module", "the path is not ASCII");
  if (!opened.isOk()) failLookup("Could not load the account creator framework %@. Error %s", path, opened.reason());
}

// Only full accounts have loaders.
bool isLoadedBy(const AccountClassInfo* loader, const Search& search, const Dictionary& properties) {
  if (loader == nullptr || search.creatorType != kFullAccount) return false;
  if (!loader->loadBundleForAccountWithProperties) {
    failLookup("The loader %@ does not answer loadBundleForAccountWithProperties:", loader->name());
  }
  return loader->loadBundleForAccountWithProperties(properties);
}

std::shared_ptr<FullAccountObject> makeFullAccount(const platform::ClassInfo& info,
                                                   const std::shared_ptr<BasicAccount>& account) {
  const auto* const creator = dynamic_cast<const AccountClassInfo*>(&info);
  if (creator == nullptr) return nullptr;
  if (creator->classForAccountType) {
    const AccountClassInfo* const made = creator->classForAccountType(account->type().value_or(Text{}));
    return made == nullptr || !made->initWithProperties ? nullptr : made->initWithProperties(account->properties());
  }
  return creator->accountWithBasicAccount ? creator->accountWithBasicAccount(account) : nullptr;
}

}  // namespace

// Defined here, so that the types have one home and are the same in the library and in every module.
FullAccountObject::~FullAccountObject() = default;
SyncAccountObject::~SyncAccountObject() = default;
AccountClassInfo::~AccountClassInfo() = default;
ServiceAccountObject::~ServiceAccountObject() = default;
RefreshQueueObject::~RefreshQueueObject() = default;

std::optional<std::string> BasicAccount::_creatorClassNameForAccountType_creatorType_loader(
    std::optional<std::string_view> type, std::string_view creatorType, const AccountClassInfo* loader) const {
  const Dictionary* const table = _accountCreationMap();
  const Array* const entries = table == nullptr || !type ? nullptr : table->array(*type);
  if (entries == nullptr) {
    failLookup("Malformed AccountCreators information. Could not find the information for the type %@", type);
  }
  const Search search{type, creatorType};
  std::optional<std::string> className;
  // Every matching entry's module is opened; the last one's class counts.
  for (const PropertyValue& entry : *entries) {
    const Dictionary* const creator = entry.asDictionary();
    const Text* const kind = creator == nullptr ? nullptr : creator->text("Type");
    if (kind == nullptr || *kind != creatorType) continue;
    const Dictionary& description = required(creator->dictionary("Description"), kNoDescription, search);
    if (!isLoadedBy(loader, search, _properties)) {
      openModule(modulePath(required(description.text("Framework"), kNoFramework, search)));
    }
    const Text* const name = description.text("Class");
    className = required(name == nullptr || name->empty() ? nullptr : name, kNoClass, search).string();
  }
  return className;
}

std::optional<std::string> BasicAccount::fullAccountCreatorClassNameForAccountType_loader(
    std::optional<std::string_view> type, const AccountClassInfo* loader) const {
  return _creatorClassNameForAccountType_creatorType_loader(type, kFullAccount, loader);
}

std::optional<std::string> BasicAccount::syncAccountCreatorClassNameForAccountType(
    std::optional<std::string_view> type) const {
  return _creatorClassNameForAccountType_creatorType_loader(type, kSyncAccount, nullptr);
}

std::shared_ptr<FullAccountObject> BasicAccount::fullAccountUsingLoader(const AccountClassInfo* loader) {
  static constexpr std::string_view kMethod = "-[BasicAccount fullAccountUsingLoader:]";
  if (_fullAccount != nullptr) return _fullAccount;
  const auto className = fullAccountCreatorClassNameForAccountType_loader(type(), loader);
  const platform::ClassInfo* const info = className ? platform::current().classes->classNamed(*className) : nullptr;
  if (info == nullptr) {
    failAssertion(kMethod, "BasicAccount", "The framework/bundle where %@ is defined has not been loaded", {className});
  }
  const std::shared_ptr<FullAccountObject> account = makeFullAccount(*info, shared_from_this());
  if (account == nullptr) {
    failAssertion(kMethod, "BasicAccount", "Could not create the account with class %@ and id %@",
                  {className, identifier()});
  }
  account->setParentAccount(parentAccount());
  setFullAccount(account);
  return _fullAccount;
}

void BasicAccount::setFullAccount(std::shared_ptr<FullAccountObject> account) { _fullAccount.swap(account); }

std::shared_ptr<SyncAccountObject> BasicAccount::_cachedSyncAccount() {
  static constexpr const char* kMethod = "-[BasicAccount _cachedSyncAccount]";
  if (_syncAccount != nullptr) return _syncAccount;
  const auto className = syncAccountCreatorClassNameForAccountType(type());
  if (!className) return nullptr;
  const platform::ClassInfo* const info = platform::current().classes->classNamed(*className);
  if (info == nullptr) {
    _ASLogSystem().log(kMethod,
                       "ERROR: The framework/bundle where %@ is defined has not been loaded, so there is no syncable "
                       "account for basic account with properties %@",
                       *className, _properties);
    return nullptr;
  }
  const auto* const creator = dynamic_cast<const AccountClassInfo*>(info);
  const bool answers = creator != nullptr && creator->accountToRefreshForBasicAccount;
  _syncAccount = answers ? creator->accountToRefreshForBasicAccount(shared_from_this()) : nullptr;
  if (_syncAccount == nullptr) {
    _ASLogSystem().log(kMethod, "ERROR: Could not create the account with class %@ and id %@", *className,
                       identifier());
  }
  return _syncAccount;
}

bool BasicAccount::refreshContainerWithIdentifier_forDataclass_isUserRequested(std::string_view identifier,
                                                                               std::string_view dataclass,
                                                                               bool isUserRequested) {
  const auto account = _cachedSyncAccount();
  return account != nullptr &&
         account->refreshContainerWithIdentifier_forDataclass_isUserRequested(identifier, dataclass, isUserRequested);
}

bool BasicAccount::refreshContainerListForDataclass_isUserRequested(std::string_view dataclass, bool isUserRequested) {
  const auto account = _cachedSyncAccount();
  return account != nullptr && account->refreshContainerListForDataclass_isUserRequested(dataclass, isUserRequested);
}

bool BasicAccount::refreshContainersForDataclass_isUserRequested(std::string_view dataclass, bool isUserRequested) {
  const auto account = _cachedSyncAccount();
  return account != nullptr && account->refreshContainersForDataclass_isUserRequested(dataclass, isUserRequested);
}

bool BasicAccount::refreshContainerWithIdentifier_forDataclass(std::string_view identifier,
                                                               std::string_view dataclass) {
  return refreshContainerWithIdentifier_forDataclass_isUserRequested(identifier, dataclass, false);
}

bool BasicAccount::refreshContainerListForDataclass(std::string_view dataclass) {
  return refreshContainerListForDataclass_isUserRequested(dataclass, false);
}

bool BasicAccount::refreshContainersForDataclass(std::string_view dataclass) {
  return refreshContainersForDataclass_isUserRequested(dataclass, false);
}

void BasicAccount::renewAccountCredentialsWithHandler(const std::function<void(int)>& handler) {
  handler(kCredentialsNotRenewed);
}

}  // namespace accountsettings
