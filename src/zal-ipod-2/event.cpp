// Event records: copy, release and the accessors. Every accessor checks the kind first
// and returns its default on another kind, on missing data or on a missing key.
#include "zal-ipod-2/event.h"

#include <cstdlib>
#include <cstring>

#include "common/log.h"
#include "zal-ipod-2/command.h"

namespace {

const gval *data_of(const zal_ipod_event *e, int kind) {
    return e != nullptr && e->kind == kind ? e->data : nullptr;
}

int32_t whole_int(const zal_ipod_event *e, int kind, int32_t fallback) {
    const gval *d = data_of(e, kind);
    return d != nullptr ? serialize_get_int(d) : fallback;
}

const char *whole_string(const zal_ipod_event *e, int kind) {
    const gval *d = data_of(e, kind);
    return zal_kind(d) == SERIALIZE_STRING ? serialize_get_string(d) : nullptr;
}

const gval *keyed(const zal_ipod_event *e, int kind, const char *key) {
    const gval *d = data_of(e, kind);
    return zal_kind(d) == SERIALIZE_HASH ? serialize_hash_get(d, key) : nullptr;
}

// Integers are returned as stored, without a kind check (the daemon sends integers).
int32_t keyed_int(const zal_ipod_event *e, int kind, const char *key) {
    const gval *v = keyed(e, kind, key);
    return v != nullptr ? serialize_get_int(v) : -1;
}

const char *keyed_string(const zal_ipod_event *e, int kind, const char *key) {
    const gval *v = keyed(e, kind, key);
    return zal_kind(v) == SERIALIZE_STRING ? serialize_get_string(v) : nullptr;
}

int keyed_string_out(const zal_ipod_event *e, int kind, const char *key, const char **out) {
    const char *s = keyed_string(e, kind, key);
    if (s == nullptr) return -1;
    if (out != nullptr) *out = s;
    return 1;
}

}  // namespace

#define EVENT_INT(name, kind, key)              \
    ZAL_API int name(const zal_ipod_event *e) { \
        return keyed_int(e, kind, key);         \
    }
#define EVENT_STRING(name, kind, key)                   \
    ZAL_API const char *name(const zal_ipod_event *e) { \
        return keyed_string(e, kind, key);              \
    }

