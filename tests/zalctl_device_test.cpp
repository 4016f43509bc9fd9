// zalctl info, eq, button, voiceover, call-state and eap against zald-sim: output, --json
// documents, exit codes and the state the commands leave in the simulated device.
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <sstream>

#include "e2e_fixture.h"
#include "sim_fixture.h"

namespace zaltest {
namespace {

using Json = nlohmann::json;

ProgramResult zalctl(const std::vector<std::string> &args, int timeout_ms = 20000) {
#ifdef ZALCTL_PATH
    return run_program(ZALCTL_PATH, args, timeout_ms * kSlowdown);
#else
    (void)args, (void)timeout_ms;
    return {};
#endif
}

std::string joined(const std::vector<std::string> &args) {
    std::string out = "zalctl";
    for (const auto &a : args) out += " " + a;
    return out;
}

size_t line_count(const std::string &text) {
    size_t n = 0;
    std::istringstream in(text);
    for (std::string line; std::getline(in, line);) ++n;
    return n;
}

class ZalctlDeviceTest : public EndToEndTest {
  protected:
    void SetUp() override {
#ifndef ZALCTL_PATH
        GTEST_SKIP() << "zalctl is not built";
#endif
        EndToEndTest::SetUp();
    }
};

struct Case {
    const char *name;
    std::vector<std::string> args;
    int status;
    std::vector<std::string> out;  // texts standard output must hold
    const char *err;               // text of the one stderr line, or null: empty stderr
};

void PrintTo(const Case &c, std::ostream *os) {
    *os << c.name;
}

const Case kCases[] = {
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
                                public ::testing::WithParamInterface<Case> {};

TEST_P(ZalctlDeviceCommandTest, PrintsAndExitsAsExpected) {
    const Case &c = GetParam();
    start_sim();
    const ProgramResult r = zalctl(c.args);
    ASSERT_EQ(r.status, c.status) << joined(c.args) << "\nstdout:\n"
                                  << r.out << "stderr:\n"
                                  << r.err;
    for (const std::string &text : c.out)
        EXPECT_NE(r.out.find(text), std::string::npos) << text << " in\n" << r.out;
    if (c.err == nullptr) {
        EXPECT_EQ(r.err, "");
    } else if (c.status == 1) {
        EXPECT_EQ(line_count(r.err), 1u) << r.err;
        EXPECT_EQ(r.err.rfind(std::string("zalctl: ") + c.err, 0), 0u) << r.err;
    }
}

INSTANTIATE_TEST_SUITE_P(BuiltInScenario, ZalctlDeviceCommandTest, ::testing::ValuesIn(kCases),
                         [](const auto &info) { return std::string(info.param.name); });

TEST_F(ZalctlDeviceTest, JsonDocuments) {
    start_sim();
    struct JsonCase {
        std::vector<std::string> args;
        const char *pointer;
        Json expected;
    };
    const JsonCase cases[] = {
        {{"--json", "info"}, "/lingos/0/version", "1.9"},
        {{"--json", "info"}, "/lingos/3/options", "0x0000000000000107"},
        {{"--json", "info"}, "/battery/level", 80},
        {{"--json", "info"}, "/localization/region", "US"},
        {{"--json", "eq", "list"}, "/profiles/2", "Bass Booster"},
        {{"--json", "voiceover", "item"}, "/frame/3", 40},
        {{"--json", "button", "playpause"}, "/mask", 1},
    };
    for (const JsonCase &c : cases) {
        const ProgramResult r = zalctl(c.args);
        ASSERT_EQ(r.status, 0) << joined(c.args) << "\n" << r.err;
        ASSERT_EQ(line_count(r.out), 1u) << r.out;
        const Json doc = Json::parse(r.out, nullptr, false);
        ASSERT_FALSE(doc.is_discarded()) << r.out;
        EXPECT_EQ(doc.at(Json::json_pointer(c.pointer)), c.expected) << joined(c.args);
    }
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
