#pragma once
// The user's language. Main thread only; it changes the environment, so it comes before other threads are started.

// Sets locale and LANGUAGE by the key "db/menu_widget/language" of the settings store, else by the environment, so that
// message catalogues are found for languages whose locale is not installed, and the English one when there is no
// language or no catalogue for it (a text id is never what a person should read). True when the language is another
// one than before.
bool language_apply();
