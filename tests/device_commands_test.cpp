// Accessory input, device information and communications commands: the exact request of
// every command and the decoding of its reply (one table), the ready test, the pending-reply
// slots and the decoders of the cached state with their fixed-size buffers.
#include <android/log.h>
#include <gtest/gtest.h>

#include <cstring>
#include <functional>
#include <memory>
#include <string>

#include "client_helpers.h"
#include "fake_daemon.h"
#include "log_capture.h"
#include "zal-ipod-2/command.h"
#include "zal-ipod-2/device_decoders.h"

using namespace zaltest;

namespace {

gval *ints(std::initializer_list<int32_t> items) {
    gval *a = serialize_array();
    for (int32_t v : items) serialize_array_add(a, serialize_int(v));
    return a;
}
gval *flagged(const char *flag, int32_t on,
              std::initializer_list<std::pair<const char *, gval *>> data) {
    gval *h = hash_of(data);
    serialize_hash_add(h, flag, serialize_int(on));
    return h;
}
gval *bytes_of(const std::string &b) {
    return serialize_bytes(b.data(), static_cast<uint32_t>(b.size()));
}

using Make = std::function<gval *()>;
using Call = std::function<int64_t(zal_ipod_handle *)>;
using Check = std::function<void(zal_ipod_handle *)>;

// One command: its _sync call, the request it must write, the reply it gets, the result and
// what the handle (or the caller's outputs) hold afterwards.
struct Row {
    const char *name;
    Call call;
    uint8_t opcode;
    Make sent;  // nullptr: a request without payload
    Make reply;
    int64_t result;
    Check check = nullptr;
    const char *error = nullptr;  // error text afterwards
};

// Outputs of the calls whose results go to the caller.
int g_state = -7, g_level = -7;
char g_eq_name[ZAL_EQPROFILE_NAME_SIZE];
std::string g_text;

int64_t keep_text(char *text) {
    g_text = text != nullptr ? text : "(null)";
    free(text);
    return text != nullptr ? 1 : 0;
}

// Every pending-reply slot, to see which ones a command changed.
std::vector<uint32_t> slot_values(const zal_pending_slots &s) {
    return {
        s.track_info_tid,         s.artwork_tid,        s.artwork_by_uid_tid, s.play_state_tid,
        s.chapter_index_tid,      s.chapter_status_tid, s.track_index_tid,    s.session_tid,
        s.category_tid,           s.records_tid,        s.select_db_tid,      s.preference_tid,
        s.indexed_track_info_tid, s.itunes_info_tid,    s.db_track_info_tid,  s.pb_track_info_tid,
        s.uid_list_tid,           s.lingo_version_tid,  s.localization_tid,   s.voiceover_item_tid,
        s.sample_rate_tid,        s.preference_class};
}

const char kEap[] = {'a', '\0', 'c'};

std::vector<Row> rows() {
    return {
        // Accessory input and video out.
        {"enter_videooutmode", zal_ipod_enter_videooutmode_sync, 65, nullptr,
         [] { return serialize_int(0); }, 0},
        {"exit_videooutmode", zal_ipod_exit_videooutmode_sync, 66, nullptr,
         [] { return serialize_int(3); }, 3},
        {"get_videooutoptions_flag", [](auto h) { return zal_ipod_get_videooutoptions_sync(h, 7); },
         67, [] { return serialize_int(1); }, [] { return serialize_int(12); }, 12},
        {"get_videooutoptions_zero", [](auto h) { return zal_ipod_get_videooutoptions_sync(h, 0); },
         67, [] { return serialize_int(0); }, [] { return serialize_int(-5); }, -5},
        {"set_videooutoptions",
         [](auto h) { return zal_ipod_set_videooutoptions_sync(h, 0x12345678); }, 68,
         [] { return serialize_int(0x12345678); }, [] { return serialize_int(0); }, 0},
        {"navigate_videoout", [](auto h) { return zal_ipod_navigate_videoout_sync(h, -2); }, 69,
         [] { return serialize_int(-2); }, [] { return serialize_int(0); }, 0},
        {"get_mode", zal_ipod_get_mode_sync, 70, nullptr, [] { return serialize_int(2); }, 2},
        {"set_statechange", [](auto h) { return zal_ipod_set_statechange_sync(h, 3); }, 64,
         [] { return serialize_int(3); }, [] { return serialize_int(0); }, 0},
        {"launchapplication",
         [](auto h) { return zal_ipod_launchapplication_sync(h, "com.example.nav"); }, 72,
         [] { return serialize_string("com.example.nav"); }, [] { return serialize_int(0); }, 0},
        {"contextbutton", [](auto h) { return zal_ipod_simple_contextbutton_sync(h, 0x80); }, 73,
         [] { return serialize_int(0x80); }, [] { return serialize_int(0); }, 0},
        {"videobutton", [](auto h) { return zal_ipod_simple_videobutton_sync(h, 1); }, 74,
         [] { return serialize_int(1); }, [] { return serialize_int(0); }, 0},
        {"audiobutton", [](auto h) { return zal_ipod_simple_audiobutton_sync(h, 2); }, 75,
         [] { return serialize_int(2); }, [] { return serialize_int(0); }, 0},
        {"radiobutton", [](auto h) { return zal_ipod_simple_radiobutton_sync(h, 4); }, 76,
         [] { return serialize_int(4); }, [] { return serialize_int(0); }, 0},
        {"camerabutton", [](auto h) { return zal_ipod_simple_camerabutton_sync(h, 0); }, 77,
         [] { return serialize_int(0); }, [] { return serialize_int(0); }, 0},
        {"set_video_delay", [](auto h) { return zal_ipod_set_video_delay_sync(h, 150); }, 85,
         [] { return serialize_int(150); }, [] { return serialize_int(0); }, 0},
        {"set_available_current",
         [](auto h) { return zal_ipod_set_available_current_sync(h, 2100); }, 86,
         [] { return serialize_int(2100); }, [] { return serialize_int(0); }, 0},
        {"set_internal_battery_charging_state",
         [](auto h) { return zal_ipod_set_internal_battery_charging_state_sync(h, 1); }, 87,
         [] { return serialize_int(1); }, [] { return serialize_int(0); }, 0},
        {"rotation_input_narrow_fields_unsigned",
         [](auto h) {
             return zal_ipod_rotation_input_sync(h, 1, -2, 70000, 255, 0, 128, 65535, 1);
         },
         88,
         [] {
             return ints({1, -2, 70000, 255, 0, 128, 65535, 1});
         },
         [] { return serialize_int(0); }, 0},
        {"voiceover_event_ends_with_a_string",
         [](auto h) { return zal_ipod_voiceover_event_sync(h, 1, 2, 3, 255, 254, 0, "Play"); }, 91,
         [] {
             gval *a = ints({1, 2, 3, 255, 254, 0});
             serialize_array_add(a, serialize_string("Play"));
             return a;
         },
         [] { return serialize_int(0); }, 0},
        {"get_voiceover_parameter",
         [](auto h) { return zal_ipod_get_voiceover_parameter_sync(h, 4); }, 92,
         [] { return serialize_int(4); },
         [] {
             return flagged("get_voiceover_parameter", 1, {{"value", serialize_int(60)}});
         },
         60},
        {"get_voiceover_parameter_flag_off",
         [](auto h) { return zal_ipod_get_voiceover_parameter_sync(h, 4); }, 92,
         [] { return serialize_int(4); },
         [] {
             return flagged("get_voiceover_parameter", 0, {{"value", serialize_int(60)}});
         },
         -1},
        {"set_voiceover_parameter",
         [](auto h) { return zal_ipod_set_voiceover_parameter_sync(h, 4, 80); }, 93,
         [] {
             return ints({4, 80});
         },
         [] { return serialize_int(0); }, 0},
        {"get_current_voiceover_itemproperty",
         [](auto h) { return zal_ipod_get_current_voiceover_itemproperty_sync(h, 1); }, 94,
         [] { return serialize_int(1); },
         [] {
             return flagged("get_current_voiceover_itemproperty", 1,
                            {{"type", serialize_int(1)},
                             {"current_index", serialize_int(4)},
                             {"last_index", serialize_int(9)},
                             {"name", serialize_string("Settings")}});
         },
         1,
         [](zal_ipod_handle *h) {
             EXPECT_EQ(zal_ipod_voiceover_item_current_index(h, 1), 4);
             EXPECT_EQ(zal_ipod_voiceover_item_last_index(h, 1), 9);
             EXPECT_STREQ(zal_ipod_voiceover_item_name(h, 1), "Settings");
         }},
        {"set_voiceover_context", [](auto h) { return zal_ipod_set_voiceover_context_sync(h, 2); },
         95, [] { return serialize_int(2); }, [] { return serialize_int(0); }, 0},
        {"register_descriptor",
         [](auto h) { return zal_ipod_register_descriptor_sync(h, 1, 2, 3, 255, 200); }, 96,
         [] {
             return ints({1, 2, 3, 255, 200});
         },
         [] { return serialize_int(0); }, 0},
        {"ipod_hid_report", [](auto h) { return zal_ipod_ipod_hid_report_sync(h, 1, -2, 3); }, 97,
         [] {
             return ints({1, -2, 3});
         },
         [] { return serialize_int(0); }, 0},
        {"unregister_descriptor_array_of_one",
         [](auto h) { return zal_ipod_unregister_descriptor_sync(h, 3); }, 98,
         [] { return ints({3}); }, [] { return serialize_int(0); }, 0},

        // Device information.
        {"request_lingo_version",
         [](auto h) { return zal_ipod_request_lingo_version_sync(h, 0x0A); }, 84,
         [] { return serialize_int(10); },
         [] {
             return flagged("request_lingo_version", 1,
                            {{"major", serialize_int(1)}, {"minor", serialize_int(9)}});
         },
         1,
         [](zal_ipod_handle *h) {
             EXPECT_EQ(zal_ipod_get_result_lingo_version_major(h), 1);
             EXPECT_EQ(zal_ipod_get_result_lingo_version_minor(h), 9);
             EXPECT_STREQ(zal_ipod_get_result_lingo_version(h), "1.9");
         }},
        {"get_lingo_options_64_bits",
         [](auto h) { return static_cast<int64_t>(zal_ipod_get_lingo_options_sync(h, 4)); }, 7,
         [] { return serialize_int(4); },
         [] { return bytes_of(std::string("\x01\x02\x03\x04\x05\x06\x07\x08", 8)); },
         0x0102030405060708},
        {"get_lingo_options_small",
         [](auto h) { return static_cast<int64_t>(zal_ipod_get_lingo_options_sync(h, 0)); }, 7,
         [] { return serialize_int(0); },
         [] { return bytes_of(std::string("\0\0\0\0\0\0\x01\x02", 8)); }, 258},
        {"localization_info", [](auto h) { return zal_ipod_localization_info_sync(h, 1); }, 89,
         [] { return serialize_int(1); },
         [] {
             return hash_of({{"type", serialize_int(1)}, {"data", serialize_string("de_DE")}});
         },
         1,
         [](zal_ipod_handle *h) {
             EXPECT_STREQ(zal_ipod_current_localization_info(h, 1), "de_DE");
         }},
        {"get_current_eqprofile_index", zal_ipod_get_current_eqprofile_index_sync, 113, nullptr,
         [] {
             return flagged("get_current_eqprofile_index", 1, {{"index", serialize_int(2)}});
         },
         2},
        {"set_current_eqprofile_index",
         [](auto h) { return zal_ipod_set_current_eqprofile_index_sync(h, 3, 1); }, 114,
         [] {
             return ints({3, 1});
         },
         [] { return serialize_int(0); }, 0},
        {"get_num_eqprofiles", zal_ipod_get_num_eqprofiles_sync, 115, nullptr,
         [] {
             return flagged("get_num_eqprofiles", 1, {{"number", serialize_int(5)}});
         },
         5},
        {"get_num_eqprofiles_error", zal_ipod_get_num_eqprofiles_sync, 115, nullptr,
         [] {
             return hash_of({{"error", serialize_string("no equaliser")}});
         },
         -1, nullptr, "no equaliser"},
        {"get_indexed_eqprofile_name",
         [](auto h) {
             memset(g_eq_name, 'x', sizeof g_eq_name);
             return zal_ipod_get_indexed_eqprofile_name_sync(h, 2, g_eq_name);
         },
         116, [] { return serialize_int(2); },
         [] {
             return flagged("get_indexed_eqprofile_name", 1, {{"name", serialize_string("Pop")}});
         },
         1,
         [](zal_ipod_handle *) {
             EXPECT_STREQ(g_eq_name, "Pop");
             for (std::size_t i = 3; i < sizeof g_eq_name; ++i) ASSERT_EQ(g_eq_name[i], '\0') << i;
         }},
        {"get_power_battery_state",
         [](auto h) { return zal_ipod_get_power_battery_state_sync(h, &g_state, &g_level); }, 117,
         nullptr,
         [] {
             return flagged("get_power_battery_state", 1,
                            {{"state", serialize_int(2)}, {"level", serialize_int(80)}});
         },
         1,
         [](zal_ipod_handle *) {
             EXPECT_EQ(g_state, 2);
             EXPECT_EQ(g_level, 80);
         }},
        {"get_power_battery_state_flag_off",
         [](auto h) {
             g_state = g_level = -7;
             return zal_ipod_get_power_battery_state_sync(h, &g_state, &g_level);
         },
         117, nullptr,
         [] {
             return flagged("get_power_battery_state", 0,
                            {{"state", serialize_int(2)}, {"level", serialize_int(80)}});
         },
         -1,
         [](zal_ipod_handle *) {
             EXPECT_EQ(g_state, -7);
             EXPECT_EQ(g_level, -7);
         }},
        {"get_sound_check_state", zal_ipod_get_sound_check_state_sync, 118, nullptr,
         [] {
             return flagged("get_sound_check_state", 1, {{"state", serialize_int(1)}});
         },
         1},
        {"set_sound_check_state",
         [](auto h) { return zal_ipod_set_sound_check_state_sync(h, 1, 0); }, 119,
         [] {
             return ints({1, 0});
         },
         [] { return serialize_int(0); }, 0},
        {"bt_connection_status",
         [](auto h) { return keep_text(zal_ipod_bt_connection_status_sync(h)); }, 106, nullptr,
         [] {
             return hash_of({{"current_bt_status", serialize_string("connected")}});
         },
         1, [](zal_ipod_handle *) { EXPECT_EQ(g_text, "connected"); }},
        {"bt_connection_status_missing",
         [](auto h) { return keep_text(zal_ipod_bt_connection_status_sync(h)); }, 106, nullptr,
         [] {
             return hash_of({{"status", serialize_string("connected")}});
         },
         0},
        {"request_wifi_connection_info", zal_ipod_request_wifi_connection_info_sync, 90, nullptr,
         [] { return serialize_int(0); }, 0},
        {"device_power_source_update_ignores_reply",
         [](auto h) { return zal_ipod_device_power_source_update_sync(h, 1, 2); }, 49,
         [] {
             return ints({1, 2});
         },
         [] { return serialize_int(7); }, 0},
        {"reauthentication", [](auto h) { return zal_ipod_reauthentication_sync(h, 1); }, 59,
         [] { return serialize_int(1); }, [] { return serialize_int(0); }, 0},

        // Communications and vehicle integration.
        {"start_telephony_callstate_information",
         [](auto h) { return zal_ipod_start_telephony_callstate_information_sync(h, 1); }, 120,
         [] { return serialize_int(1); }, [] { return serialize_int(0); }, 0},
        {"stop_telephony_callstate_information", zal_ipod_stop_telephony_callstate_information_sync,
         121, nullptr, [] { return serialize_int(0); }, 0},
        {"start_telephony_update", zal_ipod_start_telephony_update_sync, 123, nullptr,
         [] { return serialize_int(0); }, 0},
        {"stop_telephony_update", zal_ipod_stop_telephony_update_sync, 124, nullptr,
         [] { return serialize_int(0); }, 0},
        {"send_eap_datagram_exact_bytes",
         [](auto h) { return zal_ipod_send_eap_datagram_sync(h, 7, kEap, 3); }, 107,
         [] {
             gval *a = ints({7, 3});
             serialize_array_add(a, bytes_of(std::string(kEap, 3)));
             return a;
         },
         [] { return serialize_int(0); }, 0},
        {"send_eap_datagram_empty",
         [](auto h) { return zal_ipod_send_eap_datagram_sync(h, 7, nullptr, 0); }, 107,
         [] {
             gval *a = ints({7, 0});
             serialize_array_add(a, bytes_of(""));
             return a;
         },
         [] { return serialize_int(0); }, 0},
        {"send_location_information",
         [](auto h) { return zal_ipod_send_location_information_sync(h, "$GPGGA,1"); }, 108,
         [] { return serialize_string("$GPGGA,1"); }, [] { return serialize_int(0); }, 0},
        {"send_bluetooth_component_information",
         [](auto h) { return zal_ipod_send_bluetooth_component_information_sync(h, 1); }, 103,
         [] { return serialize_int(1); }, [] { return serialize_int(0); }, 0},
        {"send_vehicle_status_update_signs",
         [](auto h) { return zal_ipod_send_vehicle_status_update_sync(h, 1, 2, 3, -40, 255); }, 122,
         [] {
             return ints({1, 2, 3, -40, 255});
         },
         [] { return serialize_int(0); }, 0},
    };
}

TEST(DeviceCommands, EachWritesItsRequestAndDecodesItsReply) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d);
    ASSERT_NE(h, nullptr);
    testing::internal::CaptureStderr();  // the lingo version's trace lines
    for (const Row &row : rows()) {
        SCOPED_TRACE(row.name);
        d.expect(row.opcode, row.sent ? row.sent() : nullptr).reply(row.reply());
        EXPECT_EQ(row.call(h), row.result);
        ASSERT_TRUE(d.finish()) << d.report();
        if (row.check) row.check(h);
        if (row.error) {
            EXPECT_STREQ(zal_ipod_get_error_message(h), row.error);
        }
    }
    testing::internal::GetCapturedStderr();
    zal_ipod_close(h);
}

