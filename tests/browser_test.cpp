// The media browser against a scripted daemon: walks of the selection stack as tables (each
// step its exact requests and answers, its result, the levels, names and error text after
// it) on both protocols, the categories offered beneath every category, the records cache
// of a short page, identifier lists, playing a selection, track information, and the depth
// limit of the stack.
#include <android/log.h>
#include <gtest/gtest.h>

#include <cstdio>
#include <cstring>
#include <functional>
#include <string>
#include <vector>

#include "client_helpers.h"
#include "fake_daemon.h"
#include "log_capture.h"
#include "zal-ipod-2/command.h"
#include "zal-ipod-2/handle.h"

using namespace zaltest;

namespace {

using Names = std::vector<std::string>;

// Takes a NULL-terminated list the browser handed out (strings and array freed).
Names take_list(char **list) {
    Names out;
    for (int i = 0; list[i] != nullptr; ++i) {
        out.emplace_back(list[i]);
        free(list[i]);
    }
    free(list);
    return out;
}

// [ints..., strings...] as the filtered queries send it.
gval *args(std::initializer_list<int32_t> ints, const Names &names) {
    std::vector<const char *> p;
    for (const auto &n : names) p.push_back(n.c_str());
    return zal_arg_ints_strings(ints, p.data(), static_cast<int32_t>(p.size()));
}

gval *strings(std::initializer_list<const char *> items, int32_t first = 0) {
    gval *a = serialize_array();
    serialize_array_add(a, serialize_int(first));
    for (const char *s : items) serialize_array_add(a, serialize_string(s));
    return a;
}

gval *records(int32_t total, int32_t offset, std::initializer_list<const char *> names) {
    gval *a = zal_arg_ints({total, 1, offset, static_cast<int32_t>(names.size())});
    for (const char *s : names) serialize_array_add(a, serialize_string(s));
    return a;
}

gval *count_reply(const char *key, int32_t n) {
    return hash_of({{key, serialize_int(n)}});
}

// One request the step makes and the daemon's answer (error: an ERROR packet).
struct Exchange {
    uint8_t opcode;
    std::function<gval *()> request;
    std::function<gval *()> answer;
    bool error = false;
};

// What a step did: its result and, for list operations, the names (result 1) or NULL (-1).
struct Outcome {
    int result = 0;
    Names names;
};

using Act = std::function<Outcome(zal_ipod_handle *)>;

Outcome value(int r) {
    return {r, {}};
}
Outcome list(char **l) {
    if (l == nullptr) return {-1, {}};
    return {1, take_list(l)};
}

Act reset(int hierarchy) {
    return
        [=](zal_ipod_handle *h) { return value(zal_ipod_media_lib_reset_selection(h, hierarchy)); };
}
Act category(int c) {
    return [=](zal_ipod_handle *h) { return value(zal_ipod_media_lib_select_category(h, c)); };
}
Act item(int i) {
    return [=](zal_ipod_handle *h) { return value(zal_ipod_media_lib_select_item(h, i)); };
}
Act undo(int keep) {
    return [=](zal_ipod_handle *h) { return value(zal_ipod_media_lib_undo_selection(h, keep)); };
}
Act items_count() {
    return [](zal_ipod_handle *h) { return value(zal_ipod_media_lib_get_items_count(h)); };
}
Act categories_count() {
    return [](zal_ipod_handle *h) { return value(zal_ipod_media_lib_get_categories_count(h)); };
}
Act items(int offset, int count) {
    return [=](zal_ipod_handle *h) { return list(zal_ipod_media_lib_get_items(h, offset, count)); };
}
Act categories() {
    return [](zal_ipod_handle *h) { return list(zal_ipod_media_lib_get_categories(h)); };
}
Act play(int index) {
    return [=](zal_ipod_handle *h) {
        return value(zal_ipod_media_lib_play_current_selection(h, index));
    };
}

struct Step {
    const char *what;
    Act act;
    std::vector<Exchange> wire;
    Outcome expected;
    Names selection;               // the current filter after the step
    int start_index = 0;           // zal_ipod_media_lib_get_current_selection_start_index after
    const char *error = "";        // error text the step left ("": none)
    const char *logged = nullptr;  // text of an error record the step must log
};

struct Walk {
    const char *name;
    int protocol;
    std::vector<Step> steps;
};

// Collection record of PLAYCOLLECTION (start 0): id little-endian at 136, type at 4, mlid at 5.
gval *collection_record(uint64_t id, uint8_t type, const char *mlid) {
    unsigned char r[144] = {};
    r[4] = type;
    memcpy(r + 5, mlid, strlen(mlid) + 1);
    for (int i = 0; i < 8; ++i) r[136 + i] = static_cast<unsigned char>(id >> (8 * i));
    return serialize_struct(r, sizeof r);
}

gval *uid_bytes(uint64_t v) {
    unsigned char b[8];
    for (int i = 0; i < 8; ++i) b[i] = static_cast<unsigned char>(v >> (8 * (7 - i)));
    return serialize_bytes(b, 8);
}

// PLAYITEMS [count, start, identifiers...] for identifiers first, first+1, ...
gval *play_items_request(int32_t count, int32_t start, uint64_t first) {
    gval *a = zal_arg_ints({count, start});
    for (int32_t i = 0; i < count; ++i) serialize_array_add(a, uid_bytes(first + i));
    return a;
}

gval *identifiers(int32_t n, uint64_t first) {
    gval *a = serialize_array();
    serialize_array_add(a, serialize_int(n));
    for (int32_t i = 0; i < n; ++i)
        serialize_array_add(a, serialize_string(std::to_string(first + i).c_str()));
    return a;
}

gval *page(int32_t from, int32_t n, const char *prefix) {
    gval *a = serialize_array();
    serialize_array_add(a, serialize_int(n));
    for (int32_t i = from; i < from + n; ++i)
        serialize_array_add(a, serialize_string((prefix + std::to_string(i)).c_str()));
    return a;
}

constexpr const char *kCountItems = "count_items_category";
constexpr const char *kCountIds = "count_item_identifiers";

Exchange count_albums(int n) {
    return {ZAL_OP_COUNT_ITEMS_CURRENT_CATEGORY, [] { return args({1}, {"ALBUM"}); },
            [n] { return count_reply(kCountItems, n); }};
}

const Walk kWalks[] = {
    {"Iap2AlbumDownToTracksAndBack",
     2,
     {
         {"reset", reset(1), {}, value(1), {}},
         {"11 categories at the top", categories_count(), {}, value(11), {}},
         {"item before a category",
          item(0),
          {},
          value(-1),
          {},
          0,
          "Can't select an item without selecting a category first"},
         {"ALBUM", category(3), {}, value(1), {"ALBUM"}},
         {"no categories under a category",
          categories_count(),
          {},
          value(-1),
          {"ALBUM"},
          0,
          "Can't count the categories without selecting an item first"},
         {"no category list either",
          categories(),
          {},
          value(-1),
          {"ALBUM"},
          0,
          "Can't get the categories without selecting an item first"},
         {"no category beneath a category",
          category(5),
          {},
          value(-1),
          {"ALBUM"},
          0,
          "Can't select a category without selecting an item first"},
         {"12 albums", items_count(), {count_albums(12)}, value(12), {"ALBUM"}},
         {"a page past the end fetches nothing",
          items(10, 5),
          {count_albums(12)},
          value(-1),
          {"ALBUM"}},
         {"albums 10 and 11",
          items(10, 2),
          {count_albums(12),
           {ZAL_OP_GET_ITEMS_CURRENT_CATEGORY,
            [] {
                return args({1, 10, 2}, {"ALBUM"});
            },
            [] {
                return strings({"Tenth", "Eleventh"});
            }}},
          {1, {"Tenth", "Eleventh"}},
          {"ALBUM"}},
         {"index 2 of the page is album 12",
          item(2),
          {},
          value(-1),
          {"ALBUM"},
          0,
          "Index out of bounds"},
         {"index 1 of the page is album 11", item(1), {}, value(1), {"ALBUM", "Eleventh"}, 11},
         {"only TRACK under an album", categories(), {}, {1, {"TRACK"}}, {"ALBUM", "Eleventh"}, 11},
         {"TRACK", category(5), {}, value(1), {"ALBUM", "Eleventh", "TRACK"}},
         {"undo to the album recounts and refetches from its offset",
          undo(2),
          {count_albums(12),
           {ZAL_OP_GET_ITEMS_CURRENT_CATEGORY,
            [] {
                return args({1, 10, 12}, {"ALBUM"});
            },
            [] {
                return strings({"Tenth", "Eleventh"});
            }}},
          value(1),
          {"ALBUM", "Eleventh"},
          11},
         {"undo keeping every level",
          undo(2),
          {},
          value(-1),
          {"ALBUM", "Eleventh"},
          11,
          "Can't undo selected item or category without selecting something first"},
         {"an album plays as a collection of type 2 from 0",
          play(0),
          {{ZAL_OP_GET_COLLECTION_ID,
            [] {
                return zal_arg_array({serialize_string("ALBUM"), serialize_int(11)});
            },
            [] {
                return hash_of({{"collection_id", serialize_string("0x1122334455667788")}});
            }},
           {ZAL_OP_MEDIA_LIB_UID, [] { return nullptr; }, [] { return serialize_string("LIB"); }},
           {ZAL_OP_PLAYCOLLECTION,
            [] { return collection_record(0x1122334455667788ull, 2, "LIB"); },
            [] {
                return hash_of({{"collection_played", serialize_int(9)}});
            }}},
          value(1),
          {"ALBUM", "Eleventh"},
          11},
         {"undo to nothing is a reset", undo(0), {}, value(1), {}},
     }},
    {"Iap2TrackPagePlaysItsIdentifiersFromTheChosenTrack",
     2,
     {
         {"TRACK", category(5), {}, value(1), {"TRACK"}},
         {"a page of 20 at 40",
          items(40, 20),
          {{ZAL_OP_COUNT_ITEMS_CURRENT_CATEGORY, [] { return args({1}, {"TRACK"}); },
            [] { return count_reply(kCountItems, 100); }},
           {ZAL_OP_GET_ITEMS_CURRENT_CATEGORY,
            [] {
                return args({1, 40, 20}, {"TRACK"});
            },
            [] { return page(40, 20, "T"); }}},
          {1, {"T40", "T41", "T42", "T43", "T44", "T45", "T46", "T47", "T48", "T49",
               "T50", "T51", "T52", "T53", "T54", "T55", "T56", "T57", "T58", "T59"}},
          {"TRACK"}},
         {"track 43", item(3), {}, value(1), {"TRACK", "T43"}, 43},
         {"playing index 45 starts the page's 20 identifiers at 5",
          play(45),
          {{ZAL_OP_GET_ITEMS_IDENTIFIER_CURRENT_FILTER,
            [] {
                return args({1, 40, 20, 1}, {"TRACK"});
            },
            [] { return identifiers(20, 500); }},
           {ZAL_OP_PLAYITEMS, [] { return play_items_request(20, 5, 500); },
            [] {
                return hash_of({{"items_played", serialize_int(20)}});
            }}},
          value(1),
          {"TRACK", "T45"},
          45},
         {"a failing play keeps the daemon's text",
          play(41),
          {{ZAL_OP_GET_ITEMS_IDENTIFIER_CURRENT_FILTER,
            [] {
                return args({1, 40, 20, 1}, {"TRACK"});
            },
            [] { return identifiers(20, 500); }},
           {ZAL_OP_PLAYITEMS, [] { return play_items_request(20, 1, 500); },
            [] {
                return hash_of({{"error", serialize_string("nothing to play")}});
            },
            true}},
          value(-1),
          {"TRACK", "T41"},
          41,
          "nothing to play"},
     }},
    {"Iap2ArtistAlbumPlaysTheWholeTrackList",
     2,
     {
         {"ARTIST", category(2), {}, value(1), {"ARTIST"}},
         {"one artist",
          items(0, 1),
          {{ZAL_OP_COUNT_ITEMS_CURRENT_CATEGORY, [] { return args({1}, {"ARTIST"}); },
            [] { return count_reply(kCountItems, 1); }},
           {ZAL_OP_GET_ITEMS_CURRENT_CATEGORY,
            [] {
                return args({1, 0, 1}, {"ARTIST"});
            },
            [] { return strings({"Ann"}); }}},
          {1, {"Ann"}},
          {"ARTIST"}},
         {"Ann", item(0), {}, value(1), {"ARTIST", "Ann"}},
         {"ALBUM and TRACK under an artist",
          categories(),
          {},
          {1, {"ALBUM", "TRACK"}},
          {"ARTIST", "Ann"}},
         {"ALBUM", category(3), {}, value(1), {"ARTIST", "Ann", "ALBUM"}},
         {"one album",
          items(0, 1),
          {{ZAL_OP_COUNT_ITEMS_CURRENT_CATEGORY,
            [] {
                return args({3}, {"ARTIST", "Ann", "ALBUM"});
            },
            [] { return count_reply(kCountItems, 1); }},
           {ZAL_OP_GET_ITEMS_CURRENT_CATEGORY,
            [] {
                return args({3, 0, 1}, {"ARTIST", "Ann", "ALBUM"});
            },
            [] { return strings({"Blue"}); }}},
          {1, {"Blue"}},
          {"ARTIST", "Ann", "ALBUM"}},
         {"Blue", item(0), {}, value(1), {"ARTIST", "Ann", "ALBUM", "Blue"}},
         {"four levels: TRACK is fetched whole and played as items from index 2",
          play(2),
          {{ZAL_OP_COUNT_ITEMS_CURRENT_CATEGORY,
            [] {
                return args({5}, {"ARTIST", "Ann", "ALBUM", "Blue", "TRACK"});
            },
            [] { return count_reply(kCountItems, 3); }},
           {ZAL_OP_GET_ITEMS_CURRENT_CATEGORY,
            [] {
                return args({5, 0, 3}, {"ARTIST", "Ann", "ALBUM", "Blue", "TRACK"});
            },
            [] {
                return strings({"One", "Two", "Three"});
            }},
           {ZAL_OP_GET_ITEMS_IDENTIFIER_CURRENT_FILTER,
            [] {
                return args({5, 0, 3, 1}, {"ARTIST", "Ann", "ALBUM", "Blue", "TRACK"});
            },
            [] { return identifiers(3, 70); }},
           {ZAL_OP_PLAYITEMS, [] { return play_items_request(3, 2, 70); },
            [] {
                return hash_of({{"items_played", serialize_int(3)}});
            }}},
          value(1),
          {"ARTIST", "Ann", "ALBUM", "Blue", "TRACK", "One"}},
         {"a track is a leaf",
          categories(),
          {},
          {1, {}},
          {"ARTIST", "Ann", "ALBUM", "Blue", "TRACK", "One"}},
     }},
    {"Iap1ArtistAlbumTrackThroughTheDatabase",
     1,
     {
         {"reset sends TOP and the hierarchy",
          reset(2),
          {{ZAL_OP_SET_CATEGORY, [] { return serialize_int(0); }, [] { return serialize_int(11); }},
           {ZAL_OP_SET_HIERARCHY, [] { return serialize_int(2); },
            [] { return serialize_int(1); }}},
          value(1),
          {}},
         {"ARTIST is set on the device",
          category(2),
          {{ZAL_OP_SET_CATEGORY, [] { return serialize_int(2); },
            [] { return serialize_int(30); }}},
          value(1),
          {"ARTIST"}},
         {"the count is the device's record count", items_count(), {}, value(30), {"ARTIST"}},
         {"three artists from the records",
          items(0, 3),
          {{ZAL_OP_GET_DB_RECORDS,
            [] {
                return zal_arg_ints({0, 3});
            },
            [] {
                return records(30, 0, {"A0", "A1", "A2"});
            }}},
          {1, {"A0", "A1", "A2"}},
          {"ARTIST"}},
         {"A2", item(2), {}, value(1), {"ARTIST", "A2"}, 2},
         {"ALBUM beneath A2 selects record 2",
          category(3),
          {{ZAL_OP_SELECT_DB,
            [] {
                return zal_arg_ints({2, 3});
            },
            [] { return serialize_int(4); }}},
          value(1),
          {"ARTIST", "A2", "ALBUM"}},
         {"4 albums", items_count(), {}, value(4), {"ARTIST", "A2", "ALBUM"}},
         {"the albums",
          items(0, 4),
          {{ZAL_OP_GET_DB_RECORDS,
            [] {
                return zal_arg_ints({0, 4});
            },
            [] {
                return records(4, 0, {"B0", "B1", "B2", "B3"});
            }}},
          {1, {"B0", "B1", "B2", "B3"}},
          {"ARTIST", "A2", "ALBUM"}},
         {"playing album 1 selects it, fetches its tracks and plays the first",
          play(1),
          {{ZAL_OP_SELECT_DB,
            [] {
                return zal_arg_ints({1, 5});
            },
            [] { return serialize_int(2); }},
           {ZAL_OP_GET_DB_RECORDS,
            [] {
                return zal_arg_ints({0, 2});
            },
            [] {
                return records(2, 0, {"S0", "S1"});
            }},
           {ZAL_OP_SELECT_DB,
            [] {
                return zal_arg_ints({0, 5});
            },
            [] { return serialize_int(2); }}},
          value(1),
          {"ARTIST", "A2", "ALBUM", "B1", "TRACK", "S0"}},
         {"undo to the album rebuilds every level on the device",
          undo(4),
          {{ZAL_OP_SET_CATEGORY, [] { return serialize_int(2); }, [] { return serialize_int(30); }},
           {ZAL_OP_GET_DB_RECORDS,
            [] {
                return zal_arg_ints({0, 30});
            },
            [] {
                return records(30, 0, {"A0", "A1", "A2"});
            }},
           {ZAL_OP_SELECT_DB,
            [] {
                return zal_arg_ints({2, 3});
            },
            [] { return serialize_int(4); }},
           {ZAL_OP_GET_DB_RECORDS,
            [] {
                return zal_arg_ints({0, 4});
            },
            [] {
                return records(4, 0, {"B0", "B1", "B2", "B3"});
            }}},
          value(1),
          {"ARTIST", "A2", "ALBUM", "B1"},
          1},
         {"a failed selection still pushes its level",
          category(5),
          {{ZAL_OP_SELECT_DB,
            [] {
                return zal_arg_ints({1, 5});
            },
            [] {
                return hash_of({{"error", serialize_string("no record")}});
            },
            true}},
          value(0),
          {"ARTIST", "A2", "ALBUM", "B1", "TRACK"},
          0,
          "no record"},
         {"a failed count reads as no items",
          items(0, 1),
          {},
          value(-1),
          {"ARTIST", "A2", "ALBUM", "B1", "TRACK"}},
         {"an undo that fails on its first level keeps that level only",
          undo(3),
          {{ZAL_OP_SET_CATEGORY, [] { return serialize_int(2); },
            [] {
                return hash_of({{"error", serialize_string("busy")}});
            },
            true}},
          value(0),
          {"ARTIST"},
          0,
          "busy",
          "Can not select category! (0)\n"},
         {"undo to nothing resets with the stored hierarchy",
          undo(0),
          {{ZAL_OP_SET_CATEGORY, [] { return serialize_int(0); }, [] { return serialize_int(11); }},
           {ZAL_OP_SET_HIERARCHY, [] { return serialize_int(2); },
            [] { return serialize_int(1); }}},
          value(1),
          {}},
     }},
};

class BrowserWalk : public ::testing::TestWithParam<Walk> {};

TEST_P(BrowserWalk, EveryStepSendsAnswersAndLeavesTheStackAsTabled) {
    const Walk &walk = GetParam();
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d, walk.protocol);
    ASSERT_NE(h, nullptr);
    zal_ipod_set_read_timeout(h, 1, 0);
    for (const Step &step : walk.steps) {
        SCOPED_TRACE(step.what);
        for (const Exchange &x : step.wire) {
            d.expect(x.opcode, x.request());
            if (x.error)
                d.error(x.answer());
            else
                d.reply(x.answer());
        }
        zal_set_error_message(h, nullptr);
        LogCapture log;
        const Outcome got = step.act(h);
        if (step.logged != nullptr) {
            EXPECT_TRUE(log.contains(ANDROID_LOG_ERROR, step.logged));
        }
        EXPECT_EQ(got.result, step.expected.result);
        EXPECT_EQ(got.names, step.expected.names);
        ASSERT_TRUE(d.finish(3000)) << d.report();
        EXPECT_EQ(take_list(zal_ipod_media_lib_get_current_selection(h)), step.selection);
        EXPECT_EQ(zal_ipod_media_lib_get_current_selection_count(h),
                  static_cast<int>(step.selection.size()));
        EXPECT_EQ(zal_ipod_media_lib_get_current_selection_start_index(h), step.start_index);
        const char *error = zal_ipod_get_error_message(h);
        EXPECT_STREQ(error != nullptr ? error : "", step.error);
    }
    zal_ipod_close(h);
}

