// zalctl end to end: the program run against zald-sim (built-in scenario, scenario files with
// faults), its output, its exit codes and its time bounds.
#include <gtest/gtest.h>
#include <unistd.h>

#include <nlohmann/json.hpp>

#include "sim_fixture.h"
#include "zalctl_fixture.h"

namespace zaltest {
namespace {

using Json = nlohmann::json;

class ZalctlTest : public ZalctlSuite {
  protected:
    // Starts the simulator on a scenario given as JSON text.
    void start_scenario(const std::string &json,
                        const std::map<std::string, std::string> &env = {}) {
        scenario = std::make_unique<ScenarioFile>(json);
        start_sim({"-f", scenario->path()}, env);
    }
    std::unique_ptr<ScenarioFile> scenario;
};

// ---- Commands against the built-in scenario ------------------------------------------------

const CommandCase kCommands[] = {
    {"devices",
     {"devices"},
     0,
     {"SIMPHONE0001", "SIMPOD000002", "iAP2", "iAP1", "bluetooth"},
     nullptr},
    {"session_open",
     {"session", "open", "1"},
     0,
     {"device 1", "Sim iPod", "SIMPOD000002"},
     nullptr},
    {"session_close", {"session", "close"}, 0, {"session on device 0 closed"}, nullptr},
    {"status",
     {"status"},
     0,
     {"Sim iPhone", "paused", "Morning Drive", "0:42 / 3:35", "(1/4)"},
     nullptr},
    {"status_of_the_ipod",
     {"--device", "1", "status"},
     0,
     {"Sim iPod", "stopped", "Clickwheel Waltz", "(1/3)"},
     nullptr},
    {"keepalive", {"keepalive"}, 0, {"keep-alive"}, nullptr},
    {"config_get", {"config", "get", "socket_name"}, 0, {"zal.ipod.IPodDaemon"}, nullptr},
    {"config_get_unknown_key", {"config", "get", "no_such_key"}, 1, {}, "no_such_key"},
    {"config_set_read_only", {"config", "set", "socket_name", "other"}, 1, {}, "did not accept"},
    {"config_set_refused_value",
     {"config", "set", "app_match_team_id", "short"},
     1,
     {},
     "did not accept"},
    {"session_on_missing_device", {"session", "open", "7"}, 1, {}, "no device at index 7"},
    {"global_option_after_subcommand", {"devices", "--json"}, 0, {"\"devices\":["}, nullptr},
};

class ZalctlCommandTest : public ZalctlTest, public ::testing::WithParamInterface<CommandCase> {};

TEST_P(ZalctlCommandTest, PrintsAndExitsAsExpected) {
    start_sim();
    expect_command(GetParam());
}

INSTANTIATE_TEST_SUITE_P(BuiltInScenario, ZalctlCommandTest, ::testing::ValuesIn(kCommands),
                         [](const auto &info) { return std::string(info.param.name); });

// --json gives exactly one JSON document on standard output, nothing else.
TEST_F(ZalctlTest, JsonOutputIsOneDocument) {
    start_sim();
    const JsonCase cases[] = {
        {{"--json", "devices"}, "/devices/1/serial", "SIMPOD000002"},
        {{"--json", "status"}, "/now_playing/position_ms", 42000},
        {{"--json", "status"}, "/now_playing/length_ms", 215000},
        {{"--json", "status"}, "/device/protocol", 2},
        {{"--json", "session", "open", "0"}, "/session/name", "Sim iPhone"},
        {{"--json", "config", "get", "socket_name"}, "/value", "zal.ipod.IPodDaemon"},
    };
    for (const JsonCase &c : cases) expect_json(c);
}

// ---- Transport ------------------------------------------------------------------------------

// One connection per run, one simulated player: each step starts where the last one left it.
TEST_F(ZalctlTest, TransportStepsChangeTheSharedPlayer) {
    start_sim();
    struct Step {
        const char *command;
        const char *state;
        int track_index;
        const char *title;
    };
    // Skipping happens while paused at the start of a track, so "prev" always goes back a
    // track (after 3 s of play it would restart the track instead).
    const Step steps[] = {
        {"next", "paused", 1, "Loopback"},       {"prev", "paused", 0, "Morning Drive"},
        {"prev", "paused", 3, nullptr},  // wraps to the last track
        {"next", "paused", 0, "Morning Drive"},  {"play", "playing", 0, "Morning Drive"},
        {"pause", "paused", 0, "Morning Drive"}, {"playpause", "playing", 0, nullptr},
        {"stop", "stopped", 0, nullptr},
    };
    for (const Step &s : steps) {
        const ProgramResult r = zalctl({"--json", s.command});
        ASSERT_EQ(r.status, 0) << s.command << "\n" << r.err;
        const Json doc = Json::parse(r.out, nullptr, false);
        ASSERT_FALSE(doc.is_discarded()) << r.out;
        EXPECT_EQ(doc["command"], s.command);
        EXPECT_EQ(doc["now_playing"]["state"], s.state) << s.command;
        EXPECT_EQ(doc["now_playing"]["track_index"], s.track_index) << s.command;
        if (s.title != nullptr) {
            EXPECT_EQ(doc["now_playing"]["title"], s.title) << s.command;
        }
    }
    // A later connection sees the same player.
    const ProgramResult status = zalctl({"--json", "status"});
    ASSERT_EQ(status.status, 0) << status.err;
    const Json doc = Json::parse(status.out, nullptr, false);
    EXPECT_EQ(doc["now_playing"]["state"], "stopped");
    EXPECT_EQ(doc["now_playing"]["position_ms"], 0);
}

TEST_F(ZalctlTest, ConfigSetIsSeenByTheNextConnection) {
    start_sim();
    ASSERT_EQ(zalctl({"config", "set", "device", "front-usb"}).status, 0);
    EXPECT_EQ(zalctl({"config", "get", "device"}).out, "front-usb\n");
    // A refused write leaves the value alone.
    ASSERT_EQ(zalctl({"config", "set", "socket_name", "elsewhere"}).status, 1);
    EXPECT_EQ(zalctl({"config", "get", "socket_name"}).out, std::string(kDaemonSocket) + "\n");
}

// ---- Usage, help and an absent daemon -------------------------------------------------------

// Needs no daemon: nothing here gets as far as connecting.
#ifdef ZALCTL_PATH
#define SKIP_WITHOUT_ZALCTL()
#else
#define SKIP_WITHOUT_ZALCTL() GTEST_SKIP() << "zalctl is not built"
#endif

TEST(ZalctlUsage, WrongCommandLinesExitWithTwo) {
    SKIP_WITHOUT_ZALCTL();
    const std::vector<std::vector<std::string>> cases = {
        {},
        {"bogus"},
        {"session"},
        {"session", "open"},
        {"session", "open", "first"},
        {"session", "open", "-1"},
        {"config", "get"},
        {"config", "set", "device"},
        {"events", "--count", "0"},
        {"events", "--count", "many"},
        {"--timeout", "0", "devices"},
        {"play", "now"},
        {"devices", "--no-such-option"},
    };
    for (const auto &args : cases) {
        const ProgramResult r = zalctl(args);
        EXPECT_EQ(r.status, 2) << joined(args) << "\n" << r.err;
        EXPECT_FALSE(r.err.empty()) << joined(args);
        EXPECT_EQ(r.out, "") << joined(args);
    }
    EXPECT_EQ(zalctl({"--json", "bogus"}).err,
              "zalctl: unknown command: bogus (see zalctl --help)\n");
}

TEST(ZalctlUsage, EverySubcommandHasHelp) {
    SKIP_WITHOUT_ZALCTL();
    const std::vector<std::vector<std::string>> cases = {
        {"--help"},
        {"devices", "--help"},
        {"status", "--help"},
        {"play", "--help"},
        {"prev", "--help"},
        {"session", "open", "--help"},
        {"session", "--help"},
        {"config", "set", "--help"},
        {"events", "--help"},
        {"keepalive", "-h"},
    };
    for (const auto &args : cases) {
        const ProgramResult r = zalctl(args);
        EXPECT_EQ(r.status, 0) << joined(args) << "\n" << r.err;
        EXPECT_NE(r.out.find("Usage:"), std::string::npos) << joined(args) << "\n" << r.out;
    }
}

TEST_F(ZalctlTest, AbsentDaemonFailsQuicklyWithOneLine) {
    // No simulator: nothing listens on the daemon's name in this namespace.
    for (const char *command : {"devices", "status", "play", "events"}) {
        const ProgramResult r = zalctl({command});
        EXPECT_EQ(r.status, 1) << command << "\n" << r.err;
        EXPECT_EQ(r.err, "zalctl: cannot reach the daemon (is zald-2 or zald-sim running?)\n");
        EXPECT_LT(r.seconds, 2.0 * kSlowdown) << command;
    }
}

// ---- Events ---------------------------------------------------------------------------------

constexpr const char *kPlayingScenario = R"({
  "position_interval_ms": 100,
  "devices": [{"serial": "EV1", "name": "Events Phone",
               "tracks": [{"title": "Ticking", "length_ms": 600000}],
               "playback": {"state": "playing", "track": 0, "position_ms": 0}}]
})";

