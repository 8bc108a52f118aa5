#pragma once
// Names and paths of a cloud's tree. A server path begins with "/", its segments are plain bytes (not percent-encoded)
// and it does not end in "/" unless it is the root. All functions may be called from any thread.
#include <optional>
#include <string>
#include <string_view>

namespace cloud {

// A name that a folder may hold: not empty, not "." or "..", without "/" and NUL.
bool name_is_valid(std::string_view name);
// An absolute path whose segments are valid names; the root is one too.
bool path_is_valid(std::string_view path);

// "/a/b" -> "/a", "/a" -> "/".
std::string parent_of(const std::string &path);
std::string name_of(const std::string &path);
std::string join(const std::string &folder, const std::string &name);

// The path for use in a URL: every byte but the unreserved ones (RFC 3986, 2.3) and "/" is percent-encoded.
std::string percent_encode(const std::string &path);

// The path of a URL or of a DAV:href (RFC 4918, 8.3: an absolute URL or an absolute path), percent-decoded, as a server
// path. Nothing when a segment decodes to something that is no name, such as ".." or "a/b".
std::optional<std::string> path_of_href(std::string_view href);

// The name to try when `name` is taken: "a.jpg" -> "a(1).jpg" -> "a(2).jpg", "README" -> "README(1)". The extension is
// what follows the last dot. The base is shortened, between two UTF-8 characters, when the result would be longer than
// 255 bytes.
std::string next_free_name(const std::string &name);

// One of cloud_content_sync_content_type_e, by the extension of the name.
int content_type_of(const std::string &name);

// Names in the order of their keys (byte by byte) are in the order a person expects: case and accents count little,
// "img2" comes before "img10". The key does not depend on the locale.
std::string sort_key(const std::string &name);

} // namespace cloud
