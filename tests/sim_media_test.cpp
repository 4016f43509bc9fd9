// The simulator's media library end to end: the client library walks the iAP1 database and
// follows the iAP2 library update stream of zald-sim, plays a play list, a collection, items
// and a prepared list, and sees the player change track. Scenario-defined libraries are
// checked over the raw protocol.
#include <gtest/gtest.h>

#include <cstring>
#include <functional>
#include <map>
#include <string>
#include <vector>

#include "sim_fixture.h"
#include "zal-ipod-2/connection.h"
#include "zal-ipod-2/handle.h"
#include "zal-ipod-2/zal-ipod-2.h"

namespace zaltest {
namespace {

constexpr uint8_t kOpIndexedTrackInfo = 78;

uint64_t uid_of(const gval *bytes) {
    uint32_t length = 0;
    const auto *b = static_cast<const uint8_t *>(serialize_get_bytes(bytes, &length));
    uint64_t v = 0;
    for (uint32_t i = 0; i < length && i < 8; ++i) v = (v << 8) | b[i];
    return v;
}

// What a client learns from the update stream.
struct LibraryView {
    std::string revision;
    bool reset = false;
    int last_progress = 0;
    std::map<uint64_t, std::string> titles;
    std::vector<uint64_t> deleted;
    std::map<std::string, std::pair<uint64_t, std::vector<uint64_t>>>
        playlists;  // name -> id, items
};

int collect_update(zal_ipod_handle *, zal_ipod_event *e, void *user) {
    if (e->kind != ZALIPOD_EVENT_MEDIALIBRARYUPDATE || e->data == nullptr) return 0;
    auto *view = static_cast<LibraryView *>(user);
    const gval *data = e->data;
    if (const char *rev = serialize_get_string(serialize_hash_get(data, "revision")))
        view->revision = rev;
    if (serialize_get_int(serialize_hash_get(data, "reset")) != 0) view->reset = true;
    view->last_progress = serialize_get_int(serialize_hash_get(data, "progress"));
    const gval *items = serialize_hash_get(data, "items");
    for (int i = 0; i < serialize_array_count(items); ++i) {
        const gval *item = serialize_array_get(items, static_cast<uint32_t>(i));
        view->titles[uid_of(serialize_hash_get(item, "uid"))] =
            serialize_get_string(serialize_hash_get(item, "title"));
    }
    const gval *gone = serialize_hash_get(data, "deleted");
    for (int i = 0; i < serialize_array_count(gone); ++i)
        view->deleted.push_back(uid_of(serialize_array_get(gone, static_cast<uint32_t>(i))));
    const gval *lists = serialize_hash_get(data, "playlists");
    for (int i = 0; i < serialize_array_count(lists); ++i) {
        const gval *p = serialize_array_get(lists, static_cast<uint32_t>(i));
        auto &entry = view->playlists[serialize_get_string(serialize_hash_get(p, "name"))];
        entry.first = uid_of(serialize_hash_get(p, "uid"));
        entry.second.clear();
        const gval *members = serialize_hash_get(p, "items");
        for (int k = 0; k < serialize_array_count(members); ++k)
            entry.second.push_back(uid_of(serialize_array_get(members, static_cast<uint32_t>(k))));
    }
    return 0;
}

class SimMediaTest : public SimTest {
  protected:
    void TearDown() override {
        if (h != nullptr) zal_ipod_close(h);
        SimTest::TearDown();
    }

    // The client library on the simulator, with a session on device index once it is ready.
    void open_library_session(int32_t index) {
        zal_set_daemon_socket_name(sim->socket_name().c_str());
        h = zal_ipod_connect(nullptr);
        ASSERT_NE(h, nullptr);
        zal_ipod_set_event_cb(h, collect_update, &view);
        ASSERT_EQ(zal_ipod_open_session_sync(h, index), 1);
        pump_until([this] { return h->ready.load() != 0; });
        ASSERT_NE(h->ready.load(), 0u) << "the device never became ready";
    }

    template <typename Done>
    void pump_until(Done done, int passes = 40) {
        for (int i = 0; i < passes && !done(); ++i) zal_ipod_events_iterate(h);
    }

