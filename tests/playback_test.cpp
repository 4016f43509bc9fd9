// Playback commands and the current-track cache: the decoders (by a _sync wait and through
// the reply callback alike), the bytes each command sends, the _sync results, preference
// numbers, the cache reset of a session open, and the health examination.
#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <vector>

#include "client_helpers.h"
#include "fake_daemon.h"
#include "zal-ipod-2/command.h"
#include "zal-ipod-2/packet.h"
#include "zal-ipod-2/playback_state.h"
#include "zal-ipod-2/reply_decoders.h"

using namespace zaltest;

namespace {

using P = zal_playback_state;
using S = zal_pending_slots;

// A cache with something in every field the decoders touch.
void fill_cache(zal_ipod_handle *h) {
    P &p = h->playback;
    zal_replace_text(&p.title, "Old title");
    zal_replace_text(&p.chapter_name, "Old chapter");
    zal_replace_text(&p.artist, "Old artist");
    zal_replace_text(&p.album, "Old album");
    zal_replace_text(&p.artwork_name, "Old art");
    for (int32_t P::*field :
         {&P::track_length, &P::track_position, &P::play_state, &P::number_of_tracks,
          &P::track_index, &P::chapter_length, &P::chapter_position, &P::sample_rate, &P::timestamp,
          &P::timestamp_usec, &P::has_artwork, &P::has_chapters})
        p.*field = 99;
}

struct IntField {
    int32_t P::*field;
    int32_t value;
};
struct TextField {
    char *P::*field;
    const char *value;  // nullptr: still the old text of fill_cache
};

struct DecoderCase {
    const char *name;
    zal_reply_decoder decode;
    uint16_t S::*slot;
    std::function<gval *()> reply;
    int32_t result;
    std::vector<IntField> ints;  // fields checked after; others are not looked at
    std::vector<TextField> texts;
    const char *error;  // error text afterwards, or nullptr
};

void PrintTo(const DecoderCase &c, std::ostream *os) {
    *os << c.name;
}

const char *old_text(char *P::*field) {
    if (field == &P::title) return "Old title";
    if (field == &P::chapter_name) return "Old chapter";
    if (field == &P::artist) return "Old artist";
    if (field == &P::album) return "Old album";
    return "Old art";
}

const std::vector<IntField> kUntouchedTrack = {{&P::track_length, 99},
                                               {&P::track_position, 99},
                                               {&P::play_state, 99},
                                               {&P::track_index, 99},
                                               {&P::number_of_tracks, 99}};

const DecoderCase kDecoderCases[] = {
    {"track_info_partial",
     zal_decode_current_track_info,
     &S::track_info_tid,
     [] {
         return hash_of({{"current_track_info", serialize_int(1)},
                         {"title", serialize_string("New title")},
                         {"length", serialize_int(0)},
                         {"track_index", serialize_int(4)}});
     },
     1,
     {{&P::track_length, 0},
      {&P::track_index, -1},
      {&P::track_position, -1},
      {&P::play_state, -1},
      {&P::number_of_tracks, -1},
      {&P::timestamp, 0},
      {&P::timestamp_usec, 0},
      {&P::has_artwork, -1},
      {&P::has_chapters, -1}},
     {{&P::title, "New title"},
      {&P::artist, nullptr},
      {&P::album, nullptr},
      {&P::chapter_name, nullptr}},
     nullptr},
    {"track_info_full",
     zal_decode_current_track_info,
     &S::track_info_tid,
     [] {
         return hash_of({{"current_track_info", serialize_int(1)},
                         {"title", serialize_string("T")},
                         {"chapter", serialize_string("C")},
                         {"artist", serialize_string("A")},
                         {"album", serialize_string("B")},
                         {"artworkName", serialize_string("W")},
                         {"artwork", serialize_int(1)},
                         {"has_chapters", serialize_int(1)},
                         {"length", serialize_int(215000)},
                         {"position", serialize_int(42000)},
                         {"timestamp", serialize_int(1700000000)},
                         {"timestamp_usec", serialize_int(250)},
                         {"state", serialize_int(1)},
                         {"track_index", serialize_int(3)},
                         {"number_of_tracks", serialize_int(12)}});
     },
     1,
     {{&P::has_artwork, 1},
      {&P::has_chapters, 1},
      {&P::track_length, 215000},
      {&P::track_position, 42000},
      {&P::timestamp, 1700000000},
      {&P::timestamp_usec, 250},
      {&P::play_state, 1},
      {&P::track_index, 3},
      {&P::number_of_tracks, 12}},
     {{&P::title, "T"},
      {&P::chapter_name, "C"},
      {&P::artist, "A"},
      {&P::album, "B"},
      {&P::artwork_name, "W"}},
     nullptr},
    {"track_info_no_track",
     zal_decode_current_track_info,
     &S::track_info_tid,
     [] {
         return hash_of({{"current_track_info", serialize_int(0)}});
     },
     0,
     {{&P::track_length, -1}, {&P::track_index, -1}},
     {{&P::title, nullptr}},
     nullptr},
    {"track_info_error",
     zal_decode_current_track_info,
     &S::track_info_tid,
     [] {
         return hash_of({{"error", serialize_string("busy")}});
     },
     -1,
     kUntouchedTrack,
     {{&P::title, nullptr}},
     "busy"},
    {"track_info_without_result_key",
     zal_decode_current_track_info,
     &S::track_info_tid,
     [] {
         return hash_of({{"title", serialize_string("Stray")}, {"length", serialize_int(5)}});
     },
     -1,
     kUntouchedTrack,
     {{&P::title, nullptr}},
     nullptr},
    {"track_info_not_a_hash",
     zal_decode_current_track_info,
     &S::track_info_tid,
     [] { return serialize_int(1); },
     -1,
     kUntouchedTrack,
     {},
     nullptr},
    {"track_info_no_payload",
     zal_decode_current_track_info,
     &S::track_info_tid,
     nullptr,
     -1,
     kUntouchedTrack,
     {},
     nullptr},
    {"indexed_track_info",
     zal_decode_indexed_track_info,
     &S::indexed_track_info_tid,
     [] {
         return hash_of({{"indexed_track_info", serialize_int(7)},
                         {"artist", serialize_string("Indexed")},
                         {"length", serialize_int(1000)},
                         {"track_index", serialize_int(2)}});
     },
     7,
     {{&P::track_index, 2}, {&P::track_length, 1000}},
     {{&P::artist, "Indexed"}},
     nullptr},
    {"indexed_needs_its_own_key",
     zal_decode_indexed_track_info,
     &S::indexed_track_info_tid,
     [] {
         return hash_of({{"current_track_info", serialize_int(1)}});
     },
     -1,
     kUntouchedTrack,
     {},
     nullptr},
    {"play_state",
     zal_decode_play_state,
     &S::play_state_tid,
     [] {
         return hash_of({{"current_play_status", serialize_int(2)},
                         {"length", serialize_int(1000)},
                         {"position", serialize_int(10)}});
     },
     2,
     {{&P::play_state, 2}, {&P::track_length, 1000}, {&P::track_position, 10}},
     {},
     nullptr},
    {"play_state_without_length",
     zal_decode_play_state,
     &S::play_state_tid,
     [] {
         return hash_of({{"current_play_status", serialize_int(1)}});
     },
     1,
     {{&P::play_state, 1}, {&P::track_length, -1}, {&P::track_position, -1}},
     {},
     nullptr},
    {"play_state_without_status",
     zal_decode_play_state,
     &S::play_state_tid,
     [] {
         return hash_of({{"length", serialize_int(1)}});
     },
     -1,
     kUntouchedTrack,
     {},
     nullptr},
    {"play_state_error",
     zal_decode_play_state,
     &S::play_state_tid,
     [] {
         return hash_of({{"error", serialize_string("gone")}});
     },
     -1,
     kUntouchedTrack,
     {},
     "gone"},
    {"chapter_status",
     zal_decode_chapter_status,
     &S::chapter_status_tid,
     [] {
         return hash_of(
             {{"chapter_length", serialize_int(500)}, {"chapter_position", serialize_int(20)}});
     },
     0,
     {{&P::chapter_length, 500}, {&P::chapter_position, 20}},
     {},
     nullptr},
    {"chapter_status_empty",
     zal_decode_chapter_status,
     &S::chapter_status_tid,
     [] { return serialize_hash(); },
     0,
     {{&P::chapter_length, -1}, {&P::chapter_position, -1}},
     {},
     nullptr},
    {"chapter_status_error",
     zal_decode_chapter_status,
     &S::chapter_status_tid,
     [] {
         return hash_of({{"error", serialize_string("no chapters")}});
     },
     -1,
     {{&P::chapter_length, 99}, {&P::chapter_position, 99}},
     {},
     "no chapters"},
    {"sample_rate",
     zal_decode_sample_rate,
     &S::sample_rate_tid,
     [] {
         return hash_of({{"sample_rate", serialize_int(48000)}});
     },
     48000,
     {{&P::sample_rate, 48000}},
     {},
     nullptr},
    {"sample_rate_missing",
     zal_decode_sample_rate,
     &S::sample_rate_tid,
     [] { return serialize_hash(); },
     -1,
     {{&P::sample_rate, 99}},
     {},
     nullptr},
};

void check_cache(zal_ipod_handle *h, const DecoderCase &c) {
    for (const IntField &f : c.ints) EXPECT_EQ(h->playback.*f.field, f.value);
    for (const TextField &t : c.texts)
        EXPECT_STREQ(h->playback.*t.field, t.value != nullptr ? t.value : old_text(t.field));
    if (c.error != nullptr) {
        EXPECT_STREQ(zal_ipod_get_error_message(h), c.error);
    } else {
        EXPECT_EQ(zal_ipod_get_error_message(h), nullptr);
    }
}

struct CallbackReply {
    int calls = 0;
    int32_t result = 0;
    std::string text;
};

int keep_reply(zal_ipod_handle *, uint16_t, int32_t result, const char *text, void *user) {
    auto *r = static_cast<CallbackReply *>(user);
    ++r->calls;
    r->result = result;
    r->text = text != nullptr ? text : "";
    return 0;
}

class PlaybackDecoders : public ::testing::TestWithParam<DecoderCase> {};

// The decoder that a _sync form runs on its reply.
TEST_P(PlaybackDecoders, InAWait) {
    const DecoderCase &c = GetParam();
    zal_ipod_handle *h = offline_handle();
    fill_cache(h);
    zal_ipod_reply *r = make_reply(5, ZAL_OP_RETURN, c.reply ? c.reply() : nullptr);
    EXPECT_EQ(c.decode(h, r), c.result);
    check_cache(h, c);
    reply_record_free(r);
    zal_ipod_close(h);
}

// The same reply taken by the dispatcher for the reply callback updates the same cache.
TEST_P(PlaybackDecoders, ThroughTheReplyCallback) {
    const DecoderCase &c = GetParam();
    zal_ipod_handle *h = offline_handle();
    fill_cache(h);
    CallbackReply seen;
    zal_ipod_set_reply_cb(h, keep_reply, &seen);
    h->slots.*c.slot = 41;
    queue_record(h, make_reply(41, ZAL_OP_RETURN, c.reply ? c.reply() : nullptr));
    zal_ipod_pending_event(h);
    ASSERT_EQ(seen.calls, 1);
    EXPECT_EQ(seen.result, c.result);
    check_cache(h, c);
    zal_ipod_close(h);
}

INSTANTIATE_TEST_SUITE_P(Replies, PlaybackDecoders, ::testing::ValuesIn(kDecoderCases),
                         [](const auto &info) { return std::string(info.param.name); });

// ---- What each command sends -----------------------------------------------------------

struct WireCase {
    const char *name;
    std::function<int(zal_ipod_handle *)> send;
    uint8_t opcode;
    std::function<gval *()> argument;  // nullptr: no payload
    uint16_t S::*slot;                 // nullptr: none
};

gval *ints(std::initializer_list<int32_t> items) {
    gval *a = serialize_array();
    for (int32_t v : items) serialize_array_add(a, serialize_int(v));
    return a;
}

const WireCase kWireCases[] = {
    {"track_info", zal_ipod_current_track_info, 39, nullptr, &S::track_info_tid},
    {"sample_rate", zal_ipod_current_track_sample_rate, 40, nullptr, &S::sample_rate_tid},
    {"is_audiobook", zal_ipod_current_track_is_audiobook, 41, nullptr, nullptr},
    {"contains_video", zal_ipod_current_track_contains_video, 42, nullptr, nullptr},
    {"play_state", zal_ipod_get_play_state, 46, nullptr, &S::play_state_tid},
    {"current_draw", zal_ipod_device_current_draw, 47, nullptr, nullptr},
    {"charge_if_power", zal_ipod_device_charge_if_power, 48, nullptr, nullptr},
    {"track_index", zal_ipod_get_current_track_index, 50, nullptr, &S::track_index_tid},
    {"get_shuffle", zal_ipod_get_shuffle, 52, nullptr, nullptr},
    {"get_repeat", zal_ipod_get_repeat, 54, nullptr, nullptr},
    {"chapter_index", zal_ipod_get_chapter_index, 125, nullptr, &S::chapter_index_tid},
    {"chapter_count", zal_ipod_get_chapter_count, 126, nullptr, nullptr},
    {"write_tag", zal_ipod_write_tag, 63, nullptr, nullptr},
    {"image_limits", zal_ipod_get_color_display_image_limits, 71, nullptr, nullptr},
    {"set_position", [](zal_ipod_handle *h) { return zal_ipod_set_position(h, 61000); }, 37,
     [] { return serialize_int(61000); }, nullptr},
    {"set_track", [](zal_ipod_handle *h) { return zal_ipod_set_track(h, 3); }, 38,
     [] { return serialize_int(3); }, nullptr},
    {"set_chapter",
     [](zal_ipod_handle *h) { return zal_ipod_set_current_playing_track_chapter(h, 2); }, 127,
     [] { return serialize_int(2); }, nullptr},
    {"chapter_play_status",
     [](zal_ipod_handle *h) {
         return zal_ipod_get_current_playing_track_chapter_play_status(h, 4);
     },
     128, [] { return serialize_int(4); }, &S::chapter_status_tid},
    {"set_shuffle", [](zal_ipod_handle *h) { return zal_ipod_set_shuffle(h, 1); }, 51,
     [] { return serialize_int(1); }, nullptr},
    {"set_repeat", [](zal_ipod_handle *h) { return zal_ipod_set_repeat(h, 2); }, 53,
     [] { return serialize_int(2); }, nullptr},
    {"get_preference", [](zal_ipod_handle *h) { return zal_ipod_get_preference(h, 8); }, 61,
     [] { return serialize_int(8); }, &S::preference_tid},
    {"get_preference_unknown_class",
     [](zal_ipod_handle *h) { return zal_ipod_get_preference(h, 5); }, 61,
     [] { return serialize_int(0); }, &S::preference_tid},
    {"set_preference", [](zal_ipod_handle *h) { return zal_ipod_set_preference(h, 12, 16); }, 60,
     [] {
         return ints({12, 1});
     },
     nullptr},
    {"set_preference_unknown_class",
     [](zal_ipod_handle *h) { return zal_ipod_set_preference(h, 7, 3); }, 60,
     [] {
         return ints({0, 1});
     },
     nullptr},
    {"set_preference_setting_out_of_range",
     [](zal_ipod_handle *h) { return zal_ipod_set_preference(h, 8, 19); }, 60,
     [] {
         return ints({8, 0});
     },
     nullptr},
    {"get_ipod_preference", [](zal_ipod_handle *h) { return zal_ipod_get_ipod_preference(h, 5); },
     61, [] { return serialize_int(5); }, nullptr},
    {"set_ipod_preference",
     [](zal_ipod_handle *h) { return zal_ipod_set_ipod_preference(h, 5, 7); }, 60,
     [] {
         return ints({5, 7});
     },
     nullptr},
    {"artwork", [](zal_ipod_handle *h) { return zal_ipod_current_track_artwork(h, 1); }, 43,
     [] { return serialize_int(1); }, &S::artwork_tid},
    {"pos_artwork",
     [](zal_ipod_handle *h) { return zal_ipod_current_track_pos_artwork(h, 1, 5000); }, 44,
     [] {
         return ints({1, 5000});
     },
     &S::artwork_tid},
    {"artwork_by_uid",
     [](zal_ipod_handle *h) { return zal_ipod_track_artwork_by_uid(h, 0x0102030405060708ull); },
     129,
     [] {
         const unsigned char be[] = {1, 2, 3, 4, 5, 6, 7, 8};
         gval *a = serialize_array();
         serialize_array_add(a, serialize_bytes(be, sizeof be));
         return a;
     },
     &S::artwork_by_uid_tid},
    {"artwork_times", [](zal_ipod_handle *h) { return zal_ipod_current_track_artwork_times(h, 2); },
     45, [] { return serialize_int(2); }, nullptr},
};

TEST(PlaybackCommands, SendTheirOpcodeArgumentAndSlot) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d);
    ASSERT_NE(h, nullptr);
    for (const WireCase &c : kWireCases) {
        SCOPED_TRACE(c.name);
        d.expect(c.opcode, c.argument ? c.argument() : nullptr);
        int tid = c.send(h);
        EXPECT_GT(tid, 0);
        if (c.slot != nullptr) {
            EXPECT_EQ(h->slots.*c.slot, tid);
        }
        EXPECT_TRUE(d.finish()) << d.report();
    }
    EXPECT_EQ(h->slots.preference_class, 5u);  // the class as given, not the one sent
    zal_ipod_close(h);
}

