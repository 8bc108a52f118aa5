#include "cloud_content_sync/names.h"
#include "cloud_content_sync/cloud_content_sync.h"
#include <algorithm>
#include <array>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <glib.h>

namespace cloud {

static constexpr size_t NAME_BYTES_MAX = 255;

bool name_is_valid(std::string_view name)
{
    return !name.empty() && name != "." && name != ".." && name.find('/') == name.npos && name.find('\0') == name.npos;
}

bool path_is_valid(std::string_view path)
{
    if (path.empty() || path.front() != '/')
        return false;
    if (path == "/")
        return true;
    while (!path.empty()) {
        path.remove_prefix(1);
        const size_t end = std::min(path.find('/'), path.size());
        if (!name_is_valid(path.substr(0, end)))
            return false;
        path.remove_prefix(end);
    }
    return true;
}

std::string parent_of(const std::string &path)
{
    const size_t slash = path.rfind('/');
    return slash == 0 || slash == path.npos ? "/" : path.substr(0, slash);
}

std::string name_of(const std::string &path)
{
    return path.substr(path.rfind('/') + 1);
}

std::string join(const std::string &folder, const std::string &name)
{
    return folder == "/" ? "/" + name : folder + "/" + name;
}

std::string percent_encode(const std::string &path)
{
    static constexpr char HEX[] = "0123456789ABCDEF";
    std::string encoded;
    encoded.reserve(path.size() + 16);
    for (const char c : path) {
        const auto byte = static_cast<unsigned char>(c);
        if (g_ascii_isalnum(c) || c == '-' || c == '.' || c == '_' || c == '~' || c == '/')
            encoded += c;
        else
            encoded.append({'%', HEX[byte >> 4], HEX[byte & 15]});
    }
    return encoded;
}

static std::string percent_decode(std::string_view text)
{
    std::string decoded;
    decoded.reserve(text.size());
    for (size_t i = 0; i < text.size(); i++) {
        if (text[i] == '%' && i + 2 < text.size() && g_ascii_isxdigit(text[i + 1]) && g_ascii_isxdigit(text[i + 2])) {
            decoded += static_cast<char>(g_ascii_xdigit_value(text[i + 1]) * 16 + g_ascii_xdigit_value(text[i + 2]));
            i += 2;
        } else {
            decoded += text[i];
        }
    }
    return decoded;
}

std::optional<std::string> path_of_href(std::string_view href)
{
    if (const size_t scheme = href.find("://"); scheme != href.npos && scheme < href.find('/')) {
        const size_t path = href.find('/', scheme + 3);
        href = path == href.npos ? "/" : href.substr(path);
    }
    if (href.empty() || href.front() != '/')
        return {};
    href = href.substr(0, href.find_first_of("?#"));
    std::string path;
    while (!href.empty()) {
        href.remove_prefix(1);
        const size_t end = std::min(href.find('/'), href.size());
        // Two slashes in a row are one, as file systems have it.
        if (const std::string name = percent_decode(href.substr(0, end)); !name.empty()) {
            if (!name_is_valid(name))
                return {};
            path += "/" + name;
        }
        href.remove_prefix(end);
    }
    return path.empty() ? "/" : path;
}

static size_t utf8_boundary(const std::string &text, size_t size)
{
    while (size > 0 && size < text.size() && (static_cast<unsigned char>(text[size]) & 0xC0) == 0x80)
        size--;
    return std::min(size, text.size());
}

// A base such as "photo(3)" with a counter of 1 or more: its stem, and the counter. 0 when it has none.
static long counter_of(const std::string &base, std::string &stem)
{
    if (base.empty() || base.back() != ')')
        return 0;
    const size_t open = base.rfind('(', base.size() - 1);
    if (open == base.npos)
        return 0;
    const long counter = std::strtol(base.c_str() + open + 1, nullptr, 10);
    if (counter < 1 || counter >= INT32_MAX) // the next number must be one that can be written
        return 0;
    stem = base.substr(0, open);
    return counter;
}

std::string next_free_name(const std::string &name)
{
    const size_t dot = name.rfind('.');
    // An "extension" that fills the name is none: there would be no room for the counter.
    const bool has_extension = dot != name.npos && name.size() - dot < NAME_BYTES_MAX / 2;
    std::string head = has_extension ? name.substr(0, dot) : name;
    const std::string extension = has_extension ? name.substr(dot) : "";
    std::string stem;
    const long counter = counter_of(head, stem);
    if (counter)
        head = stem;
    const std::string tail = "(" + std::to_string(counter + 1) + ")" + extension;
    if (head.size() + tail.size() > NAME_BYTES_MAX)
        head.resize(utf8_boundary(head, NAME_BYTES_MAX - tail.size()));
    return head + tail;
}

int content_type_of(const std::string &name)
{
    static constexpr std::array IMAGES = {"avif", "bmp", "gif", "heic", "heif", "ico",  "jpe", "jpeg", "jpg",
                                          "jxl",  "dng", "png", "svg",  "tif",  "tiff", "raw", "wbmp", "webp"};
    static constexpr std::array VIDEOS = {"3g2", "3gp", "asf", "avi",  "divx", "flv", "m2ts", "m4v",  "mkv",
                                          "mov", "mp4", "mpe", "mpeg", "mpg",  "mts", "ogv",  "webm", "wmv"};
    const size_t dot = name.rfind('.');
    if (dot == name.npos)
        return CLOUD_CONTENT_TYPE_NONE;
    const char *extension = name.c_str() + dot + 1;
    const auto equal = [&](const char *known) { return g_ascii_strcasecmp(known, extension) == 0; };
    if (std::any_of(IMAGES.begin(), IMAGES.end(), equal))
        return CLOUD_CONTENT_TYPE_IMAGE;
    return std::any_of(VIDEOS.begin(), VIDEOS.end(), equal) ? CLOUD_CONTENT_TYPE_VIDEO : CLOUD_CONTENT_TYPE_NONE;
}

std::string sort_key(const std::string &name)
{
    g_autofree char *valid = g_utf8_make_valid(name.data(), static_cast<gssize>(name.size()));
    g_autofree char *folded = g_utf8_casefold(valid, -1);
    g_autofree char *plain = g_utf8_normalize(folded, -1, G_NORMALIZE_ALL);
    std::string key;
    for (const char *at = plain; *at;) {
        if (!g_ascii_isdigit(*at)) {
            key += *at++;
            continue;
        }
        // A number is preceded by its length, so that bytes compare as numbers do.
        while (*at == '0' && g_ascii_isdigit(at[1]))
            at++;
        const char *end = at;
        while (g_ascii_isdigit(*end))
            end++;
        key += static_cast<char>('0' + std::min<long>(end - at, 9));
        key.append(at, end);
        at = end;
    }
    return key;
}

} // namespace cloud

int cloud_content_sync_name_get_next(const char *name, char **next)
{
    if (!name || !*name || !next)
        return CLOUD_CONTENT_SYNC_ERROR_INVALID_PARAMETER;
    *next = strdup(cloud::next_free_name(name).c_str());
    if (!*next)
        std::abort();
    return CLOUD_CONTENT_SYNC_ERROR_NONE;
}
