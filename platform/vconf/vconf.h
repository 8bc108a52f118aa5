#pragma once
// The settings store: keys such as "db/menu_widget/language", shared by every program of the user.
//
// Keys are texts of one or more parts with '/' between them. A key that begins with "memory/" is forgotten when the
// machine starts again; all others stay. The store is the SQLite database "settings.db" in platform_data_dir(); a
// change by one process is seen by the next read of any other. Any thread may call.
//
// Every function returns 0 on success and -1 on failure: a null or empty key, a null argument, a key that has no value
// or one of the other type, a store that cannot be opened or written.

// Reads a truth value into `value`: 1 or 0. On failure `value` keeps what it had.
int vconf_get_bool(const char *key, int *value);

// The text of a key, which the caller releases with free(); null when there is none. "db/menu_widget/language", the
// language of the user interface ("de_DE.UTF-8"), is the name of the environment's LC_MESSAGES locale (setlocale(3):
// $LC_ALL, $LC_MESSAGES, $LANG) as long as nothing is stored, and null when that is "C" or "POSIX".
char *vconf_get_str(const char *key);

// Store a value, of either type before. Any `value` but 0 is true; the text is copied.
int vconf_set_bool(const char *key, int value);
int vconf_set_str(const char *key, const char *value);

// Forgets a key; one that has no value is a failure.
int vconf_unset(const char *key);

// Calls back with every key and its value as text ("true" or "false" for a truth value), sorted by key, until the
// callback returns false. The texts are valid during the call; the callback may change the store.
typedef bool (*vconf_foreach_cb)(const char *key, const char *value, bool is_bool, void *user_data);
int vconf_foreach(vconf_foreach_cb callback, void *user_data);
