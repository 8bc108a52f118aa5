#include "connection/connection.h"
#include "base/base.h"
#include "connection/system.h"
#include "vconf/vconf.h"
#include <string_view>

struct connection_s {};

namespace {

constexpr const char *OVERRIDE_KEY = "memory/connection/type";
constexpr int BUS_MILLISECONDS = 400;

struct State {
    connection_type_e type = CONNECTION_TYPE_DISCONNECTED;
    connection_cellular_state_e cellular = CONNECTION_CELLULAR_STATE_OUT_OF_SERVICE;
};

bool parse(std::string_view text, State &state)
{
    static constexpr struct {
        std::string_view name;
        connection_type_e type;
    } types[] = {{"none", CONNECTION_TYPE_DISCONNECTED},
                 {"wifi", CONNECTION_TYPE_WIFI},
                 {"cellular", CONNECTION_TYPE_CELLULAR},
                 {"ethernet", CONNECTION_TYPE_ETHERNET},
                 {"bluetooth", CONNECTION_TYPE_BT}};
    static constexpr struct {
        std::string_view name;
        connection_cellular_state_e state;
    } states[] = {{"out_of_service", CONNECTION_CELLULAR_STATE_OUT_OF_SERVICE},
                  {"flight_mode", CONNECTION_CELLULAR_STATE_FLIGHT_MODE},
                  {"roaming_off", CONNECTION_CELLULAR_STATE_ROAMING_OFF},
                  {"call_only", CONNECTION_CELLULAR_STATE_CALL_ONLY_AVAILABLE},
                  {"available", CONNECTION_CELLULAR_STATE_AVAILABLE}};
    const size_t colon = text.find(':');
    bool type_known = false;
    for (const auto &t : types)
        if (t.name == text.substr(0, colon)) {
            state.type = t.type;
            type_known = true;
        }
    if (state.type == CONNECTION_TYPE_CELLULAR)
        state.cellular = CONNECTION_CELLULAR_STATE_CONNECTED;
    if (colon == text.npos || !type_known)
        return type_known;
    for (const auto &s : states)
        if (s.name == text.substr(colon + 1)) {
            state.cellular = s.state;
            return true;
        }
    return false;
}

bool read(State &state)
{
    if (const CString set(vconf_get_str(OVERRIDE_KEY)); set)
        return parse(set.get(), state);
    const BusAnswer answer = connection_ask_bus(BUS_MILLISECONDS);
    state.type = answer.type ? *answer.type : connection_type_by_routes("");
    if (answer.radios_off ? *answer.radios_off : connection_radios_blocked(""))
        state.cellular = CONNECTION_CELLULAR_STATE_FLIGHT_MODE;
    else
        state.cellular = answer.modem;
    return true;
}

} // namespace

int connection_create(connection_h *connection)
{
    if (!connection)
        return CONNECTION_ERROR_INVALID_PARAMETER;
    *connection = new connection_s;
    return CONNECTION_ERROR_NONE;
}

int connection_destroy(connection_h connection)
{
    if (!connection)
        return CONNECTION_ERROR_INVALID_PARAMETER;
    delete connection;
    return CONNECTION_ERROR_NONE;
}

int connection_get_type(connection_h connection, connection_type_e *type)
{
    if (!connection || !type)
        return CONNECTION_ERROR_INVALID_PARAMETER;
    State state;
    if (!read(state))
        return CONNECTION_ERROR_OPERATION_FAILED;
    *type = state.type;
    return CONNECTION_ERROR_NONE;
}

int connection_get_cellular_state(connection_h connection, connection_cellular_state_e *cellular_state)
{
    if (!connection || !cellular_state)
        return CONNECTION_ERROR_INVALID_PARAMETER;
    State state;
    if (!read(state))
        return CONNECTION_ERROR_OPERATION_FAILED;
    *cellular_state = state.cellular;
    return CONNECTION_ERROR_NONE;
}
