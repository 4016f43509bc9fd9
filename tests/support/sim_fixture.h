// Shared set-up of the zald-sim suites: a running simulator and a raw client connected to
// it, plus payload builders.
#pragma once

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "raw_client.h"
#include "sim_process.h"

namespace zaltest {

// Opcodes the suites use (the simulator reads the same numbers from the public header).
enum SimOpcode : uint8_t {
    kOpHello = 0,
    kOpKeepAlive = 1,
    kOpEvent = 2,
    kOpReturn = 3,
    kOpError = 4,
    kOpOpenSession = 5,
    kOpCloseSession = 6,
    kOpPlay = 8,
    kOpPlayPause = 10,
    kOpStop = 11,
    kOpPause = 12,
    kOpNextTrack = 13,
    kOpPrevTrack = 14,
    kOpCurrentTrackInfo = 39,
    kOpGetPlayState = 46,
    kOpSetConfig = 131,
    kOpGetConfig = 132,
};

Value int_value(int32_t v);
Value string_array(const std::vector<std::string> &items);
// Text of a string value under key in a hash payload, or "" when absent.
std::string string_at(const RawPacket &packet, const char *key);

class SimTest : public ::testing::Test {
  protected:
    // Inline on purpose: ZALD_SIM_PATH is defined for the suites, not for this library.
    void SetUp() override {
#ifndef ZALD_SIM_PATH
        GTEST_SKIP() << "zald-sim is not built (ZAL_BUILD_TOOLS=OFF)";
#else
        sim = std::make_unique<SimProcess>(ZALD_SIM_PATH);
#endif
    }
    // A simulator still running is stopped the way a user stops it; a non-zero status
    // (a sanitizer report among others) fails the test.
    void TearDown() override {
        client.reset();
        if (sim && sim->running()) {
            const int status = sim->stop();
            EXPECT_EQ(status, 0) << "zald-sim stderr:\n" << sim->errors();
        }
    }
    // Starts the simulator with extra arguments; fails the test when it does not come up.
    void start(const std::vector<std::string> &args = {});
    // A further client connected to the same simulator.
    std::unique_ptr<RawClient> connect();
    // Opens a session on device index and checks "result" 1.
    void open_session(RawClient &client, int32_t index);
    // Sends opcode with arg on the client and checks the answer: an error with a message, or
    // a return whose int under key (the int itself when key is null) is expected. The caller
    // stops on HasFatalFailure().
    void expect_answer(uint8_t opcode, const gval *arg, uint8_t answer, const char *key,
                       int32_t expected);

    std::unique_ptr<SimProcess> sim;
    std::unique_ptr<RawClient> client;
};

}  // namespace zaltest

namespace zaltest {

// A scenario file in /tmp that is removed with this object.
class ScenarioFile {
  public:
    explicit ScenarioFile(const std::string &json);
    ~ScenarioFile();
    ScenarioFile(const ScenarioFile &) = delete;
    ScenarioFile &operator=(const ScenarioFile &) = delete;
    const std::string &path() const { return path_; }

  private:
    std::string path_;
};

}  // namespace zaltest
