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
        // Now playing.
        {"track_info", ZAL_OP_CURRENT_TRACK_INFO,
         [](zal_ipod_handle *h) { zal_ipod_current_track_info_sync(h); }},
        {"play_state", ZAL_OP_GET_PLAY_STATE,
         [](zal_ipod_handle *h) { zal_ipod_get_play_state_sync(h); }},
        {"set_shuffle", ZAL_OP_SET_SHUFFLE,
         [](zal_ipod_handle *h) { zal_ipod_set_shuffle_sync(h, 1); }},
        {"get_preference", ZAL_OP_GET_PREFERENCE,
         [](zal_ipod_handle *h) { zal_ipod_get_preference_sync(h, 8); }},
        // (No artwork request: its wait is raised to 20 s, beyond the soak's call bound
        // when a fault swallows the reply.)
        // Sessions.
        {"open_session", ZAL_OP_OPEN_SESSION,
         [](zal_ipod_handle *h) { zal_ipod_open_session_sync(h, 0); }},
        // iAP1 database browsing (answered with an error on an iAP2 device) and the library.
        {"set_category", ZAL_OP_SET_CATEGORY,
         [](zal_ipod_handle *h) { zal_ipod_set_category_sync(h, 1); }},
        {"get_records", ZAL_OP_GET_DB_RECORDS,
         [](zal_ipod_handle *h) { zal_ipod_get_records_sync(h, 0, 8); }},
        {"db_track_info", ZAL_OP_GET_DB_TRACK_INFO,
         [](zal_ipod_handle *h) { zal_ipod_get_db_track_info_sync(h, 0, 8, 0); }},
        {"media_library_uid", ZAL_OP_MEDIA_LIB_UID,
         [](zal_ipod_handle *h) {
             char mlid[MAXIMUM_MLID_LENGTH];
             zal_ipod_get_media_library_unique_id_sync(h, mlid, sizeof mlid);
         }},
        {"genius_available", ZAL_OP_IS_GENIUS_AVAILABLEFORTRACK,
         [](zal_ipod_handle *h) { zal_ipod_is_genius_availablefortrack_sync(h, 0, 0); }},
        // Runtime configuration.
        {"get_config", ZAL_OP_GET_CONFIG,
         [](zal_ipod_handle *h) { zal_ipod_get_config_sync(h, "socket_name", config_value); }},
        {"set_config", ZAL_OP_SET_CONFIG,
         [](zal_ipod_handle *h) { zal_ipod_set_config_sync(h, "device", "usb"); }},
    };
    return commands;
}
