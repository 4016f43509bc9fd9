// Packet layer: transaction ids, request bytes, reassembly of replies from the byte
// stream, ERROR replies, time-outs, oversized lengths and broken connections.
#include <android/log.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <string>

#include "client_helpers.h"
#include "fake_daemon.h"
#include "log_capture.h"
#include "zal-ipod-2/packet.h"

using namespace zaltest;

namespace {

// A connected handle whose HELLO got an empty device list.
zal_ipod_handle *connect_to(FakeDaemon &d) {
    d.expect(ZAL_OP_HELLO).reply(serialize_array());
    zal_ipod_handle *h = zal_ipod_connect(nullptr);
    EXPECT_NE(h, nullptr);
    return h;
}

int count_starting(const std::vector<std::string> &texts, const std::string &prefix) {
    return static_cast<int>(std::count_if(
        texts.begin(), texts.end(), [&](const std::string &t) { return t.rfind(prefix, 0) == 0; }));
}

}  // namespace

TEST(TransactionIds, RunFromOneTo65534AndWrap) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_to(d);
    ASSERT_NE(h, nullptr);
    d.expect(ZAL_OP_KEEP_ALIVE).expect(ZAL_OP_KEEP_ALIVE).expect(ZAL_OP_KEEP_ALIVE);
    EXPECT_EQ(zal_ipod_keep_alive(h), 2);  // HELLO had 1
    h->last_tid = 65533;
    EXPECT_EQ(zal_ipod_keep_alive(h), 65534);
    EXPECT_EQ(zal_ipod_keep_alive(h), 1);
    EXPECT_TRUE(d.finish()) << d.report();
    auto requests = d.requests();
    ASSERT_EQ(requests.size(), 4u);
    // A request without payload is exactly the 12 header bytes.
    EXPECT_EQ(requests[2].header, hex("fe 00 ff fe 01 00 00 00 00 00 00 00"));
    EXPECT_TRUE(requests[2].payload.empty());
    zal_ipod_close(h);
}

TEST(TransactionIds, TablesRecordOpcodeAndStartTime) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_to(d);
    ASSERT_NE(h, nullptr);
    d.expect(ZAL_OP_KEEP_ALIVE);
    int tid = zal_ipod_keep_alive(h);
    EXPECT_EQ(h->request_opcodes[tid], ZAL_OP_KEEP_ALIVE);
    EXPECT_NEAR(static_cast<double>(h->start_times[tid]), static_cast<double>(time(nullptr)), 2.0);
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

// How the reply to a keep-alive reaches the library, and what the _sync form returns.
struct DeliveryCase {
    const char *name;
    void (*script)(FakeDaemon &d);
    int result;
};

void PrintTo(const DeliveryCase &c, std::ostream *out) {
    *out << c.name;
}

class Delivery : public ::testing::TestWithParam<DeliveryCase> {};

TEST_P(Delivery, SyncFormGetsTheDecodedReply) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_to(d);
    ASSERT_NE(h, nullptr);
    zal_ipod_set_read_timeout(h, 0, 0);
    d.expect(ZAL_OP_KEEP_ALIVE);
    GetParam().script(d);
    EXPECT_EQ(zal_ipod_keep_alive_sync(h), GetParam().result);
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

INSTANTIATE_TEST_SUITE_P(
    Stream, Delivery,
    ::testing::Values(DeliveryCase{"whole", [](FakeDaemon &d) { d.reply(serialize_int(7)); }, 7},
                      DeliveryCase{"payload_split",
                                   [](FakeDaemon &d) {
                                       gval *v = serialize_int(9);
                                       Bytes b = frame(0, ZAL_OP_RETURN, v);
                                       serialize_free(v);
                                       d.send_split(
                                           [b](uint16_t tid) {
                                               Bytes out = b;
                                               out[2] = static_cast<unsigned char>(tid >> 8);
                                               out[3] = static_cast<unsigned char>(tid);
                                               return out;
                                           },
                                           {12, 14});
                                   },
                                   9},
                      DeliveryCase{"behind_other_packets",
                                   [](FakeDaemon &d) {
                                       d.send([](uint16_t tid) {
                                           gval *other = serialize_int(1);
                                           gval *mine = serialize_int(10);
                                           Bytes out = frame(static_cast<uint16_t>(tid + 100),
                                                             ZAL_OP_RETURN, other);
                                           Bytes b = event_frame("media_changed", nullptr);
                                           out.insert(out.end(), b.begin(), b.end());
                                           Bytes m = frame(tid, ZAL_OP_RETURN, mine);
                                           out.insert(out.end(), m.begin(), m.end());
                                           serialize_free(other);
                                           serialize_free(mine);
                                           return out;
                                       });
                                   },
                                   10},
                      DeliveryCase{"error_packet_with_integer",
                                   [](FakeDaemon &d) { d.error(serialize_int(-3)); }, -3},
                      DeliveryCase{"error_packet_with_text",
                                   [](FakeDaemon &d) {
                                       d.error(hash_of({{"error", serialize_string("busy")}}));
                                   },
                                   -1},
                      DeliveryCase{"no_payload", [](FakeDaemon &d) { d.reply(nullptr); }, -1},
                      DeliveryCase{"silence", [](FakeDaemon &) {}, -1}),
    [](const auto &info) { return std::string(info.param.name); });