// The asynchronous forms of a handle without a session: nothing is sent; those that take an
// argument say so with their name.
TEST(DeviceCommands, NotReadyHandleSendsNothing) {
    struct Refused {
        const char *name;
        std::function<int(zal_ipod_handle *)> send;
        bool warns;
    };
    const Refused refused[] = {
        {"zal_ipod_enter_videooutmode", zal_ipod_enter_videooutmode, false},
        {"zal_ipod_get_mode", zal_ipod_get_mode, false},
        {"zal_ipod_set_videooutoptions", [](auto h) { return zal_ipod_set_videooutoptions(h, 1); },
         true},
        {"zal_ipod_rotation_input",
         [](auto h) { return zal_ipod_rotation_input(h, 1, 2, 3, 4, 5, 6, 7, 8); }, true},
        {"zal_ipod_unregister_descriptor",
         [](auto h) { return zal_ipod_unregister_descriptor(h, 3); }, true},
        {"zal_ipod_get_current_voiceover_itemproperty",
         [](auto h) { return zal_ipod_get_current_voiceover_itemproperty(h, 0); }, true},
        {"zal_ipod_get_num_eqprofiles", zal_ipod_get_num_eqprofiles, false},
        {"zal_ipod_get_power_battery_state", zal_ipod_get_power_battery_state, false},
        {"zal_ipod_localization_info", [](auto h) { return zal_ipod_localization_info(h, 0); },
         true},
        {"zal_ipod_get_lingo_options", [](auto h) { return zal_ipod_get_lingo_options(h, 0); },
         true},
        {"zal_ipod_stop_telephony_update", zal_ipod_stop_telephony_update, false},
        {"zal_ipod_start_telephony_update", zal_ipod_start_telephony_update, false},
        {"zal_ipod_send_eap_datagram",
         [](auto h) { return zal_ipod_send_eap_datagram(h, 1, "x", 1); }, true},
        {"zal_ipod_send_vehicle_status_update",
         [](auto h) { return zal_ipod_send_vehicle_status_update(h, 1, 2, 3, 4, 5); }, true},
    };
    FakeDaemon d;
    d.expect(ZAL_OP_HELLO).reply(serialize_array());
    zal_ipod_handle *h = zal_ipod_connect(nullptr);
    ASSERT_NE(h, nullptr);
    const std::vector<uint32_t> before = slot_values(h->slots);
    for (const Refused &r : refused) {
        SCOPED_TRACE(r.name);
        LogCapture log;
        EXPECT_EQ(r.send(h), 0);
        const auto warnings = log.texts(ANDROID_LOG_WARN);
        if (r.warns) {
            EXPECT_EQ(warnings,
                      std::vector<std::string>{"not ready2 " + std::string(r.name) + "\n"});
        } else {
            EXPECT_TRUE(warnings.empty());
        }
    }
    EXPECT_EQ(slot_values(h->slots), before);
    EXPECT_TRUE(d.finish()) << d.report();  // nothing reached the daemon
    zal_ipod_close(h);
}

