// Event records: kinds, accessors with their defaults, serial lookup, clone and free.
#include <gtest/gtest.h>

#include <cstring>
#include <functional>
#include <string>

#include "client_helpers.h"

using namespace zaltest;

namespace {

// An event record as the dispatcher makes it; data taken.
zal_ipod_event *make_event(int kind, gval *data, const char *serial = "") {
    auto *e = static_cast<zal_ipod_event *>(calloc(1, sizeof(zal_ipod_event)));
    e->kind = kind;
    e->session = 3;
    strncpy(e->serial, serial, sizeof e->serial - 1);
    e->data = data;
    return e;
}

// Integer accessors: (accessor, kind, key or "" for whole data, default).
struct IntAccessor {
    const char *name;
    int (*read)(const zal_ipod_event *);
    int kind;
    const char *key;
    int fallback;
};

#define A(fn, kind, key)       \
    IntAccessor {              \
#fn, fn, kind, key, -1 \
    }
const IntAccessor kIntAccessors[] = {
    A(zal_ipod_event_authenticated, 4, ""),
    A(zal_ipod_event_mode_changed, 5, ""),
    A(zal_ipod_event_time_position, 10, ""),
    IntAccessor{"progress", zal_ipod_event_get_media_lib_update_progress, 14, "", -2},
    A(zal_ipod_event_shuffle_status, 26, ""),
    A(zal_ipod_event_role_switched, 29, ""),
    A(zal_ipod_event_eap_datagram_session_id, 18, "session_id"),
    A(zal_ipod_event_eap_datagram_protocol_index, 18, "protocol_index"),
    A(zal_ipod_event_location_information_state, 19, "location_information_state"),
    A(zal_ipod_event_location_supported_NMEA, 19, "location_data_types"),
    A(zal_ipod_event_telephony_callstate_status, 21, "Status"),
    A(zal_ipod_event_telephony_callstate_direction, 21, "Direction"),
    A(zal_ipod_event_telephony_callstate_service, 21, "Service"),
    A(zal_ipod_event_telephony_callstate_is_conferenced, 21, "IsConferenced"),
    A(zal_ipod_event_telephony_callstate_conference_group, 21, "ConferenceGroup"),
    A(zal_ipod_event_telephony_callstate_disconnect_reason, 21, "DisconnectReason"),
    A(zal_ipod_event_vehicle_status_update_is_started, 22, "vehicle_status_is_started"),
    A(zal_ipod_event_vehicle_status_update_night_mode, 22, "night_mode"),
    A(zal_ipod_event_vehicle_status_update_range, 22, "range"),
    A(zal_ipod_event_vehicle_status_update_outside_temperature, 22, "outside_temperature"),
    A(zal_ipod_event_vehicle_status_update_inside_temperature, 22, "inside_temperature"),
    A(zal_ipod_event_vehicle_status_update_range_warning, 22, "range_warning"),
    A(zal_ipod_event_wifi_information_status, 23, "wifi_status"),
    A(zal_ipod_event_wifi_information_type, 23, "wifi_type"),
    A(zal_ipod_event_telephony_update_strength, 24, "signal_strength"),
    A(zal_ipod_event_telephony_update_registration_status, 24, "registration_status"),
    A(zal_ipod_event_telephony_update_airplane_mode, 24, "airplane_mode_status"),
    A(zal_ipod_event_telephony_update_cellular_supported, 24, "cellular_supported"),
    A(zal_ipod_event_telephony_update_telephony_enabled, 24, "telephony_enabled"),
    A(zal_ipod_event_telephony_update_facetime_audio_enabled, 24, "facetime_audio_enabled"),
    A(zal_ipod_event_telephony_update_facetime_video_enabled, 24, "facetime_video_enabled"),
    A(zal_ipod_event_telephony_update_mute_status, 24, "mute_status"),
    A(zal_ipod_event_telephony_update_current_call_count, 24, "current_call_count"),
    A(zal_ipod_event_telephony_update_new_voicemail_count, 24, "new_voicemail_count"),
    A(zal_ipod_event_telephony_update_initiate_call_available, 24, "initiate_call_available"),
    A(zal_ipod_event_telephony_update_end_and_accept_available, 24, "end_and_accept_available"),
    A(zal_ipod_event_telephony_update_hold_and_accept_available, 24, "hold_and_accept_available"),
    A(zal_ipod_event_telephony_update_swap_available, 24, "swap_available"),
    A(zal_ipod_event_telephony_update_merge_available, 24, "merge_available"),
    A(zal_ipod_event_telephony_update_hold_available, 24, "hold_available"),
    A(zal_ipod_event_wireless_carplay_update_status, 32, "wireless_carplay_update_status"),
};
#undef A

struct StringAccessor {
    const char *name;
    const char *(*read)(const zal_ipod_event *);
    int kind;
    const char *key;
};

#define A(fn, kind, key)   \
    StringAccessor {       \
#fn, fn, kind, key \
    }
const StringAccessor kStringAccessors[] = {
    A(zal_ipod_event_connected_serial, 1, "serial"),
    A(zal_ipod_event_disconnected_serial, 2, ""),
    A(zal_ipod_event_bluetooth_status, 17, ""),
    A(zal_ipod_event_get_playing_app, 20, ""),
    A(zal_ipod_event_telephony_callstate_remote_id, 21, "RemoteID"),
    A(zal_ipod_event_telephony_callstate_display_name, 21, "DisplayName"),
    A(zal_ipod_event_telephony_callstate_call_uuid, 21, "CallUUID"),
    A(zal_ipod_event_telephony_callstate_address_book_id, 21, "AddressBookID"),
    A(zal_ipod_event_telephony_callstate_label, 21, "Label"),
    A(zal_ipod_event_telephony_update_carrier_name, 24, "carrier_name"),
};
#undef A

gval *data_for(const char *key, gval *value) {
    if (*key == '\0') return value;
    return hash_of({{"other", serialize_int(0)}, {key, value}});
}

}  // namespace

