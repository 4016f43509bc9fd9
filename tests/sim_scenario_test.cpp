// zald-sim scenario files: errors that name the file, the place and the problem; devices that
// arrive and leave on a script; scripted events; the extra TCP and socket-file listeners.
#include <gtest/gtest.h>

#include <unistd.h>

#include "sim_fixture.h"

namespace zaltest {
namespace {

struct BadScenario {
    const char *name;
    const char *json;
    const char *place;    // expected in the message ("" when the place is a line:column)
    const char *problem;  // expected in the message
};

const BadScenario kBadScenarios[] = {
    {"syntax", "{\n  \"devices\": [\n    }\n", ":3:", "syntax error"},
    {"not_an_object", "[1, 2]", "at /:", "expected an object, found an array"},
    {"unknown_key", R"({"devices": [{"serial": "A", "colour": "red"}]})",
     "at /devices/0/colour:", "unknown key \"colour\""},
    {"wrong_kind", R"({"devices": [{"serial": "A", "protocol": "two"}]})",
     "at /devices/0/protocol:", "expected an integer, found a string"},
    {"out_of_range", R"({"devices": [{"serial": "A", "protocol": 3}]})",
     "at /devices/0/protocol:", "outside 1..2"},
    {"missing_serial", R"({"devices": [{"name": "x"}]})",
     "at /devices/0:", "missing required key \"serial\""},
    {"duplicate_serial", R"({"devices": [{"serial": "A"}, {"serial": "A"}]})",
     "at /devices/1/serial:", "used twice"},
    {"bad_transport", R"({"devices": [{"serial": "A", "transport": "wifi"}]})",
     "at /devices/0/transport:", "\"wifi\" is not one of"},
    {"track_past_end",
     R"({"devices": [{"serial": "A", "tracks": [{"title": "t"}], "playback": {"track": 1}}]})",
     "at /devices/0/playback/track:", "outside 0..0"},
    {"script_unknown_device", R"({"script": [{"at_ms": 5, "do": "connect", "device": "B"}]})",
     "at /script/0/device:", "no device with serial \"B\""},
    {"script_unknown_action", R"({"script": [{"do": "explode"}]})",
     "at /script/0/do:", "\"explode\" is not one of"},
    {"fault_unknown_opcode", R"({"faults": [{"opcode": "PLAYY", "action": "error"}]})",
     "at /faults/0/opcode:", "unknown opcode name \"PLAYY\""},
    {"timed_fault_with_delay", R"({"faults": [{"at_ms": 10, "action": "delay"}]})",
     "at /faults/0/action:", "timed fault can only be"},
    {"listen_port", R"({"listen": {"tcp": 70000}})", "at /listen/tcp:", "outside 0..65535"},
};

void PrintTo(const BadScenario &c, std::ostream *os) {
    *os << c.name;
}

class SimBadScenarioTest : public SimTest, public ::testing::WithParamInterface<BadScenario> {};

TEST_P(SimBadScenarioTest, ExitsWithAMessageNamingFilePlaceAndProblem) {
    const BadScenario &c = GetParam();
    ScenarioFile file(c.json);
    const int status =
        sim->run_to_exit({"-u", SimProcess::unique_name("zal.sim.test"), "-f", file.path()});
    EXPECT_EQ(status, 2);
    const std::string message = sim->errors();
    EXPECT_NE(message.find(file.path()), std::string::npos) << message;
    EXPECT_NE(message.find(c.place), std::string::npos) << message;
    EXPECT_NE(message.find(c.problem), std::string::npos) << message;
}

INSTANTIATE_TEST_SUITE_P(Errors, SimBadScenarioTest, ::testing::ValuesIn(kBadScenarios),
                         [](const auto &info) { return std::string(info.param.name); });

TEST_F(SimTest, MissingScenarioFileIsAnError) {
    const std::string path = "/tmp/" + SimProcess::unique_name("absent") + ".json";
    EXPECT_EQ(sim->run_to_exit({"-u", SimProcess::unique_name("zal.sim.test"), "-f", path}), 2);
    EXPECT_NE(sim->errors().find(path + ": cannot open"), std::string::npos) << sim->errors();
}

constexpr const char *kArrivalScenario = R"({
  "name": "arrival",
  "devices": [
    {"serial": "BASE1", "protocol": 1, "transport": "usb_role", "tracks": [{"title": "a"}]},
    {"serial": "LATE2", "name": "Late Phone", "protocol": 2, "present": false, "authenticated": false,
     "auth_delay_ms": 50, "tracks": [{"title": "b"}]}
  ],
  "script": [
    {"at_ms": 1000, "do": "connect", "device": "LATE2"},
    {"at_ms": 1300, "do": "event", "device": "LATE2", "event": "telephony_update",
     "data": {"signal_strength": 4, "carrier_name": "SimNet"}},
    {"at_ms": 1400, "do": "disconnect", "device": "LATE2"}
  ]
})";

