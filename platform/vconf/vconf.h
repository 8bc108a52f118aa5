#pragma once
// The settings store: keys such as "db/menu_widget/language", shared by every program of the user.

int vconf_get_bool(const char *key, int *value);
char *vconf_get_str(const char *key);
int vconf_set_bool(const char *key, int value);
int vconf_set_str(const char *key, const char *value);
int vconf_unset(const char *key);