TEST(PlaybackCommands, NotReadyHandleSendsNothing) {
    zal_ipod_handle *h = offline_handle();
    for (const WireCase &c : kWireCases) EXPECT_EQ(c.send(h), 0) << c.name;
    EXPECT_EQ(h->slots.track_info_tid, 0);
    EXPECT_EQ(h->slots.artwork_tid, 0);
    zal_ipod_close(h);
}

// ---- _sync results ---------------------------------------------------------------------

struct SyncCase {
    const char *name;
    std::function<int(zal_ipod_handle *)> call;
    uint8_t opcode;
    std::function<gval *()> argument;
    std::function<gval *()> answer;  // nullptr: RETURN without payload
    int result;
    std::function<void(zal_ipod_handle *)> check;  // nullptr: nothing more
};

const SyncCase kSyncCases[] = {
    {"preference_mapped", [](zal_ipod_handle *h) { return zal_ipod_get_preference_sync(h, 8); }, 61,
     [] { return serialize_int(8); }, [] { return serialize_int(2); }, 9, nullptr},
    {"preference_pair_without_setting",
     [](zal_ipod_handle *h) { return zal_ipod_get_preference_sync(h, 8); }, 61,
     [] { return serialize_int(8); }, [] { return serialize_int(0); }, 255, nullptr},
    {"preference_unknown_class",
     [](zal_ipod_handle *h) { return zal_ipod_get_preference_sync(h, 5); }, 61,
     [] { return serialize_int(0); }, [] { return serialize_int(1); }, 255, nullptr},
    {"preference_error", [](zal_ipod_handle *h) { return zal_ipod_get_preference_sync(h, 13); }, 61,
     [] { return serialize_int(13); },
     [] {
         return hash_of({{"error", serialize_string("no")}});
     },
     255, nullptr},
    {"preference_class_13", [](zal_ipod_handle *h) { return zal_ipod_get_preference_sync(h, 13); },
     61, [] { return serialize_int(13); }, [] { return serialize_int(1); }, 18, nullptr},
    {"raw_preference", [](zal_ipod_handle *h) { return zal_ipod_get_ipod_preference_sync(h, 8); },
     61, [] { return serialize_int(8); }, [] { return serialize_int(3); }, 3, nullptr},
    {"raw_preference_not_an_integer",
     [](zal_ipod_handle *h) { return zal_ipod_get_ipod_preference_sync(h, 8); }, 61,
     [] { return serialize_int(8); }, [] { return serialize_string("3"); }, 255, nullptr},
    {"raw_preference_no_payload",
     [](zal_ipod_handle *h) { return zal_ipod_get_ipod_preference_sync(h, 8); }, 61,
     [] { return serialize_int(8); }, nullptr, 255, nullptr},
    {"set_preference", [](zal_ipod_handle *h) { return zal_ipod_set_preference_sync(h, 8, 10); },
     60,
     [] {
         return ints({8, 3});
     },
     [] { return serialize_int(0); }, 0, nullptr},
    {"audiobook", zal_ipod_current_track_is_audiobook_sync, 41, nullptr,
     [] {
         return hash_of({{"is_audiobook_explicitly", serialize_int(1)}});
     },
     1, nullptr},
    {"video_key_missing", zal_ipod_current_track_contains_video_sync, 42, nullptr,
     [] {
         return hash_of({{"is_audiobook_explicitly", serialize_int(1)}});
     },
     -1, nullptr},
    {"current_draw", zal_ipod_device_current_draw_sync, 47, nullptr,
     [] {
         return hash_of({{"current_draw", serialize_int(500)}});
     },
     500, nullptr},
    {"charge_not_a_hash", zal_ipod_device_charge_if_power_sync, 48, nullptr,
     [] { return serialize_int(1); }, -1, nullptr},
    {"track_index", zal_ipod_get_current_track_index_sync, 50, nullptr,
     [] { return serialize_int(7); }, 7,
     [](zal_ipod_handle *h) { EXPECT_EQ(zal_ipod_current_track_index(h), 7); }},
    {"track_index_error", zal_ipod_get_current_track_index_sync, 50, nullptr,
     [] {
         return hash_of({{"error", serialize_string("x")}});
     },
     -1, [](zal_ipod_handle *h) { EXPECT_EQ(zal_ipod_current_track_index(h), -1); }},
    {"shuffle", zal_ipod_get_shuffle_sync, 52, nullptr, [] { return serialize_int(2); }, 2,
     nullptr},
    {"shuffle_worker", _zal_ipod_get_shuffle_sync, 52, nullptr, [] { return serialize_int(1); }, 1,
     nullptr},
    {"repeat", zal_ipod_get_repeat_sync, 54, nullptr, [] { return serialize_int(1); }, 1, nullptr},
    {"chapter_index", zal_ipod_get_chapter_index_sync, 125, nullptr,
     [] { return serialize_int(3); }, 3, nullptr},
    {"chapter_count", _zal_ipod_get_chapter_count_sync, 126, nullptr,
     [] { return serialize_int(9); }, 9, nullptr},
    {"chapter_play_status",
     [](zal_ipod_handle *h) {
         return zal_ipod_get_current_playing_track_chapter_play_status_sync(h, 1);
     },
     128, [] { return serialize_int(1); },
     [] {
         return hash_of({{"chapter_length", serialize_int(60000)}});
     },
     0,
     [](zal_ipod_handle *h) {
         EXPECT_EQ(zal_ipod_current_chapter_length(h), 60000);
         EXPECT_EQ(zal_ipod_current_chapter_position(h), -1);
     }},
    {"image_limits", zal_ipod_get_color_display_image_limits_sync, 71, nullptr,
     [] {
         return hash_of({{"maxImageWidth", serialize_int(320)},
                         {"maxImageHeigh", serialize_int(240)},
                         {"pixelFormat", serialize_int(2)}});
     },
     1,
     [](zal_ipod_handle *h) {
         EXPECT_EQ(zal_ipod_get_color_display_image_limits_maxImageWidth(h), 320);
         EXPECT_EQ(zal_ipod_get_color_display_image_limits_maxImageHeigh(h), 240);
         EXPECT_EQ(zal_ipod_get_color_display_image_limits_pixelFormat(h), 2);
     }},
    {"image_limits_not_a_hash", zal_ipod_get_color_display_image_limits_sync, 71, nullptr,
     [] { return serialize_string("none"); }, 1,
     [](zal_ipod_handle *h) {
         EXPECT_EQ(zal_ipod_get_color_display_image_limits_maxImageWidth(h), 320);
     }},
    {"image_limits_partial", zal_ipod_get_color_display_image_limits_sync, 71, nullptr,
     [] {
         return hash_of({{"maxImageWidth", serialize_int(100)}});
     },
     1,
     [](zal_ipod_handle *h) {
         EXPECT_EQ(zal_ipod_get_color_display_image_limits_maxImageWidth(h), 100);
         EXPECT_EQ(zal_ipod_get_color_display_image_limits_maxImageHeigh(h), 0);
     }},
    {"image_limits_no_payload", zal_ipod_get_color_display_image_limits_sync, 71, nullptr, nullptr,
     0, nullptr},
    {"track_info", zal_ipod_current_track_info_sync, 39, nullptr,
     [] {
         return hash_of({{"current_track_info", serialize_int(1)},
                         {"title", serialize_string("Morning Drive")},
                         {"length", serialize_int(215000)}});
     },
     1,
     [](zal_ipod_handle *h) {
         EXPECT_STREQ(zal_ipod_current_track_title(h), "Morning Drive");
         EXPECT_EQ(zal_ipod_current_track_length(h), 215000);
     }},
};