// The Wi-Fi configuration goes out before any session, logs its name and has no sync form.
TEST(DeviceCommands, WifiConfigurationNeedsNoSession) {
    FakeDaemon d;
    d.expect(ZAL_OP_HELLO).reply(serialize_array());
    zal_ipod_handle *h = zal_ipod_connect(nullptr);
    ASSERT_NE(h, nullptr);
    gval *sent = serialize_array();
    serialize_array_add(sent, serialize_string("CarAP"));
    serialize_array_add(sent, serialize_string("secret"));
    serialize_array_add(sent, serialize_int(65535));
    serialize_array_add(sent, serialize_int(6));
    d.expect(ZAL_OP_SEND_ACCESSORY_WIFI_CONFIGURATION, sent);
    LogCapture log;
    const int tid =
        zal_ipod_send_accessory_wifi_configuration_information(h, "CarAP", "secret", 65535, 6);
    EXPECT_GT(tid, 0);
    EXPECT_EQ(h->request_opcodes[tid], 134);
    EXPECT_TRUE(log.contains(ANDROID_LOG_VERBOSE,
                             "zal_ipod_send_accessory_wifi_configuration_information"));
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

// Which asynchronous forms leave their tid in a pending-reply slot, and which slot.
TEST(DeviceCommands, SlotsOfTheAsynchronousForms) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d);
    ASSERT_NE(h, nullptr);
    struct Slotted {
        const char *name;
        std::function<int(zal_ipod_handle *)> send;
        uint8_t opcode;
        Make sent;
        uint16_t zal_pending_slots::*slot;  // nullptr: none may change
    };
    const Slotted cases[] = {
        {"voiceover_item", [](auto h) { return zal_ipod_get_current_voiceover_itemproperty(h, 2); },
         94, [] { return serialize_int(2); }, &zal_pending_slots::voiceover_item_tid},
        {"lingo_version", [](auto h) { return zal_ipod_request_lingo_version(h, 3); }, 84,
         [] { return serialize_int(3); }, &zal_pending_slots::lingo_version_tid},
        {"localization", [](auto h) { return zal_ipod_localization_info(h, 0); }, 89,
         [] { return serialize_int(0); }, &zal_pending_slots::localization_tid},
        {"eap_datagram", [](auto h) { return zal_ipod_send_eap_datagram(h, 2, "ab", 2); }, 107,
         [] {
             gval *a = ints({2, 2});
             serialize_array_add(a, bytes_of("ab"));
             return a;
         },
         &zal_pending_slots::uid_list_tid},
        {"lingo_options", [](auto h) { return zal_ipod_get_lingo_options(h, 3); }, 7,
         [] { return serialize_int(3); }, nullptr},
        {"voiceover_parameter", [](auto h) { return zal_ipod_get_voiceover_parameter(h, 1); }, 92,
         [] { return serialize_int(1); }, nullptr},
        {"battery", zal_ipod_get_power_battery_state, 117, [] { return (gval *)nullptr; }, nullptr},
    };
    testing::internal::CaptureStderr();
    for (const Slotted &c : cases) {
        SCOPED_TRACE(c.name);
        d.expect(c.opcode, c.sent());
        zal_pending_slots before = h->slots;
        const int tid = c.send(h);
        ASSERT_GT(tid, 0);
        if (c.slot != nullptr) {
            EXPECT_EQ(h->slots.*c.slot, tid);
            before.*c.slot = static_cast<uint16_t>(tid);
        }
        EXPECT_EQ(slot_values(h->slots), slot_values(before)) << "another slot changed";
    }
    // A datagram whose bytes cannot be read is refused before anything is sent.
    LogCapture log;
    EXPECT_EQ(zal_ipod_send_eap_datagram(h, 2, nullptr, 4), 0);
    EXPECT_EQ(zal_ipod_send_eap_datagram(h, 2, "abcd", -1), 0);
    EXPECT_EQ(log.texts(ANDROID_LOG_ERROR).size(), 4u);  // message and location, twice
    const std::string trace = testing::internal::GetCapturedStderr();
    EXPECT_NE(trace.find("zal_ipod_request_lingo_version, lingo=0x03\n"), std::string::npos);
    d.expect(ZAL_OP_KEEP_ALIVE);  // the refused datagrams did not reach the daemon
    zal_ipod_keep_alive(h);
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

