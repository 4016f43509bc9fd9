// zalctl info, eq, button, voiceover, call-state and eap against zald-sim: output, --json
// documents, exit codes and the state the commands leave in the simulated device.
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

#include "sim_fixture.h"
#include "zalctl_fixture.h"

namespace zaltest {
namespace {

using Json = nlohmann::json;

using ZalctlDeviceTest = ZalctlSuite;

const CommandCase kCases[] = {
    {"info",
     {"info"},
     0,
     {"general", "1.9", "extended interface", "1.14", "en_US / US", "80% discharging",
      "0 Off (of 7)"},
     nullptr},
    {"eq_list", {"eq", "list"}, 0, {"*  0 Off", "   6 Rock"}, nullptr},
    {"eq_set", {"eq", "set", "5"}, 0, {"equaliser: 5 Pop"}, nullptr},
    {"eq_set_out_of_range", {"eq", "set", "9"}, 1, {}, "eq set: no equaliser profile 9"},
    {"eq_without_subcommand", {"eq"}, 2, {}, ""},
    {"button", {"button", "next"}, 0, {"button next pressed and released"}, nullptr},
    {"button_unknown", {"button", "eject"}, 2, {}, ""},
    {"voiceover_item", {"voiceover", "item"}, 0, {"Music  (1 of 3)  Double tap to open"}, nullptr},
    {"voiceover_previous", {"voiceover", "previous"}, 0, {"Settings  (3 of 3)"}, nullptr},
    {"voiceover_out_at_top",
     {"voiceover", "out"},
     1,
     {},
     "voiceover out: the cursor is at the top"},
    {"voiceover_parameter",
     {"voiceover", "parameter", "1", "70"},
     0,
     {"voiceover parameter 1 = 70"},
     nullptr},
    {"voiceover_unknown_parameter", {"voiceover", "parameter", "9"}, 1, {}, "voiceover parameter"},
    {"call_state",
     {"call-state", "--count", "2", "--seconds", "10"},
     0,
     {"ringing       +15550100 Sim Caller (incoming)", "active"},
     nullptr},
    {"eap_send",
     {"eap", "send", "3", "hello"},
     0,
     {"sent 5 bytes to session 3", "received 5 bytes from session 3: hello"},
     nullptr},
    {"eap_send_missing_data", {"eap", "send", "3"}, 2, {}, ""},
};

class ZalctlDeviceCommandTest : public ZalctlDeviceTest,
                                public ::testing::WithParamInterface<CommandCase> {};

TEST_P(ZalctlDeviceCommandTest, PrintsAndExitsAsExpected) {
    start_sim();
    expect_command(GetParam());
}

INSTANTIATE_TEST_SUITE_P(BuiltInScenario, ZalctlDeviceCommandTest, ::testing::ValuesIn(kCases),
                         [](const auto &info) { return std::string(info.param.name); });

TEST_F(ZalctlDeviceTest, JsonDocuments) {
    start_sim();
    const JsonCase cases[] = {
        {{"--json", "info"}, "/lingos/0/version", "1.9"},
        {{"--json", "info"}, "/lingos/3/options", "0x0000000000000107"},
        {{"--json", "info"}, "/battery/level", 80},
        {{"--json", "info"}, "/localization/region", "US"},
        {{"--json", "eq", "list"}, "/profiles/2", "Bass Booster"},
        {{"--json", "voiceover", "item"}, "/frame/3", 40},
        {{"--json", "button", "playpause"}, "/mask", 1},
    };
    for (const JsonCase &c : cases) expect_json(c);
}

// The device keeps what a run changed; the next run sees it.
TEST_F(ZalctlDeviceTest, SettingsLastAcrossRuns) {
    start_sim();
    ASSERT_EQ(zalctl({"eq", "set", "3"}).status, 0);
    EXPECT_NE(zalctl({"eq", "list"}).out.find("*  3 Classical"), std::string::npos);
    ASSERT_EQ(zalctl({"voiceover", "in"}).status, 0);
    EXPECT_NE(zalctl({"voiceover", "item"}).out.find("Artists"), std::string::npos);
    // The context button drives the player: play/pause starts the paused track.
    ASSERT_EQ(zalctl({"button", "playpause"}).status, 0);
    const Json status = Json::parse(zalctl({"--json", "status"}).out, nullptr, false);
    ASSERT_FALSE(status.is_discarded());
    EXPECT_EQ(status["now_playing"]["state"], "playing");
}

}  // namespace
}  // namespace zaltest