TEST_F(SimTest, ScriptedArrivalAuthenticationEventAndRemoval) {
    ScenarioFile file(kArrivalScenario);
    start({"-f", file.path()});
    auto hello = client->call(kOpHello);
    ASSERT_TRUE(hello.has_value());
    Value list = hello->value();
    ASSERT_EQ(serialize_array_count(list.get()), 1);
    // A USB device behind the role switch reports no bus or address.
    const gval *base = serialize_array_get(list.get(), 0);
    EXPECT_EQ(serialize_get_int(serialize_hash_get(base, "transport")), 1);
    EXPECT_EQ(serialize_get_int(serialize_hash_get(base, "bus")), -1);

    auto connected = client->event("connected_ipod");
    ASSERT_TRUE(connected.has_value());
    Value entry = connected->value();
    const gval *data = serialize_hash_get(entry.get(), "data");
    ASSERT_NE(data, nullptr);
    EXPECT_STREQ(serialize_get_string(serialize_hash_get(data, "serial")), "LATE2");
    EXPECT_EQ(serialize_get_int(serialize_hash_get(data, "authenticated")), 0);

    auto authenticated = client->event("authenticated");
    ASSERT_TRUE(authenticated.has_value());
    EXPECT_EQ(authenticated->int_at("data"), 1);
    auto in_use = client->event("protocolinuse");
    ASSERT_TRUE(in_use.has_value());
    EXPECT_EQ(in_use->int_at("data"), 2);

    auto telephony = client->event("telephony_update");
    ASSERT_TRUE(telephony.has_value());
    Value update = telephony->value();
    const gval *fields = serialize_hash_get(update.get(), "data");
    ASSERT_NE(fields, nullptr);
    EXPECT_EQ(serialize_get_int(serialize_hash_get(fields, "signal_strength")), 4);
    EXPECT_STREQ(serialize_get_string(serialize_hash_get(fields, "carrier_name")), "SimNet");

    auto removed = client->event("disconnected_ipod");
    ASSERT_TRUE(removed.has_value());
    Value gone = removed->value();
    EXPECT_STREQ(serialize_get_string(serialize_hash_get(gone.get(), "data")), "LATE2");
    auto after = client->call(kOpHello);
    ASSERT_TRUE(after.has_value());
    EXPECT_EQ(serialize_array_count(after->value().get()), 1);
}

TEST_F(SimTest, FailedAuthenticationIsReportedAndLeavesTheDeviceUnauthenticated) {
    ScenarioFile file(R"({"devices": [{"serial": "BAD1", "protocol": 1, "authenticated": false,
                          "auth_succeeds": false, "auth_delay_ms": 1000}]})");
    start({"-f", file.path()});
    auto hello = client->call(kOpHello);
    ASSERT_TRUE(hello.has_value());
    auto outcome = client->event("authenticated");
    ASSERT_TRUE(outcome.has_value());
    EXPECT_EQ(outcome->int_at("data"), 0);
    // Opening a session works, but an unauthenticated iAP1 device never enters extended mode.
    open_session(*client, 0);
    auto after = client->call(kOpHello);
    ASSERT_TRUE(after.has_value());
    Value list = after->value();
    const gval *entry = serialize_array_get(list.get(), 0);
    EXPECT_EQ(serialize_get_int(serialize_hash_get(entry, "authenticated")), 0);
    EXPECT_EQ(serialize_get_int(serialize_hash_get(entry, "extended")), 0);
}

TEST_F(SimTest, ExtraListenersFromScenarioAndEnvironment) {
    const std::string path = "/tmp/" + SimProcess::unique_name("zald-sim") + ".sock";
    ScenarioFile file(R"({"listen": {"tcp": 0}, "devices": [{"serial": "ONE"}]})");
    sim->set_env("ZALD_SIM_SOCKET_PATH", path);
    start({"-f", file.path()});
    ASSERT_GT(sim->tcp_port(), 0) << sim->output();

    RawClient tcp, local;
    ASSERT_TRUE(tcp.connect_tcp(sim->tcp_port()));
    ASSERT_TRUE(local.connect_path(path));
    for (RawClient *c : {&tcp, &local}) {
        auto reply = c->call(kOpHello);
        ASSERT_TRUE(reply.has_value());
        EXPECT_EQ(serialize_array_count(reply->value().get()), 1);
    }
    EXPECT_EQ(sim->stop(), 0);
    EXPECT_NE(access(path.c_str(), F_OK), 0) << "the socket file outlived the simulator";
}

#ifdef ZALD_SIM_SCENARIO_DIR
class SimShippedScenarioTest : public SimTest,
                               public ::testing::WithParamInterface<const char *> {};

// The example files stay loadable; their fixed listeners are moved out of the way.
TEST_P(SimShippedScenarioTest, LoadsAndServes) {
    sim->set_env("ZALD_SIM_TCP_PORT", "0");
    sim->set_env("ZALD_SIM_SOCKET_PATH", "/tmp/" + SimProcess::unique_name("zald-sim") + ".sock");
    start({"-f", std::string(ZALD_SIM_SCENARIO_DIR) + "/" + GetParam()});
    auto reply = client->call(kOpHello);
    ASSERT_TRUE(reply.has_value());
    EXPECT_GE(serialize_array_count(reply->value().get()), 1);
}

INSTANTIATE_TEST_SUITE_P(
    Files, SimShippedScenarioTest, ::testing::Values("demo.json", "faults.json"),
    [](const auto &info) {
        return std::string(info.param).substr(0, std::string(info.param).find('.'));
    });
#endif

}  // namespace
}  // namespace zaltest
