// Library updates and play lists: exact request bytes (the update items and collection
// records, identifier byte order), the refused preconditions, and the reply decoders.
#include <android/log.h>
#include <gtest/gtest.h>

#include <cstring>
#include <functional>
#include <string>
#include <vector>

#include "client_helpers.h"
#include "fake_daemon.h"
#include "log_capture.h"
#include "zal-ipod-2/command.h"

using namespace zaltest;

namespace {

constexpr uint64_t kUid = 0x0102030405060708ull;
const uint8_t kUidBigEndian[8] = {1, 2, 3, 4, 5, 6, 7, 8};

gval *uid_value() {
    return serialize_bytes(kUidBigEndian, 8);
}

std::vector<uint8_t> update_items_bytes(const std::string &mlid, const std::vector<uint8_t> &list,
                                        const char *aux) {
    std::vector<uint8_t> r(392, 0);
    memcpy(r.data(), mlid.c_str(), mlid.size() + 1);
    if (!list.empty()) memcpy(r.data() + 129, list.data(), list.size());
    if (aux != nullptr) memcpy(r.data() + 258, aux, strlen(aux) + 1);
    const uint32_t n = static_cast<uint32_t>(list.size());
    for (int i = 0; i < 4; ++i)
        r[388 + static_cast<size_t>(i)] = static_cast<uint8_t>(n >> (8 * i));
    return r;
}

gval *struct_of(const std::vector<uint8_t> &b) {
    return serialize_struct(b.data(), static_cast<uint32_t>(b.size()));
}

// ---- Requests on the wire -----------------------------------------------------------------

struct WireCase {
    const char *name;
    uint8_t opcode;
    std::function<gval *()> argument;  // nullptr result: no payload
    std::function<int(zal_ipod_handle *)> send;
};

const WireCase kWire[] = {
    {"media_library_uid", ZAL_OP_MEDIA_LIB_UID, [] { return nullptr; },
     [](zal_ipod_handle *h) { return zal_ipod_get_media_library_unique_id(h); }},
    {"update_items", ZAL_OP_SET_UPDATE_ITEMS,
     [] {
         return struct_of(update_items_bytes("lib-1", {9, 8, 7}, "aux"));
     },
     [](zal_ipod_handle *h) {
         const uint8_t list[] = {9, 8, 7};
         return zal_ipod_set_update_items(h, "aux", "lib-1", list, 3);
     }},
    {"update_items_no_aux_empty_list", ZAL_OP_SET_UPDATE_ITEMS,
     [] { return struct_of(update_items_bytes("lib-1", {}, nullptr)); },
     [](zal_ipod_handle *h) { return zal_ipod_set_update_items(h, nullptr, "lib-1", nullptr, 0); }},
    {"update_items_longest_fields", ZAL_OP_SET_UPDATE_ITEMS,
     [] {
         return struct_of(update_items_bytes(std::string(127, 'm'), std::vector<uint8_t>(127, 0x5a),
                                             std::string(128, 'x').c_str()));
     },
     [](zal_ipod_handle *h) {
         const std::vector<uint8_t> list(127, 0x5a);
         return zal_ipod_set_update_items(h, std::string(128, 'x').c_str(),
                                          std::string(127, 'm').c_str(), list.data(), 127);
     }},
    {"start_update", ZAL_OP_START_LIB_UPDATE, [] { return serialize_string("rev-3"); },
     [](zal_ipod_handle *h) { return zal_ipod_start_library_update(h, "rev-3"); }},
    {"stop_update", ZAL_OP_STOP_LIB_UPDATE, [] { return serialize_string("lib-1"); },
     [](zal_ipod_handle *h) { return zal_ipod_stop_library_update(h, "lib-1"); }},
    {"resume_update", ZAL_OP_RESUME_LIB_UPDATE,
     [] {
         return zal_arg_array({serialize_string("lib-1"), serialize_string("7")});
     },
     [](zal_ipod_handle *h) { return zal_ipod_resume_library_update(h, "lib-1", "7"); }},
    {"play_items_none", ZAL_OP_PLAYITEMS,
     [] {
         return zal_arg_ints({0, 3});
     },
     [](zal_ipod_handle *h) { return zal_play_items(h, nullptr, 0, 3); }},
    {"play_items_big_endian", ZAL_OP_PLAYITEMS,
     [] {
         const uint8_t max[8] = {0xff, 0xff, 0xff, 0xff, 0xff, 0xff, 0xff, 0xff};
         return zal_arg_array(
             {serialize_int(2), serialize_int(1), uid_value(), serialize_bytes(max, 8)});
     },
     [](zal_ipod_handle *h) {
         const uint64_t uids[] = {kUid, UINT64_MAX};
         return zal_play_items(h, uids, 2, 1);
     }},
    {"play_collection", ZAL_OP_PLAYCOLLECTION,
     [] {
         std::vector<uint8_t> r(144, 0);
         r[0] = 5;  // start index, little-endian
         r[4] = 2;  // album
         memcpy(r.data() + 5, "lib-1", 6);
         for (int i = 0; i < 8; ++i) r[136 + static_cast<size_t>(i)] = static_cast<uint8_t>(8 - i);
         return struct_of(r);
     },
     [](zal_ipod_handle *h) { return zal_play_collection(h, kUid, 2, 5, "lib-1"); }},
    {"play_collection_type_minus_one", ZAL_OP_PLAYCOLLECTION,
     [] {
         std::vector<uint8_t> r(144, 0);
         r[0] = 0xff, r[1] = 0xff, r[2] = 0xff, r[3] = 0xff;  // start index -1
         r[4] = 255;
         memset(r.data() + 5, 'm', 127);
         return struct_of(r);
     },
     [](zal_ipod_handle *h) {
         return zal_play_collection(h, 0, -1, -1, std::string(127, 'm').c_str());
     }},
    {"prepare_uid_list", ZAL_OP_PREPARE_UID_LIST,
     [] {
         return zal_arg_array({serialize_int(0), serialize_int(0), serialize_int(8), uid_value()});
     },
     [](zal_ipod_handle *h) { return zal_ipod_prepare_uid_list(h, 0, 0, 8, kUidBigEndian); }},
    {"play_uid_list", ZAL_OP_PLAY_UID_LIST, [] { return uid_value(); },
     [](zal_ipod_handle *h) { return zal_ipod_play_uid_list(h, kUidBigEndian); }},
    {"create_genius", ZAL_OP_CREATE_GENIUS_PLAYLIST,
     [] {
         return zal_arg_ints({1, 2});
     },
     [](zal_ipod_handle *h) { return zal_ipod_create_genius_playlist(h, 1, 2); }},
    {"refresh_genius", ZAL_OP_REFRESH_GENIUS_PLAYLIST, [] { return serialize_int(4); },
     [](zal_ipod_handle *h) { return zal_ipod_refresh_genius_playlist(h, 4); }},
    {"genius_available", ZAL_OP_IS_GENIUS_AVAILABLEFORTRACK,
     [] {
         return zal_arg_ints({3, 0});
     },
     [](zal_ipod_handle *h) { return zal_ipod_is_genius_availablefortrack(h, 3, 0); }},
    {"playlist_info", ZAL_OP_GET_PLAYLIST_INFO,
     [] {
         return zal_arg_ints({1, 6});
     },
     [](zal_ipod_handle *h) { return zal_ipod_get_playlist_info(h, 1, 6); }},
};

class LibraryWire : public ::testing::TestWithParam<WireCase> {};

TEST_P(LibraryWire, SendsTheExactArgument) {
    const WireCase &c = GetParam();
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d);
    ASSERT_NE(h, nullptr);
    d.expect(c.opcode, c.argument());
    EXPECT_GT(c.send(h), 0);
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

INSTANTIATE_TEST_SUITE_P(Requests, LibraryWire, ::testing::ValuesIn(kWire),
                         [](const auto &info) { return std::string(info.param.name); });

TEST(LibraryWireSlots, PreparedListsShareTheUidListSlot) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d);
    ASSERT_NE(h, nullptr);
    d.expect(ZAL_OP_PREPARE_UID_LIST,
             zal_arg_array({serialize_int(0), serialize_int(0), serialize_int(8), uid_value()}))
        .expect(ZAL_OP_PLAY_UID_LIST, uid_value())
        .expect(ZAL_OP_PLAYITEMS, zal_arg_array({serialize_int(1), serialize_int(0), uid_value()}));
    const int prepare = zal_ipod_prepare_uid_list(h, 0, 0, 8, kUidBigEndian);
    EXPECT_EQ(h->slots.uid_list_tid, prepare);
    const int play = zal_ipod_play_uid_list(h, kUidBigEndian);
    EXPECT_EQ(h->slots.uid_list_tid, play);
    zal_play_items(h, &kUid, 1, 0);
    EXPECT_EQ(h->slots.uid_list_tid, play);  // play items has no slot
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

