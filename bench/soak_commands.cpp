// Rows of the soak run's command table, one block per family.
#include "soak_commands.h"

namespace {

char config_value[ZAL_IPOD_CONFIG_VALUE_SIZE];

}  // namespace

const std::vector<SoakCommand> &soak_commands() {
    static const std::vector<SoakCommand> commands = {
        // Transport and the other simple commands.
        {"keep_alive", ZAL_OP_KEEP_ALIVE, [](zal_ipod_handle *h) { zal_ipod_keep_alive_sync(h); }},
        {"play", ZAL_OP_PLAY, [](zal_ipod_handle *h) { zal_ipod_play_sync(h); }},
        {"pause", ZAL_OP_PAUSE, [](zal_ipod_handle *h) { zal_ipod_pause_sync(h); }},
        {"next_track", ZAL_OP_NEXT_TRACK, [](zal_ipod_handle *h) { zal_ipod_next_track_sync(h); }},
        {"prev_track", ZAL_OP_PREV_TRACK, [](zal_ipod_handle *h) { zal_ipod_prev_track_sync(h); }},
        // Sessions.
        {"open_session", ZAL_OP_OPEN_SESSION,
         [](zal_ipod_handle *h) { zal_ipod_open_session_sync(h, 0); }},
        // Runtime configuration.
        {"get_config", ZAL_OP_GET_CONFIG,
         [](zal_ipod_handle *h) { zal_ipod_get_config_sync(h, "socket_name", config_value); }},
        {"set_config", ZAL_OP_SET_CONFIG,
         [](zal_ipod_handle *h) { zal_ipod_set_config_sync(h, "device", "usb"); }},
    };
    return commands;
}
