// Connection state reports: a lost connection and its reconnect reach the connection
// callback once each, in order, from the dispatcher.
#include <gtest/gtest.h>
#include <unistd.h>

#include <chrono>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "client_helpers.h"
#include "fake_daemon.h"
#include "zal-ipod-2/packet.h"

using namespace zaltest;

namespace {

void record_state(zal_ipod_handle *, int state, void *user) {
    static_cast<std::vector<int> *>(user)->push_back(state);
}

// Reads (and so dispatches) until `states` holds `count` reports or 5 s passed.
void read_until(zal_ipod_handle *h, const std::vector<int> &states, std::size_t count) {
    auto end = std::chrono::steady_clock::now() + std::chrono::seconds(5);
    while (states.size() < count && std::chrono::steady_clock::now() < end) {
        if (zal_ipod_read(h) < 0) usleep(20 * 1000);
    }
}

struct OutageCase {
    const char *name;
    bool daemon_back_at_once;  // the reconnect target listens before the loss is noticed
};

class ConnectionState : public ::testing::TestWithParam<OutageCase> {};

TEST_P(ConnectionState, LossAndReconnectAreReportedOnceEach) {
    const OutageCase &c = GetParam();
    const std::string path = "/tmp/zal-state-test-" + std::to_string(getpid()) + "-" + c.name;
    FakeDaemon first;
    first.expect(ZAL_OP_HELLO).reply(device_list({device_entry("OLD", 1, 1)})).drop();
    zal_ipod_handle *h = zal_ipod_connect(path.c_str());
    ASSERT_NE(h, nullptr);
    ASSERT_TRUE(first.finish()) << first.report();
    std::vector<int> states;
    zal_ipod_set_connection_cb(h, record_state, &states);

    std::unique_ptr<FakeDaemon> second;
    auto start_second = [&] {
        second = std::make_unique<FakeDaemon>(FakeDaemon::Endpoint::path, path);
        second->expect(ZAL_OP_HELLO).reply(device_list({device_entry("NEW", 1, 2)}));
    };
    if (c.daemon_back_at_once) start_second();

    // The daemon closed its end in an orderly way: with a callback set that is a loss.
    read_until(h, states, 1);
    ASSERT_GE(states.size(), 1u);
    EXPECT_EQ(states[0], ZALIPOD_CONNECTION_LOST);
    if (!c.daemon_back_at_once) {
        // Reconnects keep failing meanwhile; none of them is reported again.
        for (int i = 0; i < 5; ++i) zal_ipod_read(h);
        EXPECT_EQ(states.size(), 1u);
        EXPECT_EQ(zal_ipod_fd(h), -1);
        start_second();
    }
    read_until(h, states, 2);
    EXPECT_EQ(states, (std::vector<int>{ZALIPOD_CONNECTION_LOST, ZALIPOD_CONNECTION_RESTORED}));
    EXPECT_TRUE(second->finish()) << second->report();
    EXPECT_GE(zal_ipod_fd(h), 0);
    EXPECT_STREQ(zal_ipod_device_serial(h, 0), "NEW");
    zal_ipod_close(h);
}

INSTANTIATE_TEST_SUITE_P(Outages, ConnectionState,
                         ::testing::Values(OutageCase{"back_at_once", true},
                                           OutageCase{"gone_for_a_while", false}),
                         [](const auto &info) { return std::string(info.param.name); });

TEST(ConnectionStateDefault, WithoutACallbackAnOrderlyCloseKeepsTheSocket) {
    FakeDaemon d;
    d.expect(ZAL_OP_HELLO).reply(device_list({device_entry("P", 1, 1)})).drop();
    zal_ipod_handle *h = zal_ipod_connect("/nonexistent/zal-state-test");
    ASSERT_NE(h, nullptr);
    ASSERT_TRUE(d.finish()) << d.report();
    const int fd = zal_ipod_fd(h);
    for (int i = 0; i < 3; ++i) zal_ipod_read(h);
    EXPECT_EQ(zal_ipod_fd(h), fd);
    // Removing the callback again restores this treatment too.
    std::vector<int> states;
    zal_ipod_set_connection_cb(h, record_state, &states);
    zal_ipod_set_connection_cb(h, nullptr, nullptr);
    zal_ipod_read(h);
    EXPECT_EQ(zal_ipod_fd(h), fd);
    EXPECT_TRUE(states.empty());
    zal_ipod_close(h);
}

// A change noticed while the callback runs (here: the callback itself loses the
// connection again) is reported after it returns, not from within it.
TEST(ConnectionStateDefault, ChangesDuringTheCallbackAreReportedAfterIt) {
    FakeDaemon d;
    d.expect(ZAL_OP_HELLO).reply(device_list({device_entry("P", 1, 1)}));
    zal_ipod_handle *h = zal_ipod_connect("/nonexistent/zal-state-test");
    ASSERT_NE(h, nullptr);
    ASSERT_TRUE(d.finish()) << d.report();
    struct Seen {
        std::vector<int> states;
        int depth = 0, deepest = 0;
    } seen;
    zal_ipod_set_connection_cb(
        h,
        [](zal_ipod_handle *hh, int state, void *user) {
            auto *s = static_cast<Seen *>(user);
            s->states.push_back(state);
            s->deepest = std::max(s->deepest, ++s->depth);
            // Pretend the connection came back and went again while we were busy.
            hh->connection_changes.fetch_or(kConnectionRestored);
            zal_ipod_pending_event(hh);
            --s->depth;
        },
        &seen);
    pthread_mutex_lock(&h->read_lock);
    zal_connection_drop_locked(h);
    pthread_mutex_unlock(&h->read_lock);
    zal_ipod_pending_event(h);
    EXPECT_EQ(seen.deepest, 1);
    // The restored mark came while disconnected (fd -1): nothing more to report.
    EXPECT_EQ(seen.states, std::vector<int>{ZALIPOD_CONNECTION_LOST});
    zal_ipod_close(h);
}

}  // namespace
