// The dispatcher: event kinds and their effects on the handle, the choice of records, and
// replies outside a wait through the pending-reply slots.
#include <android/log.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "client_helpers.h"
#include "fake_daemon.h"
#include "log_capture.h"
#include "zal-ipod-2/dispatch.h"
#include "zal-ipod-2/packet.h"

using namespace zaltest;

namespace {

struct Seen {
    std::vector<zal_ipod_event *> events;
    ~Seen() {
        for (auto *e : events) zal_ipod_event_free(e);
    }
};

int keep_event(zal_ipod_handle *, zal_ipod_event *e, void *user) {
    static_cast<Seen *>(user)->events.push_back(zal_ipod_event_clone_data(e));
    return 0;
}

struct Reply {
    uint16_t tid;
    int32_t result;
    std::string text;
    bool has_text;
};

int keep_reply(zal_ipod_handle *, uint16_t tid, int32_t result, const char *text, void *user) {
    static_cast<std::vector<Reply> *>(user)->push_back(
        {tid, result, text ? text : "", text != nullptr});
    return 0;
}

class Dispatch : public ::testing::Test {
  protected:
    void SetUp() override {
        h = offline_handle();
        zal_ipod_set_event_cb(h, keep_event, &seen);
    }
    void TearDown() override { zal_ipod_close(h); }
    zal_ipod_handle *h = nullptr;
    Seen seen;
};

}  // namespace

// Every type string and the kind it arrives as.
TEST_F(Dispatch, TypeStringsGiveTheirKinds) {
    const std::vector<std::pair<const char *, int>> table = {
        {"connected_ipod", 1},
        {"disconnected_ipod", 2},
        {"fail_to_detect", 3},
        {"authenticated", 4},
        {"mode_changed", 5},
        {"play_state_changed", 6},
        {"track_index_changed", 7},
        {"samplerate_retrived", 9},
        {"track_position_changed", 10},
        {"chapter_index_changed", 11},
        {"init_state", 12},
        {"protocolinuse", 13},
        {"medialibrary_update", 14},
        {"media_changed", 15},
        {"artwork_transfer_done", 16},
        {"bluetooth_connection_update", 17},
        {"data_session", 18},
        {"location_information", 19},
        {"playing_app", 20},
        {"telephony_callstate_information", 21},
        {"vehicle_status_updates", 22},
        {"wifi_information", 23},
        {"telephony_update", 24},
        {"track_is_audiobook", 25},
        {"track_contains_video", 25},
        {"shuffle_mode_changed", 26},
        {"repeat_mode_changed", 27},
        {"disconnected_ipod_hostmode", 28},
        {"role_switched", 29},
        {"telephony_vcard_information", 30},
        {"ipod_device_name", 31},
        {"wireless_carplay_update", 32},
        {"something_new", 33},
        {"Connected_ipod", 33},
    };
    for (const auto &row : table) EXPECT_EQ(zal_event_kind_of(row.first), row.second) << row.first;
}

TEST_F(Dispatch, EventRecordCarriesSessionSerialAndACopyOfTheData) {
    LogCapture log;
    queue_event(h, "something_new", serialize_string("payload"), "SER-1", 0x12345);
    queue_event(h, "medialibrary_update", serialize_int(40));
    queue_event(h, "media_changed", nullptr);
    zal_ipod_pending_event(h);
    ASSERT_EQ(seen.events.size(), 3u);
    EXPECT_EQ(seen.events[0]->kind, ZALIPOD_EVENT_UNKNOWN);
    EXPECT_EQ(seen.events[0]->session, 0x2345);
    EXPECT_STREQ(seen.events[0]->serial, "SER-1");
    EXPECT_STREQ(serialize_get_string(seen.events[0]->data), "payload");
    EXPECT_EQ(zal_ipod_event_get_media_lib_update_progress(seen.events[1]), 40);
    EXPECT_EQ(seen.events[2]->data, nullptr);
    EXPECT_STREQ(seen.events[2]->serial, "");
    // Every event but the library update is traced.
    EXPECT_EQ(log.texts(ANDROID_LOG_INFO),
              (std::vector<std::string>{"process event type=[something_new]\n",
                                        "process event type=[media_changed]\n"}));
    EXPECT_EQ(h->queue_count.load(), 0);
}

