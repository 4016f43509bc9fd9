// An application that asked for connection reports survives the daemon being killed and
// started again: it hears of the loss, of the reconnect, and opens its session anew.
#include <gtest/gtest.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <memory>
#include <string>
#include <thread>

#include "sim_process.h"
#include "zal-ipod-2/connection.h"
#include "zal-ipod-2/zal-ipod-2.h"

using namespace zaltest;

namespace {

struct Resubscriber {
    std::atomic<int> lost{0};
    std::atomic<int> restored{0};
    std::atomic<int> reopened{-2};  // result of the session reopened from the callback
};

void on_connection(zal_ipod_handle *h, int state, void *user) {
    auto *r = static_cast<Resubscriber *>(user);
    if (state == ZALIPOD_CONNECTION_LOST) {
        ++r->lost;
    } else {
        r->reopened = zal_ipod_open_session_sync(h, 0);
        ++r->restored;
    }
}

bool wait_for(const std::atomic<int> &value, int at_least, int seconds) {
    auto end = std::chrono::steady_clock::now() + std::chrono::seconds(seconds);
    while (value.load() < at_least && std::chrono::steady_clock::now() < end)
        std::this_thread::sleep_for(std::chrono::milliseconds(20));
    return value.load() >= at_least;
}

#ifdef ZALD_SIM_PATH
TEST(SimReconnect, ApplicationResubscribesAfterTheDaemonRestarts) {
    const std::string path = "/tmp/" + SimProcess::unique_name("zal-restart") + ".sock";
    auto sim = std::make_unique<SimProcess>(ZALD_SIM_PATH);
    sim->set_env("ZALD_SIM_SOCKET_PATH", path);
    ASSERT_TRUE(sim->start_listening()) << sim->errors();
    zal_set_daemon_socket_name(sim->socket_name().c_str());
    zal_ipod_handle *h = zal_ipod_connect(path.c_str());
    zal_set_daemon_socket_name(nullptr);
    ASSERT_NE(h, nullptr);
    ASSERT_EQ(zal_ipod_open_session_sync(h, 0), 1);

    Resubscriber r;
    zal_ipod_set_connection_cb(h, on_connection, &r);
    ASSERT_EQ(zal_ipod_set_loopthread(h, 1), 0);

    sim->stop(9);  // killed: no goodbye
    EXPECT_TRUE(wait_for(r.lost, 1, 10));
    EXPECT_EQ(r.restored.load(), 0);

    auto again = std::make_unique<SimProcess>(ZALD_SIM_PATH);
    again->set_env("ZALD_SIM_SOCKET_PATH", path);
    ASSERT_TRUE(again->start_listening()) << again->errors();
    EXPECT_TRUE(wait_for(r.restored, 1, 15));
    EXPECT_EQ(r.lost.load(), 1);
    EXPECT_EQ(r.reopened.load(), 1);
    EXPECT_EQ(zal_ipod_is_ready(h), 1);
    EXPECT_EQ(zal_ipod_play_sync(h), 0) << "commands work on the new session";

    zal_ipod_set_loopthread(h, 0);
    zal_ipod_close(h);
    EXPECT_EQ(again->stop(), 0) << again->errors();
}
#endif

}  // namespace