INSTANTIATE_TEST_SUITE_P(Walks, BrowserWalk, ::testing::ValuesIn(kWalks),
                         [](const auto &info) { return std::string(info.param.name); });

// ---- Categories ---------------------------------------------------------------------------

TEST(BrowserCategories, NamesAndNumbersAreOneTable) {
    const char *names[] = {"TOP",     "PLAYLIST",        "ARTIST",       "ALBUM",
                           "GENRE",   "TRACK",           "COMPOSER",     "AUDIOBOOK",
                           "PODCAST", "NESTED_PLAYLIST", "GENIUS_MIXES", "ITUNES_U"};
    for (int c = 0; c < 12; ++c) {
        EXPECT_STREQ(zal_ipod_category_to_string(c), names[c]);
        EXPECT_EQ(zal_ipod_string_to_category(names[c]), c);
    }
    for (int c : {12, -1, 1000}) EXPECT_STREQ(zal_ipod_category_to_string(c), "UNKNOWN");
    for (const char *s :
         {"TOP", "track", "", "UNKNOWN", "TRACK ", static_cast<const char *>(nullptr)})
        EXPECT_EQ(zal_ipod_string_to_category(s), 0) << (s != nullptr ? s : "(null)");
}

struct Offered {
    int chosen_from;
    Names categories;
};

