// zald-sim's accessory input, device information and communications opcodes: answers over
// the raw protocol (one table), the state they keep, the events they cause, and the client
// library end to end against the simulator for each family and for a battery event.
#include <gtest/gtest.h>

#include <cstring>
#include <vector>

#include "sim_fixture.h"
#include "zal-ipod-2/connection.h"
#include "zal-ipod-2/zal-ipod-2.h"

namespace zaltest {
namespace {

// Argument: none, one int, an array of ints, or a string.
struct Arg {
    enum Kind { none, one, list, text } kind = none;
    std::vector<int32_t> ints;
    const char *string = nullptr;
};
Arg none() {
    return {};
}
Arg one(int32_t v) {
    return {Arg::one, {v}, nullptr};
}
Arg list(std::vector<int32_t> v) {
    return {Arg::list, std::move(v), nullptr};
}
Arg text(const char *s) {
    return {Arg::text, {}, s};
}

Value payload(const Arg &a) {
    switch (a.kind) {
        case Arg::one:
            return int_value(a.ints[0]);
        case Arg::list: {
            Value array(serialize_array());
            for (int32_t v : a.ints) serialize_array_add(array.get(), serialize_int(v));
            return array;
        }
        case Arg::text:
            return Value(serialize_string(a.string));
        default:
            return nullptr;
    }
}

struct Case {
    const char *name;
    uint8_t opcode;
    Arg arg;
    uint8_t answer;     // kOpReturn or kOpError
    const char *key;    // hash key of the answer; null: the answer is an int
    int32_t expected;   // that integer
    const char *event;  // event that must follow, or null
};

void PrintTo(const Case &c, std::ostream *os) {
    *os << c.name;
}

// Against the built-in phone (session on device 0, iAP2 on USB, paused, 4 tracks).
const Case kCases[] = {
    {"enter_video_out", 65, none(), kOpReturn, nullptr, 0, nullptr},
    {"navigate_without_video_out", 69, one(1), kOpError, nullptr, 0, nullptr},
    {"supported_video_options", 67, one(0), kOpReturn, nullptr, 0x0F, nullptr},
    {"current_video_options", 67, one(1), kOpReturn, nullptr, 0, nullptr},
    {"unsupported_video_options", 68, one(0x100), kOpError, nullptr, 0, nullptr},
    {"mode", 70, none(), kOpReturn, nullptr, 0, nullptr},
    {"state_change", 64, one(2), kOpReturn, nullptr, 0, nullptr},
    {"launch_application", 72, text("Maps"), kOpReturn, nullptr, 0, "playing_app"},
    {"launch_nothing", 72, text(""), kOpError, nullptr, 0, nullptr},
    {"context_play_pause", 73, one(1), kOpReturn, nullptr, 0, "play_state_changed"},
    {"context_next", 73, one(8), kOpReturn, nullptr, 0, "track_index_changed"},
    {"camera_button", 77, one(1), kOpReturn, nullptr, 0, nullptr},
    {"button_without_integer", 74, text("1"), kOpError, nullptr, 0, nullptr},
    {"video_delay", 85, one(120), kOpReturn, nullptr, 0, nullptr},
    {"available_current_charges", 86, one(1000), kOpReturn, nullptr, 0, "power_battery_state"},
    {"negative_current", 86, one(-1), kOpError, nullptr, 0, nullptr},
    {"charging_state", 87, one(0), kOpReturn, nullptr, 0, nullptr},
    {"power_source_update", 49, list({1000, 1}), kOpReturn, nullptr, 0, "power_battery_state"},
    {"rotation_input", 88, list({1, 2, 3, 255, 0, 1, 65535, 0}), kOpReturn, nullptr, 0, nullptr},
    {"rotation_input_wide_byte", 88, list({1, 2, 3, 256, 0, 1, 0, 0}), kOpError, nullptr, 0,
     nullptr},
    {"rotation_input_short", 88, list({1, 2, 3}), kOpError, nullptr, 0, nullptr},
    {"hid_report_unregistered", 97, list({1, 2, 3}), kOpError, nullptr, 0, nullptr},
    {"unregister_unknown", 98, list({9}), kOpError, nullptr, 0, nullptr},
    {"register_descriptor", 96, list({1, 0x05ac, 0x1234, 0, 0}), kOpReturn, nullptr, 0, nullptr},
    {"voiceover_parameter", 92, one(0), kOpReturn, "value", 50, nullptr},
    {"voiceover_parameter_unknown", 92, one(9), kOpReturn, "get_voiceover_parameter", 0, nullptr},
    {"set_voiceover_parameter_out_of_range", 93, list({0, 101}), kOpError, nullptr, 0, nullptr},
    {"voiceover_label", 94, one(0), kOpReturn, "last_index", 2, nullptr},
    {"voiceover_frame", 94, one(3), kOpReturn, "bottomright_y", 40, nullptr},
    {"voiceover_bad_type", 94, one(4), kOpReturn, "get_current_voiceover_itemproperty", 0, nullptr},
    {"voiceover_context", 95, one(1), kOpReturn, nullptr, 0, nullptr},
    {"voiceover_event_without_array", 91, none(), kOpError, nullptr, 0, nullptr},
    {"lingo_version", 84, one(4), kOpReturn, "minor", 14, nullptr},
    {"lingo_version_unknown", 84, one(0x77), kOpReturn, "request_lingo_version", 0, nullptr},
    {"lingo_options_unknown", 7, one(0x77), kOpError, nullptr, 0, nullptr},
    {"localization_region", 89, one(1), kOpReturn, "type", 1, nullptr},
    {"localization_other", 89, one(2), kOpError, nullptr, 0, nullptr},
    {"eq_count", 115, none(), kOpReturn, "number", 7, nullptr},
    {"eq_index", 113, none(), kOpReturn, "index", 0, nullptr},
    {"eq_set", 114, list({5, 0}), kOpReturn, nullptr, 0, nullptr},
    {"eq_set_out_of_range", 114, list({7, 0}), kOpError, nullptr, 0, nullptr},
    {"eq_name_out_of_range", 116, one(7), kOpReturn, "get_indexed_eqprofile_name", 0, nullptr},
    {"battery", 117, none(), kOpReturn, "level", 80, nullptr},
    {"sound_check", 118, none(), kOpReturn, "state", 0, nullptr},
    {"sound_check_set", 119, list({1, 0}), kOpReturn, nullptr, 0, nullptr},
    {"wifi_info", 90, none(), kOpReturn, nullptr, 0, "wifi_information"},
    {"reauthentication", 59, one(1), kOpReturn, nullptr, 0, "authenticated"},
    {"callstate_start", 120, one(1), kOpReturn, nullptr, 0, "telephony_callstate_information"},
    {"callstate_stop", 121, none(), kOpReturn, nullptr, 0, nullptr},
    {"telephony_update", 123, none(), kOpReturn, nullptr, 0, "telephony_update"},
    {"telephony_update_stop", 124, none(), kOpReturn, nullptr, 0, nullptr},
    {"location", 108, text("$GPGGA,1"), kOpReturn, nullptr, 0, nullptr},
    {"location_empty", 108, text(""), kOpError, nullptr, 0, nullptr},
    {"vehicle_status", 122, list({1, 2, 3, -40, 255}), kOpReturn, nullptr, 0, nullptr},
    {"vehicle_status_short", 122, list({1, 2}), kOpError, nullptr, 0, nullptr},
    {"bluetooth_component", 103, one(1), kOpReturn, nullptr, 0, nullptr},
    {"eap_without_bytes", 107, list({1, 0}), kOpError, nullptr, 0, nullptr},
};

class SimDeviceTest : public SimTest, public ::testing::WithParamInterface<Case> {};

TEST_P(SimDeviceTest, Answers) {
    const Case &c = GetParam();
    start();
    open_session(*client, 0);
    expect_answer(c.opcode, payload(c.arg).get(), c.answer, c.key, c.expected);
    if (HasFatalFailure() || c.answer == kOpError || c.event == nullptr) return;
    EXPECT_TRUE(client->event(c.event).has_value()) << c.event;
}

INSTANTIATE_TEST_SUITE_P(Device, SimDeviceTest, ::testing::ValuesIn(kCases),
                         [](const auto &info) { return std::string(info.param.name); });

Value voiceover_move(int32_t move) {
    Value array(serialize_array());
    for (int32_t v : {move, 0, 0, 0, 0, 0}) serialize_array_add(array.get(), serialize_int(v));
    serialize_array_add(array.get(), serialize_string(""));
    return array;
}

TEST_F(SimTest, VoiceOverCursorWalksTheItemTree) {
    start();
    open_session(*client, 0);
    struct Step {
        int32_t move;
        const char *label;  // under the cursor afterwards
        int32_t index;
    };
    const Step steps[] = {
        {1, "Settings", 2},                           // previous wraps round
        {2, "Volume", 0},                             // into Settings
        {0, "Speaking Rate", 1}, {3, "Settings", 2},  // back out
        {0, "Music", 0},
    };
    for (const Step &s : steps) {
        SCOPED_TRACE(s.label);
        auto moved = client->call(91, voiceover_move(s.move).get());
        ASSERT_TRUE(moved.has_value());
        ASSERT_EQ(moved->opcode, kOpReturn) << string_at(*moved, "error");
        auto item = client->call(94, int_value(0).get());
        ASSERT_TRUE(item.has_value());
        EXPECT_EQ(string_at(*item, "name"), s.label);
        EXPECT_EQ(item->int_at("current_index"), s.index);
    }
}

TEST_F(SimTest, HidDescriptorsRegisterOnceAndCarryReports) {
    start();
    open_session(*client, 0);
    auto call = [&](uint8_t opcode, std::vector<int32_t> v) {
        auto r = client->call(opcode, payload(list(std::move(v))).get());
        return r.has_value() ? r->opcode : uint8_t{0};
    };
    EXPECT_EQ(call(96, {3, 1, 2, 0, 0}), kOpReturn);
    EXPECT_EQ(call(96, {3, 1, 2, 0, 0}), kOpError) << "registered twice";
    EXPECT_EQ(call(97, {3, 1, 0}), kOpReturn);
    EXPECT_EQ(call(98, {3}), kOpReturn);
    EXPECT_EQ(call(97, {3, 1, 0}), kOpError) << "report after unregistering";
}

TEST_F(SimTest, AccessoryWifiConfigurationNeedsNoSession) {
    start();
    Value args(serialize_array());
    serialize_array_add(args.get(), serialize_string("CarAP"));
    serialize_array_add(args.get(), serialize_string("secret"));
    serialize_array_add(args.get(), serialize_int(1));
    serialize_array_add(args.get(), serialize_int(6));
    auto reply = client->call(134, args.get());
    ASSERT_TRUE(reply.has_value());
    EXPECT_EQ(reply->opcode, kOpReturn) << string_at(*reply, "error");
}

TEST_F(SimTest, DeviceInformationFollowsTheScenarioAndFaults) {
    ScenarioFile file(R"({"devices": [{"serial": "D1", "eq_profiles": ["Flat", "Loud"],
        "localization": ["de_DE", "DE"], "battery": {"level": 20, "interval_ms": 60000}}],
        "faults": [{"opcode": "GET_POWER_BATTERY_STATE", "action": "error", "message": "flat"}]})");
    start({"-f", file.path()});
    open_session(*client, 0);
    auto count = client->call(115);
    ASSERT_TRUE(count.has_value());
    EXPECT_EQ(count->int_at("number"), 2);
    auto name = client->call(116, int_value(1).get());
    ASSERT_TRUE(name.has_value());
    EXPECT_EQ(string_at(*name, "name"), "Loud");
    auto language = client->call(89, int_value(0).get());
    ASSERT_TRUE(language.has_value());
    EXPECT_EQ(string_at(*language, "data"), "de_DE");
    auto battery = client->call(117);
    ASSERT_TRUE(battery.has_value());
    EXPECT_EQ(battery->opcode, kOpError);
    EXPECT_EQ(string_at(*battery, "error"), "flat");
}