TEST_F(ZalctlTest, EventsStopAfterTheCount) {
    start_scenario(kPlayingScenario);
    const ProgramResult plain = zalctl({"events", "--count", "3"});
    ASSERT_EQ(plain.status, 0) << plain.err;
    const auto lines = lines_of(plain.out);
    ASSERT_EQ(lines.size(), 3u) << plain.out;
    for (const auto &line : lines)
        EXPECT_EQ(line.rfind("track_position_changed session=1 serial=EV1 value=", 0), 0u) << line;

    const ProgramResult json = zalctl({"events", "--json", "-n", "2"});
    ASSERT_EQ(json.status, 0) << json.err;
    int32_t previous = -1;
    for (const auto &line : lines_of(json.out)) {
        const Json e = Json::parse(line, nullptr, false);
        ASSERT_FALSE(e.is_discarded()) << line;
        EXPECT_EQ(e["kind"], "track_position_changed");
        EXPECT_EQ(e["kind_id"], 10);
        EXPECT_EQ(e["serial"], "EV1");
        EXPECT_GT(e["data"].get<int32_t>(), previous);  // the clock moves forward
        previous = e["data"].get<int32_t>();
    }
    EXPECT_GE(previous, 0);
}

TEST_F(ZalctlTest, EventsWithASessionShowItsEventsAsFields) {
    start_sim();
    const ProgramResult r = zalctl({"events", "--session", "--for", "1"});
    ASSERT_EQ(r.status, 0) << r.err;
    EXPECT_NE(r.out.find("device_name session=1 serial=SIMPHONE0001 value=\"Sim iPhone\""),
              std::string::npos)
        << r.out;
    EXPECT_NE(r.out.find("playing_app session=1"), std::string::npos) << r.out;
}

