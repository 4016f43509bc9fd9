// The README's example application, run against zald-sim's built-in scenario.
#include <gtest/gtest.h>

#include <sstream>

#include "e2e_fixture.h"
#include "sim_fixture.h"

namespace zaltest {
namespace {

class ExampleTest : public EndToEndTest {
  protected:
    void SetUp() override {
#ifndef ZAL_EXAMPLE_NOW_PLAYING
        GTEST_SKIP() << "the examples are not built";
#endif
        EndToEndTest::SetUp();
    }
    ProgramResult now_playing(const std::vector<std::string> &args = {}) {
#ifdef ZAL_EXAMPLE_NOW_PLAYING
        return run_program(ZAL_EXAMPLE_NOW_PLAYING, args, 30000 * kSlowdown);
#else
        (void)args;
        return {};
#endif
    }
};

int count_lines_starting(const std::string &text, const std::string &prefix) {
    std::istringstream in(text);
    int n = 0;
    for (std::string line; std::getline(in, line);) n += line.rfind(prefix, 0) == 0 ? 1 : 0;
    return n;
}

TEST_F(ExampleTest, ListsDevicesPlaysAndPrintsEvents) {
    start_sim();
    const ProgramResult r = now_playing();
    ASSERT_EQ(r.status, 0) << r.out << r.err;
    EXPECT_NE(r.out.find("device 0: SIMPHONE0001\ndevice 1: SIMPOD000002\n"), std::string::npos)
        << r.out;
    EXPECT_GE(count_lines_starting(r.out, "event "), 4) << r.out;
    // Playing started: the playback clock reports positions.
    EXPECT_NE(r.out.find(": position "), std::string::npos) << r.out;
}

TEST_F(ExampleTest, ReportsAnAbsentDaemon) {
    const ProgramResult r = now_playing({"/nonexistent/zald.sock"});
    EXPECT_EQ(r.status, 1);
    EXPECT_NE(r.err.find("cannot reach the daemon"), std::string::npos) << r.err;
}

TEST_F(ExampleTest, ReportsADeviceThatCannotPlay) {
    ScenarioFile empty(R"({"devices": [{"serial": "QUIET", "tracks": []}]})");
    start_sim({"-f", empty.path()});
    const ProgramResult r = now_playing();
    EXPECT_EQ(r.status, 1);
    EXPECT_NE(r.err.find("cannot play on device 0"), std::string::npos) << r.err;
}

}  // namespace
}  // namespace zaltest
