// Now playing end to end: the client library against zald-sim. Track changes and the
// events they push, track information, chapters, and artwork through the shared file and
// inline.
#include <gtest/gtest.h>

#include <chrono>
#include <functional>
#include <set>
#include <string>

#include "sim_fixture.h"
#include "zal-ipod-2/connection.h"
#include "zal-ipod-2/handle.h"
#include "zal-ipod-2/zal-ipod-2.h"

namespace zaltest {
namespace {

// Two phones with the same small library: one hands out pictures through the shared file,
// the other inline. The red album's first pixel is pure red in RGB 5-6-5.
const char *kScenario = R"json({
  "name": "now playing",
  "devices": [
    {"serial": "FILEPHONE001", "protocol": 2,
     "artwork": {"delivery": "file", "width": 64, "height": 48, "pixel_format": 2},
     "tracks": [
       {"title": "Red One", "artist": "Primaries", "album": "Red", "album_color": "#ff0000",
        "length_ms": 200000, "uid": 81985529216486895, "sample_rate": 48000,
        "chapters": [{"title": "Intro", "length_ms": 60000}, {"title": "Main", "length_ms": 140000}]},
       {"title": "Blue Two", "artist": "Primaries", "album": "Blue", "album_color": "#0000ff",
        "length_ms": 150000}
     ]},
    {"serial": "INLINEPHONE2", "protocol": 2,
     "artwork": {"delivery": "inline", "width": 32, "height": 16, "pixel_format": 3},
     "tracks": [
       {"title": "Red One", "artist": "Primaries", "album": "Red", "album_color": "#ff0000",
        "length_ms": 200000}
     ]}
  ]
})json";

struct Kinds {
    std::set<int> seen;
};

int note_kind(zal_ipod_handle *, zal_ipod_event *e, void *user) {
    static_cast<Kinds *>(user)->seen.insert(e->kind);
    return 0;
}

class SimNowPlaying : public SimTest {
  protected:
    void TearDown() override {
        if (h != nullptr) zal_ipod_close(h);
        zal_set_daemon_socket_name(nullptr);
        SimTest::TearDown();
    }
    // Starts zald-sim (with the scenario when given) and opens a library session.
    void connect_library(int device, bool with_scenario = true) {
        if (with_scenario) {
            file = std::make_unique<ScenarioFile>(kScenario);
            start({"-f", file->path()});
        } else {
            start();
        }
        zal_set_daemon_socket_name(sim->socket_name().c_str());
        h = zal_ipod_connect(nullptr);
        ASSERT_NE(h, nullptr);
        zal_ipod_set_event_cb(h, note_kind, &kinds);
        ASSERT_EQ(zal_ipod_open_session_sync(h, device), 1);
        ASSERT_TRUE(pump([&] { return zal_ipod_is_ready(h) == 1; }));
    }
    // Reads and dispatches until done() or five seconds passed.
    bool pump(const std::function<bool()> &done) {
        const auto until = std::chrono::steady_clock::now() + std::chrono::seconds(5);
        while (!done()) {
            if (std::chrono::steady_clock::now() > until) return false;
            zal_ipod_read(h);
        }
        return true;
    }

    std::unique_ptr<ScenarioFile> file;
    zal_ipod_handle *h = nullptr;
    Kinds kinds;
};

TEST_F(SimNowPlaying, NextTrackUpdatesTheCacheAndTrackInformation) {
    connect_library(0, false);  // the built-in phone: paused in "Morning Drive"
    ASSERT_EQ(zal_ipod_current_track_info_sync(h), 1);
    EXPECT_STREQ(zal_ipod_current_track_title(h), "Morning Drive");
    EXPECT_EQ(zal_ipod_current_track_position(h), 42000);
    EXPECT_EQ(zal_ipod_current_track_state(h), 2);

    ASSERT_EQ(zal_ipod_next_track_sync(h), 0);
    ASSERT_TRUE(pump([&] {
        return kinds.seen.count(ZALIPOD_EVENT_ARTWORK_TRANSFER_DONE) > 0 &&
               zal_ipod_current_track_index(h) == 1;
    }));
    for (int kind : {ZALIPOD_EVENT_TRACK_CHANGED, ZALIPOD_EVENT_TRACK_POSITION_CHANGED,
                     ZALIPOD_EVENT_CHAPTER_CHANGED, ZALIPOD_EVENT_SAMPLERATE_RETRIEVED})
        EXPECT_EQ(kinds.seen.count(kind), 1u) << kind;
    EXPECT_EQ(zal_ipod_current_track_position(h), 0);
    EXPECT_EQ(zal_ipod_current_sample_rate(h), 44100);
    EXPECT_EQ(zal_ipod_current_chapter_count(h), 0);
    EXPECT_STREQ(zal_ipod_current_track_artwork_name(h), "Test Patterns");

    ASSERT_EQ(zal_ipod_current_track_info_sync(h), 1);
    EXPECT_STREQ(zal_ipod_current_track_title(h), "Loopback");
    EXPECT_STREQ(zal_ipod_current_track_artist(h), "The Simulators");
    EXPECT_STREQ(zal_ipod_current_track_album(h), "Test Patterns");
    EXPECT_EQ(zal_ipod_current_track_length(h), 187000);
    EXPECT_EQ(zal_ipod_current_track_index(h), 1);
    EXPECT_EQ(zal_ipod_current_number_of_tracks(h), 4);
    EXPECT_EQ(zal_ipod_current_track_has_artwork(h), 1);
    EXPECT_GT(zal_ipod_current_track_timestamp(h), 0);

    ASSERT_EQ(zal_ipod_set_shuffle_sync(h, 1), 0);
    ASSERT_EQ(zal_ipod_set_repeat_sync(h, 2), 0);
    ASSERT_TRUE(pump([&] {
        return zal_ipod_current_shuffle_state(h) == 1 && zal_ipod_current_repeat_state(h) == 2;
    }));
    EXPECT_EQ(zal_ipod_get_shuffle_sync(h), 1);
    EXPECT_EQ(zal_ipod_set_preference_sync(h, 8, 10), 0);
    EXPECT_EQ(zal_ipod_get_preference_sync(h, 8), 10);
}

