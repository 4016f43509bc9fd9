// Device list accessors, the session decoder and sessions over the wire.
#include <gtest/gtest.h>

#include "client_helpers.h"
#include "fake_daemon.h"
#include "zal-ipod-2/devices.h"
#include "zal-ipod-2/packet.h"

using namespace zaltest;

TEST(DeviceAccessors, ReadTheEntryOrTheirDefault) {
    zal_ipod_handle *h = offline_handle();
    EXPECT_EQ(zal_ipod_device_count(h), 0);
    EXPECT_EQ(zal_ipod_device_protocol(h, 0), -1);
    gval *bare = hash_of({{"serial", serialize_string("BARE")}});
    h->devices = device_list({device_entry("S0", 1, 2, 1), bare, serialize_int(5)});
    struct Row {
        int index;
        const char *serial;
        int transport, bus, address, rfcomm, used, authenticated, extended, protocol;
    };
    const Row rows[] = {
        {0, "S0", 0, 3, 7, -1, 1, 1, 1, 2},      // a full entry
        {1, "BARE", 0, 0, 0, 0, 0, 0, 0, -1},    // keys missing
        {2, nullptr, 0, 0, 0, 0, 0, 0, 0, -1},   // not a hash
        {3, nullptr, 0, 0, 0, 0, 0, 0, 0, -1},   // past the end
        {-1, nullptr, 0, 0, 0, 0, 0, 0, 0, -1},  // negative
    };
    for (const Row &r : rows) {
        SCOPED_TRACE(r.index);
        if (r.serial) {
            EXPECT_STREQ(zal_ipod_device_serial(h, r.index), r.serial);
        } else {
            EXPECT_EQ(zal_ipod_device_serial(h, r.index), nullptr);
        }
        EXPECT_EQ(zal_ipod_device_transport_mode(h, r.index), r.transport);
        EXPECT_EQ(zal_ipod_device_usb_bus(h, r.index), r.bus);
        EXPECT_EQ(zal_ipod_device_usb_address(h, r.index), r.address);
        EXPECT_EQ(zal_ipod_device_rfcomm_id(h, r.index), r.rfcomm);
        EXPECT_EQ(zal_ipod_device_used(h, r.index), r.used);
        EXPECT_EQ(zal_ipod_device_authenticated(h, r.index), r.authenticated);
        EXPECT_EQ(zal_ipod_device_is_extended(h, r.index), r.extended);
        EXPECT_EQ(zal_ipod_device_protocol(h, r.index), r.protocol);
    }
    EXPECT_EQ(zal_ipod_device_count(h), 3);
    EXPECT_EQ(zal_ipod_device_name(h), nullptr);
    zal_ipod_close(h);
}

// The session decoder: reply value and the device in session -> result and flags.
struct SessionCase {
    const char *name;
    bool opening;
    gval *(*reply)();  // nullptr: no reply at all
    int authenticated, protocol;
    int result, session_opened, ready, handle_protocol;
};

void PrintTo(const SessionCase &c, std::ostream *out) {
    *out << c.name;
}

class SessionDecoder : public ::testing::TestWithParam<SessionCase> {};

gval *result_reply(int result) {
    return hash_of(
        {{"result", serialize_int(result)}, {"devices", device_list({device_entry("R", 1, 1)})}});
}

TEST_P(SessionDecoder, SetsResultSessionAndReadyFlag) {
    const SessionCase &c = GetParam();
    zal_ipod_handle *h = offline_handle();
    h->devices = device_list({device_entry("OLD", c.authenticated, c.protocol)});
    h->current_session = 0;
    h->ready = 1;
    h->session_opened = 1;
    zal_ipod_reply *r = c.reply != nullptr ? make_reply(1, ZAL_OP_RETURN, c.reply()) : nullptr;
    int32_t result = c.opening ? zal_session_decode_open(h, r) : zal_session_decode_close(h, r);
    EXPECT_EQ(result, c.result);
    EXPECT_EQ(h->session_opened.load(), c.session_opened);
    EXPECT_EQ(static_cast<int>(h->ready.load()), c.ready);
    EXPECT_EQ(h->protocol, c.handle_protocol);
    reply_record_free(r);
    zal_ipod_close(h);
}

INSTANTIATE_TEST_SUITE_P(
    Forms, SessionDecoder,
    ::testing::Values(
        // The reply's list (device "R": authenticated 1, protocol 1) replaces the old one.
        SessionCase{"open_ok", true, [] { return result_reply(1); }, 0, 2, 1, 1, 1, 0},
        SessionCase{"open_refused", true, [] { return result_reply(0); }, 1, 1, 0, 0, 1, 0},
        SessionCase{"open_no_result", true, [] { return serialize_hash(); }, 1, 1, 0, 0, 0, 0},
        SessionCase{"open_no_result_iap2", true, [] { return serialize_hash(); }, 0, 2, 0, 0, 1, 2},
        SessionCase{"open_timeout_iap2", true, nullptr, 0, 2, 0, 0, 1, 2},
        SessionCase{"open_timeout_iap1", true, nullptr, 1, 1, 0, 0, 1, 0},
        SessionCase{"open_not_a_hash", true, [] { return serialize_int(1); }, 1, 1, 0, 0, 1, 0},
        SessionCase{"close_ok", false, [] { return result_reply(1); }, 1, 2, 1, 0, 0, 0},
        SessionCase{"close_timeout", false, nullptr, 1, 2, 0, 0, 0, 0}),
    [](const auto &info) { return std::string(info.param.name); });

TEST(SessionDecoder, ReplyListMakesAnUnauthenticatedDeviceNotReady) {
    zal_ipod_handle *h = offline_handle();
    zal_ipod_reply *r = make_reply(1, ZAL_OP_RETURN,
                                   hash_of({{"result", serialize_int(1)},
                                            {"devices", device_list({device_entry("U", 0, 1)})}}));
    EXPECT_EQ(zal_session_decode_open(h, r), 1);
    EXPECT_EQ(zal_ipod_is_session_opened(h), 1);
    EXPECT_EQ(h->ready.load(), 0u);
    EXPECT_STREQ(zal_ipod_device_serial(h, 0), "U");
    reply_record_free(r);
    zal_ipod_close(h);
}

TEST(Sessions, OpenAndCloseOverTheWire) {
    FakeDaemon d;
    d.expect(ZAL_OP_HELLO).reply(device_list({device_entry("P", 1, 1)}));
    zal_ipod_handle *h = zal_ipod_connect(nullptr);
    ASSERT_NE(h, nullptr);
    d.expect(ZAL_OP_OPEN_SESSION, serialize_int(0))
        .reply(hash_of(
            {{"result", serialize_int(1)}, {"devices", device_list({device_entry("P", 1, 1)})}}))
        .expect(ZAL_OP_PLAY)
        .reply(serialize_int(0))
        .expect(ZAL_OP_CLOSE_SESSION)
        .reply(hash_of({{"result", serialize_int(1)}}));
    EXPECT_EQ(zal_ipod_open_session_sync(h, 0), 1);
    EXPECT_EQ(h->slots.session_tid, 2);
    EXPECT_EQ(zal_ipod_is_ready(h), 1);
    EXPECT_EQ(zal_ipod_current_session(h), 0);
    EXPECT_EQ(zal_ipod_play_sync(h), 0);
    EXPECT_EQ(zal_ipod_close_session_sync(h), 1);
    EXPECT_EQ(zal_ipod_is_ready(h), 0);
    EXPECT_EQ(zal_ipod_device_count(h), 0);  // the close reply carried no list
    EXPECT_EQ(zal_ipod_play(h), 0);          // refused until the next open
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}