TEST(PlaybackSync, DecodeTheirReplies) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d);
    ASSERT_NE(h, nullptr);
    for (const SyncCase &c : kSyncCases) {
        SCOPED_TRACE(c.name);
        d.expect(c.opcode, c.argument ? c.argument() : nullptr)
            .reply(c.answer ? c.answer() : nullptr);
        EXPECT_EQ(c.call(h), c.result);
        if (c.check) c.check(h);
        EXPECT_TRUE(d.finish()) << d.report();
    }
    zal_ipod_close(h);
}

TEST(PlaybackSync, NoReplyGivesEachCommandsOwnFailure) {
    zal_ipod_handle *h = offline_handle();  // not ready: nothing is sent, nothing comes back
    EXPECT_EQ(zal_ipod_get_preference_sync(h, 8), 255);
    EXPECT_EQ(zal_ipod_get_ipod_preference_sync(h, 8), 255);
    EXPECT_EQ(zal_ipod_get_color_display_image_limits_sync(h), 0);
    EXPECT_EQ(zal_ipod_current_track_info_sync(h), -1);
    h->playback.track_index = 5;
    EXPECT_EQ(zal_ipod_get_current_track_index_sync(h), -1);
    EXPECT_EQ(zal_ipod_current_track_index(h), -1);
    zal_ipod_close(h);
}

