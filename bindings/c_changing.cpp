#include "bindings/c_handles.h"

using accounts::c::areGiven;
using accounts::c::handle;
using accounts::c::isDone;
using accounts::c::made;
using accounts::c::orElse;
using accounts::c::orEmpty;

extern "C" {

account_settings_edit* account_settings_edit_begin(const account_settings* settings, account_settings_error** error) {
  return made(error, [&]() -> account_settings_edit* {
    auto edit = settings->settings.edit();
    return isDone(edit, error) ? new account_settings_edit{std::move(edit).value()} : nullptr;
  });
}

account_settings_edit* account_settings_trial_begin(const account_settings* settings, account_settings_error** error) {
  return made(error, [&]() -> account_settings_edit* {
    auto edit = settings->settings.trial();
    return isDone(edit, error) ? new account_settings_edit{std::move(edit).value()} : nullptr;
  });
}

account_settings_accounts* account_settings_edit_accounts(const account_settings_edit* edit) {
  return orElse(static_cast<account_settings_accounts*>(nullptr), [&] {
    return new account_settings_accounts{edit->edit.accounts(), std::nullopt};
  });
}

account_settings_account* account_settings_edit_find(const account_settings_edit* edit, const char* identifier) {
  if (identifier == nullptr) return nullptr;
  return orElse(static_cast<account_settings_account*>(nullptr),
                [&] { return handle<account_settings_account>(edit->edit.account(identifier)); });
}

account_settings_account* account_settings_edit_add(account_settings_edit* edit, const char* type,
                                                    const char* account_class, const account_settings_value* properties,
                                                    const char* parent, account_settings_error** error) {
  return made(error, [&]() -> account_settings_account* {
    accounts::NewAccount account{orEmpty(type), orEmpty(account_class), {}, orEmpty(parent)};
    if (properties != nullptr) account.properties = properties->whole().dictionary().value_or(account.properties);
    const auto added = edit->edit.add(account);
    return isDone(added, error) ? new account_settings_account{*added} : nullptr;
  });
}

bool account_settings_edit_remove(account_settings_edit* edit, const char* identifier, account_settings_error** error) {
  return made(error, [&] { return areGiven({identifier}, error) && isDone(edit->edit.remove(identifier), error); });
}

bool account_settings_edit_set(account_settings_edit* edit, const char* identifier, const char* key,
                               const account_settings_value* value, account_settings_error** error) {
  return made(error, [&] {
    if (!areGiven({identifier, key, value}, error)) return false;
    return isDone(edit->edit.set(identifier, key, value->whole()), error);
  });
}

bool account_settings_edit_erase(account_settings_edit* edit, const char* identifier, const char* key,
                                 account_settings_error** error) {
  return made(error, [&] {
    return areGiven({identifier, key}, error) && isDone(edit->edit.erase(identifier, key), error);
  });
}

bool account_settings_edit_set_enabled(account_settings_edit* edit, const char* identifier, const char* dataclass,
                                       bool enabled, account_settings_error** error) {
  return made(error, [&] {
    if (!areGiven({identifier, dataclass}, error)) return false;
    return isDone(edit->edit.setEnabled(identifier, dataclass, enabled), error);
  });
}

account_settings_error* account_settings_edit_failure(const account_settings_edit* edit) {
  return orElse(static_cast<account_settings_error*>(nullptr), [&]() -> account_settings_error* {
    const auto failure = edit->edit.failure();
    return failure ? new account_settings_error{static_cast<int32_t>(failure->code), failure->sentence} : nullptr;
  });
}

void account_settings_edit_rewrite(account_settings_edit* edit) { edit->edit.rewrite(); }

account_settings_changes* account_settings_edit_save(account_settings_edit* edit, account_settings_error** error) {
  return made(error, [&]() -> account_settings_changes* {
    auto saved = edit->edit.save();
    if (!isDone(saved, error)) return nullptr;
    return new account_settings_changes{std::move(saved->changes), std::move(saved->notAnnounced)};
  });
}

void account_settings_edit_free(account_settings_edit* edit) { delete edit; }

bool account_settings_will_change(const account_settings* settings, const account_settings_account* account,
                                  const char* dataclass, account_settings_error** error) {
  return made(error, [&] {
    if (!areGiven({dataclass}, error)) return false;
    return isDone(settings->settings.willChange(account->account, dataclass), error);
  });
}

bool account_settings_did_change(const account_settings* settings, const account_settings_account* account,
                                 const char* dataclass, account_settings_error** error) {
  return made(error, [&] {
    if (!areGiven({dataclass}, error)) return false;
    return isDone(settings->settings.didChange(account->account, dataclass), error);
  });
}

size_t account_settings_changes_count(const account_settings_changes* changes) { return changes->changes.size(); }

int32_t account_settings_changes_kind(const account_settings_changes* changes, size_t place) {
  return place < changes->changes.size() ? static_cast<int32_t>(changes->changes[place].kind) : -1;
}

account_settings_account* account_settings_changes_account(const account_settings_changes* changes, size_t place) {
  if (place >= changes->changes.size()) return nullptr;
  return orElse(static_cast<account_settings_account*>(nullptr),
                [&] { return new account_settings_account{changes->changes[place].account}; });
}

const char* account_settings_changes_key(const account_settings_changes* changes, size_t place, size_t key) {
  if (place >= changes->changes.size()) return nullptr;
  const auto& keys = changes->changes[place].keys;
  return key < keys.size() ? keys[key].c_str() : nullptr;
}

const char* account_settings_changes_not_announced(const account_settings_changes* changes) {
  return changes->notAnnounced ? changes->notAnnounced->sentence.c_str() : nullptr;
}

size_t account_settings_changes_key_count(const account_settings_changes* changes, size_t place) {
  return place < changes->changes.size() ? changes->changes[place].keys.size() : 0;
}

void account_settings_changes_free(account_settings_changes* changes) { delete changes; }

account_settings_watch* account_settings_watch_begin(const account_settings* settings,
                                                     const account_settings_accounts* since,
                                                     account_settings_callback callback, void* data, int32_t caller,
                                                     account_settings_error** error) {
  return made(error, [&]() -> account_settings_watch* {
    if (!since->whole) {
      const std::string sentence =
          "a watch begins with the accounts of a device, as account_settings_look answers them";
      accounts::c::tell(error, ACCOUNT_SETTINGS_UNSUITABLE, sentence);
      return nullptr;
    }
    const auto told = [callback, data](const accounts::Change& change) {
      const account_settings_changes changes{{change}, std::nullopt};
      callback(&changes, data);
    };
    auto watch = settings->settings.watch(*since->whole, told, static_cast<accounts::Watch::Caller>(caller));
    return isDone(watch, error) ? new account_settings_watch{std::move(watch).value()} : nullptr;
  });
}

int account_settings_watch_descriptor(const account_settings_watch* watch) { return watch->watch.descriptor(); }

void account_settings_watch_dispatch(account_settings_watch* watch) {
  orElse(false, [&] {
    watch->watch.dispatch();
    return true;
  });
}

void account_settings_watch_free(account_settings_watch* watch) { delete watch; }

}  // extern "C"