TEST(EventAccessors, IntegersReadTheirFieldOnlyOnTheirKind) {
    for (const IntAccessor &a : kIntAccessors) {
        SCOPED_TRACE(a.name);
        zal_ipod_event *own = make_event(a.kind, data_for(a.key, serialize_int(4242)));
        EXPECT_EQ(a.read(own), 4242);
        zal_ipod_event *other =
            make_event(a.kind == 10 ? 14 : 10, data_for(a.key, serialize_int(4242)));
        EXPECT_EQ(a.read(other), a.fallback);
        zal_ipod_event *empty = make_event(a.kind, nullptr);
        EXPECT_EQ(a.read(empty), a.fallback);
        if (*a.key != '\0') {
            zal_ipod_event *missing = make_event(a.kind, hash_of({{"other", serialize_int(1)}}));
            EXPECT_EQ(a.read(missing), a.fallback);
            zal_ipod_event *scalar = make_event(a.kind, serialize_int(5));
            EXPECT_EQ(a.read(scalar), a.fallback);
            zal_ipod_event_free(missing);
            zal_ipod_event_free(scalar);
        }
        EXPECT_EQ(a.read(nullptr), a.fallback);
        zal_ipod_event_free(own);
        zal_ipod_event_free(other);
        zal_ipod_event_free(empty);
    }
}

TEST(EventAccessors, StringsReadTheirFieldOnlyOnTheirKind) {
    for (const StringAccessor &a : kStringAccessors) {
        SCOPED_TRACE(a.name);
        zal_ipod_event *own = make_event(a.kind, data_for(a.key, serialize_string("text")));
        EXPECT_STREQ(a.read(own), "text");
        zal_ipod_event *other = make_event(a.kind + 1, data_for(a.key, serialize_string("text")));
        EXPECT_EQ(a.read(other), nullptr);
        zal_ipod_event *wrong = make_event(a.kind, data_for(a.key, serialize_int(1)));
        EXPECT_EQ(a.read(wrong), nullptr);
        zal_ipod_event_free(own);
        zal_ipod_event_free(other);
        zal_ipod_event_free(wrong);
    }
}

TEST(EventAccessors, OutParametersAreLeftAloneOnDefaults) {
    zal_ipod_event *wifi = make_event(23, hash_of({{"passphrase", serialize_string("secret")}}));
    const char *out = "untouched";
    EXPECT_EQ(zal_ipod_event_wifi_information_ssid(wifi, &out), -1);
    EXPECT_STREQ(out, "untouched");
    EXPECT_EQ(zal_ipod_event_wifi_information_passphrase(wifi, &out), 1);
    EXPECT_STREQ(out, "secret");

    const unsigned char bytes[] = {1, 2, 3};
    zal_ipod_event *eap = make_event(18, hash_of({{"data", serialize_bytes(bytes, 3)}}));
    uint32_t length = 99;
    EXPECT_EQ(zal_ipod_event_eap_datagram_data(wifi, &length), nullptr);
    EXPECT_EQ(length, 99u);
    const void *p = zal_ipod_event_eap_datagram_data(eap, &length);
    ASSERT_NE(p, nullptr);
    EXPECT_EQ(length, 3u);
    EXPECT_EQ(memcmp(p, bytes, 3), 0);
    zal_ipod_event_free(wifi);
    zal_ipod_event_free(eap);
}

TEST(EventRecords, SerialComesFromTheDataForConnectAndDisconnect) {
    zal_ipod_event *connected = make_event(1, device_entry("C-1", 1, 1), "outer");
    zal_ipod_event *disconnected = make_event(2, serialize_string("D-2"), "outer");
    zal_ipod_event *authenticated = make_event(4, serialize_int(1), "A-4");
    zal_ipod_event *bare = make_event(4, serialize_int(1));
    EXPECT_STREQ(zal_ipod_event_get_serial(connected), "C-1");
    EXPECT_STREQ(zal_ipod_event_get_serial(disconnected), "D-2");
    EXPECT_STREQ(zal_ipod_event_get_serial(authenticated), "A-4");
    EXPECT_STREQ(zal_ipod_event_get_serial(bare), "");
    EXPECT_EQ(zal_ipod_event_type(nullptr), ZALIPOD_EVENT_UNKNOWN);
    EXPECT_EQ(zal_ipod_event_type(authenticated), ZALIPOD_EVENT_AUTHENTICATED);
    for (auto *e : {connected, disconnected, authenticated, bare}) zal_ipod_event_free(e);
}

TEST(EventRecords, CloneIsIndependentOfItsOrigin) {
    zal_ipod_event *origin = make_event(20, serialize_string("Radio"), "S");
    zal_ipod_event *clone = zal_ipod_event_clone_data(origin);
    ASSERT_NE(clone, nullptr);
    EXPECT_NE(clone->data, origin->data);
    zal_ipod_event_free_data(origin);
    EXPECT_STREQ(zal_ipod_event_get_playing_app(clone), "Radio");
    EXPECT_EQ(clone->session, 3);
    EXPECT_STREQ(clone->serial, "S");
    zal_ipod_event *empty = make_event(15, nullptr);
    zal_ipod_event *empty_clone = zal_ipod_event_clone_data(empty);
    EXPECT_EQ(empty_clone->data, nullptr);
    zal_ipod_event_free(clone);
    zal_ipod_event_free(empty);
    zal_ipod_event_free(empty_clone);
    zal_ipod_event_free(nullptr);
}