const Offered kOffered[] = {
    {1, {"ARTIST", "ALBUM", "GENRE", "TRACK", "COMPOSER", "AUDIOBOOK"}},
    {2, {"ALBUM", "TRACK"}},
    {3, {"TRACK"}},
    {4, {"ARTIST", "ALBUM", "TRACK", "COMPOSER", "AUDIOBOOK"}},
    {5, {}},
    {6, {"ALBUM", "TRACK"}},
    {7, {}},
    {8, {"TRACK"}},
    {9, {"TRACK", "NESTED_PLAYLIST"}},
    {10, {}},
    {11, {"TRACK"}},
    {0, {}},
    {42, {}},
};

TEST(BrowserCategories, OfferedBeneathAnItemOfEachCategory) {
    zal_ipod_handle *h = offline_handle();
    Names top = take_list(zal_ipod_media_lib_get_categories(h));
    ASSERT_EQ(top.size(), 11u);
    EXPECT_EQ(top.front(), "PLAYLIST");
    EXPECT_EQ(top.back(), "ITUNES_U");
    for (const Offered &o : kOffered) {
        SCOPED_TRACE(o.chosen_from);
        // An item chosen from the category (offline: iAP1 commands go nowhere).
        zal_browser_state &b = h->browser;
        b.selection_count = 2;
        b.selection_value[0] = o.chosen_from;
        b.selection_is_item[1] = 1;
        EXPECT_EQ(zal_ipod_media_lib_get_categories_count(h),
                  static_cast<int>(o.categories.size()));
        EXPECT_EQ(take_list(zal_ipod_media_lib_get_categories(h)), o.categories);
        for (const auto &name : o.categories) EXPECT_NE(name, "TOP");
    }
    zal_ipod_close(h);
}