// ---- Refused requests ---------------------------------------------------------------------

struct RefusedCase {
    const char *name;
    std::function<int(zal_ipod_handle *)> send;
    const char *log;  // error text expected in the log
};

const std::string kMlid128(128, 'm');
const std::string kAux129(129, 'x');
const uint8_t kList[200] = {};

const RefusedCase kRefused[] = {
    {"update_items_mlid_128",
     [](zal_ipod_handle *h) {
         return zal_ipod_set_update_items(h, nullptr, kMlid128.c_str(), kList, 1);
     },
     "zal_ipod_set_update_items: precondition \"strlen(mlid) < MAXIMUM_MLID_LENGTH\" violated; "
     "nothing sent\n"},
    {"update_items_list_128",
     [](zal_ipod_handle *h) { return zal_ipod_set_update_items(h, nullptr, "lib", kList, 128); },
     "zal_ipod_set_update_items: precondition \"listLength < MAXIMUM_MLID_LENGTH\" violated; "
     "nothing sent\n"},
    {"update_items_negative_list",
     [](zal_ipod_handle *h) { return zal_ipod_set_update_items(h, nullptr, "lib", kList, -1); },
     "zal_ipod_set_update_items: precondition \"listLength < MAXIMUM_MLID_LENGTH\" violated; "
     "nothing sent\n"},
    {"update_items_missing_list",
     [](zal_ipod_handle *h) { return zal_ipod_set_update_items(h, nullptr, "lib", nullptr, 4); },
     "zal_ipod_set_update_items: no item list; nothing sent\n"},
    {"update_items_aux_129",
     [](zal_ipod_handle *h) {
         return zal_ipod_set_update_items(h, kAux129.c_str(), "lib", kList, 1);
     },
     "zal_ipod_set_update_items: auxiliary string longer than 128 characters; nothing sent\n"},
    {"update_items_no_mlid",
     [](zal_ipod_handle *h) { return zal_ipod_set_update_items(h, nullptr, nullptr, kList, 1); },
     "zal_ipod_set_update_items: precondition \"strlen(mlid) < MAXIMUM_MLID_LENGTH\" violated; "
     "nothing sent\n"},
    {"collection_mlid_128",
     [](zal_ipod_handle *h) { return zal_play_collection(h, 1, 0, 0, kMlid128.c_str()); },
     "zal_play_collection: precondition \"strlen(mlid) < MAXIMUM_MLID_LENGTH\" violated; nothing "
     "sent\n"},
    {"play_items_negative_count",
     [](zal_ipod_handle *h) { return zal_play_items(h, &kUid, -1, 0); },
     "zal_play_items: negative count; nothing sent\n"},
    {"play_items_missing_list", [](zal_ipod_handle *h) { return zal_play_items(h, nullptr, 2, 0); },
     "zal_play_items: no identifiers; nothing sent\n"},
    {"prepare_negative_size",
     [](zal_ipod_handle *h) { return zal_ipod_prepare_uid_list(h, 0, 0, -8, kList); },
     "zal_ipod_prepare_uid_list: no identifier bytes of that size; nothing sent\n"},
    {"play_uid_list_missing", [](zal_ipod_handle *h) { return zal_ipod_play_uid_list(h, nullptr); },
     "zal_ipod_play_uid_list: no identifier; nothing sent\n"},
};

