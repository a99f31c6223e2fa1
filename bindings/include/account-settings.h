/* The accounts of a device, for programs in C and for bindings of other languages.
 *
 * Handles and strings: what a function hands out by pointer belongs to the caller, who frees it with the function of
 * its type; freeing NULL does nothing. A string belongs to the handle that it was asked of, and lives as long. No
 * handle needs another one to live. Strings are UTF-8.
 *
 * Errors: where something could not be done a function answers NULL or false and, where `error` is not NULL, makes an
 * error that the caller frees. Nothing is thrown and nothing ends the program. A handle that is asked something is a
 * live one; a text or a value may be NULL, and a place may be too high: NULL, false or -1 is answered then, with
 * ACCOUNT_SETTINGS_UNSUITABLE where there is an `error`. Places where something is put may be NULL.
 *
 * Threads: at each handle below stands who may use it. Whatever the handle, freeing it is left to one thread, once no
 * other one uses it.
 */
#ifndef ACCOUNT_SETTINGS_H
#define ACCOUNT_SETTINGS_H

#include <stdbool.h>
#include <stddef.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

#define ACCOUNT_SETTINGS_API __attribute__((visibility("default")))

/* What the functions below hand out and take. Those of the first group may be used by any thread at any time. */
typedef struct account_settings account_settings;
typedef struct account_settings_error account_settings_error;
typedef struct account_settings_account account_settings_account;
typedef struct account_settings_accounts account_settings_accounts; /* a list */
typedef struct account_settings_changes account_settings_changes;   /* a list */
/* Read by any thread, but while one fills it, by no other. */
typedef struct account_settings_value account_settings_value;
/* Used by one thread at a time; a thread that has one and begins another is answered
 * ACCOUNT_SETTINGS_NESTED. */
typedef struct account_settings_edit account_settings_edit;
/* Used by one thread at a time. Its callback is called by one thread at a time, and may use everything, and free the
 * watch. Freeing it waits for a call that its own thread is making, unless that call frees it. */
typedef struct account_settings_watch account_settings_watch;

/* Why something was not done. The numbers never change their meaning; later releases may add some. */
enum {
  ACCOUNT_SETTINGS_MISSING = 1,            /* the device has no accounts file */
  ACCOUNT_SETTINGS_NOT_MIGRATED = 2,       /* the accounts are an earlier release's; a migration has to upgrade them */
  ACCOUNT_SETTINGS_NEWER = 3,              /* the accounts are a later release's */
  ACCOUNT_SETTINGS_UNREADABLE = 4,         /* the file is no accounts file, or damaged */
  ACCOUNT_SETTINGS_REFUSED = 5,            /* somebody may have planted the accounts file or the lock file */
  ACCOUNT_SETTINGS_NO_PERMISSION = 6,      /* whoever runs the program may not do this */
  ACCOUNT_SETTINGS_BUSY = 7,               /* a migration or a change did not end within the time limit */
  ACCOUNT_SETTINGS_NESTED = 8,             /* this thread is changing the accounts already */
  ACCOUNT_SETTINGS_NO_SPACE = 9,           /* the disk or the user's share of it is full */
  ACCOUNT_SETTINGS_NOT_SAVED = 10,         /* the file could not be replaced for another reason */
  ACCOUNT_SETTINGS_WOULD_BE_DROPPED = 11,  /* an account could not be loaded again */
  ACCOUNT_SETTINGS_WOULD_DROP_OTHERS = 12, /* a save would remove records that this release cannot load */
  ACCOUNT_SETTINGS_UNKNOWN_ACCOUNT = 13,   /* there is no account of this identifier */
  ACCOUNT_SETTINGS_ALREADY_THERE = 14,     /* there is an account of this identifier already */
  ACCOUNT_SETTINGS_UNSUITABLE = 15,        /* a value that cannot be */
  ACCOUNT_SETTINGS_CONFLICT = 16,          /* a program that takes no lock removed or added the account meanwhile */
  ACCOUNT_SETTINGS_CANCELLED = 17,         /* the change was given up by whoever asked for it */
  ACCOUNT_SETTINGS_FINISHED = 18,          /* the edit is over */
  ACCOUNT_SETTINGS_NOT_ANNOUNCED = 19,     /* saved, but those who listen could not be told */
  ACCOUNT_SETTINGS_NOT_WATCHED = 20,       /* the file's directory cannot be watched */
  ACCOUNT_SETTINGS_BROKEN_INSTALLATION = 21, /* the library's own configuration or modules are missing */
  ACCOUNT_SETTINGS_NO_MEMORY = 22            /* there is not enough memory */
};