// ---- Records cache and identifier lists ----------------------------------------------------

TEST(BrowserQueries, AShortPageLeavesTheCacheItsNamesAndEmptyTextsBeyond) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d, 2);
    ASSERT_NE(h, nullptr);
    d.expect(ZAL_OP_GET_ITEMS_CURRENT_CATEGORY, args({0, 10, 4}, {}))
        .reply(strings({"first", "second"}));
    testing::internal::CaptureStdout();
    char **got = zal_ipod_get_items_current_category_sync(h, 10, 4);
    ASSERT_NE(got, nullptr);
    EXPECT_EQ(take_list(got), (Names{"first", "second", "", ""}));
    EXPECT_STREQ(zal_ipod_record(h, 11), "second");
    EXPECT_STREQ(zal_ipod_record(h, 9), "");
    fflush(stdout);
    const std::string out = testing::internal::GetCapturedStdout();
    EXPECT_NE(out.find("Err: offset[12] >= (_offset[10]+_count[2]): \n"), std::string::npos) << out;
    EXPECT_NE(out.find("Err: offset[9]<_offset[10]\n"), std::string::npos) << out;
    // A reply without elements leaves the cache; no reply at all gives NULL.
    d.expect(ZAL_OP_GET_ITEMS_CURRENT_CATEGORY, args({0, 0, 1}, {})).reply(serialize_array());
    EXPECT_EQ(zal_ipod_get_items_current_category_sync(h, 0, 1), nullptr);
    EXPECT_STREQ(zal_ipod_record(h, 10), "first");
    ASSERT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

