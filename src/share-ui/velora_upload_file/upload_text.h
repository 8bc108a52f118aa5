#pragma once
// Words and names as the upload view shows them. Any thread, where nothing else is said.
#include <glib.h>
#include <string>

// The text of an id in the language of the view, for texts that are not set on a widget for good.
const char *__text(const char *id);
// The same for a number of things.
const char *__text_of(const char *id, int count);

// The part of a path behind its last slash; points into the path, and is null for null.
const char *__last_segment(const char *path);
// The folder that a server path lies in: "/a/b" gives "/a", "/a" gives "/".
std::string __folder_of(const std::string &path);

// A name for a text of one line in the theme, to free: escaped, for the theme's texts are markup, and with pictures in
// the place of what would break the line or turn the letters behind it around. A line break as such makes Edje's layout
// run for ever. Main loop only.
char *__one_line_markup(const char *text);

// Short words for why a transfer failed, translated.
const char *__failure_text(int error);

// A number of bytes for a line with little room: "812 KB", "1.5 MB", with the language's decimal sign.
std::string __short_size(gint64 bytes);