TEST_F(ZalctlTest, TooFewEventsIsAFailureWithinTheBound) {
    start_sim();  // paused player: no events come unasked
    const ProgramResult r = zalctl({"events", "--count", "5", "--for", "1"});
    EXPECT_EQ(r.status, 1);
    EXPECT_NE(r.err.find("0 of 5 events"), std::string::npos) << r.err;
    EXPECT_LT(r.seconds, 5.0 * kSlowdown);
}

// ---- Faults ---------------------------------------------------------------------------------

struct FaultCase {
    const char *name;
    const char *fault;
    std::vector<std::string> args;
    const char *err;
};

void PrintTo(const FaultCase &c, std::ostream *os) {
    *os << c.name;
}

const FaultCase kFaults[] = {
    {"reply_never_comes",
     R"({"opcode": "PLAY", "action": "no_reply"})",
     {"--timeout", "1", "play"},
     "play: no answer from the daemon"},
    {"error_reply",
     R"({"opcode": "PAUSE", "action": "error", "message": "device busy"})",
     {"pause"},
     "zalctl: pause: device busy\n"},
    {"error_on_track_info",
     R"({"opcode": "CURRENT_TRACK_INFO", "action": "error", "message": "no track data"})",
     {"status"},
     "zalctl: status: no track data\n"},
    {"error_on_config",
     R"({"opcode": "GET_CONFIG", "action": "error", "message": "locked"})",
     {"config", "get", "device"},
     "zalctl: config get: locked\n"},
    {"connection_dropped", R"({"opcode": "NEXT_TRACK", "action": "drop"})", {"next"}, "connection"},
    {"session_refused",
     R"({"opcode": "OPEN_SESSION", "action": "error", "message": "busy"})",
     {"status"},
     "session open"},
    {"keepalive_never_answered",
     R"({"opcode": "KEEP_ALIVE", "action": "no_reply"})",
     {"-t", "1", "keepalive"},
     "keepalive: no answer"},
};

