// Runtime configuration over the wire: the requests as the daemon reads them, sent
// without a session, and the synchronous forms' results from the daemon's replies.
#include <android/log.h>
#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "client_helpers.h"
#include "fake_daemon.h"
#include "log_capture.h"
#include "zal-ipod-2/opcodes.h"
#include "zal-ipod-2/zal-ipod-2.h"

using namespace zaltest;

namespace {

gval *strings(std::initializer_list<const char *> items) {
    gval *array = serialize_array();
    for (const char *s : items) serialize_array_add(array, serialize_string(s));
    return array;
}

// A connected handle with no session: the configuration needs none.
zal_ipod_handle *connected_handle(FakeDaemon &d) {
    d.expect(ZAL_OP_HELLO).reply(serialize_array());
    return zal_ipod_connect(nullptr);
}

TEST(RuntimeConfig, SetSendsKeyAndValueWithoutASessionAndReportsTheRefusedPart) {
    FakeDaemon d;
    zal_ipod_handle *h = connected_handle(d);
    ASSERT_NE(h, nullptr);
    ASSERT_NE(zal_ipod_is_ready(h), 1);
    d.expect(ZAL_OP_SET_CONFIG, strings({"volume", "7"}))
        .reply(hash_of(
            {{"config_updated_cfg", serialize_int(1)}, {"config_updated_ctx", serialize_int(0)}}));
    LogCapture log;
    EXPECT_EQ(zal_ipod_set_config_sync(h, "volume", "7"), 1);
    std::vector<std::string> errors = log.texts(ANDROID_LOG_ERROR);
    ASSERT_EQ(errors.size(), 2u);
    EXPECT_EQ(errors[0], "the context could not be updated for key 'volume' and value '7'!\n");
    EXPECT_TRUE(log.texts(ANDROID_LOG_WARN).empty()) << "no not-ready warning";
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

TEST(RuntimeConfig, AsyncFormsReturnTheTidOfTheirRequest) {
    FakeDaemon d;
    zal_ipod_handle *h = connected_handle(d);
    ASSERT_NE(h, nullptr);
    d.expect(ZAL_OP_SET_CONFIG, strings({"name", ""})).expect(ZAL_OP_GET_CONFIG, strings({"name"}));
    uint16_t set_tid = zal_ipod_set_config(h, "name", "");  // an empty value is a value
    uint16_t get_tid = zal_ipod_get_config(h, "name");
    EXPECT_GT(set_tid, 0);
    EXPECT_EQ(get_tid, static_cast<uint16_t>(set_tid + 1));
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

TEST(RuntimeConfig, GetCopiesTheValueOrPassesTheErrorCodeThrough) {
    FakeDaemon d;
    zal_ipod_handle *h = connected_handle(d);
    ASSERT_NE(h, nullptr);
    d.expect(ZAL_OP_GET_CONFIG, strings({"socket"}))
        .reply(hash_of({{"config_val", serialize_string("zal.ipod.IPodDaemon")},
                        {"config_val_errorcode", serialize_int(-3)}}))
        .expect(ZAL_OP_GET_CONFIG, strings({"nothing"}))
        .reply(hash_of({{"config_val_errorcode", serialize_int(-3)}}));
    char out[64] = "";
    EXPECT_EQ(zal_ipod_get_config_sync(h, "socket", out), 1);
    EXPECT_STREQ(out, "zal.ipod.IPodDaemon");
    EXPECT_EQ(zal_ipod_get_config_sync(h, "nothing", out), -3);
    EXPECT_STREQ(out, "zal.ipod.IPodDaemon");
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

TEST(RuntimeConfig, ReplyWithoutPayloadIsNoReply) {
    FakeDaemon d;
    zal_ipod_handle *h = connected_handle(d);
    ASSERT_NE(h, nullptr);
    d.expect(ZAL_OP_SET_CONFIG, strings({"k", "v"}))
        .reply(nullptr)
        .expect(ZAL_OP_GET_CONFIG, strings({"k"}))
        .reply(nullptr);
    char out[8] = "keep";
    LogCapture log;
    EXPECT_EQ(zal_ipod_set_config_sync(h, "k", "v"), -1);
    EXPECT_EQ(zal_ipod_get_config_sync(h, "k", out), -2);
    EXPECT_STREQ(out, "keep");
    EXPECT_TRUE(log.texts(ANDROID_LOG_ERROR).empty());
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

TEST(RuntimeConfig, NullHandleSendsNothing) {
    char out[8] = "keep";
    EXPECT_EQ(zal_ipod_set_config(nullptr, "k", "v"), 0);
    EXPECT_EQ(zal_ipod_get_config(nullptr, "k"), 0);
    EXPECT_EQ(zal_ipod_set_config_sync(nullptr, "k", "v"), -1);
    EXPECT_EQ(zal_ipod_get_config_sync(nullptr, "k", out), -2);
}

}  // namespace