// Replies that arrive outside a wait are decoded into the handle before the callback.
TEST(DeviceCommands, RepliesThroughTheSlotsFillTheCache) {
    zal_ipod_handle *h = offline_handle();
    struct Seen {
        uint16_t tid;
        int32_t result;
    };
    std::vector<Seen> seen;
    zal_ipod_set_reply_cb(
        h,
        [](zal_ipod_handle *, uint16_t tid, int32_t result, const char *, void *user) {
            static_cast<std::vector<Seen> *>(user)->push_back({tid, result});
            return 0;
        },
        &seen);
    h->slots.voiceover_item_tid = 11;
    h->slots.lingo_version_tid = 12;
    h->slots.localization_tid = 13;
    h->slots.uid_list_tid = 14;  // an EAP datagram's
    queue_record(h, make_reply(11, ZAL_OP_RETURN,
                               flagged("get_current_voiceover_itemproperty", 1,
                                       {{"type", serialize_int(3)},
                                        {"topleft_x", serialize_int(10)},
                                        {"topleft_y", serialize_int(20)},
                                        {"bottomright_x", serialize_int(300)},
                                        {"bottomright_y", serialize_int(70000)}})));
    queue_record(h,
                 make_reply(12, ZAL_OP_RETURN,
                            flagged("request_lingo_version", 1,
                                    {{"major", serialize_int(2)}, {"minor", serialize_int(11)}})));
    queue_record(
        h, make_reply(13, ZAL_OP_RETURN,
                      hash_of({{"type", serialize_int(0)}, {"data", serialize_string("en_GB")}})));
    queue_record(h, make_reply(14, ZAL_OP_RETURN, serialize_int(0)));
    testing::internal::CaptureStderr();
    zal_ipod_pending_event(h);
    testing::internal::GetCapturedStderr();
    ASSERT_EQ(seen.size(), 4u);
    for (const Seen &s : seen) EXPECT_EQ(s.result, 1) << "tid " << s.tid;
    EXPECT_EQ(zal_ipod_voiceover_item_topleft_x(h), 10);
    EXPECT_EQ(zal_ipod_voiceover_item_topleft_y(h), 20);
    EXPECT_EQ(zal_ipod_voiceover_item_bottomright_x(h), 300);
    EXPECT_EQ(zal_ipod_voiceover_item_bottomright_y(h), 70000 & 0xFFFF);
    EXPECT_STREQ(zal_ipod_get_result_lingo_version(h), "2.11");
    EXPECT_STREQ(zal_ipod_current_localization_info(h, 0), "en_GB");
    zal_ipod_close(h);
}

