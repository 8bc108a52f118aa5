#pragma once
// What the running system says about itself.
enum runtime_info_key_e { RUNTIME_INFO_KEY_24HOUR_CLOCK_FORMAT_ENABLED = 13 };
enum runtime_info_error_e {
    RUNTIME_INFO_ERROR_NONE = 0,
    RUNTIME_INFO_ERROR_INVALID_PARAMETER = -22,
    RUNTIME_INFO_ERROR_IO_ERROR = -5,
};
int runtime_info_get_value_bool(runtime_info_key_e key, bool *value);