extern "C" {

ZAL_API int zal_ipod_event_type(const zal_ipod_event *e) {
    return e != nullptr ? e->kind : ZALIPOD_EVENT_UNKNOWN;
}

ZAL_API const char *zal_ipod_event_get_serial(const zal_ipod_event *e) {
    if (e == nullptr) return nullptr;
    if (e->kind == ZALIPOD_EVENT_CONNECTED) return zal_ipod_event_connected_serial(e);
    if (e->kind == ZALIPOD_EVENT_DISCONNECTED) return zal_ipod_event_disconnected_serial(e);
    return e->serial;
}

ZAL_API zal_ipod_event *zal_ipod_event_clone_data(const zal_ipod_event *e) {
    if (e == nullptr) return nullptr;
    auto *copy = static_cast<zal_ipod_event *>(malloc(sizeof(zal_ipod_event)));
    if (copy != nullptr) {
        memcpy(copy, e, sizeof *copy);
        copy->data = nullptr;
        if (e->data == nullptr) return copy;
        copy->data = serialize_dup(e->data);
        if (copy->data != nullptr) return copy;
        free(copy);
    }
    ZAL_LOGE("%s: out of memory\n", __func__);
    return nullptr;
}

ZAL_API void zal_ipod_event_free(zal_ipod_event *e) {
    if (e == nullptr) return;
    serialize_free(e->data);
    free(e);
}

ZAL_API void zal_ipod_event_free_data(zal_ipod_event *e) {
    zal_ipod_event_free(e);
}

// Whole-data accessors.
ZAL_API const char *zal_ipod_event_disconnected_serial(const zal_ipod_event *e) {
    return whole_string(e, ZALIPOD_EVENT_DISCONNECTED);
}
ZAL_API int zal_ipod_event_authenticated(const zal_ipod_event *e) {
    return whole_int(e, ZALIPOD_EVENT_AUTHENTICATED, -1);
}
ZAL_API int zal_ipod_event_mode_changed(const zal_ipod_event *e) {
    return whole_int(e, ZALIPOD_EVENT_MODE_CHANGED, -1);
}
ZAL_API int zal_ipod_event_time_position(const zal_ipod_event *e) {
    return whole_int(e, ZALIPOD_EVENT_TRACK_POSITION_CHANGED, -1);
}
ZAL_API int zal_ipod_event_get_media_lib_update_progress(const zal_ipod_event *e) {
    return whole_int(e, ZALIPOD_EVENT_MEDIALIBRARYUPDATE, -2);
}
ZAL_API const char *zal_ipod_event_bluetooth_status(const zal_ipod_event *e) {
    return whole_string(e, ZALIPOD_EVENT_BT_CONNECTION_UPDATE);
}
ZAL_API const char *zal_ipod_event_get_playing_app(const zal_ipod_event *e) {
    return whole_string(e, ZALIPOD_EVENT_PLAYING_APP);
}
ZAL_API int zal_ipod_event_shuffle_status(const zal_ipod_event *e) {
    return whole_int(e, ZALIPOD_EVENT_SHUFFLE_MODE_CHANGED, -1);
}
ZAL_API int zal_ipod_event_role_switched(const zal_ipod_event *e) {
    return whole_int(e, ZALIPOD_EVENT_ROLE_SWITCHED, -1);
}

// Keyed accessors.
EVENT_STRING(zal_ipod_event_connected_serial, ZALIPOD_EVENT_CONNECTED, "serial")

EVENT_INT(zal_ipod_event_eap_datagram_session_id, ZALIPOD_EVENT_EAP_DATAGRAM, "session_id")
EVENT_INT(zal_ipod_event_eap_datagram_protocol_index, ZALIPOD_EVENT_EAP_DATAGRAM, "protocol_index")
ZAL_API const void *zal_ipod_event_eap_datagram_data(const zal_ipod_event *e, uint32_t *length) {
    const gval *v = keyed(e, ZALIPOD_EVENT_EAP_DATAGRAM, "data");
    if (zal_kind(v) != SERIALIZE_BYTES && zal_kind(v) != SERIALIZE_STRING) return nullptr;
    uint32_t n = 0;
    const void *bytes = serialize_get_bytes(v, &n);
    if (length != nullptr) *length = n;
    return bytes;
}

EVENT_INT(zal_ipod_event_location_information_state, ZALIPOD_EVENT_LOCATION_INFORMATION,
          "location_information_state")
EVENT_INT(zal_ipod_event_location_supported_NMEA, ZALIPOD_EVENT_LOCATION_INFORMATION,
          "location_data_types")

#define CALLSTATE ZALIPOD_EVENT_TELEPHONY_CALLSTATE_INFORMATION
EVENT_STRING(zal_ipod_event_telephony_callstate_remote_id, CALLSTATE, "RemoteID")
EVENT_STRING(zal_ipod_event_telephony_callstate_display_name, CALLSTATE, "DisplayName")
EVENT_INT(zal_ipod_event_telephony_callstate_status, CALLSTATE, "Status")
EVENT_INT(zal_ipod_event_telephony_callstate_direction, CALLSTATE, "Direction")
EVENT_STRING(zal_ipod_event_telephony_callstate_call_uuid, CALLSTATE, "CallUUID")
EVENT_STRING(zal_ipod_event_telephony_callstate_address_book_id, CALLSTATE, "AddressBookID")
EVENT_STRING(zal_ipod_event_telephony_callstate_label, CALLSTATE, "Label")
EVENT_INT(zal_ipod_event_telephony_callstate_service, CALLSTATE, "Service")
EVENT_INT(zal_ipod_event_telephony_callstate_is_conferenced, CALLSTATE, "IsConferenced")
EVENT_INT(zal_ipod_event_telephony_callstate_conference_group, CALLSTATE, "ConferenceGroup")
EVENT_INT(zal_ipod_event_telephony_callstate_disconnect_reason, CALLSTATE, "DisconnectReason")
#undef CALLSTATE

#define VEHICLE ZALIPOD_EVENT_VEHICLE_STATUS_UPDATE
EVENT_INT(zal_ipod_event_vehicle_status_update_is_started, VEHICLE, "vehicle_status_is_started")
EVENT_INT(zal_ipod_event_vehicle_status_update_night_mode, VEHICLE, "night_mode")
EVENT_INT(zal_ipod_event_vehicle_status_update_range, VEHICLE, "range")
EVENT_INT(zal_ipod_event_vehicle_status_update_outside_temperature, VEHICLE, "outside_temperature")
EVENT_INT(zal_ipod_event_vehicle_status_update_inside_temperature, VEHICLE, "inside_temperature")
EVENT_INT(zal_ipod_event_vehicle_status_update_range_warning, VEHICLE, "range_warning")
#undef VEHICLE

EVENT_INT(zal_ipod_event_wifi_information_status, ZALIPOD_EVENT_WIFI_INFORMATION, "wifi_status")
EVENT_INT(zal_ipod_event_wifi_information_type, ZALIPOD_EVENT_WIFI_INFORMATION, "wifi_type")
ZAL_API int zal_ipod_event_wifi_information_ssid(const zal_ipod_event *e, const char **out) {
    return keyed_string_out(e, ZALIPOD_EVENT_WIFI_INFORMATION, "ssid", out);
}
ZAL_API int zal_ipod_event_wifi_information_passphrase(const zal_ipod_event *e, const char **out) {
    return keyed_string_out(e, ZALIPOD_EVENT_WIFI_INFORMATION, "passphrase", out);
}

#define TELEPHONY ZALIPOD_EVENT_TELEPHONY_UPDATE
EVENT_INT(zal_ipod_event_telephony_update_strength, TELEPHONY, "signal_strength")
EVENT_INT(zal_ipod_event_telephony_update_registration_status, TELEPHONY, "registration_status")
EVENT_INT(zal_ipod_event_telephony_update_airplane_mode, TELEPHONY, "airplane_mode_status")
EVENT_STRING(zal_ipod_event_telephony_update_carrier_name, TELEPHONY, "carrier_name")
EVENT_INT(zal_ipod_event_telephony_update_cellular_supported, TELEPHONY, "cellular_supported")
EVENT_INT(zal_ipod_event_telephony_update_telephony_enabled, TELEPHONY, "telephony_enabled")
EVENT_INT(zal_ipod_event_telephony_update_facetime_audio_enabled, TELEPHONY,
          "facetime_audio_enabled")
EVENT_INT(zal_ipod_event_telephony_update_facetime_video_enabled, TELEPHONY,
          "facetime_video_enabled")
EVENT_INT(zal_ipod_event_telephony_update_mute_status, TELEPHONY, "mute_status")
EVENT_INT(zal_ipod_event_telephony_update_current_call_count, TELEPHONY, "current_call_count")
EVENT_INT(zal_ipod_event_telephony_update_new_voicemail_count, TELEPHONY, "new_voicemail_count")
EVENT_INT(zal_ipod_event_telephony_update_initiate_call_available, TELEPHONY,
          "initiate_call_available")
EVENT_INT(zal_ipod_event_telephony_update_end_and_accept_available, TELEPHONY,
          "end_and_accept_available")
EVENT_INT(zal_ipod_event_telephony_update_hold_and_accept_available, TELEPHONY,
          "hold_and_accept_available")
EVENT_INT(zal_ipod_event_telephony_update_swap_available, TELEPHONY, "swap_available")
EVENT_INT(zal_ipod_event_telephony_update_merge_available, TELEPHONY, "merge_available")
EVENT_INT(zal_ipod_event_telephony_update_hold_available, TELEPHONY, "hold_available")
#undef TELEPHONY

EVENT_INT(zal_ipod_event_wireless_carplay_update_status, ZALIPOD_EVENT_WIRELESS_CARPLAY_UPDATE,
          "wireless_carplay_update_status")

}  // extern "C"