TEST(Delivery, HeaderSplitAcrossThreeWrites) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_to(d);
    ASSERT_NE(h, nullptr);
    d.expect(ZAL_OP_KEEP_ALIVE)
        .send_split(
            [](uint16_t tid) {
                gval *v = serialize_int(8);
                Bytes b = frame(tid, ZAL_OP_RETURN, v);
                serialize_free(v);
                return b;
            },
            {3, 7});
    EXPECT_EQ(zal_ipod_keep_alive_sync(h), 8);
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

TEST(Reader, QueuesEveryWholePacketOfOneWriteInOrder) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_to(d);
    ASSERT_NE(h, nullptr);
    ASSERT_TRUE(d.finish());
    Bytes stream;
    for (uint16_t tid : {40, 41, 42}) {
        gval *v = serialize_int(tid);
        Bytes b = frame(tid, ZAL_OP_RETURN, v);
        serialize_free(v);
        stream.insert(stream.end(), b.begin(), b.end());
    }
    stream.resize(stream.size() + 5, 0xFE);  // start of a fourth packet
    d.write_now(stream);
    int queued = 0;
    for (int i = 0; i < 10 && queued == 0; ++i) queued = zal_ipod_receive(h);
    EXPECT_EQ(queued, 3);
    EXPECT_EQ(h->queue_count.load(), 3);
    EXPECT_EQ(h->rx_length, 5u);
    int expected = 40;
    for (zal_ipod_reply *r = h->queue->next; r != nullptr; r = r->next)
        EXPECT_EQ(r->tid, expected++);
    zal_ipod_close(h);
}

TEST(Reader, DiscardsEventsWhileNobodyListens) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_to(d);
    ASSERT_NE(h, nullptr);
    ASSERT_TRUE(d.finish());
    d.write_now(event_frame("media_changed", nullptr));
    int queued = 0;
    for (int i = 0; i < 4 && h->rx_length == 0 && queued == 0; ++i) queued = zal_ipod_receive(h);
    EXPECT_EQ(queued, 0);
    EXPECT_EQ(h->queue_count.load(), 0);
    zal_ipod_close(h);
}

TEST(Reader, ReceivesALargeReplyWhole) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_to(d);
    ASSERT_NE(h, nullptr);
    Bytes big(3u << 20);
    for (std::size_t i = 0; i < big.size(); ++i) big[i] = static_cast<unsigned char>(i * 7);
    d.expect(ZAL_OP_KEEP_ALIVE)
        .reply(serialize_bytes(big.data(), static_cast<uint32_t>(big.size())));
    zal_ipod_reply *r = zal_ipod_wait_for_tid(h, static_cast<uint16_t>(zal_ipod_keep_alive(h)));
    ASSERT_NE(r, nullptr);
    GvalPtr v(unserialize(r->payload, r->length));
    uint32_t n = 0;
    const void *bytes = serialize_get_bytes(v.get(), &n);
    ASSERT_EQ(n, big.size());
    EXPECT_EQ(memcmp(bytes, big.data(), n), 0);
    zal_ipod_reply_free(r);
    zal_ipod_close(h);
}

TEST(Reader, OversizedLengthDropsTheConnection) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_to(d);
    ASSERT_NE(h, nullptr);
    ASSERT_TRUE(d.finish());
    // A whole reply, then a header announcing too much, in one write.
    gval *zero = serialize_int(0);
    Bytes bad = frame(7, ZAL_OP_RETURN, zero);
    serialize_free(zero);
    Bytes header = hex("fe 00 00 05 03 00 00 00");
    bad.insert(bad.end(), header.begin(), header.end());
    uint32_t length = kMaxPayloadLength + 1;
    for (int shift : {24, 16, 8, 0}) bad.push_back(static_cast<unsigned char>(length >> shift));
    d.write_now(bad);
    LogCapture log;
    int result = 0;
    for (int i = 0; i < 10 && result == 0; ++i) result = zal_ipod_receive(h);
    EXPECT_EQ(result, -1);
    auto errors = log.texts(ANDROID_LOG_ERROR);
    EXPECT_TRUE(std::any_of(errors.begin(), errors.end(), [](const std::string &t) {
        return t.find("the stream is broken") != std::string::npos;
    }));
    EXPECT_EQ(count_starting(errors, "Could not find to zal.ipod.IPodDaemon"), 1);  // reconnect ran
    // The reply before the broken header stays queued (and is released with the handle).
    EXPECT_EQ(h->queue_count.load(), 1);
    EXPECT_EQ(zal_ipod_fd(h), -1);
    zal_ipod_close(h);
}