class LibraryRefused : public ::testing::TestWithParam<RefusedCase> {};

TEST_P(LibraryRefused, NothingIsSentAndTheReasonIsLogged) {
    const RefusedCase &c = GetParam();
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d);
    ASSERT_NE(h, nullptr);
    d.expect(ZAL_OP_KEEP_ALIVE);  // the next request on the wire must be this one
    LogCapture log;
    EXPECT_EQ(c.send(h), 0);
    EXPECT_TRUE(log.contains(ANDROID_LOG_ERROR, c.log)) << c.log;
    zal_ipod_keep_alive(h);
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

INSTANTIATE_TEST_SUITE_P(Preconditions, LibraryRefused, ::testing::ValuesIn(kRefused),
                         [](const auto &info) { return std::string(info.param.name); });

// ---- Synchronous results ------------------------------------------------------------------

struct SyncCase {
    const char *name;
    uint8_t opcode;
    std::function<gval *()> argument;
    std::function<gval *()> answer;  // nullptr value: a reply without payload
    std::function<int(zal_ipod_handle *)> sync;
    int expected;
    const char *error;  // error text afterwards, or nullptr for "unchanged" (none)
};

gval *genius(int ok, int result, bool with_result = true) {
    gval *h = hash_of({{"is_genius_availablefortrack", serialize_int(ok)}});
    if (with_result) serialize_hash_add(h, "result", serialize_int(result));
    return h;
}