// Events that write one cached integer.
TEST_F(Dispatch, EventsUpdateTheCachedNumbers) {
    struct Row {
        const char *type;
        int32_t zal_playback_state::*field;
    };
    const Row rows[] = {
        {"play_state_changed", &zal_playback_state::play_state},
        {"track_index_changed", &zal_playback_state::track_index},
        {"samplerate_retrived", &zal_playback_state::sample_rate},
        {"track_position_changed", &zal_playback_state::track_position},
        {"init_state", &zal_playback_state::init_state},
        {"shuffle_mode_changed", &zal_playback_state::shuffle_state},
        {"repeat_mode_changed", &zal_playback_state::repeat_state},
    };
    int value = 100;
    for (const Row &row : rows) {
        queue_event(h, row.type, serialize_int(++value));
        zal_ipod_pending_event(h);
        EXPECT_EQ(h->playback.*row.field, value) << row.type;
    }
    queue_event(h, "chapter_index_changed",
                hash_of({{"track_index", serialize_int(4)},
                         {"chapter_index", serialize_int(2)},
                         {"chapter_count", serialize_int(9)}}));
    queue_event(h, "artwork_transfer_done", serialize_string("art-1"));
    queue_event(h, "ipod_device_name", serialize_string("Kitchen"));
    zal_ipod_pending_event(h);
    EXPECT_EQ(h->playback.track_index, 4);
    EXPECT_EQ(h->playback.chapter_index, 2);
    EXPECT_EQ(h->playback.chapter_count, 9);
    EXPECT_STREQ(h->playback.artwork_name, "art-1");
    EXPECT_STREQ(zal_ipod_device_name(h), "Kitchen");
}

TEST_F(Dispatch, PlayingApplicationNameIsCutAt255Characters) {
    std::string longer(300, 'n');
    queue_event(h, "playing_app", serialize_string(longer.c_str()));
    zal_ipod_pending_event(h);
    EXPECT_EQ(std::string(h->playback.playing_app), longer.substr(0, 255));
    // The event itself keeps the whole name.
    EXPECT_EQ(std::string(zal_ipod_event_get_playing_app(seen.events.at(0))), longer);
}

TEST_F(Dispatch, DeviceListFollowsConnectAndDisconnect) {
    h->devices =
        device_list({device_entry("A", 1, 1), device_entry("B", 1, 1), device_entry("C", 1, 1)});
    h->current_session = 2;
    h->session_opened = 1;
    h->playback.play_state = 1;
    zal_replace_text(&h->playback.title, "Song");
    queue_event(h, "connected_ipod", device_entry("D", 0, 2));
    queue_event(h, "disconnected_ipod", serialize_string("A"));  // ahead of the session
    zal_ipod_pending_event(h);
    EXPECT_EQ(zal_ipod_device_count(h), 3);
    EXPECT_STREQ(zal_ipod_device_serial(h, 2), "D");
    // The session still names device C, now one place lower.
    EXPECT_EQ(zal_ipod_current_session(h), 1);
    EXPECT_STREQ(zal_ipod_device_serial(h, 1), "C");
    EXPECT_EQ(zal_ipod_is_session_opened(h), 1);
    EXPECT_EQ(h->playback.title, nullptr);
    EXPECT_EQ(h->playback.play_state, -1);

    queue_event(h, "disconnected_ipod", serialize_string("C"));  // the device in session
    zal_ipod_pending_event(h);
    EXPECT_EQ(zal_ipod_current_session(h), -1);
    EXPECT_EQ(zal_ipod_is_session_opened(h), 0);
    EXPECT_EQ(zal_ipod_device_count(h), 2);
}

