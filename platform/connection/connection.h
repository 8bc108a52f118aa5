#pragma once
// The network connection of the device.

typedef struct connection_s *connection_h;
enum connection_error_e {
    CONNECTION_ERROR_NONE = 0,
    CONNECTION_ERROR_INVALID_PARAMETER = -22,
    CONNECTION_ERROR_OUT_OF_MEMORY = -12,
    CONNECTION_ERROR_OPERATION_FAILED = -3001,
};
enum connection_type_e {
    CONNECTION_TYPE_DISCONNECTED = 0,
    CONNECTION_TYPE_WIFI = 1,
    CONNECTION_TYPE_CELLULAR = 2,
    CONNECTION_TYPE_ETHERNET = 3,
    CONNECTION_TYPE_BT = 4,
};
enum connection_cellular_state_e {
    CONNECTION_CELLULAR_STATE_OUT_OF_SERVICE = 0,
    CONNECTION_CELLULAR_STATE_FLIGHT_MODE = 1,
    CONNECTION_CELLULAR_STATE_ROAMING_OFF = 2,
    CONNECTION_CELLULAR_STATE_CALL_ONLY_AVAILABLE = 3,
    CONNECTION_CELLULAR_STATE_AVAILABLE = 4,
    CONNECTION_CELLULAR_STATE_CONNECTED = 5,
};
int connection_create(connection_h *connection);
int connection_destroy(connection_h connection);
int connection_get_type(connection_h connection, connection_type_e *type);
int connection_get_cellular_state(connection_h connection, connection_cellular_state_e *state);