// ---- Decoders of the cached state, their fixed-size buffers among them ----

std::string repeat(char c, std::size_t n) {
    return std::string(n, c);
}

gval *item_reply(int32_t type, gval *name, int32_t flag = 1) {
    gval *h = flagged("get_current_voiceover_itemproperty", flag,
                      {{"type", serialize_int(type)},
                       {"current_index", serialize_int(65536 + 5)},
                       {"last_index", serialize_int(6)}});
    if (name != nullptr) serialize_hash_add(h, "name", name);
    return h;
}

TEST(DeviceDecoders, VoiceOverItem) {
    struct Case {
        const char *name;
        gval *reply;  // nullptr: no payload
        int32_t result;
        int type;              // the named type that must have changed, or -1
        std::string expected;  // its name afterwards
    };
    const std::string long_name = repeat('n', 200);
    const Case cases[] = {
        {"type0", item_reply(0, serialize_string("Back")), 1, 0, "Back"},
        {"type2_exactly_127", item_reply(2, serialize_string(repeat('a', 127).c_str())), 1, 2,
         repeat('a', 127)},
        {"type1_128_is_cut", item_reply(1, serialize_string(repeat('b', 128).c_str())), 1, 1,
         repeat('b', 127)},
        {"type1_200_is_cut", item_reply(1, serialize_string(long_name.c_str())), 1, 1,
         repeat('n', 127)},
        {"type1_without_name", item_reply(1, nullptr), 1, 1, ""},
        {"type1_name_not_text", item_reply(1, serialize_int(5)), 1, 1, ""},
        {"type4", item_reply(4, serialize_string("x")), -1, -1, ""},
        {"negative_type", item_reply(-1, serialize_string("x")), -1, -1, ""},
        {"flag_off", item_reply(0, serialize_string("x"), 0), -1, -1, ""},
        {"no_flag", hash_of({{"type", serialize_int(0)}, {"name", serialize_string("x")}}), -1, -1,
         ""},
        {"error", hash_of({{"error", serialize_string("no cursor")}}), -1, -1, ""},
        {"not_a_hash", serialize_int(1), -1, -1, ""},
        {"no_payload", nullptr, -1, -1, ""},
    };
    zal_ipod_handle *h = offline_handle();
    for (const Case &c : cases) {
        SCOPED_TRACE(c.name);
        // Known contents in every type, to see which one the reply touched.
        for (int t = 0; t < 3; ++t) {
            h->voiceover.current_index[t] = 1;
            snprintf(h->voiceover.name[t], sizeof h->voiceover.name[t], "old%d", t);
        }
        zal_ipod_reply *r = make_reply(1, ZAL_OP_RETURN, c.reply);
        EXPECT_EQ(zal_voiceover_item_decode(h, r), c.result);
        reply_record_free(r);
        for (int t = 0; t < 3; ++t) {
            if (t == c.type) {
                EXPECT_EQ(zal_ipod_voiceover_item_name(h, t), c.expected);
                EXPECT_EQ(zal_ipod_voiceover_item_current_index(h, t), 5);  // cut to 16 bits
                EXPECT_EQ(zal_ipod_voiceover_item_last_index(h, t), 6);
            } else {
                EXPECT_EQ(zal_ipod_voiceover_item_name(h, t), "old" + std::to_string(t));
                EXPECT_EQ(zal_ipod_voiceover_item_current_index(h, t), 1);
            }
        }
    }
    EXPECT_STREQ(zal_ipod_get_error_message(h), "no cursor");
    EXPECT_EQ(zal_ipod_voiceover_item_name(h, 3), nullptr);
    EXPECT_EQ(zal_ipod_voiceover_item_current_index(h, -1), -1);
    zal_ipod_close(h);
}

