#include "mime_type/mime_type.h"
#include <cstring>
#include <gio/gio.h>
#include <memory>
#include <string>

namespace {
struct GFree {
    void operator()(char *p) const
    {
        g_free(p);
    }
};
using GText = std::unique_ptr<char, GFree>;
} // namespace

int mime_type_get_mime_type(const char *file_extension, char **mime_type)
{
    if (!file_extension || !*file_extension || !mime_type || std::strchr(file_extension, '/'))
        return MIME_TYPE_ERROR_INVALID_PARAMETER;
    const std::string name = std::string("name.") + file_extension;
    const GText content_type(g_content_type_guess(name.c_str(), nullptr, 0, nullptr));
    if (!content_type || g_content_type_is_unknown(content_type.get()))
        return MIME_TYPE_ERROR_INVALID_PARAMETER;
    const GText mime(g_content_type_get_mime_type(content_type.get()));
    if (!mime)
        return MIME_TYPE_ERROR_INVALID_PARAMETER;
    *mime_type = strdup(mime.get());
    return *mime_type ? MIME_TYPE_ERROR_NONE : MIME_TYPE_ERROR_OUT_OF_MEMORY;
}