/* One of the codes above, and why, for people, in English. */
ACCOUNT_SETTINGS_API int32_t account_settings_error_code(const account_settings_error* error);
ACCOUNT_SETTINGS_API const char* account_settings_error_sentence(const account_settings_error* error);
/* As every function of this name: gives the handle back. */
ACCOUNT_SETTINGS_API void account_settings_error_free(account_settings_error* error);

/* --- Open --- */

enum {
  ACCOUNT_SETTINGS_MAY_BE_MISSING = 1,          /* a device without accounts has an empty list of them */
  ACCOUNT_SETTINGS_MAY_DROP_UNREADABLE = 2,     /* a change may remove records that this release cannot load */
  ACCOUNT_SETTINGS_MAY_BE_OF_OTHER_RELEASE = 4, /* an earlier or later release's can be looked at, never changed */
  ACCOUNT_SETTINGS_MAY_BE_MIGRATING = 8,        /* opening waits for no migration, though a change does */
  ACCOUNT_SETTINGS_OPENS_MODULES = 16           /* below another root, too, its account modules run in this process */
};

/* The accounts of the device whose file tree stands at `root`; NULL is the device that the program runs on. Waits for a
 * migration, and each change for another program's, no longer than the time limit. `flags` are those above, or 0. */
ACCOUNT_SETTINGS_API account_settings* account_settings_open(const char* root, int64_t time_limit_ms, uint32_t flags,
                                                             account_settings_error** error);
/* Whether no migration is under way, once that is so; false when the time limit is over. */
ACCOUNT_SETTINGS_API bool account_settings_wait_for_migration(const char* root, int64_t time_limit_ms,
                                                              account_settings_error** error);
ACCOUNT_SETTINGS_API void account_settings_free(account_settings* settings);

/* The sentence, which is lent for the call, says for whom a thread has been waiting for a second. Must not throw, or
 * jump out. */
typedef void (*account_settings_waiting)(const char* sentence, void* data);

/* As account_settings_open, with the mobile user's home directory and the directory of the configuration; NULL for
 * those of the root and of the installed library. Each thread that waits, now or for a change, calls `while_waiting`
 * where that is not NULL. */
ACCOUNT_SETTINGS_API account_settings* account_settings_open_at(const char* root, const char* home,
                                                                const char* resources, int64_t time_limit_ms,
                                                                uint32_t flags, account_settings_waiting while_waiting,
                                                                void* data, account_settings_error** error);

/* --- Look --- */

/* The accounts as the file has them now; waits for nobody. */
ACCOUNT_SETTINGS_API account_settings_accounts* account_settings_look(const account_settings* settings,
                                                                      account_settings_error** error);
/* Top-level accounts in the file's order. Of a place that is not there, and of an account that is not, NULL. */
ACCOUNT_SETTINGS_API size_t account_settings_accounts_count(const account_settings_accounts* accounts);
ACCOUNT_SETTINGS_API account_settings_account* account_settings_accounts_at(const account_settings_accounts* accounts,
                                                                            size_t place);
/* Children are found, too. */
ACCOUNT_SETTINGS_API account_settings_account* account_settings_accounts_find(const account_settings_accounts* accounts,
                                                                              const char* identifier);
ACCOUNT_SETTINGS_API account_settings_account* account_settings_accounts_find_sync(
    const account_settings_accounts* accounts, const char* sync_identifier);
/* With children behind their parents. NULL for want of memory, and where the text is. */
ACCOUNT_SETTINGS_API account_settings_accounts* account_settings_accounts_of_type(
    const account_settings_accounts* accounts, const char* type);
ACCOUNT_SETTINGS_API account_settings_accounts* account_settings_accounts_with_dataclass(
    const account_settings_accounts* accounts, const char* dataclass);