// ---- Preference numbers ----------------------------------------------------------------

TEST(PreferenceNumbers, EverySettingMapsBackToItself) {
    const uint32_t classes[] = {0, 1, 2, 3, 8, 9, 10, 12, 13};
    int found = 0;
    for (int32_t setting = 0; setting <= 18; ++setting) {
        const int32_t value = zal_preference_value(setting);
        for (uint32_t c : classes)
            if (zal_preference_setting(c, value) == setting) ++found;
    }
    EXPECT_EQ(found, 19);  // exactly one class per setting
    for (uint32_t c = 0; c < 16; ++c) {
        const bool known = c <= 3 || c == 8 || c == 9 || c == 10 || c == 12 || c == 13;
        EXPECT_EQ(zal_preference_class(c), known ? c : 0u) << c;
    }
    for (int32_t setting : {-1, 19, 255}) EXPECT_EQ(zal_preference_value(setting), 0);
    EXPECT_EQ(zal_preference_setting(8, 0), 255);
    EXPECT_EQ(zal_preference_setting(0, -1), 255);
    EXPECT_EQ(zal_preference_setting(5, 1), 255);
}

// ---- Session open, revision, health examination ----------------------------------------

TEST(PlaybackCache, SessionOpenForgetsNumbersButKeepsTexts) {
    FakeDaemon d;
    zal_ipod_handle *h = connect_with_session(d);
    ASSERT_NE(h, nullptr);
    fill_cache(h);
    h->playback.shuffle_state = 1;
    h->playback.chapter_count = 4;
    d.expect(ZAL_OP_OPEN_SESSION, serialize_int(0))
        .reply(hash_of(
            {{"result", serialize_int(1)}, {"devices", device_list({device_entry("P", 1, 1)})}}));
    EXPECT_EQ(zal_ipod_open_session_sync(h, 0), 1);
    EXPECT_TRUE(d.finish()) << d.report();
    EXPECT_STREQ(zal_ipod_current_track_title(h), "Old title");
    EXPECT_STREQ(zal_ipod_current_track_artist(h), "Old artist");
    EXPECT_EQ(zal_ipod_current_track_length(h), -1);
    EXPECT_EQ(zal_ipod_current_track_position(h), -1);
    EXPECT_EQ(zal_ipod_current_track_state(h), -1);
    EXPECT_EQ(zal_ipod_current_chapter_count(h), 0);
    EXPECT_EQ(zal_ipod_current_track_timestamp(h), 0);
    EXPECT_EQ(zal_ipod_current_shuffle_state(h), 1);
    zal_ipod_close(h);
}

