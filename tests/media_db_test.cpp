// iAP1 database browsing: the commands on the wire, the records cache, the track info
// results and their accessors (table-driven over reply shapes, and a randomised property
// test that the accessors answer as the records say without reading past them), and the
// library information.
#include <android/log.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <climits>
#include <cstring>
#include <functional>
#include <random>
#include <string>
#include <vector>

#include "client_helpers.h"
#include "fake_daemon.h"
#include "log_capture.h"
#include "zal-ipod-2/command.h"
#include "zal-ipod-2/dispatch.h"
#include "zal-ipod-2/media_db_state.h"
#include "zal-ipod-2/packet.h"

using namespace zaltest;

namespace {

gval *ints(std::initializer_list<int32_t> items) {
    return zal_arg_ints(items);
}

gval *uid_bytes(uint8_t first, uint32_t length = 8) {
    std::vector<uint8_t> b(length);
    for (uint32_t i = 0; i < length; ++i) b[i] = static_cast<uint8_t>(first + i);
    return serialize_bytes(b.data(), length);
}

// One full track record, eight elements appended to array.
void add_track(gval *array, int32_t capability, const std::string &name, int32_t duration,
               uint8_t uid_first) {
    serialize_array_add(array, serialize_int(capability));
    serialize_array_add(array, serialize_string(name.c_str()));
    serialize_array_add(array, serialize_string((name + " artist").c_str()));
    serialize_array_add(array, serialize_string((name + " album").c_str()));
    serialize_array_add(array, serialize_string((name + " genre").c_str()));
    serialize_array_add(array, serialize_string((name + " composer").c_str()));
    serialize_array_add(array, serialize_int(duration));
    serialize_array_add(array, uid_bytes(uid_first));
}

// Runs a decoder over a reply built from value on an offline handle.
int32_t decode_with(zal_ipod_handle *h, zal_record_decoder decode, gval *value) {
    zal_ipod_reply *r = make_reply(1, ZAL_OP_RETURN, value);
    int32_t result = decode(h, r);
    reply_record_free(r);
    return result;
}

// ---- Commands on the wire ---------------------------------------------------------------

struct WireCase {
    const char *name;
    uint8_t opcode;
    std::function<gval *()> argument;  // the exact argument value expected
    std::function<gval *()> answer;
    std::function<int(zal_ipod_handle *)> sync;
    int expected;
    uint16_t zal_pending_slots::*slot;  // slot the async form fills, or nullptr
    std::function<int(zal_ipod_handle *)> send;
};

using S = zal_pending_slots;

const WireCase kWire[] = {
    {"set_hierarchy", ZAL_OP_SET_HIERARCHY, [] { return serialize_int(1); },
     [] { return serialize_int(0); },
     [](zal_ipod_handle *h) { return zal_ipod_set_hierarchy_sync(h, 1); }, 0, nullptr,
     [](zal_ipod_handle *h) { return zal_ipod_set_hierarchy(h, 1); }},
    {"set_category", ZAL_OP_SET_CATEGORY, [] { return serialize_int(3); },
     [] { return serialize_int(42); },
     [](zal_ipod_handle *h) { return zal_ipod_set_category_sync(h, 3); }, 42, &S::category_tid,
     [](zal_ipod_handle *h) { return zal_ipod_set_category(h, 3); }},
    {"select_db", ZAL_OP_SELECT_DB,
     [] {
         return ints({7, 2});
     },
     [] { return serialize_int(9); },
     [](zal_ipod_handle *h) { return zal_ipod_select_db_sync(h, 7, 2); }, 9, &S::select_db_tid,
     [](zal_ipod_handle *h) { return zal_ipod_select_db(h, 7, 2); }},
    {"get_records", ZAL_OP_GET_DB_RECORDS,
     [] {
         return ints({10, 2});
     },
     [] {
         gval *a = ints({0, 1, 10, 2});
         serialize_array_add(a, serialize_string("A"));
         serialize_array_add(a, serialize_string("B"));
         return a;
     },
     [](zal_ipod_handle *h) { return zal_ipod_get_records_sync(h, 10, 2); }, 1, &S::records_tid,
     [](zal_ipod_handle *h) { return zal_ipod_get_records(h, 10, 2); }},
    {"indexed_track_info", ZAL_OP_INDEXED_TRACK_INFO, [] { return serialize_int(4); },
     [] {
         return hash_of({{"indexed_track_info", serialize_int(1)}});
     },
     [](zal_ipod_handle *h) { return zal_ipod_indexed_track_info_sync(h, 4); }, 1,
     &S::indexed_track_info_tid,
     [](zal_ipod_handle *h) { return zal_ipod_indexed_track_info(h, 4); }},
    {"itunes_info", ZAL_OP_GET_DB_ITUNES_INFO, [] { return serialize_int(2); },
     [] {
         return hash_of({{"type", serialize_int(2)}, {"count", serialize_int(5)}});
     },
     [](zal_ipod_handle *h) { return zal_ipod_get_db_itunes_info_sync(h, 2); }, 1,
     &S::itunes_info_tid, [](zal_ipod_handle *h) { return zal_ipod_get_db_itunes_info(h, 2); }},
    {"db_track_info", ZAL_OP_GET_DB_TRACK_INFO,
     [] {
         return ints({0, 3, 1});
     },
     [] {
         gval *a = ints({3});
         serialize_array_add(a, uid_bytes(1));
         return a;
     },
     [](zal_ipod_handle *h) { return zal_ipod_get_db_track_info_sync(h, 0, 3, 1); }, 1,
     &S::db_track_info_tid,
     [](zal_ipod_handle *h) { return zal_ipod_get_db_track_info(h, 0, 3, 1); }},
    {"pb_track_info", ZAL_OP_GET_PB_TRACK_INFO,
     [] {
         return ints({5, 1, 0});
     },
     [] {
         return hash_of({{"error", serialize_string("no queue")}});
     },
     [](zal_ipod_handle *h) { return zal_ipod_get_pb_track_info_sync(h, 5, 1, 0); }, -1,
     &S::pb_track_info_tid,
     [](zal_ipod_handle *h) { return zal_ipod_get_pb_track_info(h, 5, 1, 0); }},
};

class MediaDbWire : public ::testing::TestWithParam<WireCase> {};

TEST_P(MediaDbWire, SendsItsArgumentFillsItsSlotAndDecodes) {
    const WireCase &c = GetParam();
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d);
    ASSERT_NE(h, nullptr);
    d.expect(c.opcode, c.argument()).expect(c.opcode, c.argument()).reply(c.answer());
    const int tid = c.send(h);
    EXPECT_GT(tid, 0);
    if (c.slot != nullptr) {
        EXPECT_EQ(h->slots.*c.slot, tid);
    }
    EXPECT_EQ(c.sync(h), c.expected);
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

INSTANTIATE_TEST_SUITE_P(Commands, MediaDbWire, ::testing::ValuesIn(kWire),
                         [](const auto &info) { return std::string(info.param.name); });

TEST(MediaDbState, CategoryAndRecordCountFollowTheReplies) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d);
    ASSERT_NE(h, nullptr);
    d.expect(ZAL_OP_SET_CATEGORY, serialize_int(2))
        .reply(serialize_int(12))
        .expect(ZAL_OP_SELECT_DB, ints({3, 2}))
        .error(hash_of({{"error", serialize_string("no such record")}}))
        .expect(ZAL_OP_SET_HIERARCHY, serialize_int(4))
        .reply(serialize_int(0));
    EXPECT_EQ(zal_ipod_set_category_sync(h, 2), 12);
    EXPECT_EQ(zal_ipod_get_category(h), 2);
    EXPECT_EQ(zal_ipod_record_count(h), 12);
    EXPECT_EQ(zal_ipod_select_db_sync(h, 3, 2), -1);
    EXPECT_EQ(zal_ipod_record_count(h), -1);  // a browser sees no items after a failure
    EXPECT_STREQ(zal_ipod_get_error_message(h), "no such record");
    EXPECT_EQ(zal_ipod_set_hierarchy_sync(h, 4), 0);
    EXPECT_EQ(h->records.hierarchy, 4);
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