/* Of what account_settings_look answers, the data version of the file and the number of its records that this release
 * cannot load; of other lists, 0. */
ACCOUNT_SETTINGS_API uint64_t account_settings_accounts_version(const account_settings_accounts* accounts);
ACCOUNT_SETTINGS_API size_t account_settings_accounts_unreadable(const account_settings_accounts* accounts);
ACCOUNT_SETTINGS_API void account_settings_accounts_free(account_settings_accounts* accounts);

/* NULL where the account has none; a child has its parent's. */
ACCOUNT_SETTINGS_API const char* account_settings_account_identifier(const account_settings_account* account);
ACCOUNT_SETTINGS_API const char* account_settings_account_type(const account_settings_account* account);
ACCOUNT_SETTINGS_API const char* account_settings_account_class(const account_settings_account* account);
ACCOUNT_SETTINGS_API const char* account_settings_account_display_name(const account_settings_account* account);
ACCOUNT_SETTINGS_API const char* account_settings_account_username(const account_settings_account* account);
ACCOUNT_SETTINGS_API const char* account_settings_account_sync_identifier(const account_settings_account* account);
/* NULL for a top-level account. */
ACCOUNT_SETTINGS_API const char* account_settings_account_parent(const account_settings_account* account);
ACCOUNT_SETTINGS_API account_settings_accounts* account_settings_account_children(
    const account_settings_account* account);
/* Lists of texts. */
ACCOUNT_SETTINGS_API account_settings_value* account_settings_account_supported(
    const account_settings_account* account);
ACCOUNT_SETTINGS_API account_settings_value* account_settings_account_enabled(const account_settings_account* account);
ACCOUNT_SETTINGS_API bool account_settings_account_is_enabled(const account_settings_account* account,
                                                              const char* dataclass);
/* Whether the account's module knows where its service is reached. Each place may be NULL. */
ACCOUNT_SETTINGS_API bool account_settings_account_service(const account_settings_account* account, const char** host,
                                                           uint16_t* port, bool* is_secure);
/* NULL, or false, where there is none of that kind. */
ACCOUNT_SETTINGS_API account_settings_value* account_settings_account_property(const account_settings_account* account,
                                                                               const char* key);
ACCOUNT_SETTINGS_API bool account_settings_account_integer(const account_settings_account* account, const char* key,
                                                           int64_t* value);
ACCOUNT_SETTINGS_API bool account_settings_account_boolean(const account_settings_account* account, const char* key,
                                                           bool* value);
/* A dictionary of the account's own properties. */
ACCOUNT_SETTINGS_API account_settings_value* account_settings_account_properties(
    const account_settings_account* account);
/* The property where it is a text; a child's is its parent's where it has none itself. */
ACCOUNT_SETTINGS_API const char* account_settings_account_text(const account_settings_account* account,
                                                               const char* key);
/* Whether there is a list of the data classes that are switched on, be it an empty one. */
ACCOUNT_SETTINGS_API bool account_settings_account_lists_dataclasses(const account_settings_account* account);
ACCOUNT_SETTINGS_API void account_settings_account_free(account_settings_account* account);

/* --- Values --- */

enum {
  ACCOUNT_SETTINGS_TEXT,
  ACCOUNT_SETTINGS_INTEGER,
  ACCOUNT_SETTINGS_REAL,
  ACCOUNT_SETTINGS_BOOLEAN,
  ACCOUNT_SETTINGS_DATE, /* seconds since 2001-01-01 00:00:00 UTC */
  ACCOUNT_SETTINGS_DATA,
  ACCOUNT_SETTINGS_LIST,
  ACCOUNT_SETTINGS_DICTIONARY,
  ACCOUNT_SETTINGS_OTHER /* nobody reads it; it may be passed on */
};