TEST(PlaybackCache, LastKnownLibraryRevisionIsAnOwnedCopy) {
    zal_ipod_handle *h = offline_handle();
    EXPECT_EQ(zal_ipod_last_known_librevision(h), nullptr);
    std::string revision = "rev-1";
    zal_ipod_set_last_known_librevision(h, revision.c_str());
    revision[4] = '2';
    EXPECT_STREQ(zal_ipod_last_known_librevision(h), "rev-1");
    zal_ipod_set_last_known_librevision(h, "rev-3");
    EXPECT_STREQ(zal_ipod_last_known_librevision(h), "rev-3");
    zal_ipod_free_last_known_librevision(h);
    EXPECT_EQ(zal_ipod_last_known_librevision(h), nullptr);
    zal_ipod_set_last_known_librevision(h, "kept until close");  // the close frees it
    zal_ipod_close(h);
}

TEST(PlaybackCache, GettersOfNoHandleGiveTheirDefaults) {
    EXPECT_EQ(zal_ipod_current_track_title(nullptr), nullptr);
    EXPECT_EQ(zal_ipod_playing_app(nullptr), nullptr);
    EXPECT_EQ(zal_ipod_current_track_length(nullptr), -1);
    EXPECT_EQ(zal_ipod_current_track_artwork_data(nullptr), nullptr);
    EXPECT_EQ(zal_ipod_current_track_artwork_length(nullptr), 0u);
}