int play_one(zal_ipod_handle *h) {
    return zal_play_items_sync(h, &kUid, 1, 0);
}
gval *collection_argument() {
    std::vector<uint8_t> r(144, 0);
    r[4] = 2;
    memcpy(r.data() + 5, "lib", 4);
    for (int i = 0; i < 8; ++i) r[136 + static_cast<size_t>(i)] = static_cast<uint8_t>(8 - i);
    return struct_of(r);
}
int play_album(zal_ipod_handle *h) {
    return zal_play_collection_sync(h, kUid, 2, 0, "lib");
}

const SyncCase kSync[] = {
    {"play_items_played", ZAL_OP_PLAYITEMS,
     [] {
         return zal_arg_array({serialize_int(1), serialize_int(0), uid_value()});
     },
     [] {
         return hash_of({{"items_played", serialize_int(1)}});
     },
     play_one, 1, nullptr},
    {"play_items_error", ZAL_OP_PLAYITEMS,
     [] {
         return zal_arg_array({serialize_int(1), serialize_int(0), uid_value()});
     },
     [] {
         return hash_of({{"error", serialize_string("gone")}});
     },
     play_one, -1, "gone"},
    {"play_items_int", ZAL_OP_PLAYITEMS,
     [] {
         return zal_arg_array({serialize_int(1), serialize_int(0), uid_value()});
     },
     [] { return serialize_int(1); }, play_one, -1, nullptr},
    {"play_items_key_missing", ZAL_OP_PLAYITEMS,
     [] {
         return zal_arg_array({serialize_int(1), serialize_int(0), uid_value()});
     },
     [] {
         return hash_of({{"other", serialize_int(1)}});
     },
     play_one, -1, nullptr},
    {"play_items_no_payload", ZAL_OP_PLAYITEMS,
     [] {
         return zal_arg_array({serialize_int(1), serialize_int(0), uid_value()});
     },
     [] { return nullptr; }, play_one, -1, nullptr},
    {"collection_played", ZAL_OP_PLAYCOLLECTION, collection_argument,
     [] {
         return hash_of({{"collection_played", serialize_int(12)}});
     },
     play_album, 12, nullptr},
    {"collection_error", ZAL_OP_PLAYCOLLECTION, collection_argument,
     [] {
         return hash_of({{"error", serialize_string("no album")}});
     },
     play_album, -1, "no album"},
    {"genius_available_result_0", ZAL_OP_IS_GENIUS_AVAILABLEFORTRACK,
     [] {
         return zal_arg_ints({0, 0});
     },
     [] { return genius(1, 0); },
     [](zal_ipod_handle *h) { return zal_ipod_is_genius_availablefortrack_sync(h, 0, 0); }, 1,
     nullptr},
    {"genius_available_result_3", ZAL_OP_IS_GENIUS_AVAILABLEFORTRACK,
     [] {
         return zal_arg_ints({0, 0});
     },
     [] { return genius(1, 3); },
     [](zal_ipod_handle *h) { return zal_ipod_is_genius_availablefortrack_sync(h, 0, 0); }, 3,
     nullptr},
    {"genius_unavailable", ZAL_OP_IS_GENIUS_AVAILABLEFORTRACK,
     [] {
         return zal_arg_ints({0, 0});
     },
     [] { return genius(0, 5, false); },
     [](zal_ipod_handle *h) { return zal_ipod_is_genius_availablefortrack_sync(h, 0, 0); }, 0,
     nullptr},
    {"genius_no_payload", ZAL_OP_IS_GENIUS_AVAILABLEFORTRACK,
     [] {
         return zal_arg_ints({0, 0});
     },
     [] { return nullptr; },
     [](zal_ipod_handle *h) { return zal_ipod_is_genius_availablefortrack_sync(h, 0, 0); }, 0,
     nullptr},
    {"genius_error", ZAL_OP_IS_GENIUS_AVAILABLEFORTRACK,
     [] {
         return zal_arg_ints({0, 0});
     },
     [] {
         return hash_of({{"error", serialize_string("no genius")}});
     },
     [](zal_ipod_handle *h) { return zal_ipod_is_genius_availablefortrack_sync(h, 0, 0); }, 0,
     "no genius"},
    {"update_items_any_reply", ZAL_OP_SET_UPDATE_ITEMS,
     [] { return struct_of(update_items_bytes("lib", {}, nullptr)); },
     [] { return serialize_int(-7); },
     [](zal_ipod_handle *h) {
         return zal_ipod_set_update_items_sync(h, nullptr, "lib", nullptr, 0);
     },
     0, nullptr},
    {"start_update_error_reply", ZAL_OP_START_LIB_UPDATE, [] { return serialize_string("r"); },
     [] {
         return hash_of({{"error", serialize_string("x")}});
     },
     [](zal_ipod_handle *h) { return zal_ipod_start_library_update_sync(h, "r"); }, 0, nullptr},
    {"stop_update", ZAL_OP_STOP_LIB_UPDATE, [] { return serialize_string("r"); },
     [] { return serialize_int(1); },
     [](zal_ipod_handle *h) { return zal_ipod_stop_library_update_sync(h, "r"); }, 0, nullptr},
    {"resume_update", ZAL_OP_RESUME_LIB_UPDATE,
     [] {
         return zal_arg_array({serialize_string("a"), serialize_string("b")});
     },
     [] { return serialize_int(1); },
     [](zal_ipod_handle *h) { return zal_ipod_resume_library_update_sync(h, "a", "b"); }, 0,
     nullptr},
    {"prepare_integer", ZAL_OP_PREPARE_UID_LIST,
     [] {
         return zal_arg_array({serialize_int(0), serialize_int(0), serialize_int(8), uid_value()});
     },
     [] { return serialize_int(2); },
     [](zal_ipod_handle *h) { return zal_ipod_prepare_uid_list_sync(h, 0, 0, 8, kUidBigEndian); },
     2, nullptr},
    {"play_uid_list_error", ZAL_OP_PLAY_UID_LIST, uid_value,
     [] {
         return hash_of({{"error", serialize_string("unprepared")}});
     },
     [](zal_ipod_handle *h) { return zal_ipod_play_uid_list_sync(h, kUidBigEndian); }, -1,
     "unprepared"},
    {"create_genius", ZAL_OP_CREATE_GENIUS_PLAYLIST,
     [] {
         return zal_arg_ints({1, 1});
     },
     [] { return serialize_int(0); },
     [](zal_ipod_handle *h) { return zal_ipod_create_genius_playlist_sync(h, 1, 1); }, 0, nullptr},
    {"refresh_genius", ZAL_OP_REFRESH_GENIUS_PLAYLIST, [] { return serialize_int(1); },
     [] { return serialize_int(-3); },
     [](zal_ipod_handle *h) { return zal_ipod_refresh_genius_playlist_sync(h, 1); }, -3, nullptr},
};

