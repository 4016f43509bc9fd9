// Commands without an argument whose _sync form follows the integer reply rule.
#include "zal-ipod-2/command.h"

#define SIMPLE_COMMAND(name, opcode)                         \
    ZAL_API int zal_ipod_##name(zal_ipod_handle *h) {        \
        return zal_cmd_send(h, opcode);                      \
    }                                                        \
    ZAL_API int zal_ipod_##name##_sync(zal_ipod_handle *h) { \
        return zal_cmd_sync_int(h, zal_ipod_##name(h));      \
    }

extern "C" {

// Keep-alive goes out on any connected handle, before a session too.
ZAL_API int zal_ipod_keep_alive(zal_ipod_handle *h) {
    return zal_cmd_send(h, ZAL_OP_KEEP_ALIVE, nullptr, nullptr, nullptr, false);
}
ZAL_API int zal_ipod_keep_alive_sync(zal_ipod_handle *h) {
    return zal_cmd_sync_int(h, zal_ipod_keep_alive(h));
}

SIMPLE_COMMAND(play, ZAL_OP_PLAY)
SIMPLE_COMMAND(playpause, ZAL_OP_PLAYPAUSE)
SIMPLE_COMMAND(stop, ZAL_OP_STOP)
SIMPLE_COMMAND(pause, ZAL_OP_PAUSE)
SIMPLE_COMMAND(next_track, ZAL_OP_NEXT_TRACK)
SIMPLE_COMMAND(prev_track, ZAL_OP_PREV_TRACK)
SIMPLE_COMMAND(mute, ZAL_OP_MUTE)
SIMPLE_COMMAND(inc, ZAL_OP_VOLUME_INC)
SIMPLE_COMMAND(dec, ZAL_OP_VOLUME_DEC)
SIMPLE_COMMAND(start_device_audio_info, ZAL_OP_START_DEV_AUDIO_ROUTE)
SIMPLE_COMMAND(stop_device_audio_info, ZAL_OP_STOP_DEV_AUDIO_ROUTE)
SIMPLE_COMMAND(start_tracking_dec, ZAL_OP_TRACKING_DEC)
SIMPLE_COMMAND(start_tracking_inc, ZAL_OP_TRACKING_INC)
SIMPLE_COMMAND(start_tracking_normal, ZAL_OP_TRACKING_NORMAL)
SIMPLE_COMMAND(start_ffw, ZAL_OP_START_FFW)
SIMPLE_COMMAND(start_rew, ZAL_OP_START_REW)
SIMPLE_COMMAND(stop_ffwrew, ZAL_OP_STOP_FFWREW)
SIMPLE_COMMAND(voice_command, ZAL_OP_VOICE_COMMAND)
SIMPLE_COMMAND(promote, ZAL_OP_PROMOTE)
SIMPLE_COMMAND(demote, ZAL_OP_DEMOTE)
SIMPLE_COMMAND(add_to_cart, ZAL_OP_ADD_TO_CART)
SIMPLE_COMMAND(start_bt_connection_updates, ZAL_OP_START_BT_UPDATES)
SIMPLE_COMMAND(stop_bt_connection_updates, ZAL_OP_STOP_BT_UPDATES)

}  // extern "C"