TEST(BrowserQueries, IdentifierListsEndWithNullAndStayOwnedByTheHandle) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d, 2);
    ASSERT_NE(h, nullptr);
    d.expect(ZAL_OP_GET_ITEMS_IDENTIFIER_CURRENT_FILTER, args({0, 0, 5, 1}, {}))
        .reply(strings({}, 0))
        .expect(ZAL_OP_GET_ITEMS_IDENTIFIER_CURRENT_FILTER, args({0, 0, 5, 1}, {}))
        .reply(serialize_array())
        .expect(ZAL_OP_GET_ITEMS_IDENTIFIER_CURRENT_FILTER, args({0, 0, 5, 1}, {}))
        .reply(strings({"7", "0x10"}, 2))
        .expect(ZAL_OP_COUNT_ITEMS_IDENTIFIER_CURRENT_FILTER, args({0}, {}))
        .reply(count_reply(kCountIds, 4))
        .expect(ZAL_OP_COUNT_ITEMS_CURRENT_CATEGORY, args({0}, {}))
        .reply(hash_of({{"count", serialize_int(4)}}))
        .expect(ZAL_OP_GET_COLLECTION_ID,
                zal_arg_array({serialize_string("GENRE"), serialize_int(1)}))
        .reply(hash_of({{"collection_id", serialize_string("99")}}));
    const char **empty = zal_ipod_get_item_identifiers_current_filter_sync(h, 0, 5, 1);
    ASSERT_NE(empty, nullptr);
    EXPECT_EQ(empty[0], nullptr);
    free(static_cast<void *>(empty));
    EXPECT_EQ(zal_ipod_get_item_identifiers_current_filter_sync(h, 0, 5, 1), nullptr);
    const char **two = zal_ipod_get_item_identifiers_current_filter_sync(h, 0, 5, 1);
    ASSERT_NE(two, nullptr);
    EXPECT_STREQ(two[0], "7");
    EXPECT_STREQ(two[1], "0x10");
    EXPECT_EQ(two[2], nullptr);
    free(static_cast<void *>(two));
    EXPECT_EQ(zal_ipod_count_item_identifiers_current_filter_sync(h), 4);
    EXPECT_EQ(zal_ipod_count_items_current_category_sync(h), -1);  // lacks its key
    EXPECT_STREQ(zal_ipod_get_collection_identifier_sync(h, "GENRE", 1), "99");
    ASSERT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

