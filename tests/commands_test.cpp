// The command pattern: the simple commands over the wire, the ready test, the reply rules
// and the argument builders.
#include <android/log.h>
#include <gtest/gtest.h>

#include "client_helpers.h"
#include "fake_daemon.h"
#include "log_capture.h"
#include "zal-ipod-2/command.h"
#include "zal-ipod-2/packet.h"

using namespace zaltest;

namespace {

struct SimpleCommand {
    const char *name;
    int (*send)(zal_ipod_handle *);
    int (*sync)(zal_ipod_handle *);
    uint8_t opcode;
};

#define C(name, opcode)                                        \
    SimpleCommand {                                            \
#name, zal_ipod_##name, zal_ipod_##name##_sync, opcode \
    }
const SimpleCommand kSimpleCommands[] = {
    C(play, 8),
    C(playpause, 10),
    C(stop, 11),
    C(pause, 12),
    C(next_track, 13),
    C(prev_track, 14),
    C(mute, 15),
    C(inc, 16),
    C(dec, 17),
    C(start_device_audio_info, 24),
    C(stop_device_audio_info, 25),
    C(start_tracking_dec, 27),
    C(start_tracking_inc, 28),
    C(start_tracking_normal, 29),
    C(start_ffw, 30),
    C(start_rew, 31),
    C(stop_ffwrew, 32),
    C(voice_command, 33),
    C(promote, 34),
    C(demote, 35),
    C(add_to_cart, 36),
    C(start_bt_connection_updates, 104),
    C(stop_bt_connection_updates, 105),
    C(keep_alive, 1),
};
#undef C

}  // namespace

TEST(SimpleCommands, BothFormsSendTheirOpcodeAndDecodeTheInteger) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d);
    ASSERT_NE(h, nullptr);
    int value = 0;
    for (const SimpleCommand &c : kSimpleCommands) {
        SCOPED_TRACE(c.name);
        d.expect(c.opcode).expect(c.opcode).reply(serialize_int(++value));
        int tid = c.send(h);
        EXPECT_GT(tid, 0);
        EXPECT_EQ(h->request_opcodes[tid], c.opcode);
        EXPECT_EQ(c.sync(h), value);
        EXPECT_TRUE(d.finish()) << d.report();
    }
    zal_ipod_close(h);
}

TEST(SimpleCommands, NotReadyHandleSendsOnlyTheKeepAlive) {
    FakeDaemon d;
    d.expect(ZAL_OP_HELLO).reply(serialize_array());
    zal_ipod_handle *h = zal_ipod_connect(nullptr);
    ASSERT_NE(h, nullptr);
    LogCapture log;
    for (const SimpleCommand &c : kSimpleCommands) {
        if (c.opcode == ZAL_OP_KEEP_ALIVE) continue;
        EXPECT_EQ(c.send(h), 0) << c.name;
    }
    EXPECT_TRUE(log.texts(ANDROID_LOG_WARN).empty());  // no argument, no warning
    EXPECT_EQ(zal_ipod_play_sync(h), -1);
    d.expect(ZAL_OP_KEEP_ALIVE);
    EXPECT_GT(zal_ipod_keep_alive(h), 0);
    EXPECT_TRUE(d.finish()) << d.report();  // nothing else reached the daemon
    zal_ipod_close(h);
}

TEST(CommandHelpers, RefusedCommandWithArgumentWarnsWithItsName) {
    zal_ipod_handle *h = offline_handle();
    LogCapture log;
    EXPECT_EQ(zal_cmd_send(h, ZAL_OP_SET_POSITION, zal_arg_int(5), "zal_ipod_set_position"), 0);
    EXPECT_EQ(log.texts(ANDROID_LOG_WARN),
              std::vector<std::string>{"not ready2 zal_ipod_set_position\n"});
    zal_ipod_close(h);
}

TEST(CommandHelpers, SlotGetsTheTidOnlyWhenSent) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d);
    ASSERT_NE(h, nullptr);
    d.expect(ZAL_OP_CURRENT_TRACK_INFO).expect(ZAL_OP_CURRENT_TRACK_INFO);
    int first = zal_cmd_send(h, ZAL_OP_CURRENT_TRACK_INFO, nullptr, nullptr,
                             &zal_pending_slots::track_info_tid);
    int second = zal_cmd_send(h, ZAL_OP_CURRENT_TRACK_INFO, nullptr, nullptr,
                              &zal_pending_slots::track_info_tid);
    EXPECT_EQ(h->slots.track_info_tid, second);
    EXPECT_NE(first, second);
    EXPECT_TRUE(d.finish()) << d.report();
    h->ready = 0;
    EXPECT_EQ(zal_cmd_send(h, ZAL_OP_CURRENT_TRACK_INFO, nullptr, nullptr,
                           &zal_pending_slots::track_info_tid),
              0);
    EXPECT_EQ(h->slots.track_info_tid, second);
    zal_ipod_close(h);
}

