// The media browser end to end on zald-sim: from an artist to one of its albums to a track,
// played on the iAP2 device (identifier list) and the iAP1 device (database record), and an
// album played as a collection; the player's current track tells what was played.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "sim_fixture.h"
#include "zal-ipod-2/connection.h"
#include "zal-ipod-2/handle.h"
#include "zal-ipod-2/zal-ipod-2.h"

namespace zaltest {
namespace {

using Names = std::vector<std::string>;

Names take(char **list) {
    Names out;
    if (list == nullptr) return out;
    for (int i = 0; list[i] != nullptr; ++i) {
        out.emplace_back(list[i]);
        free(list[i]);
    }
    free(list);
    return out;
}

std::string take_text(char *text) {
    std::string out = text != nullptr ? text : "";
    free(text);
    return out;
}

class SimBrowserTest : public SimTest, public ::testing::WithParamInterface<int> {
  protected:
    void TearDown() override {
        if (h != nullptr) zal_ipod_close(h);
        SimTest::TearDown();
    }

    void open_library_session(int32_t index) {
        zal_set_daemon_socket_name(sim->socket_name().c_str());
        h = zal_ipod_connect(nullptr);
        ASSERT_NE(h, nullptr);
        ASSERT_EQ(zal_ipod_open_session_sync(h, index), 1);
        for (int i = 0; i < 40 && h->ready.load() == 0; ++i) zal_ipod_events_iterate(h);
        ASSERT_NE(h->ready.load(), 0u) << "the device never became ready";
    }

    std::string playing_title(int32_t device) {
        if (!raw_session) {
            open_session(*client, device);
            raw_session = true;
        }
        auto reply = client->call(kOpCurrentTrackInfo);
        return reply ? string_at(*reply, "title") : "";
    }

    // Selects category c, lists all of its items and selects item index; returns the list.
    Names choose(int category, int index) {
        EXPECT_EQ(zal_ipod_media_lib_select_category(h, category), 1);
        const int n = zal_ipod_media_lib_get_items_count(h);
        EXPECT_GT(n, index);
        if (n <= index) return {};
        Names names = take(zal_ipod_media_lib_get_items(h, 0, n));
        EXPECT_EQ(static_cast<int>(names.size()), n);
        EXPECT_EQ(zal_ipod_media_lib_select_item(h, index), 1);
        return names;
    }

    zal_ipod_handle *h = nullptr;
    bool raw_session = false;
};

TEST_P(SimBrowserTest, ArtistToAlbumToTrackAndPlayIt) {
    const int device = GetParam();
    start();
    open_library_session(device);
    ASSERT_EQ(zal_ipod_media_lib_reset_selection(h, 1), 1);
    EXPECT_EQ(take(zal_ipod_media_lib_get_categories(h)).size(), 11u);

    const Names artists = choose(2, 0);
    ASSERT_FALSE(artists.empty());
    EXPECT_EQ(take(zal_ipod_media_lib_get_categories(h)), (Names{"ALBUM", "TRACK"}));
    const Names albums = choose(3, 0);
    ASSERT_FALSE(albums.empty());
    EXPECT_EQ(take(zal_ipod_media_lib_get_categories(h)), (Names{"TRACK"}));
    const Names tracks = choose(5, 1);
    ASSERT_GT(tracks.size(), 1u);
    EXPECT_EQ(take(zal_ipod_media_lib_get_current_selection(h)),
              (Names{"ARTIST", artists[0], "ALBUM", albums[0], "TRACK", tracks[1]}));
    EXPECT_EQ(zal_ipod_media_lib_get_current_selection_start_index(h), 1);

    // The track records of the album agree with the names walked.
    ASSERT_EQ(zal_ipod_media_lib_undo_selection(h, 5), 1);
    const int count = static_cast<int>(tracks.size());
    const void *info = zal_ipod_media_lib_get_tracks_info(h, 0, 0, count);
    ASSERT_NE(info, nullptr);
    char *text = nullptr;
    ASSERT_EQ(zal_ipod_media_lib_get_track_name(h, info, 1, &text), 1);
    EXPECT_EQ(take_text(text), tracks[1]);
    ASSERT_EQ(zal_ipod_media_lib_get_track_artist(h, info, 1, &text), 1);
    EXPECT_EQ(take_text(text), artists[0]);
    ASSERT_EQ(zal_ipod_media_lib_get_track_album(h, info, 1, &text), 1);
    EXPECT_EQ(take_text(text), albums[0]);
    uint64_t uid = 0;
    EXPECT_EQ(zal_ipod_media_lib_get_track_uid(h, info, 1, &uid), 1);
    EXPECT_NE(uid, 0u);

    // Back on the track (its page fetched again), and play it: the album becomes the play
    // queue from that track.
    EXPECT_EQ(zal_ipod_media_lib_get_items_count(h), count);
    EXPECT_EQ(take(zal_ipod_media_lib_get_items(h, 0, count)), tracks);
    ASSERT_EQ(zal_ipod_media_lib_select_item(h, 1), 1);
    ASSERT_EQ(zal_ipod_media_lib_play_current_selection(h, 1), 1);
    EXPECT_EQ(playing_title(device), tracks[1]);
    ASSERT_EQ(zal_ipod_media_lib_play_current_selection(h, count - 1), 1);
    EXPECT_EQ(playing_title(device), tracks[static_cast<size_t>(count - 1)]);
}

TEST_P(SimBrowserTest, AnAlbumChosenAtTheTopPlaysFromItsFirstTrack) {
    const int device = GetParam();
    start();
    open_library_session(device);
    ASSERT_EQ(zal_ipod_media_lib_reset_selection(h, 1), 1);
    const Names albums = choose(3, 2);
    ASSERT_GT(albums.size(), 2u);
    ASSERT_EQ(zal_ipod_media_lib_play_current_selection(h, 0), 1);
    const std::string playing = playing_title(device);
    // iAP2 plays the album as a collection and keeps two levels; iAP1 walks down to its
    // first track.
    const int levels = zal_ipod_media_lib_get_current_selection_count(h);
    EXPECT_EQ(levels, device == 0 ? 2 : 4);
    if (levels == 2) {
        const Names tracks = choose(5, 0);
        ASSERT_FALSE(tracks.empty());
        EXPECT_EQ(playing, tracks[0]);
    } else {
        EXPECT_EQ(playing, take(zal_ipod_media_lib_get_current_selection(h)).back());
    }
}

INSTANTIATE_TEST_SUITE_P(Devices, SimBrowserTest, ::testing::Values(0, 1),
                         [](const auto &info) { return info.param == 0 ? "Iap2" : "Iap1"; });

}  // namespace
}  // namespace zaltest