TEST(DeviceDecoders, Localization) {
    struct Case {
        const char *name;
        gval *reply;
        int32_t result;
        std::string type0, type1;  // texts afterwards
    };
    const Case cases[] = {
        {"type0", hash_of({{"type", serialize_int(0)}, {"data", serialize_string("fr_FR")}}), 1,
         "fr_FR", "old1"},
        {"type1_63",
         hash_of({{"type", serialize_int(1)}, {"data", serialize_string(repeat('c', 63).c_str())}}),
         1, "old0", repeat('c', 63)},
        {"type1_64_is_cut",
         hash_of({{"type", serialize_int(1)}, {"data", serialize_string(repeat('d', 64).c_str())}}),
         1, "old0", repeat('d', 63)},
        {"type1_500_is_cut",
         hash_of(
             {{"type", serialize_int(1)}, {"data", serialize_string(repeat('e', 500).c_str())}}),
         1, "old0", repeat('e', 63)},
        {"type2_ignored", hash_of({{"type", serialize_int(2)}, {"data", serialize_string("x")}}),
         -1, "old0", "old1"},
        {"negative_type_ignored",
         hash_of({{"type", serialize_int(-1)}, {"data", serialize_string("x")}}), -1, "old0",
         "old1"},
        {"no_text", hash_of({{"type", serialize_int(0)}}), -1, "old0", "old1"},
        {"no_type", hash_of({{"data", serialize_string("x")}}), -1, "old0", "old1"},
        {"no_payload", nullptr, -1, "old0", "old1"},
    };
    zal_ipod_handle *h = offline_handle();
    for (const Case &c : cases) {
        SCOPED_TRACE(c.name);
        strcpy(h->device_info.localization[0], "old0");
        strcpy(h->device_info.localization[1], "old1");
        zal_ipod_reply *r = make_reply(1, ZAL_OP_RETURN, c.reply);
        EXPECT_EQ(zal_localization_decode(h, r), c.result);
        reply_record_free(r);
        EXPECT_EQ(zal_ipod_current_localization_info(h, 0), c.type0);
        EXPECT_EQ(zal_ipod_current_localization_info(h, 1), c.type1);
    }
    EXPECT_EQ(zal_ipod_current_localization_info(h, 2), nullptr);
    zal_ipod_close(h);
}