// ---- Playing lists --------------------------------------------------------------------------

TEST(BrowserPlayItems, Iap2CutsTo8000AndRefusesAStartBeyond) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d, 2);
    ASSERT_NE(h, nullptr);
    std::vector<uint64_t> uids(9000);
    for (size_t i = 0; i < uids.size(); ++i) uids[i] = 1000 + i;
    d.expect(ZAL_OP_PLAYITEMS, play_items_request(8000, 0, 1000))
        .reply(hash_of({{"items_played", serialize_int(8000)}}))
        .expect(ZAL_OP_PLAYITEMS, play_items_request(8000, 8000, 1000))
        .reply(hash_of({{"items_played", serialize_int(8000)}}));
    EXPECT_EQ(zal_ipod_media_lib_play_items(h, uids.data(), 9000, 0), 8000);
    EXPECT_EQ(zal_ipod_media_lib_play_items(h, uids.data(), 9000, 8000), 8000);
    EXPECT_EQ(zal_ipod_media_lib_play_items(h, uids.data(), 9000, 8001), 0);
    EXPECT_EQ(zal_ipod_media_lib_play_items(h, nullptr, 3, 0), 0);
    ASSERT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

std::vector<unsigned char> be_list(const std::vector<uint64_t> &uids) {
    std::vector<unsigned char> out;
    for (uint64_t v : uids)
        for (int i = 0; i < 8; ++i) out.push_back(static_cast<unsigned char>(v >> (8 * (7 - i))));
    return out;
}

