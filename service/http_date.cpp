#include "http_date.h"
#include <ctime>

// The locale is always "C" here. The second and third forms are obsolete, but must be read.
static const char *const FORMS[] = {"%a, %d %b %Y %H:%M:%S GMT", "%A, %d-%b-%y %H:%M:%S GMT", "%a %b %e %H:%M:%S %Y"};

std::string http_date(int64_t nanoseconds)
{
    const time_t seconds = nanoseconds / 1000000000;
    struct tm parts;
    char text[64];
    gmtime_r(&seconds, &parts);
    std::strftime(text, sizeof text, FORMS[0], &parts);
    return text;
}

const std::string &http_date_now()
{
    static time_t known = 0;
    static std::string text;
    if (const time_t now = time(nullptr); now != known) {
        known = now;
        text = http_date(static_cast<int64_t>(now) * 1000000000);
    }
    return text;
}

int64_t http_date_read(const char *text)
{
    for (const char *form : FORMS) {
        struct tm parts = {};
        const char *end = text ? strptime(text, form, &parts) : nullptr;
        if (end && !*end)
            return timegm(&parts);
    }
    return -1;
}