TEST_F(SimTest, BatteryDrainsOnItsClockAndStopsEmpty) {
    ScenarioFile file(
        R"({"devices": [{"serial": "D1", "battery": {"level": 4, "interval_ms": 50}}]})");
    start({"-f", file.path()});
    // The clock may have run before this client connected: the levels seen go down by one
    // from wherever they were, to 0.
    int32_t last = -1;
    while (last != 0) {
        auto event = client->event("power_battery_state");
        ASSERT_TRUE(event.has_value()) << "after level " << last;
        Value payload = event->value();
        gval *data = serialize_hash_get(payload.get(), "data");
        ASSERT_NE(data, nullptr);
        const int32_t level = serialize_get_int(serialize_hash_get(data, "level"));
        if (last >= 0) {
            EXPECT_EQ(level, last - 1);
        }
        ASSERT_GE(level, 0);
        EXPECT_EQ(serialize_get_int(serialize_hash_get(data, "state")), 1);  // discharging
        last = level;
    }
    EXPECT_FALSE(client->event("power_battery_state", 300).has_value()) << "nothing below 0";
    open_session(*client, 0);
    auto battery = client->call(117);
    ASSERT_TRUE(battery.has_value());
    EXPECT_EQ(battery->int_at("level"), 0);
}

// ---- The client library against the simulator ----

