// Device list accessors, sessions and the session decoder.
#include "zal-ipod-2/devices.h"

#include "zal-ipod-2/command.h"
#include "zal-ipod-2/playback_state.h"

gval *zal_device_entry(const zal_ipod_handle *h, int index) {
    if (h == nullptr || index < 0 || zal_kind(h->devices) != SERIALIZE_ARRAY) return nullptr;
    if (index >= serialize_array_count(h->devices)) return nullptr;
    gval *entry = serialize_array_get(h->devices, static_cast<uint32_t>(index));
    return zal_kind(entry) == SERIALIZE_HASH ? entry : nullptr;
}

namespace {

enum class session_form { opening, closing };

int device_int(const zal_ipod_handle *h, int index, const char *key, int fallback) {
    return zal_hash_int(zal_device_entry(h, index), key, fallback);
}

// Opening form only: an iAP2 device makes the handle ready whatever the reply said.
void apply_protocol(zal_ipod_handle *h) {
    if (device_int(h, h->current_session, "protocolinuse", -1) == 2) {
        h->protocol = 2;
        h->ready = 1;
    }
}

int32_t decode_session(zal_ipod_handle *h, const zal_ipod_reply *reply, session_form form) {
    gval *v = nullptr;
    if (reply != nullptr && reply->length > 0 && reply->payload != nullptr)
        v = unserialize(reply->payload, reply->length);
    gval *result_value = zal_kind(v) == SERIALIZE_HASH ? serialize_hash_get(v, "result") : nullptr;
    int32_t result = 0;
    pthread_mutex_lock(&h->state_lock);
    if (result_value != nullptr) {
        result = zal_kind(result_value) == SERIALIZE_INT ? serialize_get_int(result_value) : 0;
        gval *devices = serialize_hash_get(v, "devices");
        serialize_free(h->devices);
        h->devices = devices != nullptr ? serialize_dup(devices) : nullptr;
    } else if (zal_kind(v) == SERIALIZE_HASH) {
        h->ready = 0;
    }
    if (form == session_form::closing) {
        h->session_opened = 0;
        h->ready = 0;
    } else {
        if (result_value != nullptr && result == 1) {
            h->session_opened = 1;
            h->ready = device_int(h, h->current_session, "authenticated", 0) == 1 ? 1 : 0;
        } else {
            h->session_opened = 0;
        }
        apply_protocol(h);
    }
    pthread_mutex_unlock(&h->state_lock);
    serialize_free(v);
    return result;
}

}  // namespace

int32_t zal_session_decode_open(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    return decode_session(h, reply, session_form::opening);
}

int32_t zal_session_decode_close(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    return decode_session(h, reply, session_form::closing);
}

extern "C" {

ZAL_API int zal_ipod_device_count(zal_ipod_handle *h) {
    if (h == nullptr || zal_kind(h->devices) != SERIALIZE_ARRAY) return 0;
    return serialize_array_count(h->devices);
}

ZAL_API const char *zal_ipod_device_serial(zal_ipod_handle *h, int index) {
    return zal_hash_string(zal_device_entry(h, index), "serial");
}

ZAL_API int zal_ipod_device_transport_mode(zal_ipod_handle *h, int index) {
    return device_int(h, index, "transport", 0);
}
ZAL_API int zal_ipod_device_usb_bus(zal_ipod_handle *h, int index) {
    return device_int(h, index, "bus", 0);
}
ZAL_API int zal_ipod_device_usb_address(zal_ipod_handle *h, int index) {
    return device_int(h, index, "address", 0);
}
ZAL_API int zal_ipod_device_rfcomm_id(zal_ipod_handle *h, int index) {
    return device_int(h, index, "rfcommId", 0);
}
ZAL_API int zal_ipod_device_used(zal_ipod_handle *h, int index) {
    return device_int(h, index, "used", 0);
}
ZAL_API int zal_ipod_device_authenticated(zal_ipod_handle *h, int index) {
    return device_int(h, index, "authenticated", 0);
}
ZAL_API int zal_ipod_device_is_extended(zal_ipod_handle *h, int index) {
    return device_int(h, index, "extended", 0);
}
ZAL_API int zal_ipod_device_protocol(zal_ipod_handle *h, int index) {
    return device_int(h, index, "protocolinuse", -1);
}
ZAL_API const char *zal_ipod_device_name(zal_ipod_handle *h) {
    return h != nullptr ? h->device_name : nullptr;
}

ZAL_API int zal_ipod_open_session(zal_ipod_handle *h, int device_index) {
    if (h == nullptr) return 0;
    // Before the send: a reply dispatched on another thread must find these already set.
    h->current_session = device_index;
    zal_playback_cache_reset(h);
    return zal_cmd_send(h, ZAL_OP_OPEN_SESSION, zal_arg_int(device_index), __func__,
                        &zal_pending_slots::session_tid, false);
}

ZAL_API int zal_ipod_open_session_sync(zal_ipod_handle *h, int device_index) {
    return zal_cmd_sync(h, zal_ipod_open_session(h, device_index), zal_session_decode_open);
}

ZAL_API int zal_ipod_close_session(zal_ipod_handle *h) {
    if (h == nullptr) return 0;
    int tid = zal_cmd_send(h, ZAL_OP_CLOSE_SESSION, nullptr, nullptr, nullptr, false);
    h->session_opened = 0;
    return tid;
}

ZAL_API int zal_ipod_close_session_sync(zal_ipod_handle *h) {
    return zal_cmd_sync(h, zal_ipod_close_session(h), zal_session_decode_close);
}

ZAL_API int zal_ipod_current_session(zal_ipod_handle *h) {
    return h != nullptr ? h->current_session.load() : -1;
}

ZAL_API int zal_ipod_is_session_opened(zal_ipod_handle *h) {
    return h != nullptr ? h->session_opened.load() : 0;
}

}  // extern "C"