class LibrarySync : public ::testing::TestWithParam<SyncCase> {};

TEST_P(LibrarySync, DecodesTheReply) {
    const SyncCase &c = GetParam();
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d);
    ASSERT_NE(h, nullptr);
    d.expect(c.opcode, c.argument()).reply(c.answer());
    EXPECT_EQ(c.sync(h), c.expected);
    if (c.error != nullptr) {
        EXPECT_STREQ(zal_ipod_get_error_message(h), c.error);
    } else {
        EXPECT_EQ(zal_ipod_get_error_message(h), nullptr);
    }
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

INSTANTIATE_TEST_SUITE_P(Replies, LibrarySync, ::testing::ValuesIn(kSync),
                         [](const auto &info) { return std::string(info.param.name); });

struct PlaylistInfoCase {
    const char *name;
    std::function<gval *()> answer;
    int expected;
    uint8_t data;  // the caller's byte afterwards (starts at 0xaa)
};

const PlaylistInfoCase kPlaylistInfo[] = {
    {"status_and_data",
     [] {
         return hash_of({{"playlist_info", serialize_int(1)},
                         {"status", serialize_int(4)},
                         {"type", serialize_int(1)},
                         {"data", serialize_int(0x1234)}});
     },
     4, 0x34},
    {"no_information",
     [] {
         return hash_of({{"playlist_info", serialize_int(0)},
                         {"status", serialize_int(4)},
                         {"data", serialize_int(1)}});
     },
     -1, 0xaa},
    {"no_data_key",
     [] {
         return hash_of({{"playlist_info", serialize_int(1)}, {"status", serialize_int(0)}});
     },
     0, 0xaa},
    {"not_a_hash", [] { return serialize_int(3); }, -1, 0xaa},
};

