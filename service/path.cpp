#include "path.h"
#include <cstring>
#include <glib.h>
#include <memory>

static const size_t NAME_BYTES = 255, DEPTH = 128;

std::string Path::name() const
{
    return parts.empty() ? std::string() : parts.back();
}

static std::string joined(const std::vector<std::string> &parts, size_t count)
{
    std::string text;
    for (size_t i = 0; i < count; i++) {
        if (i)
            text += '/';
        text += parts[i];
    }
    return text;
}

std::string Path::folder() const
{
    return parts.empty() ? std::string() : joined(parts, parts.size() - 1);
}

std::string Path::whole() const
{
    return joined(parts, parts.size());
}

bool Path::holds(const Path &other) const
{
    return other.parts.size() > parts.size() && std::equal(parts.begin(), parts.end(), other.parts.begin());
}

void append_encoded(std::string &out, std::string_view name)
{
    static const char digits[] = "0123456789ABCDEF";
    for (const char c : name) {
        const auto byte = static_cast<unsigned char>(c);
        if (g_ascii_isalnum(c) || c == '-' || c == '.' || c == '_' || c == '~') {
            out += c;
        } else {
            out += '%';
            out += digits[byte >> 4];
            out += digits[byte & 15];
        }
    }
}

std::string Path::href(bool is_folder) const
{
    std::string text = "/dav";
    for (const std::string &part : parts) {
        text += '/';
        append_encoded(text, part);
    }
    if (is_folder)
        text += '/';
    return text;
}

bool valid_name(const std::string &name)
{
    return !name.empty() && name != "." && name != ".." && name.find('/') == std::string::npos &&
           g_utf8_validate(name.data(), static_cast<gssize>(name.size()), nullptr);
}

int parse_path(const char *uri_path, Path &path)
{
    path = {};
    if (std::strncmp(uri_path, "/dav", 4) != 0 || (uri_path[4] && uri_path[4] != '/'))
        return 404;
    std::string_view rest(uri_path + 4);
    path.slash = rest.empty() || rest.back() == '/';
    while (!rest.empty()) {
        const size_t end = std::min(rest.find('/'), rest.size());
        const std::string_view part = rest.substr(0, end);
        rest.remove_prefix(std::min(end + 1, rest.size()));
        if (part.empty())
            continue;
        // Refuses a bad escape, %00 and an escaped '/'.
        const std::unique_ptr<char, decltype(&g_free)> name(
            g_uri_unescape_segment(part.data(), part.data() + part.size(), "/"), g_free);
        if (!name || !valid_name(name.get()))
            return 400;
        if (std::strlen(name.get()) > NAME_BYTES || path.parts.size() == DEPTH)
            return 414;
        path.parts.emplace_back(name.get());
    }
    return 0;
}

int parse_plain_path(const std::string &text, Path &path)
{
    std::string encoded = "/dav/";
    for (const char &c : text) {
        if (c == '/')
            encoded += c;
        else
            append_encoded(encoded, std::string_view(&c, 1));
    }
    return parse_path(encoded.c_str(), path);
}