TEST(BrowserPlayItems, Iap1PreparesTheListThenPlaysFromItsStartWithALongerTimeout) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d, 1);
    ASSERT_NE(h, nullptr);
    // No time at all: the waits only work because the list raises it.
    zal_ipod_set_read_timeout(h, 0, 0);
    const std::vector<uint64_t> uids = {0x0102030405060708ull, 0x1112131415161718ull, 3};
    const auto bytes = be_list(uids);
    auto prepare = [&bytes] {
        gval *a = zal_arg_ints({0, 0, 24});
        serialize_array_add(a, serialize_bytes(bytes.data(), 24));
        return a;
    };
    d.expect(ZAL_OP_PREPARE_UID_LIST, prepare())
        .reply(serialize_int(1))
        .expect(ZAL_OP_PLAY_UID_LIST, serialize_bytes(bytes.data() + 8, 8))
        .reply(serialize_int(1))
        // A start outside the list plays from the first entry.
        .expect(ZAL_OP_PREPARE_UID_LIST, prepare())
        .reply(serialize_int(1))
        .expect(ZAL_OP_PLAY_UID_LIST, serialize_bytes(bytes.data(), 8))
        .reply(serialize_int(1))
        // A refused list is not played.
        .expect(ZAL_OP_PREPARE_UID_LIST, prepare())
        .reply(serialize_int(0));
    EXPECT_EQ(zal_ipod_media_lib_play_items(h, uids.data(), 3, 1), 1);
    EXPECT_EQ(zal_ipod_media_lib_play_items(h, uids.data(), 3, -1), 1);
    EXPECT_EQ(zal_ipod_media_lib_play_items(h, uids.data(), 3, 2), 0);
    EXPECT_EQ(h->read_timeout_sec.load(), 0u);  // restored after each
    ASSERT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

// ---- Track information ---------------------------------------------------------------------