TEST(HealthExamine, GoesOutWithoutASessionAndReturnsTheReply) {
    FakeDaemon d;
    gval *sent = serialize_array();
    serialize_array_add(sent, serialize_string("probe"));
    serialize_array_add(sent, serialize_int(7));
    d.expect(ZAL_OP_HELLO)
        .reply(serialize_array())
        .expect(ZAL_OP_HEALTH_EXAMINE, sent)
        .reply(hash_of({{"status", serialize_string("ok")}}))
        .expect(ZAL_OP_HEALTH_EXAMINE, [] {
            gval *a = serialize_array();
            serialize_array_add(a, serialize_string("bare"));
            return a;
        }());
    zal_ipod_handle *h = zal_ipod_connect(nullptr);
    ASSERT_NE(h, nullptr);
    ASSERT_EQ(zal_ipod_is_ready(h), 0);
    gval *reply = zal_ipod_health_examine(h, "probe", serialize_int(7));
    ASSERT_NE(reply, nullptr);
    EXPECT_STREQ(zal_hash_string(reply, "status"), "ok");
    serialize_free(reply);
    zal_ipod_set_read_timeout(h, 0, 0);
    EXPECT_EQ(zal_ipod_health_examine(h, "bare", nullptr), nullptr);  // no reply: NULL
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

}  // namespace