TEST_F(Dispatch, ListEventsOnAHandleWithoutAList) {
    queue_event(h, "authenticated", serialize_int(1), "X");
    queue_event(h, "mode_changed", serialize_int(1), "X");
    queue_event(h, "disconnected_ipod", serialize_string("X"));
    zal_ipod_pending_event(h);
    EXPECT_EQ(h->devices, nullptr);
    EXPECT_EQ(seen.events.size(), 3u);
    queue_event(h, "connected_ipod", device_entry("X", 0, 1));
    zal_ipod_pending_event(h);
    EXPECT_EQ(zal_ipod_device_count(h), 1);  // the first device starts the list
}

TEST_F(Dispatch, ReadyFlagRules) {
    h->devices = device_list({device_entry("A", 0, 1), device_entry("B", 0, 1)});
    h->current_session = 0;
    queue_event(h, "mode_changed", serialize_int(1), "A");  // not authenticated yet
    zal_ipod_pending_event(h);
    EXPECT_EQ(h->ready.load(), 0u);
    EXPECT_EQ(zal_ipod_device_is_extended(h, 0), 1);
    queue_event(h, "authenticated", serialize_int(1), "B");  // another device
    queue_event(h, "mode_changed", serialize_int(1), "B");
    zal_ipod_pending_event(h);
    EXPECT_EQ(h->ready.load(), 0u);
    queue_event(h, "authenticated", serialize_int(1), "A");
    queue_event(h, "mode_changed", serialize_int(1), "A");
    zal_ipod_pending_event(h);
    EXPECT_EQ(h->ready.load(), 1u);

    h->ready = 0;
    queue_event(h, "protocolinuse", serialize_int(0), "B");  // whatever the data says
    zal_ipod_pending_event(h);
    EXPECT_EQ(h->ready.load(), 1u);
    EXPECT_EQ(zal_ipod_device_protocol(h, 1), 0);
}

TEST_F(Dispatch, WithoutAReplyCallbackRepliesStayAndEventsBehindThemGo) {
    queue_record(h, make_reply(5, ZAL_OP_RETURN, serialize_int(1)));
    queue_event(h, "media_changed", nullptr);
    zal_ipod_pending_event(h);
    EXPECT_EQ(seen.events.size(), 1u);
    EXPECT_EQ(h->queue_count.load(), 1);
    EXPECT_EQ(h->queue->next->tid, 5);
}

// Replies outside a wait: slot, reply value and what reaches the reply callback.
struct SlotCase {
    const char *name;
    uint16_t zal_pending_slots::*slot;  // nullptr: no slot
    gval *(*value)();
    int32_t result;
    const char *text;  // nullptr: no text
};

void PrintTo(const SlotCase &c, std::ostream *out) {
    *out << c.name;
}

class ReplySlots : public ::testing::TestWithParam<SlotCase> {};

TEST_P(ReplySlots, DecodeAndHandToTheReplyCallback) {
    const SlotCase &c = GetParam();
    zal_ipod_handle *h = offline_handle();
    std::vector<Reply> replies;
    zal_ipod_set_reply_cb(h, keep_reply, &replies);
    if (c.slot != nullptr) h->slots.*c.slot = 77;
    h->slots.preference_class = 8;
    zal_set_error_message(h, "stale");
    queue_record(h, make_reply(77, ZAL_OP_RETURN, c.value ? c.value() : nullptr));
    zal_ipod_pending_event(h);
    ASSERT_EQ(replies.size(), 1u);
    EXPECT_EQ(replies[0].tid, 77);
    EXPECT_EQ(replies[0].result, c.result);
    EXPECT_EQ(replies[0].has_text, c.text != nullptr);
    if (c.text != nullptr) {
        EXPECT_EQ(replies[0].text, c.text);
    }
    zal_ipod_close(h);
}

