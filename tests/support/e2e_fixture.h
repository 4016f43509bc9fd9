// Shared set-up of the end-to-end suites: the test process gets a network namespace of its
// own, so zald-sim can listen on the daemon's real socket name, which is the only one a
// program on the public API (zalctl, the examples) connects to first.
#pragma once

#include <gtest/gtest.h>

#include <map>
#include <memory>
#include <string>
#include <vector>

#include "fake_daemon.h"
#include "program_run.h"
#include "sim_process.h"

namespace zaltest {

constexpr const char *kDaemonSocket = "zal.ipod.IPodDaemon";

// Programs under the emulator start slowly: every bound there is this many times larger.
#ifdef ZAL_TEST_EMULATOR
constexpr int kSlowdown = sizeof(ZAL_TEST_EMULATOR) > 1 ? 10 : 1;
#else
constexpr int kSlowdown = 1;
#endif

class EndToEndTest : public ::testing::Test {
  protected:
    // Inline on purpose: ZALD_SIM_PATH is defined for the suites, not for this library.
    void SetUp() override {
#ifndef ZALD_SIM_PATH
        GTEST_SKIP() << "zald-sim is not built (ZAL_BUILD_TOOLS=OFF)";
#else
        isolate_daemon_socket();
        if (!isolated_namespace())
            GTEST_SKIP() << "no private network namespace here: zald-sim would have to take "
                            "the daemon's shared socket name";
        sim = std::make_unique<SimProcess>(ZALD_SIM_PATH);
#endif
    }
    // A simulator that does not stop cleanly (a sanitizer report among others) fails the test.
    void TearDown() override {
        if (sim && sim->running()) {
            const int status = sim->stop();
            EXPECT_EQ(status, 0) << "zald-sim stderr:\n" << sim->errors();
        }
    }
    // Starts zald-sim on the daemon's socket name; fails the test when it does not come up.
    void start_sim(const std::vector<std::string> &args = {},
                   const std::map<std::string, std::string> &env = {}) {
        for (const auto &[key, value] : env) sim->set_env(key, value);
        ASSERT_TRUE(sim->start_on(kDaemonSocket, args)) << "zald-sim:\n" << sim->errors();
    }

    std::unique_ptr<SimProcess> sim;
};

}  // namespace zaltest