TEST(BrowserTracksInfo, Iap2RecordsOfSixStringsReadThroughTheAccessors) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d, 2);
    ASSERT_NE(h, nullptr);
    EXPECT_EQ(zal_ipod_media_lib_get_tracks_info(h, 0, 0, 2), nullptr);
    EXPECT_STREQ(zal_ipod_get_error_message(h),
                 "Media lib category should be TRACK or AUDIOBOOK to be able to get track info");
    ASSERT_EQ(zal_ipod_media_lib_select_category(h, 5), 1);
    d.expect(ZAL_OP_COUNT_ITEMS_IDENTIFIER_CURRENT_FILTER, args({1}, {"TRACK"}))
        .reply(count_reply(kCountIds, 2))
        .expect(ZAL_OP_GET_ITEMS_IDENTIFIER_CURRENT_FILTER, args({1, 0, 2, 0}, {"TRACK"}))
        .reply(strings({"0x10", "Song", "0x100", "Ann", "Blue", "Jazz", "017", "Tune"}, 2))
        .expect(ZAL_OP_COUNT_ITEMS_IDENTIFIER_CURRENT_FILTER, args({1}, {"TRACK"}))
        .reply(count_reply(kCountIds, 2));
    const void *info = zal_ipod_media_lib_get_tracks_info(h, 0, 0, 2);
    ASSERT_NE(info, nullptr);
    uint64_t uid = 0;
    uint32_t duration = 0;
    char *text = nullptr;
    EXPECT_EQ(zal_ipod_media_lib_get_track_uid(h, info, 0, &uid), 1);
    EXPECT_EQ(uid, 16u);
    EXPECT_EQ(zal_ipod_media_lib_get_track_duration(h, info, 0, &duration), 1);
    EXPECT_EQ(duration, 256u);
    for (auto [get, expected] :
         std::vector<std::pair<decltype(&zal_ipod_media_lib_get_track_name), const char *>>{
             {zal_ipod_media_lib_get_track_name, "Song"},
             {zal_ipod_media_lib_get_track_artist, "Ann"},
             {zal_ipod_media_lib_get_track_album, "Blue"},
             {zal_ipod_media_lib_get_track_genre, "Jazz"}}) {
        ASSERT_EQ(get(h, info, 0, &text), 1);
        EXPECT_STREQ(text, expected);
        free(text);
    }
    // Track 1 is cut short after its name: the missing fields read as "".
    EXPECT_EQ(zal_ipod_media_lib_get_track_uid(h, info, 1, &uid), 1);
    EXPECT_EQ(uid, 15u);  // octal
    ASSERT_EQ(zal_ipod_media_lib_get_track_genre(h, info, 1, &text), 1);
    EXPECT_STREQ(text, "");
    free(text);
    EXPECT_EQ(zal_ipod_media_lib_get_track_name(h, info, 2, &text), 0);
    int dummy = 0;
    EXPECT_EQ(zal_ipod_media_lib_get_track_uid(h, &dummy, 0, &uid), 0);  // not a result
    // Three tracks are not there: nothing is fetched.
    EXPECT_EQ(zal_ipod_media_lib_get_tracks_info(h, 1, 0, 3), nullptr);
    ASSERT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

// ---- Depth limit ---------------------------------------------------------------------------

// A daemon that answers every count with 3 and every page with three names.
Bytes answer_everything(const Request &r) {
    gval *v = nullptr;
    if (r.opcode == ZAL_OP_COUNT_ITEMS_CURRENT_CATEGORY)
        v = count_reply(kCountItems, 3);
    else if (r.opcode == ZAL_OP_GET_ITEMS_CURRENT_CATEGORY)
        v = strings({"x", "y", "z"});
    else
        v = serialize_int(-1);
    Bytes out = frame(r.tid, ZAL_OP_RETURN, v);
    serialize_free(v);
    return out;
}

TEST(BrowserDepth, TheStackHolds256LevelsAndRefusesAnyDeeperWalk) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d, 2);
    ASSERT_NE(h, nullptr);
    d.serve(answer_everything);
    for (int level = 0; level < kSelectionLevels; level += 2) {
        ASSERT_EQ(zal_ipod_media_lib_select_category(h, 9), 1) << level;
        char **page = zal_ipod_media_lib_get_items(h, 1, 2);
        ASSERT_NE(page, nullptr) << level;
        take_list(page);
        ASSERT_EQ(zal_ipod_media_lib_select_item(h, 1), 1) << level;
    }
    ASSERT_EQ(zal_ipod_media_lib_get_current_selection_count(h), kSelectionLevels);
    const Names before = take_list(zal_ipod_media_lib_get_current_selection(h));
    EXPECT_EQ(before.back(), "y");
    EXPECT_EQ(zal_ipod_media_lib_get_current_selection_start_index(h), 2);

    EXPECT_EQ(zal_ipod_media_lib_select_category(h, 5), -1);
    EXPECT_STREQ(zal_ipod_get_error_message(h), "Can't select deeper than 256 levels");
    EXPECT_EQ(zal_ipod_media_lib_play_current_selection(h, 0), -1);
    EXPECT_EQ(zal_ipod_media_lib_get_current_selection_count(h), kSelectionLevels);
    EXPECT_EQ(take_list(zal_ipod_media_lib_get_current_selection(h)), before);

    // Back one level and down again; the rebuild goes through every level.
    ASSERT_EQ(zal_ipod_media_lib_undo_selection(h, kSelectionLevels - 1), 1);
    EXPECT_EQ(zal_ipod_media_lib_get_current_selection_count(h), kSelectionLevels - 1);
    // The category on top is counted afresh before an item of it is chosen.
    EXPECT_EQ(zal_ipod_media_lib_select_item(h, 0), -1);
    EXPECT_EQ(zal_ipod_media_lib_get_items_count(h), 3);
    EXPECT_EQ(zal_ipod_media_lib_select_item(h, 0), 1);
    EXPECT_EQ(zal_ipod_media_lib_get_current_selection_count(h), kSelectionLevels);
    zal_ipod_close(h);
}

}  // namespace
