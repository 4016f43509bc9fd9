// Playback cache of the client handle: what the device is playing, filled by replies,
// by the dispatcher's events and read by the playback getters without traffic.
#pragma once

#include <pthread.h>

#include <cstdint>

struct zal_ipod_handle;
struct zal_ipod_reply;

struct zal_playback_state {
    char *title = nullptr;
    char *chapter_name = nullptr;
    char *artist = nullptr;
    char *album = nullptr;
    char *last_known_librevision = nullptr;
    char *artwork_name = nullptr;
    int32_t track_length = 0;
    int32_t track_position = 0;
    int32_t play_state = 0;
    int32_t init_state = 0;
    char playing_app[256] = {};
    int32_t number_of_tracks = 0;
    int32_t track_index = 0;
    int32_t chapter_index = 0;
    int32_t chapter_count = 0;
    int32_t chapter_length = 0;
    int32_t chapter_position = 0;
    int32_t sample_rate = 0;
    int32_t timestamp = 0;
    int32_t timestamp_usec = 0;
    int32_t has_artwork = 0;
    int32_t has_chapters = 0;
    int32_t shuffle_state = 0;
    int32_t repeat_state = 0;
    int32_t max_image_width = 0;
    int32_t max_image_height = 0;
    int32_t image_pixel_format = 0;

    zal_playback_state() = default;
    zal_playback_state(const zal_playback_state &) = delete;
    zal_playback_state &operator=(const zal_playback_state &) = delete;
    ~zal_playback_state();

    // Forgets the current track: the texts are released and the numbers become unknown.
    void forget_track();
};

// Cache reset run at connect and at every session open: the per-track numbers become
// unknown, the artwork and record state are cleared and the protocol is forgotten. Texts,
// shuffle, repeat, init state, playing application and display limits survive.
void zal_playback_cache_reset(zal_ipod_handle *h);

// Replaces *field by a copy of text (NULL clears it); the old text is released.
void zal_replace_text(char **field, const char *text);

// Preference numbers. A class the device does not know becomes class 0.
uint32_t zal_preference_class(uint32_t preference_class);
// Setting number of a (class, value) preference pair; 255 when the pair has none.
int32_t zal_preference_setting(uint32_t preference_class, int32_t value);
// Value of a setting number (1..18); 0 for any other number.
int32_t zal_preference_value(int32_t setting);
// Setting number meaning "no such setting".
constexpr int32_t kNoPreferenceSetting = 255;

// Holds the handle's state lock while a decoder writes the cache: a dispatcher on another
// thread may apply an event or another reply to the same fields at the same time.
class zal_state_guard {
  public:
    explicit zal_state_guard(zal_ipod_handle *h);
    ~zal_state_guard();
    zal_state_guard(const zal_state_guard &) = delete;
    zal_state_guard &operator=(const zal_state_guard &) = delete;

  private:
    pthread_mutex_t *lock_;
};

// Decoders of the playback replies (the _sync forms and replies outside a wait).
// Track information with the result key "current_track_info" / "indexed_track_info".
int32_t zal_decode_current_track_info(zal_ipod_handle *h, const zal_ipod_reply *reply);
int32_t zal_decode_indexed_track_info(zal_ipod_handle *h, const zal_ipod_reply *reply);
int32_t zal_decode_play_state(zal_ipod_handle *h, const zal_ipod_reply *reply);
int32_t zal_decode_chapter_status(zal_ipod_handle *h, const zal_ipod_reply *reply);
int32_t zal_decode_sample_rate(zal_ipod_handle *h, const zal_ipod_reply *reply);