/* One of those above. */
ACCOUNT_SETTINGS_API int32_t account_settings_value_kind(const account_settings_value* value);
/* Of another kind: NULL, false or 0. */
ACCOUNT_SETTINGS_API const char* account_settings_value_text(const account_settings_value* value);
ACCOUNT_SETTINGS_API bool account_settings_value_integer(const account_settings_value* value, int64_t* integer);
ACCOUNT_SETTINGS_API bool account_settings_value_unsigned(const account_settings_value* value, uint64_t* integer);
ACCOUNT_SETTINGS_API bool account_settings_value_real(const account_settings_value* value, double* real);
ACCOUNT_SETTINGS_API bool account_settings_value_boolean(const account_settings_value* value, bool* boolean);
ACCOUNT_SETTINGS_API bool account_settings_value_date(const account_settings_value* value, double* seconds);
ACCOUNT_SETTINGS_API const uint8_t* account_settings_value_data(const account_settings_value* value, size_t* size);
/* Of a list or a dictionary. */
ACCOUNT_SETTINGS_API size_t account_settings_value_count(const account_settings_value* value);
ACCOUNT_SETTINGS_API account_settings_value* account_settings_value_at(const account_settings_value* value,
                                                                       size_t place);
ACCOUNT_SETTINGS_API const char* account_settings_value_key_at(const account_settings_value* value, size_t place);

/* NULL for want of memory, where the text is NULL, and where the data is, but for a size of 0. */
ACCOUNT_SETTINGS_API account_settings_value* account_settings_value_of_text(const char* text);
ACCOUNT_SETTINGS_API account_settings_value* account_settings_value_of_integer(int64_t integer);
ACCOUNT_SETTINGS_API account_settings_value* account_settings_value_of_unsigned(uint64_t integer);
ACCOUNT_SETTINGS_API account_settings_value* account_settings_value_of_real(double real);
ACCOUNT_SETTINGS_API account_settings_value* account_settings_value_of_boolean(bool boolean);
ACCOUNT_SETTINGS_API account_settings_value* account_settings_value_of_date(double seconds);
ACCOUNT_SETTINGS_API account_settings_value* account_settings_value_of_data(const uint8_t* data, size_t size);
ACCOUNT_SETTINGS_API account_settings_value* account_settings_value_of_list(void);
ACCOUNT_SETTINGS_API account_settings_value* account_settings_value_of_dictionary(void);
/* Fills a list or dictionary with a copy of the element, at a cost that does not grow with what it has. False for
 * another kind, and for want of memory. */
ACCOUNT_SETTINGS_API bool account_settings_value_append(account_settings_value* list,
                                                        const account_settings_value* element);
ACCOUNT_SETTINGS_API bool account_settings_value_set(account_settings_value* dictionary, const char* key,
                                                     const account_settings_value* element);
ACCOUNT_SETTINGS_API void account_settings_value_free(account_settings_value* value);

/* --- Change --- */

/* The accounts as the file has them now, to be changed while nobody else who takes the lock changes them. Nothing
 * reaches the file before it is saved; freeing it gives the lock back. The process must not fork in between. */
ACCOUNT_SETTINGS_API account_settings_edit* account_settings_edit_begin(const account_settings* settings,
                                                                        account_settings_error** error);
/* To see what a change would do: takes no lock, and saving it writes nothing. */
ACCOUNT_SETTINGS_API account_settings_edit* account_settings_trial_begin(const account_settings* settings,
                                                                         account_settings_error** error);
/* With what was changed so far. */
ACCOUNT_SETTINGS_API account_settings_accounts* account_settings_edit_accounts(const account_settings_edit* edit);
ACCOUNT_SETTINGS_API account_settings_account* account_settings_edit_find(const account_settings_edit* edit,
                                                                          const char* identifier);
/* `properties` is a dictionary or NULL; `parent` the identifier of a top-level account or NULL. */
ACCOUNT_SETTINGS_API account_settings_account* account_settings_edit_add(account_settings_edit* edit, const char* type,
                                                                         const char* account_class,
                                                                         const account_settings_value* properties,
                                                                         const char* parent,
                                                                         account_settings_error** error);
ACCOUNT_SETTINGS_API bool account_settings_edit_remove(account_settings_edit* edit, const char* identifier,
                                                       account_settings_error** error);
ACCOUNT_SETTINGS_API bool account_settings_edit_set(account_settings_edit* edit, const char* identifier,
                                                    const char* key, const account_settings_value* value,
                                                    account_settings_error** error);