    // Title of the track the simulator plays now, asked on the raw connection.
    std::string playing_title(int32_t device) {
        if (!raw_session) {
            open_session(*client, device);
            raw_session = true;
        }
        auto reply = client->call(kOpCurrentTrackInfo);
        return reply ? string_at(*reply, "title") : "";
    }

    zal_ipod_handle *h = nullptr;
    LibraryView view;
    bool raw_session = false;
};

TEST_F(SimMediaTest, Iap2PlaysAPlayListFromTheUpdateStreamAsACollection) {
    start();
    open_library_session(0);
    char mlid[MAXIMUM_MLID_LENGTH] = {};
    ASSERT_EQ(zal_ipod_get_media_library_unique_id_sync(h, mlid, sizeof mlid), 1);
    EXPECT_STREQ(mlid, "SIMLIB-SIMPHONE0001");
    EXPECT_EQ(zal_ipod_start_library_update_sync(h, ""), 0);
    pump_until([this] { return view.last_progress == 100; });
    ASSERT_EQ(view.last_progress, 100);
    EXPECT_TRUE(view.reset);  // no revision given: the whole library
    EXPECT_GE(view.titles.size(), 300u);
    ASSERT_EQ(view.playlists.count("Road Trip"), 1u);
    const auto &[list_id, items] = view.playlists["Road Trip"];
    ASSERT_GT(items.size(), 2u);
    const std::string before = playing_title(0);
    EXPECT_EQ(before, "Morning Drive");
    EXPECT_EQ(zal_play_collection_sync(h, list_id, 0, 2, mlid), static_cast<int>(items.size()));
    EXPECT_EQ(playing_title(0), view.titles[items[2]]);
    // A stream resumed at the revision it holds brings nothing new and no reset.
    LibraryView again;
    zal_ipod_set_event_cb(h, collect_update, &again);
    EXPECT_EQ(zal_ipod_resume_library_update_sync(h, mlid, view.revision.c_str()), 0);
    pump_until([&again] { return again.last_progress == 100; });
    EXPECT_FALSE(again.reset);
    EXPECT_TRUE(again.titles.empty());
    EXPECT_EQ(again.revision, view.revision);
}

TEST_F(SimMediaTest, Iap2PlayItemsStartsWhereAsked) {
    start();
    open_library_session(0);
    EXPECT_EQ(zal_ipod_start_library_update_sync(h, "0"), 0);
    pump_until([this] { return view.last_progress == 100; });
    ASSERT_GE(view.titles.size(), 3u);
    std::vector<uint64_t> uids;
    for (auto it = view.titles.rbegin(); uids.size() < 3; ++it) uids.push_back(it->first);
    EXPECT_EQ(zal_play_items_sync(h, uids.data(), 3, 1), 3);
    EXPECT_EQ(playing_title(0), view.titles[uids[1]]);
    const uint64_t unknown = 42;
    EXPECT_EQ(zal_play_items_sync(h, &unknown, 1, 0), -1);
    EXPECT_STREQ(zal_ipod_get_error_message(h), "unknown track identifier");
}

TEST_F(SimMediaTest, Iap1WalksToAPlayListAndPlaysOneOfItsTracks) {
    start();
    open_library_session(1);
    EXPECT_EQ(zal_ipod_set_hierarchy_sync(h, 1), 1);
    const int playlists = zal_ipod_set_category_sync(h, 1);
    ASSERT_GT(playlists, 0);
    EXPECT_EQ(zal_ipod_record_count(h), playlists);
    ASSERT_EQ(zal_ipod_get_records_sync(h, 0, playlists), 1);
    EXPECT_STREQ(zal_ipod_record(h, 0), "Road Trip");
    const int tracks = zal_ipod_select_db_sync(h, 0, 5);
    ASSERT_GT(tracks, 3);
    ASSERT_EQ(zal_ipod_set_category_sync(h, 5), tracks);  // same listing, now as records
    ASSERT_EQ(zal_ipod_get_db_track_info_sync(h, 0, tracks, 0), 1);
    const gval *info = zal_ipod_get_result_db_track_info(h);
    ASSERT_EQ(zal_ipod_get_result_db_track_info_count(info), tracks);
    const char *third = nullptr;
    ASSERT_EQ(zal_ipod_get_result_db_track_info_name(info, 2, &third), 1);
    const std::string expected = third;
    EXPECT_EQ(playing_title(1), "Clickwheel Waltz");
    EXPECT_EQ(zal_ipod_select_db_sync(h, 2, 5), tracks);  // a track record plays
    EXPECT_EQ(playing_title(1), expected);
    // The play queue is now the play list.
    ASSERT_EQ(zal_ipod_get_pb_track_info_sync(h, 0, tracks, 1), 1);
    const gval *queue = zal_ipod_get_result_pb_track_info(h);
    EXPECT_EQ(zal_ipod_get_result_db_track_info_count(queue), tracks);
    const uint8_t *uid = nullptr;
    EXPECT_EQ(zal_ipod_get_result_db_track_info_uid(queue, 2, &uid), 1);
    const uint8_t *listed = nullptr;
    ASSERT_EQ(zal_ipod_get_result_db_track_info_uid(info, 2, &listed), 1);
    EXPECT_EQ(memcmp(uid, listed, 8), 0);
}

TEST_F(SimMediaTest, Iap1PlaysAPreparedIdentifierList) {
    start();
    open_library_session(1);
    const int tracks = zal_ipod_set_category_sync(h, 5);
    ASSERT_GT(tracks, 14);
    EXPECT_EQ(zal_ipod_record_count(h), tracks);
    ASSERT_EQ(zal_ipod_get_db_track_info_sync(h, 10, 4, 1), 1);
    const gval *ids = zal_ipod_get_result_db_track_info(h);
    ASSERT_EQ(zal_ipod_get_result_db_track_info_count(ids), 4);
    uint8_t list[32];
    for (int i = 0; i < 4; ++i) {
        const uint8_t *uid = nullptr;
        ASSERT_EQ(zal_ipod_get_result_db_track_info_uid(ids, i, &uid), 1);
        memcpy(list + 8 * i, uid, 8);
    }
    EXPECT_EQ(zal_ipod_prepare_uid_list_sync(h, 0, 0, sizeof list, list), 1);
    EXPECT_EQ(zal_ipod_play_uid_list_sync(h, list + 24), 1);
    ASSERT_EQ(zal_ipod_get_db_track_info_sync(h, 13, 1, 0), 1);
    const char *name = nullptr;
    ASSERT_EQ(
        zal_ipod_get_result_db_track_info_name(zal_ipod_get_result_db_track_info(h), 0, &name), 1);
    EXPECT_EQ(playing_title(1), name);
    EXPECT_EQ(zal_ipod_get_db_itunes_info_sync(h, 2), 1);
    EXPECT_GE(zal_ipod_get_result_db_itunes_info_count(h), 300);
}

// A scenario library: fixed tracks and a play list, a change that deletes and inserts, and
// the update stream carrying it as the next revision.
TEST_F(SimMediaTest, ScenarioLibraryChangesReachTheUpdateStream) {
    ScenarioFile file(R"json({
      "devices": [{
        "serial": "LIB1", "protocol": 2,
        "tracks": [{"title": "Queued", "genre": "Pop"}],
        "library": {
          "mlid": "MY-LIB", "generate": 0, "genius": false,
          "tracks": [{"title": "One", "artist": "A", "genre": "Pop"},
                     {"title": "Two", "artist": "A", "genre": "Pop"},
                     {"title": "Three", "artist": "B", "genre": "Jazz"}],
          "playlists": [{"name": "Mine", "tracks": ["Three", "One"]}],
          "changes": [{"at_ms": 1500, "delete": ["One"], "insert": [{"title": "Four", "artist": "B"}]}]
        }
      }]
    })json");
    start({"-f", file.path()});
    open_library_session(0);
    EXPECT_EQ(zal_ipod_start_library_update_sync(h, ""), 0);
    pump_until([this] { return view.last_progress == 100; });
    ASSERT_EQ(view.titles.size(), 4u);
    ASSERT_EQ(view.playlists["Mine"].second.size(), 2u);
    EXPECT_EQ(view.titles[view.playlists["Mine"].second[0]], "Three");
    const std::string first_revision = view.revision;
    uint64_t one = 0;
    for (const auto &[uid, title] : view.titles)
        if (title == "One") one = uid;
    LibraryView next;
    zal_ipod_set_event_cb(h, collect_update, &next);
    pump_until([&next] { return next.last_progress == 100; }, 60);
    EXPECT_FALSE(next.reset);
    EXPECT_EQ(next.deleted, std::vector<uint64_t>{one});
    ASSERT_EQ(next.titles.size(), 1u);
    EXPECT_EQ(next.titles.begin()->second, "Four");
    EXPECT_EQ(next.playlists["Mine"].second.size(), 1u);
    EXPECT_NE(next.revision, first_revision);
    EXPECT_EQ(zal_ipod_is_genius_availablefortrack_sync(h, 0, 0), 0);  // "genius": false
}

struct RawCase {
    const char *name;
    int32_t device;
    uint8_t opcode;
    std::function<Value()> argument;
    uint8_t answer;
    const char *error;  // text of an ERROR answer, or nullptr
};

Value ints(std::initializer_list<int32_t> items) {
    Value a(serialize_array());
    for (int32_t i : items) serialize_array_add(a.get(), serialize_int(i));
    return a;
}

void PrintTo(const RawCase &c, std::ostream *os) {
    *os << c.name;
}

const RawCase kRaw[] = {
    {"browsing_needs_iap1", 0, 55, [] { return int_value(1); }, kOpError,
     "database browsing needs an iAP1 device"},
    {"play_items_need_iap2", 1, 18,
     [] {
         return ints({0, 0});
     },
     kOpError, "this command needs an iAP2 device"},
    {"unknown_category", 1, 55, [] { return int_value(12); }, kOpError, "no such category"},
    {"record_out_of_range", 1, 57,
     [] {
         return ints({9999, 5});
     },
     kOpError, "no record 9999 in TOP"},
    {"bad_hierarchy", 1, 56, [] { return int_value(3); }, kOpError,
     "the hierarchy is 1 (audio) or 2 (video)"},
    {"negative_records", 1, 58,
     [] {
         return ints({-1, 2});
     },
     kOpError, "GET_DB_RECORDS needs an offset and a count, both 0 or more"},
    {"indexed_beyond_queue", 1, kOpIndexedTrackInfo, [] { return int_value(3); }, kOpError,
     "no track 3 in the play queue"},
    {"indexed_first", 1, kOpIndexedTrackInfo, [] { return int_value(0); }, kOpReturn, nullptr},
    {"play_empty_items", 0, 18,
     [] {
         return ints({0, 0});
     },
     kOpError, "nothing to play"},
    {"collection_record_too_short", 0, 19, [] { return Value(serialize_struct("abc", 3)); },
     kOpError, "PLAYCOLLECTION needs a collection record of 144 bytes"},
    {"uid_list_not_prepared", 1, 83, [] { return Value(serialize_bytes("\1\2\3\4\5\6\7\10", 8)); },
     kOpError, "the identifier is not in the prepared list"},
    {"prepared_size_mismatch", 1, 82,
     [] {
         Value a = ints({0, 0, 16});
         serialize_array_add(a.get(), serialize_bytes("\1\2\3\4\5\6\7\10", 8));
         return a;
     },
     kOpError, "the identifier bytes are not size bytes of 8-byte identifiers"},
    {"playlist_info_unknown", 1, 102,
     [] {
         return ints({500, 0});
     },
     kOpReturn, nullptr},
};

class SimMediaRawTest : public SimTest, public ::testing::WithParamInterface<RawCase> {};

TEST_P(SimMediaRawTest, AnswersAsDocumented) {
    const RawCase &c = GetParam();
    start();
    open_session(*client, c.device);
    auto reply = client->call(c.opcode, c.argument().get());
    ASSERT_TRUE(reply.has_value());
    EXPECT_EQ(reply->opcode, c.answer);
    if (c.error != nullptr) {
        EXPECT_EQ(string_at(*reply, "error"), c.error);
    }
}

INSTANTIATE_TEST_SUITE_P(Requests, SimMediaRawTest, ::testing::ValuesIn(kRaw),
                         [](const auto &info) { return std::string(info.param.name); });

}  // namespace
}  // namespace zaltest
