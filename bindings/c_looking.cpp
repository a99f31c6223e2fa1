#include "bindings/c_handles.h"

using accounts::Account;
using accounts::Value;
using accounts::c::handle;
using accounts::c::isDone;
using accounts::c::made;
using accounts::c::orElse;
using accounts::c::orEmpty;
using accounts::c::put;

namespace {

const char* orNull(const std::string& text) { return text.empty() ? nullptr : text.c_str(); }
const char* orNull(const std::optional<std::string>& text) { return text ? text->c_str() : nullptr; }

template <typename Handle, typename Content>
Handle* newOf(Content content) noexcept {
  return orElse(static_cast<Handle*>(nullptr), [&] { return new Handle{std::move(content)}; });
}

account_settings_value* listOf(const std::vector<std::string>& texts) {
  return new account_settings_value{Value{Value::List(texts.begin(), texts.end())}};
}

account_settings_accounts* listOf(std::vector<Account> accounts) {
  return new account_settings_accounts{std::move(accounts), std::nullopt};
}

template <typename Predicate>
account_settings_account* found(const account_settings_accounts& accounts, const Predicate& isMeant) {
  for (const Account& account : accounts.list) {
    if (isMeant(account)) return new account_settings_account{account};
    for (const Account& child : account.children()) {
      if (isMeant(child)) return new account_settings_account{child};
    }
  }
  return nullptr;
}

template <typename Predicate>
account_settings_accounts* all(const account_settings_accounts& accounts, const Predicate& isMeant) {
  std::vector<Account> meant;
  for (const Account& account : accounts.list) {
    if (isMeant(account)) meant.push_back(account);
    for (const Account& child : account.children()) {
      if (isMeant(child)) meant.push_back(child);
    }
  }
  return listOf(std::move(meant));
}

constexpr account_settings_account* kNoAccount = nullptr;
constexpr account_settings_accounts* kNoAccounts = nullptr;
constexpr account_settings_value* kNoValue = nullptr;

}  // namespace