ACCOUNT_SETTINGS_API bool account_settings_edit_erase(account_settings_edit* edit, const char* identifier,
                                                      const char* key, account_settings_error** error);
ACCOUNT_SETTINGS_API bool account_settings_edit_set_enabled(account_settings_edit* edit, const char* identifier,
                                                            const char* dataclass, bool enabled,
                                                            account_settings_error** error);
/* The first of the steps above that failed, which need not be asked for its error itself; NULL where all were done. */
ACCOUNT_SETTINGS_API account_settings_error* account_settings_edit_failure(const account_settings_edit* edit);
/* Has the save write the file even where nothing was changed, so that what loading repaired stands in it. */
ACCOUNT_SETTINGS_API void account_settings_edit_rewrite(account_settings_edit* edit);
/* What was saved. The edit is over then, whatever is answered, and is still to be freed. */
ACCOUNT_SETTINGS_API account_settings_changes* account_settings_edit_save(account_settings_edit* edit,
                                                                          account_settings_error** error);
ACCOUNT_SETTINGS_API void account_settings_edit_free(account_settings_edit* edit);

/* Tell the modules that follow the data class that the account is about to change, before the edit begins, and that it
 * has, after it was saved. */
ACCOUNT_SETTINGS_API bool account_settings_will_change(const account_settings* settings,
                                                       const account_settings_account* account, const char* dataclass,
                                                       account_settings_error** error);
ACCOUNT_SETTINGS_API bool account_settings_did_change(const account_settings* settings,
                                                      const account_settings_account* account, const char* dataclass,
                                                      account_settings_error** error);

enum { ACCOUNT_SETTINGS_ADDED, ACCOUNT_SETTINGS_CHANGED, ACCOUNT_SETTINGS_REMOVED };

/* What became of how many accounts: of each, one of the kinds above, and the account as it is afterwards; one that was
 * removed, as it was before. -1 and NULL behind the last one. */
ACCOUNT_SETTINGS_API size_t account_settings_changes_count(const account_settings_changes* changes);
ACCOUNT_SETTINGS_API int32_t account_settings_changes_kind(const account_settings_changes* changes, size_t place);
ACCOUNT_SETTINGS_API account_settings_account* account_settings_changes_account(const account_settings_changes* changes,
                                                                                size_t place);
/* NULL behind the last one. */
ACCOUNT_SETTINGS_API const char* account_settings_changes_key(const account_settings_changes* changes, size_t place,
                                                              size_t key);
/* NULL where everybody who listens was told, else why not. */
ACCOUNT_SETTINGS_API const char* account_settings_changes_not_announced(const account_settings_changes* changes);
/* How many keys there are; none of an account that was added or removed, and behind the last change. */
ACCOUNT_SETTINGS_API size_t account_settings_changes_key_count(const account_settings_changes* changes, size_t place);
ACCOUNT_SETTINGS_API void account_settings_changes_free(account_settings_changes* changes);

/* --- Watch --- */

/* The change is lent for the call: a list of this one. Must not throw, or jump out. Called by the watch's own thread,
 * or by the one that dispatches. */
typedef void (*account_settings_callback)(const account_settings_changes* change, void* data);

enum { ACCOUNT_SETTINGS_OWN_THREAD, ACCOUNT_SETTINGS_EVENT_LOOP };

/* Tells of what differs from the given accounts by now, and then of every change, until it is freed. `caller` says who
 * calls: a thread of the watch's own, or whoever calls account_settings_watch_dispatch. */
ACCOUNT_SETTINGS_API account_settings_watch* account_settings_watch_begin(const account_settings* settings,
                                                                          const account_settings_accounts* since,
                                                                          account_settings_callback callback,
                                                                          void* data, int32_t caller,
                                                                          account_settings_error** error);
/* Readable when there is something to dispatch; -1 with a thread of its own. For poll(2) only. */
ACCOUNT_SETTINGS_API int account_settings_watch_descriptor(const account_settings_watch* watch);
ACCOUNT_SETTINGS_API void account_settings_watch_dispatch(account_settings_watch* watch);
ACCOUNT_SETTINGS_API void account_settings_watch_free(account_settings_watch* watch);

#ifdef __cplusplus
}
#endif

#endif