class SimLibraryTest : public SimTest {
  protected:
    void SetUp() override {
        SimTest::SetUp();
        if (IsSkipped()) return;
        ASSERT_TRUE(sim->start_listening(args)) << sim->output() << sim->errors();
        zal_set_daemon_socket_name(sim->socket_name().c_str());
        h = zal_ipod_connect(nullptr);
        ASSERT_NE(h, nullptr);
        ASSERT_EQ(zal_ipod_open_session_sync(h, 0), 1);
    }
    void TearDown() override {
        if (h != nullptr) zal_ipod_close(h);
        zal_set_daemon_socket_name(nullptr);
        SimTest::TearDown();
    }
    // Collects every event from now on (a _sync call dispatches the events it read on its
    // way, so the callback is in place before the command that causes one).
    void collect_events() {
        zal_ipod_set_event_cb(
            h,
            [](zal_ipod_handle *, zal_ipod_event *e, void *user) {
                static_cast<std::vector<zal_ipod_event *> *>(user)->push_back(
                    zal_ipod_event_clone_data(e));
                return 0;
            },
            &seen);
    }
    // An event of this kind, collected already or read through the library's dispatcher.
    bool wait_event(int kind, int timeout_ms = 5000) {
        for (int waited = 0; event_of(kind) == nullptr && waited < timeout_ms; waited += 100)
            zal_ipod_events_iterate(h);
        return event_of(kind) != nullptr;
    }
    ~SimLibraryTest() override {
        for (zal_ipod_event *e : seen) zal_ipod_event_free(e);
    }
    const zal_ipod_event *event_of(int kind) const {
        for (zal_ipod_event *e : seen)
            if (zal_ipod_event_type(e) == kind) return e;
        return nullptr;
    }