TEST(DeviceDecoders, LingoVersion) {
    struct Case {
        const char *name;
        gval *reply;
        int32_t result;
        int32_t major, minor;
        const char *text;
        const char *out;  // standard output
    };
    auto version = [](int flag, int32_t major, int32_t minor) {
        return flagged("request_lingo_version", flag,
                       {{"major", serialize_int(major)}, {"minor", serialize_int(minor)}});
    };
    const Case cases[] = {
        {"one_nine", version(1, 1, 9), 1, 1, 9, "1.9", ""},
        {"seven_characters", version(1, 100, 200), 1, 100, 200, "100.200", ""},
        {"does_not_fit", version(1, 1000, 200), 1, 1000, 200, "", ""},
        {"negative_does_not_fit", version(1, -2147483647 - 1, -1), 1, -2147483647 - 1, -1, "", ""},
        {"flag_off", version(0, 3, 4), -1, 7, 7, "7.7", "Requesting lingo version failed!\n"},
        {"no_payload", nullptr, -1, 7, 7, "7.7", ""},
    };
    zal_ipod_handle *h = offline_handle();
    for (const Case &c : cases) {
        SCOPED_TRACE(c.name);
        h->device_info.lingo_major = h->device_info.lingo_minor = 7;
        strcpy(h->device_info.lingo_version, "7.7");
        zal_ipod_reply *r = make_reply(1, ZAL_OP_RETURN, c.reply);
        testing::internal::CaptureStdout();
        testing::internal::CaptureStderr();
        EXPECT_EQ(zal_lingo_version_decode(h, r), c.result);
        const std::string err = testing::internal::GetCapturedStderr();
        EXPECT_EQ(testing::internal::GetCapturedStdout(), c.out);
        reply_record_free(r);
        EXPECT_EQ(err.rfind("set_lingo_version\n", 0), 0u) << err;
        EXPECT_EQ(zal_ipod_get_result_lingo_version_major(h), c.major);
        EXPECT_EQ(zal_ipod_get_result_lingo_version_minor(h), c.minor);
        EXPECT_STREQ(zal_ipod_get_result_lingo_version(h), c.text);
        if (c.result == 1) {
            EXPECT_NE(err.find("set_lingo_version, major=" + std::to_string(c.major) +
                               ", minor=" + std::to_string(c.minor) + "\n"),
                      std::string::npos);
        }
    }
    zal_ipod_close(h);
}

// Lingo options and equaliser names over the wire: short byte strings and long names
// against buffers of exactly their documented size (ASan sees any overrun).
TEST(DeviceDecoders, LingoOptionsNeverReadPastTheReply) {
    struct Case {
        const char *name;
        gval *reply;
        uint64_t result;
    };
    const Case cases[] = {
        {"nine_bytes_first_eight", bytes_of(std::string("\xff\0\0\0\0\0\0\x01\x09", 9)),
         0xff00000000000001ull},
        {"seven_bytes", bytes_of(std::string("\x01\x02\x03\x04\x05\x06\x07", 7)), 0},
        {"empty", bytes_of(""), 0},
        {"string", serialize_string("12345678"), 0},
        {"integer", serialize_int(258), 0},
    };
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d);
    ASSERT_NE(h, nullptr);
    for (const Case &c : cases) {
        SCOPED_TRACE(c.name);
        d.expect(ZAL_OP_LINGO_OPTIONS, serialize_int(1)).reply(c.reply);
        EXPECT_EQ(zal_ipod_get_lingo_options_sync(h, 1), c.result);
    }
    d.expect(ZAL_OP_LINGO_OPTIONS, serialize_int(1));  // no reply: time-out
    zal_ipod_set_read_timeout(h, 1, 0);
    EXPECT_EQ(zal_ipod_get_lingo_options_sync(h, 1), 0u);
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

