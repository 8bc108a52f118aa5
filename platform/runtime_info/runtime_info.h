#pragma once
// What the running system says about itself.
enum runtime_info_key_e { RUNTIME_INFO_KEY_24HOUR_CLOCK_FORMAT_ENABLED = 13 };
enum runtime_info_error_e {
    RUNTIME_INFO_ERROR_NONE = 0,
    RUNTIME_INFO_ERROR_INVALID_PARAMETER = -22,
    RUNTIME_INFO_ERROR_IO_ERROR = -5,
};

// Reads a truth value. RUNTIME_INFO_KEY_24HOUR_CLOCK_FORMAT_ENABLED, whether times are shown as 14:05, is the user's
// setting "db/menu_widget/regionformat_24hour" (a truth value of the settings store); while that is unset, it is what
// the environment's LC_TIME locale uses: false when its time format (nl_langinfo(3), T_FMT) counts to 12 hours. A null
// `value` or another key: RUNTIME_INFO_ERROR_INVALID_PARAMETER. An environment that names a locale which the machine
// does not have: RUNTIME_INFO_ERROR_IO_ERROR. Any thread.
int runtime_info_get_value_bool(runtime_info_key_e key, bool *value);
