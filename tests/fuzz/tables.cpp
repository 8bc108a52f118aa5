// Colour and font tables: any file is read or refused.
#include "assist/assist.h"
#include "fuzz.h"
#include <glib.h>
#include <sys/mman.h>
#include <unistd.h>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    static const int fd = [] {
        g_log_set_default_handler([](const gchar *, GLogLevelFlags, const gchar *, gpointer) {}, nullptr);
        return memfd_create("table", MFD_CLOEXEC);
    }();
    static const std::string path = "/proc/self/fd/" + std::to_string(fd);
    must(ftruncate(fd, 0) == 0 && pwrite(fd, data, size, 0) == static_cast<ssize_t>(size));
    ea_theme_color_table_free(ea_theme_color_table_new(path.c_str()));
    ea_theme_font_table_free(ea_theme_font_table_new(path.c_str()));
    return 0;
}
