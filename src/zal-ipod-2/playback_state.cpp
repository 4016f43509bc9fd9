// Playback cache: release, track reset and the cache reset of connect and session open.
#include "zal-ipod-2/playback_state.h"

#include <cstdlib>
#include <cstring>

#include "zal-ipod-2/handle.h"

void zal_replace_text(char **field, const char *text) {
    char *copy = text != nullptr ? strdup(text) : nullptr;
    free(*field);
    *field = copy;
}

zal_playback_state::~zal_playback_state() {
    free(title);
    free(chapter_name);
    free(artist);
    free(album);
    free(last_known_librevision);
    free(artwork_name);
}

void zal_playback_state::forget_track() {
    zal_replace_text(&title, nullptr);
    zal_replace_text(&chapter_name, nullptr);
    zal_replace_text(&artist, nullptr);
    zal_replace_text(&album, nullptr);
    zal_replace_text(&artwork_name, nullptr);
    track_length = -1;
    track_position = -1;
    play_state = -1;
    track_index = -1;
}

void zal_playback_cache_reset(zal_ipod_handle *h) {
    zal_playback_state &p = h->playback;
    p.track_length = -1;
    p.track_position = -1;
    p.play_state = -1;
    p.number_of_tracks = -1;
    p.track_index = -1;
    p.chapter_index = -1;
    p.chapter_count = 0;
    p.chapter_length = -1;
    p.chapter_position = -1;
    p.sample_rate = -1;
    p.timestamp = 0;
    p.timestamp_usec = 0;
    p.has_artwork = -1;
    h->protocol = 0;
    h->artwork.reset();
    h->records.reset();
    h->browser.reset();
}

zal_state_guard::zal_state_guard(zal_ipod_handle *h) : lock_(&h->state_lock) {
    pthread_mutex_lock(lock_);
}
zal_state_guard::~zal_state_guard() {
    pthread_mutex_unlock(lock_);
}

namespace {
struct preference_pair {
    uint32_t preference_class;
    int32_t value;
};
// Index = setting number.
constexpr preference_pair kPreferenceSettings[] = {
    {0, 0}, {0, 1}, {1, 0}, {1, 1},  {2, 0},  {2, 1},  {3, 0},  {3, 1},  {8, 1},  {8, 2},
    {8, 3}, {9, 0}, {9, 1}, {10, 0}, {10, 1}, {12, 0}, {12, 1}, {13, 0}, {13, 1},
};
constexpr std::size_t kSettings = sizeof kPreferenceSettings / sizeof kPreferenceSettings[0];
}  // namespace

uint32_t zal_preference_class(uint32_t preference_class) {
    // The classes are the ones the settings table names.
    for (const preference_pair &p : kPreferenceSettings)
        if (p.preference_class == preference_class) return preference_class;
    return 0;
}

int32_t zal_preference_value(int32_t setting) {
    // Setting 0 is (class 0, value 0): 0 either way.
    if (setting < 1 || static_cast<std::size_t>(setting) >= kSettings) return 0;
    return kPreferenceSettings[setting].value;
}

int32_t zal_preference_setting(uint32_t preference_class, int32_t value) {
    for (std::size_t i = 0; i < kSettings; ++i)
        if (kPreferenceSettings[i].preference_class == preference_class &&
            kPreferenceSettings[i].value == value)
            return static_cast<int32_t>(i);
    return kNoPreferenceSetting;
}