TEST(DeviceDecoders, EqualiserNameFillsExactlyItsBuffer) {
    struct Case {
        const char *name;
        gval *reply;
        int32_t result;
        std::string expected;  // the 64 bytes afterwards, "" + 'x' fill when untouched
    };
    const std::string untouched(ZAL_EQPROFILE_NAME_SIZE, 'x');
    auto name_reply = [](const std::string &n) {
        return flagged("get_indexed_eqprofile_name", 1, {{"name", serialize_string(n.c_str())}});
    };
    const Case cases[] = {
        {"short_padded", name_reply("Pop"), 1, "Pop" + std::string(61, '\0')},
        {"63_terminated", name_reply(repeat('r', 63)), 1, repeat('r', 63) + '\0'},
        {"64_unterminated", name_reply(repeat('s', 64)), 1, repeat('s', 64)},
        {"300_cut_at_64", name_reply(repeat('t', 300)), 1, repeat('t', 64)},
        {"flag_off", flagged("get_indexed_eqprofile_name", 0, {{"name", serialize_string("P")}}),
         -1, untouched},
        {"no_name", flagged("get_indexed_eqprofile_name", 1, {}), -1, untouched},
    };
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d);
    ASSERT_NE(h, nullptr);
    for (const Case &c : cases) {
        SCOPED_TRACE(c.name);
        auto buffer = std::make_unique<char[]>(ZAL_EQPROFILE_NAME_SIZE);
        memset(buffer.get(), 'x', ZAL_EQPROFILE_NAME_SIZE);
        d.expect(ZAL_OP_GET_INDEXED_EQPROFILE_NAME, serialize_int(0)).reply(c.reply);
        EXPECT_EQ(zal_ipod_get_indexed_eqprofile_name_sync(h, 0, buffer.get()), c.result);
        EXPECT_EQ(std::string(buffer.get(), ZAL_EQPROFILE_NAME_SIZE), c.expected);
    }
    d.expect(ZAL_OP_GET_INDEXED_EQPROFILE_NAME, serialize_int(0)).reply(name_reply("Pop"));
    EXPECT_EQ(zal_ipod_get_indexed_eqprofile_name_sync(h, 0, nullptr), 1);
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

// ---- The helpers these commands added ----

TEST(CommandHelpers, ArgumentListWidensEachItemByItsOwnType) {
    const uint8_t u8 = 255;
    const uint16_t u16 = 65535;
    const int16_t s16 = -40;
    const int8_t s8 = -1;
    GvalPtr list(zal_arg_list(u8, u16, s16, s8, int32_t{-7}, "text"));
    ASSERT_NE(list, nullptr);
    GvalPtr expected(ints({255, 65535, -40, -1, -7}));
    serialize_array_add(expected.get(), serialize_string("text"));
    EXPECT_EQ(encode(list.get()), encode(expected.get()));
    GvalPtr with_value(zal_arg_list(1, zal_arg_bytes("ab", 2)));
    ASSERT_NE(with_value, nullptr);
    EXPECT_EQ(serialize_type(serialize_array_get(with_value.get(), 1)), SERIALIZE_BYTES);
    EXPECT_EQ(zal_arg_list(1, zal_arg_byte_string(nullptr, 1)), nullptr);
}

TEST(CommandHelpers, ByteStringFromACallersPointerAndLength) {
    EXPECT_EQ(zal_arg_byte_string(nullptr, 3), nullptr);
    EXPECT_EQ(zal_arg_byte_string("abc", -1), nullptr);
    GvalPtr empty(zal_arg_byte_string(nullptr, 0));
    ASSERT_NE(empty, nullptr);
    uint32_t length = 99;
    serialize_get_bytes(empty.get(), &length);
    EXPECT_EQ(length, 0u);
    GvalPtr three(zal_arg_byte_string("a\0c", 3));
    const void *p = serialize_get_bytes(three.get(), &length);
    ASSERT_EQ(length, 3u);
    EXPECT_EQ(memcmp(p, "a\0c", 3), 0);
}

TEST(CommandHelpers, CopyTextCutsAndAlwaysTerminates) {
    struct Case {
        const char *text;
        std::size_t size;
        std::string expected;
    };
    const Case cases[] = {
        {"abc", 8, "abc"}, {"abcdefg", 8, "abcdefg"}, {"abcdefgh", 8, "abcdefg"},
        {"abc", 1, ""},    {nullptr, 4, ""},
    };
    for (const Case &c : cases) {
        auto buffer = std::make_unique<char[]>(c.size);
        memset(buffer.get(), 'x', c.size);
        zal_copy_text(buffer.get(), c.size, c.text);
        EXPECT_EQ(std::string(buffer.get()), c.expected) << (c.text ? c.text : "null");
    }
}

TEST(CommandHelpers, FlaggedReplyNeedsItsFlag) {
    zal_ipod_handle *h = offline_handle();
    struct Case {
        gval *reply;
        int32_t result;
    };
    const Case cases[] = {
        {flagged("q", 1, {{"n", serialize_int(4)}}), 4},
        {flagged("q", 2, {{"n", serialize_int(4)}}), 4},
        {flagged("q", 0, {{"n", serialize_int(4)}}), -1},
        {flagged("q", 1, {}), -1},
        {hash_of({{"n", serialize_int(4)}}), -1},
        {hash_of({{"q", serialize_string("1")}, {"n", serialize_int(4)}}), -1},
    };
    for (const Case &c : cases) {
        zal_ipod_reply *r = make_reply(1, ZAL_OP_RETURN, c.reply);
        EXPECT_EQ(zal_decode_flagged_int(h, r, "q", "n"), c.result);
        reply_record_free(r);
    }
    zal_ipod_close(h);
}

}  // namespace