TEST(MediaDbState, NotReadyHandleSendsNothingButSyncSetCategoryStillSetsIt) {
    FakeDaemon d;
    d.expect(ZAL_OP_HELLO).reply(serialize_array());
    zal_ipod_handle *h = zal_ipod_connect(nullptr);
    ASSERT_NE(h, nullptr);
    zal_ipod_set_read_timeout(h, 0, 100000);
    LogCapture log;
    EXPECT_EQ(zal_ipod_set_category(h, 5), 0);
    EXPECT_EQ(zal_ipod_get_category(h), 0);  // the async form changes it only on sending
    EXPECT_TRUE(log.contains(ANDROID_LOG_WARN, "not ready2 zal_ipod_set_category\n"));
    EXPECT_EQ(zal_ipod_set_category_sync(h, 6), -1);
    EXPECT_EQ(zal_ipod_get_category(h), 6);
    EXPECT_EQ(zal_ipod_record_count(h), -1);
    EXPECT_EQ(zal_ipod_set_hierarchy(h, 3), 0);
    EXPECT_EQ(h->records.hierarchy, 0);
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

TEST(MediaDbState, SessionOpenResetsCategoryAndCount) {
    zal_ipod_handle *h = offline_handle();
    h->records.current_category = 4;
    h->records.record_count = 30;
    h->records.hierarchy = 2;
    zal_playback_cache_reset(h);
    EXPECT_EQ(zal_ipod_get_category(h), 0);
    EXPECT_EQ(zal_ipod_record_count(h), 0);
    EXPECT_EQ(h->records.hierarchy, 2);
    zal_ipod_close(h);
}

// ---- Records cache ------------------------------------------------------------------------

gval *records_reply(int32_t validity, int32_t offset, int32_t count,
                    std::initializer_list<gval *> names) {
    gval *a = ints({0, validity, offset, count});
    for (gval *n : names) serialize_array_add(a, n);
    return a;
}

struct RecordRead {
    int index;
    const char *name;  // "" for nothing held
};

struct RecordsCase {
    const char *name;
    std::function<gval *()> reply;  // nullptr value: no payload
    int32_t result;
    std::vector<RecordRead> reads;
};

const RecordsCase kRecords[] = {
    {"valid_range",
     [] {
         return records_reply(1, 10, 2, {serialize_string("Alpha"), serialize_string("Beta")});
     },
     1,
     {{9, ""}, {10, "Alpha"}, {11, "Beta"}, {12, ""}}},
    {"invalid_cache",
     [] { return records_reply(0, 0, 1, {serialize_string("Alpha")}); },
     0,
     {{0, ""}}},
    // The count claims more names than the array holds: no read past the array.
    {"count_beyond_array",
     [] { return records_reply(1, 0, 1000, {serialize_string("Only")}); },
     1,
     {{0, "Only"}, {1, ""}, {999, ""}}},
    // A name that is not a string is not handed out.
    {"name_not_a_string",
     [] {
         return records_reply(1, 0, 2, {serialize_int(5), serialize_string("B")});
     },
     1,
     {{0, ""}, {1, "B"}}},
    {"offset_near_int_max",
     [] { return records_reply(1, INT_MAX - 1, INT_MAX, {serialize_string("Edge")}); },
     1,
     {{INT_MAX - 1, "Edge"}, {INT_MAX, ""}, {INT_MIN, ""}}},
    {"too_short_for_a_flag", [] { return ints({0}); }, 0, {{0, ""}}},
};

class RecordsDecoding : public ::testing::TestWithParam<RecordsCase> {};

TEST_P(RecordsDecoding, CacheAnswersOnlyWhatItHolds) {
    const RecordsCase &c = GetParam();
    zal_ipod_handle *h = offline_handle();
    EXPECT_EQ(decode_with(h, zal_records_decode, c.reply()), c.result);
    for (const RecordRead &r : c.reads)
        EXPECT_STREQ(zal_ipod_record(h, r.index), r.name) << r.index;
    zal_ipod_close(h);
}

INSTANTIATE_TEST_SUITE_P(Shapes, RecordsDecoding, ::testing::ValuesIn(kRecords),
                         [](const auto &info) { return std::string(info.param.name); });

TEST(RecordsDecodingRules, NonArrayKeepsTheCacheAndNoReplyFails) {
    zal_ipod_handle *h = offline_handle();
    EXPECT_STREQ(zal_ipod_record(h, 0), "");  // no cache yet
    ASSERT_EQ(
        decode_with(h, zal_records_decode, records_reply(1, 0, 1, {serialize_string("Kept")})), 1);
    EXPECT_EQ(decode_with(h, zal_records_decode, hash_of({{"error", serialize_string("x")}})), 1);
    EXPECT_EQ(decode_with(h, zal_records_decode, serialize_string("odd")), 1);
    EXPECT_EQ(decode_with(h, zal_records_decode, nullptr), -1);
    EXPECT_EQ(zal_records_decode(h, nullptr), -1);
    EXPECT_STREQ(zal_ipod_record(h, 0), "Kept");
    zal_ipod_close(h);
}

// ---- Track info results -------------------------------------------------------------------

struct TrackInfoCase {
    const char *name;
    std::function<gval *()> reply;  // the whole reply, element 0 included
    int32_t result;
    int count;                        // tracks in the kept result
    std::vector<int> names_present;   // tracks whose name accessor answers
    std::vector<int> uid_ok;          // tracks whose identifier accessor returns 1
    std::vector<int> uid_set_not_ok;  // tracks with a byte string of another length
};

gval *full_reply(int tracks, int extra_elements) {
    gval *a = ints({tracks});
    for (int i = 0; i < tracks; ++i)
        add_track(a, i, "T" + std::to_string(i), 1000 * i, uint8_t(i * 8));
    for (int i = 0; i < extra_elements; ++i) serialize_array_add(a, serialize_int(i));
    return a;
}

const TrackInfoCase kTrackInfo[] = {
    // 17 elements after element 0 goes: 2 whole tracks, the 17th is ignored.
    {"full_17_elements", [] { return full_reply(2, 1); }, 1, 2, {0, 1}, {0, 1}, {}},
    {"identifiers_with_a_short_one",
     [] {
         gval *a = ints({3});
         serialize_array_add(a, uid_bytes(1));
         serialize_array_add(a, uid_bytes(9, 7));
         serialize_array_add(a, uid_bytes(17));
         return a;
     },
     1,
     3,
     {},
     {0, 2},
     {1}},
    {"empty_after_the_head", [] { return ints({0}); }, 1, 0, {}, {}, {}},
    {"empty_reply_array", [] { return serialize_array(); }, 1, 0, {}, {}, {}},
    {"full_with_mistyped_fields",
     [] {
         gval *a = ints({1});
         serialize_array_add(a, serialize_int(1));
         serialize_array_add(a, serialize_int(99));  // name is not a string
         for (int i = 0; i < 4; ++i) serialize_array_add(a, serialize_string("x"));
         serialize_array_add(a, serialize_int(10));
         serialize_array_add(a, serialize_string("not bytes"));
         return a;
     },
     1,
     1,
     {},
     {},
     {}},
    {"full_with_long_identifier",
     [] {
         gval *a = ints({1});
         serialize_array_add(a, serialize_int(1));
         for (int i = 0; i < 5; ++i) serialize_array_add(a, serialize_string("x"));
         serialize_array_add(a, serialize_int(10));
         serialize_array_add(a, uid_bytes(1, 9));
         return a;
     },
     1,
     1,
     {0},
     {},
     {0}},
};

class TrackInfoDecoding : public ::testing::TestWithParam<TrackInfoCase> {};

TEST_P(TrackInfoDecoding, ResultCountsAndAccessorsFollowTheLayout) {
    const TrackInfoCase &c = GetParam();
    zal_ipod_handle *h = offline_handle();
    ASSERT_EQ(decode_with(h, zal_db_track_info_decode, c.reply()), c.result);
    const gval *r = zal_ipod_get_result_db_track_info(h);
    ASSERT_NE(r, nullptr);
    EXPECT_EQ(zal_ipod_get_result_db_track_info_count(r), c.count);
    for (int i = -1; i <= c.count + 1; ++i) {
        SCOPED_TRACE(i);
        const char *name = "untouched";
        const bool has_name =
            std::find(c.names_present.begin(), c.names_present.end(), i) != c.names_present.end();
        EXPECT_EQ(zal_ipod_get_result_db_track_info_name(r, i, &name), has_name ? 1 : 0);
        if (!has_name) {
            EXPECT_STREQ(name, "untouched");
        }
        const uint8_t *uid = nullptr;
        const bool ok = std::find(c.uid_ok.begin(), c.uid_ok.end(), i) != c.uid_ok.end();
        const bool set = std::find(c.uid_set_not_ok.begin(), c.uid_set_not_ok.end(), i) !=
                         c.uid_set_not_ok.end();
        EXPECT_EQ(zal_ipod_get_result_db_track_info_uid(r, i, &uid), ok ? 1 : 0);
        EXPECT_EQ(uid != nullptr, ok || set);
    }
    EXPECT_EQ(zal_ipod_get_result_pb_track_info(h), nullptr);  // the other kind is apart
    zal_ipod_close(h);
}

INSTANTIATE_TEST_SUITE_P(Shapes, TrackInfoDecoding, ::testing::ValuesIn(kTrackInfo),
                         [](const auto &info) { return std::string(info.param.name); });

TEST(TrackInfoDecodingRules, FailuresKeepThePreviousResult) {
    zal_ipod_handle *h = offline_handle();
    ASSERT_EQ(decode_with(h, zal_pb_track_info_decode, full_reply(1, 0)), 1);
    const gval *before = zal_ipod_get_result_pb_track_info(h);
    EXPECT_EQ(
        decode_with(h, zal_pb_track_info_decode, hash_of({{"error", serialize_string("busy")}})),
        -1);
    EXPECT_STREQ(zal_ipod_get_error_message(h), "busy");
    EXPECT_EQ(decode_with(h, zal_pb_track_info_decode, serialize_int(3)), -1);
    EXPECT_EQ(decode_with(h, zal_pb_track_info_decode, nullptr), -1);
    EXPECT_EQ(zal_ipod_get_result_pb_track_info(h), before);
    const char *name = nullptr;
    EXPECT_EQ(zal_ipod_get_result_db_track_info_name(before, 0, &name), 1);
    EXPECT_STREQ(name, "T0");
    zal_ipod_close(h);
}

TEST(TrackInfoAccessors, RefuseNullResultsOutputsAndIndexesThatWouldWrap) {
    EXPECT_EQ(zal_ipod_get_result_db_track_info_count(nullptr), 0);
    GvalPtr not_array(serialize_int(4));
    EXPECT_EQ(zal_ipod_get_result_db_track_info_count(not_array.get()), 0);
    int value = 7;
    const char *text = nullptr;
    const uint8_t *uid = nullptr;
    EXPECT_EQ(zal_ipod_get_result_db_track_info_capability(nullptr, 0, &value), 0);
    EXPECT_EQ(zal_ipod_get_result_db_track_info_uid(not_array.get(), 0, &uid), 0);
    gval *full = full_reply(2, 0);
    serialize_array_del(full, 0);
    GvalPtr result(full);
    EXPECT_EQ(zal_ipod_get_result_db_track_info_capability(result.get(), 0, nullptr), 0);
    // 8 * i would wrap in 32 bits for these; none may reach an element.
    for (int i : {INT_MAX, INT_MAX / 8 + 1, 0x20000000, INT_MIN}) {
        EXPECT_EQ(zal_ipod_get_result_db_track_info_duration(result.get(), i, &value), 0);
        EXPECT_EQ(zal_ipod_get_result_db_track_info_composer(result.get(), i, &text), 0);
        EXPECT_EQ(zal_ipod_get_result_db_track_info_uid(result.get(), i, &uid), 0);
    }
    EXPECT_EQ(value, 7);
    EXPECT_EQ(text, nullptr);
    EXPECT_EQ(uid, nullptr);
}

// Random track-record sets: whole and cut records, fields of the wrong kind, identifiers
// of every length, texts from empty to long. Every accessor must answer as the model says,
// and under ASan none may read beyond what the decoded reply holds.
TEST(TrackInfoProperty, AccessorsAnswerAsTheRecordsSay) {
    std::mt19937 rng(20261123);
    auto pick = [&](int n) { return static_cast<int>(rng() % static_cast<uint32_t>(n)); };
    for (int round = 0; round < 300; ++round) {
        SCOPED_TRACE(round);
        const bool identifiers = pick(4) == 0;
        const int tracks = pick(40);
        const int tail = identifiers ? 0 : pick(8);  // elements of a cut last record
        struct Element {
            int kind;  // SERIALIZE_INT, _STRING or _BYTES
            int32_t number;
            std::string bytes;
        };
        std::vector<Element> model;
        GvalPtr reply(ints({tracks}));
        const int elements = identifiers ? tracks : tracks * 8 + tail;
        for (int e = 0; e < elements; ++e) {
            const int field = e % 8;
            int kind = identifiers || field == 7  ? SERIALIZE_BYTES
                       : field == 0 || field == 6 ? SERIALIZE_INT
                                                  : SERIALIZE_STRING;
            if (pick(10) == 0) kind = (kind == SERIALIZE_INT) ? SERIALIZE_STRING : SERIALIZE_INT;
            if (identifiers && e == 0) kind = SERIALIZE_BYTES;  // keeps the layout
            Element el{kind, static_cast<int32_t>(rng()), {}};
            gval *v = nullptr;
            if (kind == SERIALIZE_INT) {
                v = serialize_int(el.number);
            } else if (kind == SERIALIZE_STRING) {
                el.bytes.assign(static_cast<size_t>(pick(3) == 0 ? pick(600) : pick(12)),
                                'a' + char(pick(26)));
                v = serialize_string(el.bytes.c_str());
            } else {
                const int length = pick(3) == 0 ? pick(17) : 8;
                for (int i = 0; i < length; ++i) el.bytes.push_back(static_cast<char>(rng()));
                v = serialize_bytes(el.bytes.data(), static_cast<uint32_t>(length));
            }
            // Full-layout sets must not start with bytes, or they read as identifiers.
            if (!identifiers && e == 0 && kind == SERIALIZE_BYTES) {
                serialize_free(v);
                el.kind = SERIALIZE_INT;
                v = serialize_int(el.number);
            }
            serialize_array_add(reply.get(), v);
            model.push_back(el);
        }
        zal_ipod_handle *h = offline_handle();
        ASSERT_EQ(decode_with(h, zal_db_track_info_decode, serialize_dup(reply.get())), 1);
        const gval *r = zal_ipod_get_result_db_track_info(h);
        const bool id_layout = model.empty() || model[0].kind == SERIALIZE_BYTES;
        const int count = id_layout ? elements : elements / 8;
        ASSERT_EQ(zal_ipod_get_result_db_track_info_count(r), count);
        using TextAccessor = int (*)(const gval *, int, const char **);
        const TextAccessor texts[] = {
            zal_ipod_get_result_db_track_info_name, zal_ipod_get_result_db_track_info_artist,
            zal_ipod_get_result_db_track_info_album, zal_ipod_get_result_db_track_info_genre,
            zal_ipod_get_result_db_track_info_composer};
        for (int i = -1; i <= count; ++i) {
            const bool whole = i >= 0 && i < count && !id_layout;
            auto el = [&](int f) -> const Element * {
                return whole ? &model[static_cast<size_t>(i * 8 + f)] : nullptr;
            };
            int number = -12345;
            EXPECT_EQ(zal_ipod_get_result_db_track_info_capability(r, i, &number),
                      el(0) && el(0)->kind == SERIALIZE_INT ? 1 : 0);
            if (el(0) && el(0)->kind == SERIALIZE_INT) {
                EXPECT_EQ(number, el(0)->number);
            }
            number = -12345;
            EXPECT_EQ(zal_ipod_get_result_db_track_info_duration(r, i, &number),
                      el(6) && el(6)->kind == SERIALIZE_INT ? 1 : 0);
            if (el(6) && el(6)->kind == SERIALIZE_INT) {
                EXPECT_EQ(number, el(6)->number);
            }
            for (int f = 1; f <= 5; ++f) {
                const char *text = nullptr;
                const bool is_text = el(f) && el(f)->kind == SERIALIZE_STRING;
                EXPECT_EQ(texts[f - 1](r, i, &text), is_text ? 1 : 0);
                if (is_text) {
                    EXPECT_EQ(std::string(text), el(f)->bytes);
                } else {
                    EXPECT_EQ(text, nullptr);
                }
            }
            const Element *u =
                id_layout ? (i >= 0 && i < count ? &model[static_cast<size_t>(i)] : nullptr)
                          : el(7);
            const uint8_t *uid = nullptr;
            const bool is_bytes = u && u->kind == SERIALIZE_BYTES;
            EXPECT_EQ(zal_ipod_get_result_db_track_info_uid(r, i, &uid),
                      is_bytes && u->bytes.size() == 8 ? 1 : 0);
            EXPECT_EQ(uid != nullptr, is_bytes);
            if (is_bytes) {
                EXPECT_EQ(memcmp(uid, u->bytes.data(), u->bytes.size()), 0);
            }
        }
        zal_ipod_close(h);
    }
}

// ---- Library information ------------------------------------------------------------------

struct ItunesCase {
    const char *name;
    std::function<gval *()> reply;
    int32_t result;
    bool uid_changed;
    bool sync_changed;
    int32_t count;  // the information count afterwards (starts at 77)
};

const uint8_t kOldUid[8] = {0xee, 0xee, 0xee, 0xee, 0xee, 0xee, 0xee, 0xee};

const ItunesCase kItunes[] = {
    {"uid",
     [] {
         return hash_of({{"type", serialize_int(0)}, {"uid", uid_bytes(1)}});
     },
     1, true, false, 77},
    {"uid_longer_copies_eight",
     [] {
         return hash_of({{"type", serialize_int(0)}, {"uid", uid_bytes(1, 12)}});
     },
     1, true, false, 77},
    {"last_sync",
     [] {
         return hash_of({{"type", serialize_int(1)}, {"last_sync", uid_bytes(1, 7)}});
     },
     1, false, true, 77},
    {"count",
     [] {
         return hash_of({{"type", serialize_int(2)}, {"count", serialize_int(1234)}});
     },
     1, false, false, 1234},
    {"short_uid",
     [] {
         return hash_of({{"type", serialize_int(0)}, {"uid", uid_bytes(1, 5)}});
     },
     -1, false, false, 77},
    {"uid_as_text",
     [] {
         return hash_of({{"type", serialize_int(0)}, {"uid", serialize_string("12345678")}});
     },
     -1, false, false, 77},
    {"short_last_sync",
     [] {
         return hash_of({{"type", serialize_int(1)}, {"last_sync", uid_bytes(1, 6)}});
     },
     -1, false, false, 77},
    {"count_missing",
     [] {
         return hash_of({{"type", serialize_int(3)}});
     },
     -1, false, false, 77},
    {"error",
     [] {
         return hash_of({{"error", serialize_string("no db")},
                         {"type", serialize_int(2)},
                         {"count", serialize_int(1)}});
     },
     -1, false, false, 77},
    {"not_a_hash", [] { return serialize_int(0); }, -1, false, false, 77},
};

class ItunesInfoDecoding : public ::testing::TestWithParam<ItunesCase> {};

TEST_P(ItunesInfoDecoding, StoresOnlyTheFieldItsTypeNames) {
    const ItunesCase &c = GetParam();
    zal_ipod_handle *h = offline_handle();
    memcpy(h->records.device_uid, kOldUid, 8);
    memset(h->records.last_sync_time, 0xdd, 7);
    h->records.itunes_info_count = 77;
    testing::internal::CaptureStdout();
    EXPECT_EQ(decode_with(h, zal_itunes_info_decode, c.reply()), c.result);
    testing::internal::GetCapturedStdout();
    const uint8_t *uid = zal_ipod_get_result_db_device_uid(h);
    EXPECT_EQ(memcmp(uid, kOldUid, 8) != 0, c.uid_changed);
    if (c.uid_changed) {
        EXPECT_EQ(uid[0], 1);
        EXPECT_EQ(uid[7], 8);
    }
    const uint8_t *sync = zal_ipod_get_result_db_last_sync_time(h);
    EXPECT_EQ(sync[0] != 0xdd, c.sync_changed);
    if (c.sync_changed) {
        EXPECT_EQ(sync[6], 7);
    }
    EXPECT_EQ(zal_ipod_get_result_db_itunes_info_count(h), c.count);
    zal_ipod_close(h);
}

INSTANTIATE_TEST_SUITE_P(Shapes, ItunesInfoDecoding, ::testing::ValuesIn(kItunes),
                         [](const auto &info) { return std::string(info.param.name); });

// ---- Replies outside a wait ---------------------------------------------------------------

struct Reply {
    uint16_t tid;
    int32_t result;
};

int keep_reply(zal_ipod_handle *, uint16_t tid, int32_t result, const char *, void *user) {
    static_cast<std::vector<Reply> *>(user)->push_back({tid, result});
    return 0;
}

TEST(MediaDbReplySlots, DispatcherDecodesIntoTheHandle) {
    zal_ipod_handle *h = offline_handle();
    std::vector<Reply> replies;
    zal_ipod_set_reply_cb(h, keep_reply, &replies);
    h->slots.records_tid = 11;
    h->slots.db_track_info_tid = 12;
    h->slots.pb_track_info_tid = 13;
    h->slots.itunes_info_tid = 14;
    h->slots.select_db_tid = 15;
    queue_record(h, make_reply(11, ZAL_OP_RETURN, records_reply(1, 0, 1, {serialize_string("R")})));
    queue_record(h, make_reply(12, ZAL_OP_RETURN, full_reply(1, 0)));
    queue_record(h, make_reply(13, ZAL_OP_RETURN, full_reply(3, 0)));
    queue_record(h, make_reply(14, ZAL_OP_RETURN,
                               hash_of({{"type", serialize_int(9)}, {"count", serialize_int(8)}})));
    queue_record(h, make_reply(15, ZAL_OP_RETURN, serialize_int(-1)));
    testing::internal::CaptureStdout();
    zal_ipod_pending_event(h);
    testing::internal::GetCapturedStdout();
    ASSERT_EQ(replies.size(), 5u);
    EXPECT_EQ(replies[0].result, 1);
    EXPECT_STREQ(zal_ipod_record(h, 0), "R");
    EXPECT_EQ(zal_ipod_get_result_db_track_info_count(zal_ipod_get_result_db_track_info(h)), 1);
    EXPECT_EQ(zal_ipod_get_result_db_track_info_count(zal_ipod_get_result_pb_track_info(h)), 3);
    EXPECT_EQ(zal_ipod_get_result_db_itunes_info_count(h), 8);
    EXPECT_EQ(replies[4].result, 0);
    EXPECT_EQ(zal_ipod_record_count(h), -1);
    zal_ipod_close(h);
}

}  // namespace