extern "C" {

int32_t account_settings_error_code(const account_settings_error* error) { return error->code; }
const char* account_settings_error_sentence(const account_settings_error* error) { return error->sentence.c_str(); }
void account_settings_error_free(account_settings_error* error) { delete error; }

account_settings* account_settings_open(const char* root, int64_t time_limit_ms, uint32_t flags,
                                        account_settings_error** error) {
  return account_settings_open_at(root, nullptr, nullptr, time_limit_ms, flags, nullptr, nullptr, error);
}

bool account_settings_wait_for_migration(const char* root, int64_t time_limit_ms, account_settings_error** error) {
  return made(error, [&] {
    accounts::OpenOptions options;
    options.root = orEmpty(root);
    options.timeLimit = std::chrono::milliseconds{time_limit_ms};
    return isDone(accounts::AccountSettings::waitForMigration(options), error);
  });
}

void account_settings_free(account_settings* settings) { delete settings; }

account_settings* account_settings_open_at(const char* root, const char* home, const char* resources,
                                           int64_t time_limit_ms, uint32_t flags,
                                           account_settings_waiting while_waiting, void* data,
                                           account_settings_error** error) {
  return made(error, [&]() -> account_settings* {
    accounts::OpenOptions options;
    options.root = orEmpty(root);
    options.home = orEmpty(home);
    options.resources = orEmpty(resources);
    options.timeLimit = std::chrono::milliseconds{time_limit_ms};
    if (while_waiting != nullptr) {
      options.whileWaiting = [while_waiting, data](const std::string& say) { while_waiting(say.c_str(), data); };
    }
    options.mayBeMissing = (flags & ACCOUNT_SETTINGS_MAY_BE_MISSING) != 0;
    options.mayDropUnreadable = (flags & ACCOUNT_SETTINGS_MAY_DROP_UNREADABLE) != 0;
    options.mayBeOfOtherRelease = (flags & ACCOUNT_SETTINGS_MAY_BE_OF_OTHER_RELEASE) != 0;
    options.mayBeMigrating = (flags & ACCOUNT_SETTINGS_MAY_BE_MIGRATING) != 0;
    options.opensModules = (flags & ACCOUNT_SETTINGS_OPENS_MODULES) != 0;
    auto settings = accounts::AccountSettings::open(options);
    return isDone(settings, error) ? new account_settings{std::move(settings).value()} : nullptr;
  });
}

account_settings_accounts* account_settings_look(const account_settings* settings, account_settings_error** error) {
  return made(error, [&]() -> account_settings_accounts* {
    const auto accounts = settings->settings.accounts();
    return isDone(accounts, error) ? new account_settings_accounts{accounts->all(), *accounts} : nullptr;
  });
}

size_t account_settings_accounts_count(const account_settings_accounts* accounts) { return accounts->list.size(); }

account_settings_account* account_settings_accounts_at(const account_settings_accounts* accounts, size_t place) {
  if (place >= accounts->list.size()) return nullptr;
  return newOf<account_settings_account>(accounts->list[place]);
}

account_settings_account* account_settings_accounts_find(const account_settings_accounts* accounts,
                                                         const char* identifier) {
  if (identifier == nullptr) return nullptr;
  return orElse(kNoAccount, [&] {
    if (accounts->whole) return handle<account_settings_account>(accounts->whole->withIdentifier(identifier));
    return found(*accounts, [&](const Account& account) { return account.identifier() == identifier; });
  });
}

account_settings_account* account_settings_accounts_find_sync(const account_settings_accounts* accounts,
                                                              const char* sync_identifier) {
  if (sync_identifier == nullptr) return nullptr;
  return orElse(kNoAccount, [&] {
    if (accounts->whole) return handle<account_settings_account>(accounts->whole->withSyncIdentifier(sync_identifier));
    return found(*accounts, [&](const Account& account) { return account.syncIdentifier() == sync_identifier; });
  });
}

account_settings_accounts* account_settings_accounts_of_type(const account_settings_accounts* accounts,
                                                             const char* type) {
  if (type == nullptr) return nullptr;
  return orElse(kNoAccounts,
                [&] { return all(*accounts, [&](const Account& account) { return account.type() == type; }); });
}

account_settings_accounts* account_settings_accounts_with_dataclass(const account_settings_accounts* accounts,
                                                                    const char* dataclass) {
  if (dataclass == nullptr) return nullptr;
  return orElse(kNoAccounts,
                [&] { return all(*accounts, [&](const Account& account) { return account.isEnabled(dataclass); }); });
}

uint64_t account_settings_accounts_version(const account_settings_accounts* accounts) {
  return accounts->whole ? accounts->whole->dataVersion() : 0;
}

size_t account_settings_accounts_unreadable(const account_settings_accounts* accounts) {
  return accounts->whole ? accounts->whole->unreadable() : 0;
}

void account_settings_accounts_free(account_settings_accounts* accounts) { delete accounts; }

const char* account_settings_account_identifier(const account_settings_account* account) {
  return orNull(account->identifier);
}
const char* account_settings_account_type(const account_settings_account* account) { return orNull(account->type); }
const char* account_settings_account_class(const account_settings_account* account) {
  return orNull(account->accountClass);
}
const char* account_settings_account_display_name(const account_settings_account* account) {
  return orNull(account->displayName);
}
const char* account_settings_account_username(const account_settings_account* account) {
  return orNull(account->username);
}
const char* account_settings_account_sync_identifier(const account_settings_account* account) {
  return orNull(account->syncIdentifier);
}
const char* account_settings_account_parent(const account_settings_account* account) { return orNull(account->parent); }

account_settings_accounts* account_settings_account_children(const account_settings_account* account) {
  return orElse(kNoAccounts, [&] { return listOf(account->account.children()); });
}

account_settings_value* account_settings_account_supported(const account_settings_account* account) {
  return orElse(kNoValue, [&] { return listOf(account->account.supportedDataclasses()); });
}

account_settings_value* account_settings_account_enabled(const account_settings_account* account) {
  return orElse(kNoValue, [&] { return listOf(account->account.enabledDataclasses()); });
}

bool account_settings_account_is_enabled(const account_settings_account* account, const char* dataclass) {
  if (dataclass == nullptr) return false;
  return orElse(false, [&] { return account->account.isEnabled(dataclass); });
}

bool account_settings_account_service(const account_settings_account* account, const char** host, uint16_t* port,
                                      bool* is_secure) {
  return orElse(false, [&] {
    std::call_once(account->serviceAsked, [&] { account->service = account->account.service(); });
    if (!account->service) return false;
    if (host != nullptr) *host = account->service->host.c_str();
    if (port != nullptr) *port = account->service->port;
    if (is_secure != nullptr) *is_secure = account->service->isSecure;
    return true;
  });
}

account_settings_value* account_settings_account_property(const account_settings_account* account, const char* key) {
  if (key == nullptr) return nullptr;
  return orElse(kNoValue, [&] { return handle<account_settings_value>(account->account.property(key)); });
}

bool account_settings_account_integer(const account_settings_account* account, const char* key, int64_t* value) {
  if (key == nullptr) return false;
  return orElse(false, [&] { return put(account->account.integer(key), value); });
}

bool account_settings_account_boolean(const account_settings_account* account, const char* key, bool* value) {
  if (key == nullptr) return false;
  return orElse(false, [&] { return put(account->account.boolean(key), value); });
}

account_settings_value* account_settings_account_properties(const account_settings_account* account) {
  return orElse(kNoValue, [&] { return new account_settings_value{Value{account->account.ownProperties()}}; });
}

const char* account_settings_account_text(const account_settings_account* account, const char* key) {
  return orElse(static_cast<const char*>(nullptr), [&]() -> const char* {
    const auto text = account->account.text(key);
    if (!text) return nullptr;
    const std::lock_guard guard{account->textsMutex};
    return account->texts.emplace(key, *text).first->second.c_str();
  });
}

bool account_settings_account_lists_dataclasses(const account_settings_account* account) {
  return orElse(false, [&] { return account->account.listsDataclasses(); });
}

void account_settings_account_free(account_settings_account* account) { delete account; }

int32_t account_settings_value_kind(const account_settings_value* value) {
  return static_cast<int32_t>(value->value.kind());
}

const char* account_settings_value_text(const account_settings_value* value) { return orNull(value->text); }

bool account_settings_value_integer(const account_settings_value* value, int64_t* integer) {
  return put(value->value.integer(), integer);
}

bool account_settings_value_unsigned(const account_settings_value* value, uint64_t* integer) {
  return put(value->value.unsignedInteger(), integer);
}

bool account_settings_value_real(const account_settings_value* value, double* real) {
  return put(value->value.real(), real);
}

bool account_settings_value_boolean(const account_settings_value* value, bool* boolean) {
  return put(value->value.boolean(), boolean);
}

bool account_settings_value_date(const account_settings_value* value, double* seconds) {
  const auto date = value->value.date();
  if (date && seconds != nullptr) *seconds = date->secondsSince2001;
  return date.has_value();
}

const uint8_t* account_settings_value_data(const account_settings_value* value, size_t* size) {
  if (!value->data) return nullptr;
  if (size != nullptr) *size = value->data->size();
  static constexpr uint8_t kNone = 0;  // of no bytes, but not NULL either
  return value->data->empty() ? &kNone : value->data->data();
}

size_t account_settings_value_count(const account_settings_value* value) {
  return value->elements.size() + value->entries.size();
}

account_settings_value* account_settings_value_at(const account_settings_value* value, size_t place) {
  if (place >= account_settings_value_count(value)) return nullptr;
  return newOf<account_settings_value>(value->entries.empty() ? value->elements[place] : value->entries[place].second);
}

const char* account_settings_value_key_at(const account_settings_value* value, size_t place) {
  return place < value->entries.size() ? value->entries[place].first.c_str() : nullptr;
}

account_settings_value* account_settings_value_of_text(const char* text) {
  if (text == nullptr) return nullptr;
  return orElse(kNoValue, [&] { return new account_settings_value{Value{text}}; });
}

account_settings_value* account_settings_value_of_integer(int64_t integer) {
  return orElse(kNoValue, [&] { return new account_settings_value{Value{integer}}; });
}

account_settings_value* account_settings_value_of_unsigned(uint64_t integer) {
  return orElse(kNoValue, [&] { return new account_settings_value{Value{integer}}; });
}

account_settings_value* account_settings_value_of_real(double real) {
  return orElse(kNoValue, [&] { return new account_settings_value{Value{real}}; });
}

account_settings_value* account_settings_value_of_boolean(bool boolean) {
  return orElse(kNoValue, [&] { return new account_settings_value{Value{boolean}}; });
}

account_settings_value* account_settings_value_of_date(double seconds) {
  return orElse(kNoValue, [&] { return new account_settings_value{Value{accounts::Date{seconds}}}; });
}

account_settings_value* account_settings_value_of_data(const uint8_t* data, size_t size) {
  if (data == nullptr && size > 0) return nullptr;
  return orElse(kNoValue, [&] { return new account_settings_value{Value{Value::Data(data, data + size)}}; });
}

account_settings_value* account_settings_value_of_list(void) {
  return orElse(kNoValue, [] { return new account_settings_value{Value{Value::List{}}}; });
}

account_settings_value* account_settings_value_of_dictionary(void) {
  return orElse(kNoValue, [] { return new account_settings_value{Value{Value::Dictionary{}}}; });
}

bool account_settings_value_append(account_settings_value* list, const account_settings_value* element) {
  if (element == nullptr || list->value.kind() != Value::Kind::list) return false;
  return orElse(false, [&] {
    list->append(element->whole());
    return true;
  });
}

bool account_settings_value_set(account_settings_value* dictionary, const char* key,
                                const account_settings_value* element) {
  if (key == nullptr || element == nullptr || dictionary->value.kind() != Value::Kind::dictionary) return false;
  return orElse(false, [&] {
    dictionary->set(key, element->whole());
    return true;
  });
}

void account_settings_value_free(account_settings_value* value) { delete value; }

}  // extern "C"