using S = zal_pending_slots;
INSTANTIATE_TEST_SUITE_P(
    Slots, ReplySlots,
    ::testing::Values(
        SlotCase{"generic_int", nullptr, [] { return serialize_int(-7); }, -7, nullptr},
        SlotCase{"generic_none", nullptr, nullptr, 0, nullptr},
        SlotCase{"generic_string", nullptr, [] { return serialize_string("x"); }, 0, nullptr},
        SlotCase{"generic_error", nullptr,
                 [] {
                     return hash_of({{"error", serialize_string("no")}});
                 },
                 0, "no"},
        SlotCase{"chapter_index_hash", &S::chapter_index_tid, [] { return serialize_hash(); }, 0,
                 nullptr},
        SlotCase{"chapter_index_int", &S::chapter_index_tid, [] { return serialize_int(3); }, -1,
                 nullptr},
        SlotCase{"chapter_index_none", &S::chapter_index_tid, nullptr, -1, nullptr},
        SlotCase{"category_count", &S::category_tid, [] { return serialize_int(12); }, 1, nullptr},
        SlotCase{"category_failed", &S::category_tid, [] { return serialize_int(-1); }, 0, nullptr},
        SlotCase{"select_db_zero", &S::select_db_tid, [] { return serialize_int(0); }, 1, nullptr},
        SlotCase{"uid_list", &S::uid_list_tid, [] { return serialize_int(-9); }, 1, nullptr},
        SlotCase{"preference_mapped", &S::preference_tid, [] { return serialize_int(2); }, 9,
                 nullptr},
        SlotCase{"preference_unknown", &S::preference_tid, [] { return serialize_int(0); }, 255,
                 nullptr},
        SlotCase{"track_index", &S::track_index_tid, [] { return serialize_int(6); }, 6, nullptr},
        SlotCase{"session_open", &S::session_tid,
                 [] {
                     return hash_of({{"result", serialize_int(1)}});
                 },
                 1, nullptr}),
    [](const auto &info) { return std::string(info.param.name); });

TEST(ReplySlotsState, GenericRuleStoresWhatItsSlotNames) {
    zal_ipod_handle *h = offline_handle();
    std::vector<Reply> replies;
    zal_ipod_set_reply_cb(h, keep_reply, &replies);
    h->slots.track_index_tid = 3;
    h->slots.category_tid = 4;
    queue_record(h, make_reply(3, ZAL_OP_RETURN, serialize_int(11)));
    queue_record(h, make_reply(4, ZAL_OP_ERROR, serialize_int(25)));
    queue_record(h, make_reply(9, ZAL_OP_RETURN, hash_of({{"error", serialize_string("bad")}})));
    zal_ipod_pending_event(h);
    EXPECT_EQ(replies.size(), 3u);
    EXPECT_EQ(h->playback.track_index, 11);
    EXPECT_EQ(h->records.record_count, 25);
    EXPECT_STREQ(zal_ipod_get_error_message(h), "bad");
    zal_ipod_close(h);
}

TEST(LoopThread, DeliversEventsUntilStopped) {
    FakeDaemon d;
    d.expect(ZAL_OP_HELLO).reply(serialize_array());
    zal_ipod_handle *h = zal_ipod_connect(nullptr);
    ASSERT_NE(h, nullptr);
    std::atomic<int> count{0};
    zal_ipod_set_event_cb(
        h,
        [](zal_ipod_handle *, zal_ipod_event *e, void *user) {
            char name[32] = {};
            pthread_getname_np(pthread_self(), name, sizeof name);
            if (std::string(name) == "IAP2EventThread" && e->kind == ZALIPOD_EVENT_MEDIA_CHANGED)
                static_cast<std::atomic<int> *>(user)->fetch_add(1);
            return 0;
        },
        &count);
    EXPECT_EQ(zal_ipod_set_loopthread(h, 1), 0);
    d.event("media_changed", nullptr).event("media_changed", nullptr);
    EXPECT_TRUE(d.finish());
    for (int i = 0; i < 200 && count.load() < 2; ++i) usleep(10000);
    EXPECT_EQ(count.load(), 2);
    EXPECT_EQ(zal_ipod_set_loopthread(h, 0), 0);
    zal_ipod_close(h);
}