TEST_F(SimNowPlaying, ChaptersOfTheCurrentTrack) {
    connect_library(0);
    ASSERT_EQ(zal_ipod_current_track_info_sync(h), 1);
    EXPECT_STREQ(zal_ipod_current_track_chapter(h), "Intro");
    EXPECT_EQ(zal_ipod_current_track_has_chapters(h), 1);
    EXPECT_EQ(zal_ipod_get_chapter_count_sync(h), 2);
    EXPECT_EQ(zal_ipod_current_track_sample_rate_sync(h), 48000);

    ASSERT_EQ(zal_ipod_set_current_playing_track_chapter_sync(h, 1), 0);
    ASSERT_TRUE(pump([&] { return zal_ipod_current_chapter_index(h) == 1; }));
    EXPECT_EQ(zal_ipod_current_chapter_count(h), 2);
    EXPECT_EQ(zal_ipod_get_chapter_index_sync(h), 1);
    EXPECT_EQ(zal_ipod_get_current_playing_track_chapter_play_status_sync(h, 1), 0);
    EXPECT_EQ(zal_ipod_current_chapter_length(h), 140000);
    EXPECT_EQ(zal_ipod_current_chapter_position(h), 0);
    EXPECT_EQ(zal_ipod_set_current_playing_track_chapter_sync(h, 5), -1);
    EXPECT_NE(zal_ipod_get_error_message(h), nullptr);

    int32_t *times = nullptr;
    int32_t count = 0;
    ASSERT_EQ(zal_ipod_current_track_artwork_times_sync(h, 0, &times, &count), 1);
    ASSERT_EQ(count, 2);
    EXPECT_EQ(times[0], 0);
    EXPECT_EQ(times[1], 60000);
    free(times);
}

TEST_F(SimNowPlaying, ArtworkThroughTheSharedFile) {
    connect_library(0);
    ASSERT_EQ(zal_ipod_current_track_artwork_sync(h, 0), 1);
    EXPECT_EQ(zal_ipod_current_track_artwork_width(h), 64);
    EXPECT_EQ(zal_ipod_current_track_artwork_height(h), 48);
    EXPECT_EQ(zal_ipod_current_track_artwork_rowstride(h), 128);
    EXPECT_EQ(zal_ipod_current_track_artwork_length(h), 48u * 128u);
    ASSERT_NE(h->artwork.mapping, nullptr);
    const unsigned char *pixels = zal_ipod_current_track_artwork_data(h);
    EXPECT_EQ(pixels, h->artwork.mapping);
    EXPECT_EQ(pixels[0], 0x00);  // 0xF800, least significant byte first
    EXPECT_EQ(pixels[1], 0xF8);
    void *mapping = h->artwork.mapping;

    // The next track's picture lands in the same file: the mapping is kept, the pixels
    // are the blue album's.
    ASSERT_EQ(zal_ipod_next_track_sync(h), 0);
    ASSERT_EQ(zal_ipod_current_track_artwork_sync(h, 0), 1);
    EXPECT_EQ(h->artwork.mapping, mapping);
    EXPECT_EQ(pixels[0], 0x1F);
    EXPECT_EQ(pixels[1], 0x00);

    // The first track by its identifier (0x0123456789ABCDEF), and an unknown one.
    ASSERT_EQ(zal_ipod_track_artwork_by_uid_sync(h, 0x0123456789ABCDEFull), 1);
    EXPECT_EQ(pixels[1], 0xF8);
    EXPECT_EQ(zal_ipod_track_artwork_by_uid_sync(h, 42), -1);
    EXPECT_EQ(h->artwork.mapping, mapping);  // a failed reply keeps the picture

    // A picture at a time position is the same gradient moved along.
    ASSERT_EQ(zal_ipod_current_track_pos_artwork_sync(h, 0, 30000), 1);
    EXPECT_NE(pixels[0] | (pixels[1] << 8), 0x001F);
}

TEST_F(SimNowPlaying, ArtworkInline) {
    connect_library(1);
    ASSERT_EQ(zal_ipod_current_track_artwork_sync(h, 0), 1);
    EXPECT_EQ(h->artwork.mapping, nullptr);
    EXPECT_EQ(zal_ipod_current_track_artwork_pixel_format(h), 3);
    EXPECT_EQ(zal_ipod_current_track_artwork_length(h), 16u * 64u);
    const unsigned char *pixels = zal_ipod_current_track_artwork_data(h);
    ASSERT_NE(pixels, nullptr);
    EXPECT_EQ(pixels[0], 0xF8);  // most significant byte first
    EXPECT_EQ(pixels[1], 0x00);
}

}  // namespace
}  // namespace zaltest
