// Several threads issuing commands on one handle while the loop thread runs and events
// stream in: every reply reaches its caller and every event the callback.
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <thread>
#include <vector>

#include "client_helpers.h"
#include "fake_daemon.h"

using namespace zaltest;

namespace {
constexpr int kThreads = 4;
constexpr int kCallsPerThread = 150;

int count_event(zal_ipod_handle *, zal_ipod_event *e, void *user) {
    if (e->kind == ZALIPOD_EVENT_PLAYSTATE_CHANGED)
        static_cast<std::atomic<int> *>(user)->fetch_add(1);
    return 0;
}
}  // namespace

TEST(Concurrency, RepliesReachTheirCallersAndEventsTheCallback) {
    FakeDaemon d;
    d.expect(ZAL_OP_HELLO).reply(serialize_array());
    zal_ipod_handle *h = zal_ipod_connect(nullptr);
    ASSERT_NE(h, nullptr);
    std::atomic<int> events{0};
    std::atomic<int> events_sent{0};
    zal_ipod_set_event_cb(h, count_event, &events);
    // Each reply carries its request's tid; every other reply is followed by an event,
    // sometimes in the same write.
    d.serve([&](const Request &r) {
        gval *v = serialize_int(r.tid);
        Bytes out = frame(r.tid, ZAL_OP_RETURN, v);
        serialize_free(v);
        if (r.tid % 2 == 0) {
            Bytes e = event_frame("play_state_changed", serialize_int(r.tid));
            out.insert(r.tid % 4 == 0 ? out.end() : out.begin(), e.begin(), e.end());
            events_sent.fetch_add(1);
        }
        return out;
    });
    ASSERT_EQ(zal_ipod_set_loopthread(h, 1), 0);

    std::atomic<int> wrong{0};
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([&, t] {
            for (int i = 0; i < kCallsPerThread; ++i) {
                if ((i + t) % 2 == 0) {
                    // The asynchronous form and an explicit wait: the result must be our tid.
                    int tid = zal_ipod_keep_alive(h);
                    zal_ipod_reply *r = zal_ipod_wait_for_tid(h, static_cast<uint16_t>(tid));
                    GvalPtr v(r != nullptr ? unserialize(r->payload, r->length) : nullptr);
                    if (v == nullptr || serialize_get_int(v.get()) != tid) wrong.fetch_add(1);
                    zal_ipod_reply_free(r);
                } else if (zal_ipod_keep_alive_sync(h) <= 0) {
                    wrong.fetch_add(1);
                }
            }
        });
    }
    for (auto &t : threads) t.join();
    EXPECT_EQ(wrong.load(), 0);
    for (int i = 0; i < 500 && events.load() < events_sent.load(); ++i)
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
    EXPECT_EQ(events.load(), events_sent.load());
    EXPECT_EQ(events_sent.load(), kThreads * kCallsPerThread / 2);
    EXPECT_EQ(zal_ipod_set_loopthread(h, 0), 0);
    EXPECT_EQ(h->queue_count.load(), 0);
    zal_ipod_close(h);
}
