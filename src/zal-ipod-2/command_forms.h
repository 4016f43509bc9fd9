// The two most common command shapes as definitions of both forms: no argument, and one
// 32-bit integer argument, each with the integer reply rule in its _sync form. Commands of
// other shapes are written out over the helpers of command.h.
#pragma once

#include "zal-ipod-2/command.h"

// zal_ipod_<name>(h) / zal_ipod_<name>_sync(h): no argument; a handle that is not ready
// sends nothing and logs nothing.
#define ZAL_COMMAND_NO_ARG(name, opcode)                     \
    ZAL_API int zal_ipod_##name(zal_ipod_handle *h) {        \
        return zal_cmd_send(h, opcode);                      \
    }                                                        \
    ZAL_API int zal_ipod_##name##_sync(zal_ipod_handle *h) { \
        return zal_cmd_sync_int(h, zal_ipod_##name(h));      \
    }

// zal_ipod_<name>(h, v) / zal_ipod_<name>_sync(h, v): one int sent as an integer value; a
// handle that is not ready logs "not ready2 zal_ipod_<name>".
#define ZAL_COMMAND_INT_ARG(name, opcode)                           \
    ZAL_API int zal_ipod_##name(zal_ipod_handle *h, int v) {        \
        return zal_cmd_send(h, opcode, zal_arg_int(v), __func__);   \
    }                                                               \
    ZAL_API int zal_ipod_##name##_sync(zal_ipod_handle *h, int v) { \
        return zal_cmd_sync_int(h, zal_ipod_##name(h, v));          \
    }
