// zald-sim end to end over the raw protocol: device list, sessions, transport commands and
// their events, configuration keys, unknown opcodes, several clients.
#include <gtest/gtest.h>

#include <unistd.h>

#include <fstream>
#include <sstream>

#include "sim_fixture.h"

namespace zaltest {
namespace {

struct DeviceExpectation {
    const char *serial;
    int32_t protocol;
    int32_t transport;
    int32_t bus, address, rfcomm;
};

// The built-in scenario: an iAP2 phone on USB and an iAP1 player on Bluetooth.
constexpr DeviceExpectation kDefaultDevices[] = {
    {"SIMPHONE0001", 2, 0, 1, 4, -1},
    {"SIMPOD000002", 1, 2, -1, -1, 3},
};

int32_t hash_int(const gval *hash, const char *key) {
    const gval *v = serialize_hash_get(hash, key);
    return v && serialize_type(v) == SERIALIZE_INT ? serialize_get_int(v) : -9999;
}

void expect_default_device_list(const gval *list) {
    ASSERT_NE(list, nullptr);
    ASSERT_EQ(serialize_type(list), SERIALIZE_ARRAY);
    ASSERT_EQ(serialize_array_count(list), 2);
    static const char *kKeys[] = {"serial",   "name",          "authenticated", "used",
                                  "extended", "protocolinuse", "transport",     "bus",
                                  "address",  "rfcommId"};
    for (uint32_t i = 0; i < 2; ++i) {
        const gval *entry = serialize_array_get(list, i);
        const DeviceExpectation &want = kDefaultDevices[i];
        ASSERT_EQ(serialize_type(entry), SERIALIZE_HASH);
        ASSERT_EQ(serialize_hash_count(entry), 10);
        for (int k = 0; k < 10; ++k) EXPECT_STREQ(serialize_hash_get_key(entry, k), kKeys[k]);
        EXPECT_STREQ(serialize_get_string(serialize_hash_get(entry, "serial")), want.serial);
        EXPECT_EQ(hash_int(entry, "authenticated"), 1);
        EXPECT_EQ(hash_int(entry, "protocolinuse"), want.protocol);
        EXPECT_EQ(hash_int(entry, "transport"), want.transport);
        EXPECT_EQ(hash_int(entry, "bus"), want.bus);
        EXPECT_EQ(hash_int(entry, "address"), want.address);
        EXPECT_EQ(hash_int(entry, "rfcommId"), want.rfcomm);
    }
}

TEST_F(SimTest, HelloAnswersWithTheDeviceList) {
    start();
    const uint16_t tid = client->send(kOpHello);
    auto reply = client->reply(tid);
    ASSERT_TRUE(reply.has_value());
    EXPECT_EQ(reply->opcode, kOpReturn);
    EXPECT_EQ(reply->tid, tid);
    expect_default_device_list(reply->value().get());
}

TEST_F(SimTest, RepliesCarryTheRequestTidAndKeepAliveAnswersZero) {
    start();
    client->send(kOpKeepAlive);
    client->send(kOpKeepAlive);
    const uint16_t third = client->send(kOpKeepAlive);
    auto reply = client->reply(third);
    ASSERT_TRUE(reply.has_value());
    EXPECT_EQ(reply->opcode, kOpReturn);
    ASSERT_TRUE(reply->value());
    EXPECT_EQ(serialize_get_int(reply->value().get()), 0);
}

TEST_F(SimTest, OpenSessionRepliesResultAndDevicesAndMarksTheDeviceUsed) {
    start();
    auto reply = client->call(kOpOpenSession, int_value(1).get());
    ASSERT_TRUE(reply.has_value());
    EXPECT_EQ(reply->opcode, kOpReturn);
    Value v = reply->value();
    ASSERT_TRUE(v);
    EXPECT_EQ(hash_int(v.get(), "result"), 1);
    const gval *devices = serialize_hash_get(v.get(), "devices");
    ASSERT_NE(devices, nullptr);
    EXPECT_EQ(hash_int(serialize_array_get(devices, 1), "used"), 1);
    EXPECT_EQ(hash_int(serialize_array_get(devices, 0), "used"), 0);
    // The iAP1 player enters extended mode once the session is open.
    auto mode = client->event("mode_changed");
    ASSERT_TRUE(mode.has_value());
    EXPECT_EQ(mode->int_at("data"), 1);
    EXPECT_EQ(string_at(*mode, "serial"), "SIMPOD000002");

    auto closed = client->call(kOpCloseSession);
    ASSERT_TRUE(closed.has_value());
    EXPECT_EQ(closed->int_at("result"), 1);
}

TEST_F(SimTest, OpenSessionOnAMissingDeviceAnswersResultZero) {
    start();
    auto reply = client->call(kOpOpenSession, int_value(7).get());
    ASSERT_TRUE(reply.has_value());
    EXPECT_EQ(reply->opcode, kOpReturn);
    EXPECT_EQ(reply->int_at("result"), 0);
}

TEST_F(SimTest, TransportWithoutSessionIsAnError) {
    start();
    auto reply = client->call(kOpPlay);
    ASSERT_TRUE(reply.has_value());
    EXPECT_EQ(reply->opcode, kOpError);
    EXPECT_EQ(string_at(*reply, "error"), "no session is open");
}

// Each command, from the default phone's paused state at track 0, and the event it pushes.
struct TransportCase {
    const char *name;
    uint8_t opcode;
    const char *event;
    int32_t data;
};

void PrintTo(const TransportCase &c, std::ostream *os) {
    *os << c.name;
}

class SimTransportTest : public SimTest, public ::testing::WithParamInterface<TransportCase> {};

TEST_P(SimTransportTest, CommandAnswersZeroThenPushesItsEvent) {
    const TransportCase &c = GetParam();
    start();
    open_session(*client, 0);
    auto reply = client->call(c.opcode);
    ASSERT_TRUE(reply.has_value());
    ASSERT_EQ(reply->opcode, kOpReturn);
    EXPECT_EQ(serialize_get_int(reply->value().get()), 0);
    auto event = client->event(c.event);
    ASSERT_TRUE(event.has_value()) << c.event;
    EXPECT_EQ(event->int_at("data"), c.data);
    EXPECT_EQ(string_at(*event, "serial"), "SIMPHONE0001");
}

INSTANTIATE_TEST_SUITE_P(
    Transport, SimTransportTest,
    ::testing::Values(TransportCase{"play", kOpPlay, "play_state_changed", 1},
                      TransportCase{"playpause", kOpPlayPause, "play_state_changed", 1},
                      TransportCase{"stop", kOpStop, "play_state_changed", 0},
                      TransportCase{"next", kOpNextTrack, "track_index_changed", 1},
                      // 42 s into the track: previous restarts it
                      TransportCase{"prev", kOpPrevTrack, "track_position_changed", 0}),
    [](const auto &info) { return std::string(info.param.name); });

TEST_F(SimTest, PlayThenPauseMovesThePlayerAndTheClock) {
    start();
    open_session(*client, 0);
    ASSERT_TRUE(client->call(kOpPlay).has_value());
    ASSERT_TRUE(client->event("play_state_changed").has_value());
    // While playing the position is pushed and moves on from 42 s.
    auto position = client->event("track_position_changed");
    ASSERT_TRUE(position.has_value());
    EXPECT_GT(position->int_at("data"), 42000);

    ASSERT_TRUE(client->call(kOpPause).has_value());
    auto paused = client->event("play_state_changed");
    ASSERT_TRUE(paused.has_value());
    EXPECT_EQ(paused->int_at("data"), 2);
    auto state = client->call(kOpGetPlayState);
    ASSERT_TRUE(state.has_value());
    EXPECT_EQ(state->int_at("current_play_status"), 2);
    EXPECT_EQ(state->int_at("length"), 215000);
}

TEST_F(SimTest, NextTrackChangesTheTrackInfo) {
    start();
    open_session(*client, 0);
    ASSERT_TRUE(client->call(kOpNextTrack).has_value());
    auto info = client->call(kOpCurrentTrackInfo);
    ASSERT_TRUE(info.has_value());
    EXPECT_EQ(info->int_at("current_track_info"), 1);
    EXPECT_EQ(string_at(*info, "title"), "Loopback");
    EXPECT_EQ(info->int_at("track_index"), 1);
    EXPECT_EQ(info->int_at("number_of_tracks"), 4);
}

TEST_F(SimTest, EventsReachEveryClient) {
    start();
    auto second = connect();
    ASSERT_NE(second, nullptr);
    // The second client's HELLO answer proves it is registered before the event is made.
    ASSERT_TRUE(second->call(kOpHello).has_value());
    open_session(*client, 0);
    ASSERT_TRUE(client->call(kOpPlay).has_value());
    for (RawClient *c : {client.get(), second.get()}) {
        auto event = c->event("play_state_changed");
        ASSERT_TRUE(event.has_value());
        EXPECT_EQ(event->int_at("data"), 1);
        EXPECT_EQ(event->tid, 0);
    }
}

TEST_F(SimTest, UnknownOpcodeAnswersErrorWithText) {
    start();
    const uint16_t tid = client->send(200);
    auto reply = client->reply(tid);
    ASSERT_TRUE(reply.has_value());
    EXPECT_EQ(reply->opcode, kOpError);
    EXPECT_NE(string_at(*reply, "error").find("200"), std::string::npos);
    // The connection stays usable.
    EXPECT_TRUE(client->call(kOpKeepAlive).has_value());
}

TEST_F(SimTest, PayloadThatIsNotAValueIsAnError) {
    start();
    std::string packet("\xFE\x00\x00\x09\x05\x00\x00\x00\x00\x00\x00\x02\x00\x00", 14);
    ASSERT_TRUE(client->send_raw(packet));
    auto reply = client->reply(9);
    ASSERT_TRUE(reply.has_value());
    EXPECT_EQ(reply->opcode, kOpError);
}

TEST_F(SimTest, RequestArrivingInPiecesIsAnsweredOnce) {
    start();
    // OPEN_SESSION, tid 0x0102, payload int 0 (69 04 00 00 00 00), written in three parts.
    const std::string packet(
        "\xFE\x00\x01\x02\x05\x00\x00\x00\x00\x00\x00\x06\x69\x04\x00\x00\x00\x00", 18);
    ASSERT_TRUE(client->send_raw(packet.substr(0, 5)));
    ASSERT_TRUE(client->send_raw(packet.substr(5, 9)));
    ASSERT_TRUE(client->send_raw(packet.substr(14)));
    auto reply = client->reply(0x0102);
    ASSERT_TRUE(reply.has_value());
    EXPECT_EQ(reply->int_at("result"), 1);
    // Nothing else answers that tid: the next reply belongs to the next request.
    const uint16_t next = client->send(kOpKeepAlive);
    auto following = client->next();
    while (following && following->opcode == kOpEvent) following = client->next();
    ASSERT_TRUE(following.has_value());
    EXPECT_EQ(following->tid, next);
}

TEST_F(SimTest, OversizedPayloadLengthEndsOnlyThatConnection) {
    start();
    ASSERT_TRUE(
        client->send_raw(std::string("\xFE\x00\x00\x01\x01\x00\x00\x00\xFF\xFF\xFF\xFF", 12)));
    EXPECT_TRUE(client->closed());
    auto other = connect();
    ASSERT_NE(other, nullptr);
    EXPECT_TRUE(other->call(kOpKeepAlive).has_value());
}

struct ConfigCase {
    const char *name;
    std::vector<std::string> set;  // key, value
    int32_t cfg, ctx;
    std::string read_back;  // expected GET_CONFIG value afterwards ("" = unchanged check skipped)
};

void PrintTo(const ConfigCase &c, std::ostream *os) {
    *os << c.name;
}

class SimConfigTest : public SimTest, public ::testing::WithParamInterface<ConfigCase> {};

TEST_P(SimConfigTest, SetReportsItsOutcomeAndGetReadsBack) {
    const ConfigCase &c = GetParam();
    start({"-i", "2"});
    auto reply = client->call(kOpSetConfig, string_array(c.set).get());
    ASSERT_TRUE(reply.has_value());
    ASSERT_EQ(reply->opcode, kOpReturn);
    EXPECT_EQ(reply->int_at("config_updated_cfg"), c.cfg);
    EXPECT_EQ(reply->int_at("config_updated_ctx"), c.ctx);
    auto get = client->call(kOpGetConfig, string_array({c.set[0]}).get());
    ASSERT_TRUE(get.has_value());
    if (c.cfg == -1) {
        EXPECT_EQ(get->int_at("config_val_errorcode"), -1);
    } else if (c.cfg != -10) {  // a read-only key's value: ReadOnlyKeyKeepsTheCommandLineValue
        EXPECT_EQ(string_at(*get, "config_val"), c.read_back);
    }
}

INSTANTIATE_TEST_SUITE_P(
    Keys, SimConfigTest,
    ::testing::Values(
        ConfigCase{"writable", {"artwork_path", "/tmp/art"}, 1, 1, "/tmp/art"},
        ConfigCase{"read_only", {"socket_name", "other"}, -10, 0, ""},
        ConfigCase{"unknown", {"no_such_key", "x"}, -1, 0, ""},
        ConfigCase{"refused_value", {"app_match_team_id", "123"}, 0, 0, ""},
        ConfigCase{"team_id", {"app_match_team_id", "ABCDE12345"}, 1, 1, "ABCDE12345"},
        ConfigCase{"protocol_from_command_line", {"highest_protocol_mode", "x"}, 0, 0, "2"}),
    [](const auto &info) { return std::string(info.param.name); });

TEST_F(SimTest, CommandLineSettingsAreConfigurationKeys) {
    start({"-t", "car", "-e", "com.example.a,com.example.b"});
    const std::pair<const char *, const char *> kExpected[] = {
        {"device", "car"},
        {"eap", "com.example.a,com.example.b"},
        {"highest_protocol_mode", "2"},
        {"version", "2.0.10"}};
    for (const auto &[key, value] : kExpected) {
        auto get = client->call(kOpGetConfig, string_array({key}).get());
        ASSERT_TRUE(get.has_value());
        EXPECT_EQ(string_at(*get, "config_val"), value) << key;
    }
    // Writing a context key goes through the context: the list is split and joined again.
    auto set = client->call(kOpSetConfig, string_array({"eap", "x,,y"}).get());
    ASSERT_TRUE(set.has_value());
    EXPECT_EQ(set->int_at("config_updated_ctx"), 1);
    auto get = client->call(kOpGetConfig, string_array({"eap"}).get());
    ASSERT_TRUE(get.has_value());
    EXPECT_EQ(string_at(*get, "config_val"), "x,y");
}

TEST_F(SimTest, RefusedCommandLineExitsWithTheUsage) {
    EXPECT_EQ(sim->run_to_exit({"-u", SimProcess::unique_name("zal.sim.test"), "-a", "123"}), 1);
    EXPECT_NE(sim->output().find("Usage"), std::string::npos) << sim->output();
}

TEST_F(SimTest, ReadOnlyKeyKeepsTheCommandLineValue) {
    start();
    auto get = client->call(kOpGetConfig, string_array({"socket_name"}).get());
    ASSERT_TRUE(get.has_value());
    EXPECT_EQ(string_at(*get, "config_val"), sim->socket_name());
}

TEST_F(SimTest, ProtocolOptionSetsTheFirstDevice) {
    start({"-i", "1"});
    auto reply = client->call(kOpHello);
    ASSERT_TRUE(reply.has_value());
    Value list = reply->value();
    EXPECT_EQ(hash_int(serialize_array_get(list.get(), 0), "protocolinuse"), 1);
}

TEST_F(SimTest, LogDestinationGetsTimeStampedRecords) {
    const std::string log = "/tmp/" + SimProcess::unique_name("zald-sim") + ".log";
    start({"-d", log});
    ASSERT_TRUE(client->call(kOpHello).has_value());
    client.reset();
    EXPECT_EQ(sim->stop(), 0);
    std::ifstream in(log);
    std::stringstream text;
    text << in.rdbuf();
    unlink(log.c_str());
    EXPECT_NE(text.str().find("client 1 connected"), std::string::npos) << text.str();
    EXPECT_EQ(text.str().rfind("[", 0), 0u) << "records start with the time stamp";
}

TEST_F(SimTest, StopsCleanlyOnSigterm) {
    start();
    EXPECT_EQ(sim->stop(15), 0);
    EXPECT_NE(sim->output().find("zald-sim: stopped"), std::string::npos);
}

}  // namespace
}  // namespace zaltest
