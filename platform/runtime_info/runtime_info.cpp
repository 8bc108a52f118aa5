#include "runtime_info/runtime_info.h"
#include "vconf/vconf.h"
#include <langinfo.h>
#include <locale.h>
#include <string_view>

int runtime_info_get_value_bool(runtime_info_key_e key, bool *value)
{
    if (key != RUNTIME_INFO_KEY_24HOUR_CLOCK_FORMAT_ENABLED || !value)
        return RUNTIME_INFO_ERROR_INVALID_PARAMETER;
    if (int set = 0; vconf_get_bool("db/menu_widget/regionformat_24hour", &set) == 0) {
        *value = set != 0;
        return RUNTIME_INFO_ERROR_NONE;
    }
    const locale_t locale = newlocale(LC_TIME_MASK, "", nullptr);
    if (!locale)
        return RUNTIME_INFO_ERROR_IO_ERROR;
    const std::string_view format = nl_langinfo_l(T_FMT, locale);
    *value = true;
    for (const char *twelve : {"%r", "%I", "%l", "%p", "%P"})
        if (format.find(twelve) != format.npos)
            *value = false;
    freelocale(locale);
    return RUNTIME_INFO_ERROR_NONE;
}