TEST(CommandHelpers, ArgumentsGoOutEncodedInParameterOrder) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d);
    ASSERT_NE(h, nullptr);
    gval *mixed = serialize_array();
    serialize_array_add(mixed, serialize_string("name"));
    serialize_array_add(mixed, serialize_int(65535));
    d.expect(ZAL_OP_SET_POSITION, serialize_int(-4))
        .expect(ZAL_OP_GET_VIDEOOUTOPTIONS, serialize_int(1))
        .expect(ZAL_OP_LAUNCHAPPLICATION, serialize_string("app"))
        .expect(ZAL_OP_ROTAION_IPNUT,
                [] {
                    gval *a = serialize_array();
                    for (int v : {1, 2, 3}) serialize_array_add(a, serialize_int(v));
                    return a;
                }())
        .expect(ZAL_OP_HEALTH_EXAMINE, mixed);
    EXPECT_GT(zal_cmd_send(h, ZAL_OP_SET_POSITION, zal_arg_int(-4), "f"), 0);
    EXPECT_GT(zal_cmd_send(h, ZAL_OP_GET_VIDEOOUTOPTIONS, zal_arg_bool(42), "f"), 0);
    EXPECT_GT(zal_cmd_send(h, ZAL_OP_LAUNCHAPPLICATION, zal_arg_string("app"), "f"), 0);
    EXPECT_GT(zal_cmd_send(h, ZAL_OP_ROTAION_IPNUT, zal_arg_ints({1, 2, 3}), "f"), 0);
    uint16_t narrow = 65535;
    EXPECT_GT(zal_cmd_send(h, ZAL_OP_HEALTH_EXAMINE,
                           zal_arg_array({zal_arg_string("name"), zal_arg_int(narrow)}), "f",
                           nullptr, false),
              0);
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

TEST(CommandHelpers, ArrayWithAMissingItemIsRefusedWhole) {
    EXPECT_EQ(zal_arg_array({zal_arg_int(1), nullptr, zal_arg_string("x")}), nullptr);
    zal_ipod_handle *h = offline_handle();
    h->ready = 1;
    LogCapture log;
    EXPECT_EQ(zal_cmd_send(h, ZAL_OP_SET_POSITION, nullptr, "zal_ipod_set_position"), 0);
    EXPECT_FALSE(log.texts(ANDROID_LOG_ERROR).empty());
    zal_ipod_close(h);
}

// The integer reply rule.
TEST(ReplyRules, IntegerRule) {
    struct Row {
        const char *name;
        gval *value;
        bool record;
        int32_t result;
        const char *error;  // error text afterwards
    };
    zal_ipod_handle *h = offline_handle();
    const Row rows[] = {
        {"zero", serialize_int(0), true, 0, nullptr},
        {"negative", serialize_int(-5), true, -5, nullptr},
        {"string", serialize_string("5"), true, -1, nullptr},
        {"hash", hash_of({{"x", serialize_int(1)}}), true, -1, nullptr},
        {"array", serialize_array(), true, -1, nullptr},
        {"no_payload", nullptr, true, -1, nullptr},
        {"no_record", nullptr, false, -1, nullptr},
        {"error", hash_of({{"error", serialize_string("first")}}), true, -1, "first"},
        {"second_error", hash_of({{"error", serialize_string("second")}}), true, -1, "second"},
        {"success_keeps_text", serialize_int(1), true, 1, "second"},
    };
    for (const Row &row : rows) {
        SCOPED_TRACE(row.name);
        zal_ipod_reply *r = row.record ? make_reply(1, ZAL_OP_RETURN, row.value) : nullptr;
        EXPECT_EQ(zal_decode_int(h, r), row.result);
        if (row.error) {
            EXPECT_STREQ(zal_ipod_get_error_message(h), row.error);
        } else {
            EXPECT_EQ(zal_ipod_get_error_message(h), nullptr);
        }
        reply_record_free(r);
    }
    zal_ipod_close(h);
}

TEST(ReplyRules, HashRule) {
    zal_ipod_handle *h = offline_handle();
    auto read = [](zal_ipod_handle *, const gval *hash) { return zal_hash_int(hash, "n", -9); };
    zal_ipod_reply *ok = make_reply(1, ZAL_OP_RETURN, hash_of({{"n", serialize_int(4)}}));
    zal_ipod_reply *bad = make_reply(
        1, ZAL_OP_RETURN, hash_of({{"error", serialize_string("e")}, {"n", serialize_int(4)}}));
    zal_ipod_reply *scalar = make_reply(1, ZAL_OP_RETURN, serialize_int(4));
    EXPECT_EQ(zal_decode_hash(h, ok, read), 4);
    EXPECT_EQ(zal_decode_hash(h, scalar, read), -1);
    EXPECT_EQ(zal_decode_hash(h, nullptr, read), -1);
    EXPECT_EQ(zal_decode_hash(h, bad, read), -1);
    EXPECT_STREQ(zal_ipod_get_error_message(h), "e");
    for (auto *r : {ok, bad, scalar}) reply_record_free(r);
    zal_ipod_close(h);
}
