#include "velora_common/velora_number.h"
#include "velora_common/velora_app_data.h"
#include <clocale>
#include <cstring>
#include <libintl.h>

std::string _velora_common_number(double value, int decimals)
{
    static const char id[] = "IDS_VELORA_BODY_DECIMAL_SIGN";
    char format[8], text[400];
    g_snprintf(format, sizeof format, "%%.%df", decimals);
    std::string number = g_ascii_formatd(text, sizeof text, format, value);
    const char *sign = dcgettext(VELORA_DOMAIN, id, LC_MESSAGES);
    if (const size_t point = number.find('.'); point != number.npos && std::strcmp(sign, id) != 0)
        number.replace(point, 1, sign);
    return number;
}