TEST(Wait, TimeOutMarksTheRequestAndALateReplyWaitsForTheReplyCallback) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_to(d);
    ASSERT_NE(h, nullptr);
    zal_ipod_set_read_timeout(h, 0, 0);
    d.expect(ZAL_OP_KEEP_ALIVE);
    LogCapture log;
    int tid = zal_ipod_keep_alive(h);
    EXPECT_EQ(zal_ipod_wait_for_tid(h, static_cast<uint16_t>(tid)), nullptr);
    EXPECT_EQ(h->request_opcodes[tid], kTimedOutOpcode);
    bool reported = false;
    for (const auto &t : log.texts(ANDROID_LOG_ERROR))
        if (t.find(" Transaction timeout tid: " + std::to_string(tid) + ", start-time: ") !=
            std::string::npos)
            reported = true;
    EXPECT_TRUE(reported);
    // The late reply is read by the next pass and stays for nobody but the queue.
    d.reply(serialize_int(1));
    ASSERT_TRUE(d.finish());
    for (int i = 0; i < 10 && h->queue_count.load() == 0; ++i) zal_ipod_events_iterate(h);
    EXPECT_EQ(h->queue_count.load(), 1);
    // Once a reply callback is set, the dispatcher hands it over.
    std::vector<std::pair<int, int>> seen;
    zal_ipod_set_reply_cb(
        h,
        [](zal_ipod_handle *, uint16_t t, int32_t result, const char *, void *user) {
            static_cast<std::vector<std::pair<int, int>> *>(user)->emplace_back(t, result);
            return 0;
        },
        &seen);
    zal_ipod_pending_event(h);
    EXPECT_EQ(seen, (std::vector<std::pair<int, int>>{{tid, 1}}));
    EXPECT_EQ(h->queue_count.load(), 0);
    zal_ipod_close(h);
}

TEST(Wait, ErrorPacketIsLogged) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_to(d);
    ASSERT_NE(h, nullptr);
    d.expect(ZAL_OP_KEEP_ALIVE).error(serialize_int(0));
    LogCapture log;
    int tid = zal_ipod_keep_alive(h);
    zal_ipod_reply *r = zal_ipod_wait_for_tid(h, static_cast<uint16_t>(tid));
    ASSERT_NE(r, nullptr);
    EXPECT_EQ(r->opcode, ZAL_OP_ERROR);
    char text[64];
    snprintf(text, sizeof text, "%p Packet error: transaction id 0x%04x\n", static_cast<void *>(h),
             tid);
    EXPECT_TRUE(log.contains(ANDROID_LOG_ERROR, text));
    zal_ipod_reply_free(r);
    zal_ipod_close(h);
}

TEST(Reader, AnOrderlyCloseKeepsTheDescriptorUntilASendFails) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_to(d);
    ASSERT_NE(h, nullptr);
    int fd = zal_ipod_fd(h);
    d.drop();
    ASSERT_TRUE(d.finish());
    // End of stream: the descriptor stays, and the reader stops polling a socket that
    // would report readable forever.
    EXPECT_EQ(zal_ipod_read(h), -1);
    EXPECT_EQ(zal_ipod_fd(h), fd);
    EXPECT_TRUE(h->peer_closed.load());
    EXPECT_EQ(zal_ipod_read(h), 0);
    EXPECT_EQ(zal_ipod_fd(h), fd);
    // Writing to the closed connection fails; the next read drops it and reconnects.
    h->address = strdup("/tmp/zal-core-test-nothing-here");
    for (int i = 0; i < 2 && !h->send_failed.load(); ++i) zal_ipod_keep_alive(h);
    EXPECT_TRUE(h->send_failed.load());
    EXPECT_EQ(zal_ipod_read(h), -1);
    EXPECT_EQ(zal_ipod_fd(h), -1);
    EXPECT_FALSE(h->peer_closed.load());
    zal_ipod_close(h);
}

TEST(Sender, AFailedWriteNeverTouchesTheDescriptorAgain) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_to(d);
    ASSERT_NE(h, nullptr);
    d.drop();
    ASSERT_TRUE(d.finish());
    LogCapture log;
    // The daemon is gone: the first write fails, the second is not attempted.
    int first = zal_ipod_keep_alive(h);
    int second = zal_ipod_keep_alive(h);
    EXPECT_GT(first, 0);
    EXPECT_GT(second, 0);
    EXPECT_EQ(count_starting(log.texts(ANDROID_LOG_ERROR), "send error: "), 1);
    EXPECT_TRUE(h->send_failed.load());
    // The next read closes it and reconnects (to a target that is not there).
    h->address = strdup("/tmp/zal-core-test-nothing-here");
    EXPECT_EQ(zal_ipod_read(h), -1);
    EXPECT_EQ(zal_ipod_fd(h), -1);
    EXPECT_FALSE(h->send_failed.load());
    EXPECT_EQ(zal_ipod_send_packet(h, nullptr), -1);
    zal_ipod_close(h);
}
