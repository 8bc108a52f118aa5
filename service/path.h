#pragma once
// The path of a file or folder within an account, as requests and answers write it.
#include <string>
#include <string_view>
#include <vector>

// Below /dav/. An empty list is the account's root folder. A part is a name of 1 to 255 bytes of valid UTF-8 without
// '/' and NUL, and is neither "." nor "..".
struct Path {
    std::vector<std::string> parts;
    bool slash = false; // the address ended with '/'

    bool root() const
    {
        return parts.empty();
    }
    // "" for the root.
    std::string name() const;
    // The names above name(), joined by '/'.
    std::string folder() const;
    // All names, joined by '/'.
    std::string whole() const;
    // Whether `other` lies below this.
    bool holds(const Path &other) const;
    // The percent-encoded address ("/dav/a%20b"), ending with '/' for folders.
    std::string href(bool is_folder) const;
};

// Appends `name` percent-encoded; only the unreserved characters of RFC 3986 stand for themselves.
void append_encoded(std::string &out, std::string_view name);

// Whether every name in a folder on disk can be part of a Path: not "." or "..", and valid UTF-8.
bool valid_name(const std::string &name);

// Reads the path of a URI as it was sent ("/dav/a%20b"). The result is 0, or the HTTP status that says what is wrong
// with it: 404 not below /dav, 400 not a path of ours, 414 a name over 255 bytes or over 128 names.
int parse_path(const char *uri_path, Path &path);
// The same for a path below the account's root that is not encoded ("/a b").
int parse_plain_path(const std::string &text, Path &path);
