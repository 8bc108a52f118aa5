#include "velora_upload_file/upload_text.h"
#include "cloud_content_sync/cloud_content_sync.h"
#include "velora_common/velora_app_data.h"
#include "velora_common/velora_number.h"
#include <clocale>
#include <cstdio>
#include <cstring>
#include <libintl.h>

const char *__text(const char *id)
{
    return *id ? dcgettext(VELORA_SHARE_DOMAIN, id, LC_MESSAGES) : id;
}

const char *__text_of(const char *id, int count)
{
    return dcngettext(VELORA_SHARE_DOMAIN, id, id, static_cast<unsigned long>(count), LC_MESSAGES);
}

const char *__last_segment(const char *path)
{
    const char *slash = path ? std::strrchr(path, '/') : nullptr;
    return slash ? slash + 1 : path;
}

std::string __folder_of(const std::string &path)
{
    const size_t slash = path.rfind('/');
    return slash == std::string::npos || slash == 0 ? "/" : path.substr(0, slash);
}

// What stands for a character that must not act: the sign that Unicode has for it, or the one for "no such character".
static gunichar __shown(gunichar c)
{
    constexpr gunichar first_picture = 0x2400, delete_picture = 0x2421, newline_picture = 0x2424, unknown = 0xFFFD;
    if (c < 0x20)
        return first_picture + c;
    if (c == 0x7F)
        return delete_picture;
    if (c == 0x85 || c == 0x2028 || c == 0x2029) // they break lines as well
        return newline_picture;
    // Controls, and what embeds, overrides or isolates a direction (Unicode's annex 9, 2).
    const bool turns = (c >= 0x202A && c <= 0x202E) || (c >= 0x2066 && c <= 0x2069);
    return turns || (c > 0x7F && c < 0xA0) ? unknown : c;
}

char *__one_line_markup(const char *text)
{
    char *valid = g_utf8_make_valid(text, -1);
    std::string shown;
    for (const char *at = valid; *at; at = g_utf8_next_char(at)) {
        char bytes[6];
        shown.append(bytes, static_cast<size_t>(g_unichar_to_utf8(__shown(g_utf8_get_char(at)), bytes)));
    }
    g_free(valid);
    return elm_entry_utf8_to_markup(shown.c_str());
}

const char *__failure_text(int error)
{
    switch (error) {
    case CLOUD_CONTENT_SYNC_ERROR_NETWORK:
        return __text("IDS_VELORA_BODY_NO_NETWORK");
    case CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED:
    case CLOUD_CONTENT_SYNC_ERROR_NO_ACCOUNT:
        return __text("IDS_VELORA_BODY_SIGN_IN_AGAIN");
    case CLOUD_CONTENT_SYNC_ERROR_LOCAL_FILE:
        return __text("IDS_VELORA_BODY_FILE_MISSING");
    case CLOUD_CONTENT_SYNC_ERROR_LOCAL_PRIVATE:
        return __text("IDS_VELORA_BODY_FILE_PRIVATE");
    case CLOUD_CONTENT_SYNC_ERROR_LOCAL_CHANGED:
        return __text("IDS_VELORA_BODY_FILE_CHANGED");
    case CLOUD_CONTENT_SYNC_ERROR_FORBIDDEN:
        return __text("IDS_VELORA_BODY_REFUSED");
    case CLOUD_CONTENT_SYNC_ERROR_BAD_NAME:
        return __text("IDS_VELORA_BODY_BAD_NAME");
    case CLOUD_CONTENT_SYNC_ERROR_OUTCOME_UNKNOWN:
        return __text("IDS_VELORA_BODY_MAYBE_UPLOADED");
    case CLOUD_CONTENT_SYNC_ERROR_STORAGE_FULL:
        return __text("IDS_VELORA_BODY_STORAGE_FULL");
    case CLOUD_CONTENT_SYNC_ERROR_UNSAFE:
        return __text("IDS_VELORA_BODY_UNSAFE");
    default:
        return __text("IDS_VELORA_BODY_FAILED");
    }
}

std::string __short_size(gint64 bytes)
{
    static const char *const units[] = {"KB", "MB", "GB", "TB"};
    double value = static_cast<double>(bytes) / 1024;
    size_t unit = 0;
    while (value >= 999.5 && unit + 1 < std::size(units)) {
        value /= 1024;
        unit++;
    }
    if (bytes > 0 && bytes < 512)
        value = 1; // something is not nothing
    return _velora_common_number(value, value < 9.95 && unit > 0 ? 1 : 0) + "\u00a0" + units[unit];
}
