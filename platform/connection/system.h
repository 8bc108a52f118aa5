#pragma once
// Where the state of the network is read from; for connection.cpp and its tests.
#include "connection/connection.h"
#include <optional>
#include <string>

// Reads the route tables and interfaces below `root`, "" on the machine itself.
connection_type_e connection_type_by_routes(const std::string &root);
// True when there are rfkill switches of Wi-Fi or cellular radios below `root`, and all are blocked.
bool connection_radios_blocked(const std::string &root);

struct BusAnswer {
    std::optional<connection_type_e> type; // what NetworkManager says, when it does
    std::optional<bool> radios_off;
    connection_cellular_state_e modem = CONNECTION_CELLULAR_STATE_OUT_OF_SERVICE;
};
// What the system bus says, within `milliseconds`; empty answers when it is absent or silent. Nothing of the answer is
// older than the call. Any thread.
BusAnswer connection_ask_bus(int milliseconds);