class PlaylistInfo : public ::testing::TestWithParam<PlaylistInfoCase> {};

TEST_P(PlaylistInfo, ReadsStatusAndTheLowByteOfData) {
    const PlaylistInfoCase &c = GetParam();
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d);
    ASSERT_NE(h, nullptr);
    d.expect(ZAL_OP_GET_PLAYLIST_INFO, zal_arg_ints({2, 3})).reply(c.answer());
    d.expect(ZAL_OP_GET_PLAYLIST_INFO, zal_arg_ints({2, 3})).reply(c.answer());
    uint8_t data = 0xaa;
    EXPECT_EQ(zal_ipod_get_playlist_info_sync(h, 2, 3, &data), c.expected);
    EXPECT_EQ(data, c.data);
    EXPECT_EQ(zal_ipod_get_playlist_info_sync(h, 2, 3, nullptr), c.expected);
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

INSTANTIATE_TEST_SUITE_P(Replies, PlaylistInfo, ::testing::ValuesIn(kPlaylistInfo),
                         [](const auto &info) { return std::string(info.param.name); });

struct UniqueIdCase {
    const char *name;
    std::function<gval *()> answer;
    int size;
    int expected;
    std::string buffer;  // the 12-byte buffer afterwards (filled with '#' before)
};

const UniqueIdCase kUniqueId[] = {
    {"fits_with_terminator", [] { return serialize_string("ABCDEFGH"); }, 12, 1,
     std::string("ABCDEFGH\0###", 12)},
    {"short_buffer_no_terminator", [] { return serialize_string("ABCDEFGH"); }, 4, 1,
     "ABCD########"},
    {"exact_without_room_for_nul", [] { return serialize_string("ABCDEFGH"); }, 8, 1,
     "ABCDEFGH####"},
    {"zero_size", [] { return serialize_string("ABCDEFGH"); }, 0, 1, "############"},
    {"not_a_string", [] { return serialize_int(5); }, 12, 0, "############"},
    {"no_payload", [] { return nullptr; }, 12, 0, "############"},
};

class MediaLibraryUniqueId : public ::testing::TestWithParam<UniqueIdCase> {};

TEST_P(MediaLibraryUniqueId, CopiesAtMostSizeBytes) {
    const UniqueIdCase &c = GetParam();
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d);
    ASSERT_NE(h, nullptr);
    d.expect(ZAL_OP_MEDIA_LIB_UID).reply(c.answer());
    char buffer[12];
    memset(buffer, '#', sizeof buffer);
    EXPECT_EQ(zal_ipod_get_media_library_unique_id_sync(h, buffer, c.size), c.expected);
    EXPECT_EQ(std::string(buffer, sizeof buffer), c.buffer);
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

INSTANTIATE_TEST_SUITE_P(Replies, MediaLibraryUniqueId, ::testing::ValuesIn(kUniqueId),
                         [](const auto &info) { return std::string(info.param.name); });

}  // namespace