    std::vector<std::string> args;
    zal_ipod_handle *h = nullptr;
    std::vector<zal_ipod_event *> seen;
};

TEST_F(SimLibraryTest, AccessoryInputVoiceOverItem) {
    EXPECT_EQ(zal_ipod_get_current_voiceover_itemproperty_sync(h, 0), 1);
    EXPECT_STREQ(zal_ipod_voiceover_item_name(h, 0), "Music");
    EXPECT_EQ(zal_ipod_voiceover_item_last_index(h, 0), 2);
    EXPECT_EQ(zal_ipod_simple_contextbutton_sync(h, 0), 0);
}

TEST_F(SimLibraryTest, DeviceInformationEqualiserAndLingo) {
    EXPECT_EQ(zal_ipod_get_num_eqprofiles_sync(h), 7);
    char name[ZAL_EQPROFILE_NAME_SIZE];
    EXPECT_EQ(zal_ipod_get_indexed_eqprofile_name_sync(h, 6, name), 1);
    EXPECT_STREQ(name, "Rock");
    testing::internal::CaptureStderr();
    EXPECT_EQ(zal_ipod_request_lingo_version_sync(h, 0), 1);
    testing::internal::GetCapturedStderr();
    EXPECT_STREQ(zal_ipod_get_result_lingo_version(h), "1.9");
    EXPECT_EQ(zal_ipod_get_lingo_options_sync(h, 4), 0x107u);
}

TEST_F(SimLibraryTest, CommunicationsEapDatagramComesBack) {
    const unsigned char datagram[] = {0x00, 0xff, 0x10};
    collect_events();
    EXPECT_EQ(zal_ipod_send_eap_datagram_sync(h, 5, datagram, 3), 0);
    ASSERT_TRUE(wait_event(ZALIPOD_EVENT_EAP_DATAGRAM));
    const zal_ipod_event *e = event_of(ZALIPOD_EVENT_EAP_DATAGRAM);
    EXPECT_EQ(zal_ipod_event_eap_datagram_session_id(e), 5);
    uint32_t length = 0;
    const void *data = zal_ipod_event_eap_datagram_data(e, &length);
    ASSERT_EQ(length, 3u);
    EXPECT_EQ(memcmp(data, datagram, 3), 0);
}

TEST_F(SimLibraryTest, BatteryChargesWhenCurrentIsOfferedAndSaysSo) {
    int state = 0, level = 0;
    ASSERT_EQ(zal_ipod_get_power_battery_state_sync(h, &state, &level), 1);
    EXPECT_EQ(state, 1);  // discharging
    collect_events();
    EXPECT_EQ(zal_ipod_set_available_current_sync(h, 1000), 0);
    ASSERT_TRUE(wait_event(ZALIPOD_EVENT_UNKNOWN));
    const zal_ipod_event *e = event_of(ZALIPOD_EVENT_UNKNOWN);
    ASSERT_NE(e->data, nullptr);
    EXPECT_EQ(serialize_get_int(serialize_hash_get(e->data, "state")), 2);  // charging
    ASSERT_EQ(zal_ipod_get_power_battery_state_sync(h, &state, &level), 1);
    EXPECT_EQ(state, 2);
}

}  // namespace
}  // namespace zaltest
