#pragma once
// The network connection of the device.
//
// NetworkManager and ModemManager are asked over the system bus where they run. A machine without them counts by its
// routes (/proc/net/route, /proc/net/ipv6_route) and its radio switches (rfkill in /sys). Reading never takes longer
// than half a second: a bus that does not answer by then counts as absent.
//
// A machine with nothing but its loopback interface is disconnected, although services on the machine itself can be
// reached. Such a machine, a demo or a test sets the state by hand, by the key "memory/connection/type" of the settings
// store (until the machine starts again, or the key is unset). Programs that run already see the change at their next
// read, and nothing else is asked then:
//
//     settings-store set memory/connection/type wifi              also cellular, ethernet, bluetooth
//     settings-store set memory/connection/type none              disconnected, the cellular network out of service
//     settings-store set memory/connection/type none:flight_mode  disconnected, and the state of the cellular network:
//                        out_of_service, flight_mode, roaming_off, call_only or available
//
// With cellular the cellular state is CONNECTED, with the other types OUT_OF_SERVICE unless it is named in the same way
// ("wifi:available"). A value that is none of these makes reading fail with CONNECTION_ERROR_OPERATION_FAILED.
//
// Any thread may call. A null argument gives CONNECTION_ERROR_INVALID_PARAMETER; results are written on success alone.

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

// Makes a handle; connection_destroy frees it. A handle keeps no state of the network: every read asks anew.
int connection_create(connection_h *connection);
int connection_destroy(connection_h connection);

// Tells when the network may have changed: an address, a link or a route of the kernel (rtnetlink(7)), or the settings
// store. Nothing polls. OPERATION_FAILED when the kernel refuses.
typedef struct connection_watch_s *connection_watch_h;
int connection_watch_create(connection_watch_h *watch);
int connection_watch_destroy(connection_watch_h watch);
// A descriptor of the watch's own that can be read (poll(2), POLLIN) once something may have changed.
int connection_watch_get_fd(connection_watch_h watch, int *fd);
// Takes note of what has happened, so that the descriptor rests until something else does. OPERATION_FAILED when
// nothing has.
int connection_watch_read(connection_watch_h watch);

// The type of the connection that is used by default. Where NetworkManager does not say (it does not manage the
// interface, or the connection is a tunnel), it is the interface of the default route, or else of a route to a network
// that is not link-local, by its kind in /sys/class/net.
int connection_get_type(connection_h connection, connection_type_e *type);

// The state of the cellular network, the first of these that holds:
//   FLIGHT_MODE          the radios are switched off: NetworkManager's WirelessEnabled and WwanEnabled are both false;
//                        without NetworkManager, all of the rfkill switches for Wi-Fi and cellular, of which there is
//                        one
//   CONNECTED, AVAILABLE a modem has a data connection, or is registered in its own network
//   CALL_ONLY_AVAILABLE  a modem is registered for calls and messages alone
//   ROAMING_OFF          a modem is registered in a foreign network without a data connection
//   OUT_OF_SERVICE       otherwise, also without a modem
int connection_get_cellular_state(connection_h connection, connection_cellular_state_e *state);