class ZalctlFaultTest : public ZalctlTest, public ::testing::WithParamInterface<FaultCase> {};

TEST_P(ZalctlFaultTest, FailsWithOneLineWithinTheBound) {
    const FaultCase &c = GetParam();
    start_scenario(std::string(R"({"devices": [{"serial": "F1", "name": "Faulty",
        "tracks": [{"title": "t"}]}], "faults": [)") +
                   c.fault + "]}");
    const ProgramResult r = zalctl(c.args);
    EXPECT_EQ(r.status, 1) << r.out << r.err;
    EXPECT_NE(r.err.find(c.err), std::string::npos) << r.err;
    EXPECT_EQ(lines_of(r.err).size(), 1u) << r.err;
    // Time-out 1 s (5 s by default) plus the library's whole-second rounding.
    EXPECT_LT(r.seconds, 8.0 * kSlowdown);
}

INSTANTIATE_TEST_SUITE_P(Faults, ZalctlFaultTest, ::testing::ValuesIn(kFaults),
                         [](const auto &info) { return std::string(info.param.name); });

// A dropped connection comes back through the reconnect address, and events continue.
TEST_F(ZalctlTest, EventsFollowTheConnectionThroughAReconnect) {
    const std::string path = "/tmp/" + SimProcess::unique_name("zalctl-sock");
    const int drop_at_ms = 2000 * kSlowdown;
    const int interval_ms = 100;
    start_scenario(R"({"position_interval_ms": )" + std::to_string(interval_ms) + R"(,
        "devices": [{"serial": "RC1", "tracks": [{"title": "t", "length_ms": 3600000}],
                     "playback": {"state": "playing"}}],
        "faults": [{"at_ms": )" +
                       std::to_string(drop_at_ms) + R"(, "action": "drop"}]})",
                   {{"ZALD_SIM_SOCKET_PATH", path}});
    // More events than can come before the drop: the rest must come after the reconnect.
    const int count = drop_at_ms / interval_ms + 5;
    const ProgramResult r = zalctl({"--daemon", path, "events", "--count", std::to_string(count),
                                    "--for", std::to_string(15 * kSlowdown)});
    EXPECT_EQ(r.status, 0) << r.err;
    EXPECT_EQ(static_cast<int>(lines_of(r.out).size()), count);
    EXPECT_NE(r.err.find("connection to the daemon was lost"), std::string::npos) << r.err;
    EXPECT_NE(r.err.find("zalctl: reconnected"), std::string::npos) << r.err;
}

TEST_F(ZalctlTest, EventsFailWhenTheConnectionCannotComeBack) {
    start_scenario(R"({"position_interval_ms": 100,
        "devices": [{"serial": "RC2", "tracks": [{"title": "t", "length_ms": 3600000}],
                     "playback": {"state": "playing"}}],
        "faults": [{"at_ms": )" +
                   std::to_string(1500 * kSlowdown) + R"(, "action": "drop"}]})");
    // No reconnect address: the library looks for a socket file that is not there.
    const ProgramResult r = zalctl({"-t", "1", "events", "--follow"}, 30000,
                                   {{"ZALIPODDAEMON", "/nonexistent/zald.sock"}});
    EXPECT_EQ(r.status, 1) << r.err;
    EXPECT_NE(r.err.find("zalctl: events: the connection to the daemon was lost"),
              std::string::npos)
        << r.err;
    EXPECT_FALSE(r.out.empty());  // events came before the drop
}

}  // namespace
}  // namespace zaltest
