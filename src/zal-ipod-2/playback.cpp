// Playback commands and the current-track cache: what the device plays and where, its
// queries and setters, the device preferences with their setting numbers, the colour
// display limits, the health examination, and the getters that read the cache without
// traffic.
//
// Replies the daemon always completes: a reply without "error" that lacks the key a
// decoder takes as always sent ("current_track_info", "current_play_status",
// "sample_rate", "current_draw", ...) is treated as malformed: the result is -1 and the
// cache is left as it was, rather than filled from a reply that cannot be trusted.
#include <cstdlib>

#include "common/log.h"
#include "zal-ipod-2/command.h"
#include "zal-ipod-2/packet.h"
#include "zal-ipod-2/playback_state.h"

namespace {

using S = zal_pending_slots;

// Track information; the result key names the request the reply answers.
template <const char *result_key>
int32_t read_track_info(zal_ipod_handle *h, const gval *hash) {
    gval *result = serialize_hash_get(hash, result_key);
    if (zal_kind(result) != SERIALIZE_INT) return -1;
    zal_state_guard lock(h);
    zal_playback_state &p = h->playback;
    const struct {
        const char *key;
        char *zal_playback_state::*field;
    } texts[] = {
        {"title", &zal_playback_state::title},
        {"chapter", &zal_playback_state::chapter_name},
        {"artist", &zal_playback_state::artist},
        {"album", &zal_playback_state::album},
        {"artworkName", &zal_playback_state::artwork_name},
    };
    for (const auto &t : texts) {
        const char *text = zal_hash_string(hash, t.key);
        if (text != nullptr) zal_replace_text(&(p.*t.field), text);
    }
    const struct {
        const char *key;
        int32_t zal_playback_state::*field;
        int32_t fallback;
    } numbers[] = {
        {"artwork", &zal_playback_state::has_artwork, -1},
        {"has_chapters", &zal_playback_state::has_chapters, -1},
        {"length", &zal_playback_state::track_length, -1},
        {"position", &zal_playback_state::track_position, -1},
        {"timestamp", &zal_playback_state::timestamp, 0},
        {"timestamp_usec", &zal_playback_state::timestamp_usec, 0},
        {"state", &zal_playback_state::play_state, -1},
        {"track_index", &zal_playback_state::track_index, -1},
        {"number_of_tracks", &zal_playback_state::number_of_tracks, -1},
    };
    for (const auto &n : numbers) p.*n.field = zal_hash_int(hash, n.key, n.fallback);
    // A track of length 0 is no track: its index means nothing.
    if (p.track_length == 0) p.track_index = -1;
    return serialize_get_int(result);
}
constexpr char kCurrentTrackInfo[] = "current_track_info";
constexpr char kIndexedTrackInfo[] = "indexed_track_info";

int32_t read_play_state(zal_ipod_handle *h, const gval *hash) {
    gval *status = serialize_hash_get(hash, "current_play_status");
    if (zal_kind(status) != SERIALIZE_INT) return -1;
    zal_state_guard lock(h);
    zal_playback_state &p = h->playback;
    p.play_state = serialize_get_int(status);
    p.track_length = zal_hash_int(hash, "length", -1);
    p.track_position = zal_hash_int(hash, "position", -1);
    return p.play_state;
}

int32_t read_chapter_status(zal_ipod_handle *h, const gval *hash) {
    zal_state_guard lock(h);
    h->playback.chapter_length = zal_hash_int(hash, "chapter_length", -1);
    h->playback.chapter_position = zal_hash_int(hash, "chapter_position", -1);
    return 0;
}

int32_t read_sample_rate(zal_ipod_handle *h, const gval *hash) {
    gval *rate = serialize_hash_get(hash, "sample_rate");
    if (zal_kind(rate) != SERIALIZE_INT) return -1;
    zal_state_guard lock(h);
    h->playback.sample_rate = serialize_get_int(rate);
    return h->playback.sample_rate;
}

gval *reply_value(const zal_ipod_reply *reply) {
    if (reply == nullptr || reply->length == 0 || reply->payload == nullptr) return nullptr;
    return unserialize(reply->payload, reply->length);
}

// Power and track-flag queries: the integer under key of the reply hash; -1 without one.
// No "error" check and nothing stored: the cache learns these flags from events only.
template <const char *key>
int32_t decode_hash_key(zal_ipod_handle *, const zal_ipod_reply *reply) {
    gval *v = reply_value(reply);
    int32_t result = zal_hash_int(v, key, -1);
    serialize_free(v);
    return result;
}
constexpr char kCurrentDraw[] = "current_draw";
constexpr char kIfCharge[] = "if_charge";
constexpr char kIsAudiobook[] = "is_audiobook_explicitly";
constexpr char kContainsVideo[] = "contains_video_explicitly";

// Colour display limits: 0 without a reply, 1 for any reply with a payload. A hash with
// "error" stores its text and leaves the limits as they were (they describe the display,
// not the reply); any other hash sets the three limits, 0 for a missing key.
int32_t decode_image_limits(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    gval *v = reply_value(reply);
    if (reply == nullptr || reply->length == 0 || reply->payload == nullptr) return 0;
    if (zal_kind(v) == SERIALIZE_HASH) {
        const char *error = zal_hash_string(v, "error");
        if (error != nullptr) {
            zal_set_error_message(h, error);
        } else {
            zal_state_guard lock(h);
            h->playback.max_image_width = zal_hash_int(v, "maxImageWidth", 0);
            h->playback.max_image_height = zal_hash_int(v, "maxImageHeigh", 0);  // spelt so
            h->playback.image_pixel_format = zal_hash_int(v, "pixelFormat", 0);
        }
    }
    serialize_free(v);
    return 1;
}

// Raw preference value: 255 without a reply. A reply that is not an integer (the daemon
// sends one) gives 255 too, the number that means "no such setting"; an "error" text in
// it is stored.
int32_t decode_raw_preference(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    gval *v = reply_value(reply);
    int32_t result = kNoPreferenceSetting;
    if (zal_kind(v) == SERIALIZE_INT) {
        result = serialize_get_int(v);
    } else if (zal_kind(v) == SERIALIZE_HASH) {
        const char *error = zal_hash_string(v, "error");
        if (error != nullptr) zal_set_error_message(h, error);
    }
    serialize_free(v);
    return result;
}

}  // namespace

int32_t zal_decode_current_track_info(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    return zal_decode_hash(h, reply, read_track_info<kCurrentTrackInfo>);
}
int32_t zal_decode_indexed_track_info(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    return zal_decode_hash(h, reply, read_track_info<kIndexedTrackInfo>);
}
int32_t zal_decode_play_state(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    return zal_decode_hash(h, reply, read_play_state);
}
int32_t zal_decode_chapter_status(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    return zal_decode_hash(h, reply, read_chapter_status);
}
int32_t zal_decode_sample_rate(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    return zal_decode_hash(h, reply, read_sample_rate);
}

// Commands without an argument: async form, and a _sync form with the given decoder.
#define QUERY(name, opcode, slot, decoder)                      \
    ZAL_API int zal_ipod_##name(zal_ipod_handle *h) {           \
        return zal_cmd_send(h, opcode, nullptr, nullptr, slot); \
    }                                                           \
    ZAL_API int zal_ipod_##name##_sync(zal_ipod_handle *h) {    \
        return zal_cmd_sync(h, zal_ipod_##name(h), decoder);    \
    }

// Commands with one integer argument whose _sync form follows the integer rule.
#define INT_SETTER(name, opcode)                                        \
    ZAL_API int zal_ipod_##name(zal_ipod_handle *h, int value) {        \
        return zal_cmd_send(h, opcode, zal_arg_int(value), __func__);   \
    }                                                                   \
    ZAL_API int zal_ipod_##name##_sync(zal_ipod_handle *h, int value) { \
        return zal_cmd_sync_int(h, zal_ipod_##name(h, value));          \
    }

// Getters of the cache: no traffic, the field or `fallback` without a handle.
#define GETTER(type, name, field, fallback)                 \
    ZAL_API type zal_ipod_##name(zal_ipod_handle *h) {      \
        return h != nullptr ? h->playback.field : fallback; \
    }

extern "C" {

QUERY(current_track_info, ZAL_OP_CURRENT_TRACK_INFO, &S::track_info_tid,
      zal_decode_current_track_info)
QUERY(current_track_sample_rate, ZAL_OP_CURRENT_TRACK_SAMPLE_RATE, &S::sample_rate_tid,
      zal_decode_sample_rate)
QUERY(current_track_is_audiobook, ZAL_OP_CURRENT_TRACK_IS_AUDIOBOOK, nullptr,
      decode_hash_key<kIsAudiobook>)
QUERY(current_track_contains_video, ZAL_OP_CURRENT_TRACK_CONTAINS_VIDEO, nullptr,
      decode_hash_key<kContainsVideo>)
QUERY(get_play_state, ZAL_OP_GET_PLAY_STATE, &S::play_state_tid, zal_decode_play_state)
QUERY(device_current_draw, ZAL_OP_GET_CURRENT_DRAW, nullptr, decode_hash_key<kCurrentDraw>)
QUERY(device_charge_if_power, ZAL_OP_GET_IF_CHARGE, nullptr, decode_hash_key<kIfCharge>)
QUERY(write_tag, ZAL_OP_WRITE_TAG, nullptr, zal_decode_int)
QUERY(get_color_display_image_limits, ZAL_OP_GET_COLOR_DISPLAY_IMAGE_LIMITS, nullptr,
      decode_image_limits)

ZAL_API int zal_ipod_get_current_track_index(zal_ipod_handle *h) {
    return zal_cmd_send(h, ZAL_OP_GET_CURRENT_TRACK_INDEX, nullptr, nullptr, &S::track_index_tid);
}
// The answer is also the cached track index, -1 when there was none.
ZAL_API int zal_ipod_get_current_track_index_sync(zal_ipod_handle *h) {
    int32_t index = zal_cmd_sync_int(h, zal_ipod_get_current_track_index(h));
    if (h != nullptr) {
        zal_state_guard lock(h);
        h->playback.track_index = index;
    }
    return index;
}

ZAL_API int zal_ipod_get_shuffle(zal_ipod_handle *h) {
    return zal_cmd_send(h, ZAL_OP_GET_SHUFFLE);
}
ZAL_API int _zal_ipod_get_shuffle_sync(zal_ipod_handle *h) {
    return zal_cmd_sync_int(h, zal_ipod_get_shuffle(h));
}
ZAL_API int zal_ipod_get_shuffle_sync(zal_ipod_handle *h) {
    return _zal_ipod_get_shuffle_sync(h);
}

ZAL_API int zal_ipod_get_repeat(zal_ipod_handle *h) {
    return zal_cmd_send(h, ZAL_OP_GET_REPEAT);
}
ZAL_API int _zal_ipod_get_repeat_sync(zal_ipod_handle *h) {
    return zal_cmd_sync_int(h, zal_ipod_get_repeat(h));
}
ZAL_API int zal_ipod_get_repeat_sync(zal_ipod_handle *h) {
    return _zal_ipod_get_repeat_sync(h);
}

ZAL_API int zal_ipod_get_chapter_index(zal_ipod_handle *h) {
    return zal_cmd_send(h, ZAL_OP_GET_CURRENT_PLAYING_TRACK_CHAPTER_INDEX, nullptr, nullptr,
                        &S::chapter_index_tid);
}
ZAL_API int _zal_ipod_get_chapter_index_sync(zal_ipod_handle *h) {
    return zal_cmd_sync_int(h, zal_ipod_get_chapter_index(h));
}
ZAL_API int zal_ipod_get_chapter_index_sync(zal_ipod_handle *h) {
    return _zal_ipod_get_chapter_index_sync(h);
}

ZAL_API int zal_ipod_get_chapter_count(zal_ipod_handle *h) {
    return zal_cmd_send(h, ZAL_OP_GET_CURRENT_PLAYING_TRACK_CHAPTER_COUNT);
}
ZAL_API int _zal_ipod_get_chapter_count_sync(zal_ipod_handle *h) {
    return zal_cmd_sync_int(h, zal_ipod_get_chapter_count(h));
}
ZAL_API int zal_ipod_get_chapter_count_sync(zal_ipod_handle *h) {
    return _zal_ipod_get_chapter_count_sync(h);
}

INT_SETTER(set_position, ZAL_OP_SET_POSITION)
INT_SETTER(set_track, ZAL_OP_SET_TRACK)
INT_SETTER(set_current_playing_track_chapter, ZAL_OP_SET_CURRENT_PLAYING_TRACK_CHAPTER)
INT_SETTER(set_shuffle, ZAL_OP_SET_SHUFFLE)
INT_SETTER(set_repeat, ZAL_OP_SET_REPEAT)

ZAL_API int zal_ipod_get_current_playing_track_chapter_play_status(zal_ipod_handle *h,
                                                                   int chapter_index) {
    return zal_cmd_send(h, ZAL_OP_GET_CURRENT_PLAYING_TRACK_CHAPTER_PLAY_STATUS,
                        zal_arg_int(chapter_index), __func__, &S::chapter_status_tid);
}
ZAL_API int zal_ipod_get_current_playing_track_chapter_play_status_sync(zal_ipod_handle *h,
                                                                        int chapter_index) {
    return zal_cmd_sync(h, zal_ipod_get_current_playing_track_chapter_play_status(h, chapter_index),
                        zal_decode_chapter_status);
}

// ---- Preferences -----------------------------------------------------------------------

ZAL_API int zal_ipod_get_preference(zal_ipod_handle *h, uint32_t preference_class) {
    // The class goes into its slot before the send: a reply dispatched on another thread
    // must find it there.
    if (h != nullptr && h->ready.load() != 0) h->slots.preference_class = preference_class;
    return zal_cmd_send(h, ZAL_OP_GET_PREFERENCE,
                        zal_arg_int(static_cast<int32_t>(zal_preference_class(preference_class))),
                        __func__, &S::preference_tid);
}
// The setting number of the answer; 255 for an answer that names none, an error or no
// answer at all.
ZAL_API int zal_ipod_get_preference_sync(zal_ipod_handle *h, uint32_t preference_class) {
    return zal_preference_setting(
        preference_class, zal_cmd_sync_int(h, zal_ipod_get_preference(h, preference_class)));
}

ZAL_API int zal_ipod_set_preference(zal_ipod_handle *h, uint32_t preference_class, int setting) {
    return zal_cmd_send(h, ZAL_OP_SET_PREFERENCE,
                        zal_arg_ints({static_cast<int32_t>(zal_preference_class(preference_class)),
                                      zal_preference_value(setting)}),
                        __func__);
}
ZAL_API int zal_ipod_set_preference_sync(zal_ipod_handle *h, uint32_t preference_class,
                                         int setting) {
    return zal_cmd_sync_int(h, zal_ipod_set_preference(h, preference_class, setting));
}

ZAL_API int zal_ipod_get_ipod_preference(zal_ipod_handle *h, uint32_t preference_class) {
    return zal_cmd_send(h, ZAL_OP_GET_PREFERENCE,
                        zal_arg_int(static_cast<int32_t>(preference_class)), __func__);
}
ZAL_API int zal_ipod_get_ipod_preference_sync(zal_ipod_handle *h, uint32_t preference_class) {
    return zal_cmd_sync(h, zal_ipod_get_ipod_preference(h, preference_class),
                        decode_raw_preference);
}

ZAL_API int zal_ipod_set_ipod_preference(zal_ipod_handle *h, uint32_t preference_class, int value) {
    return zal_cmd_send(h, ZAL_OP_SET_PREFERENCE,
                        zal_arg_ints({static_cast<int32_t>(preference_class), value}), __func__);
}
ZAL_API int zal_ipod_set_ipod_preference_sync(zal_ipod_handle *h, uint32_t preference_class,
                                              int value) {
    return zal_cmd_sync_int(h, zal_ipod_set_ipod_preference(h, preference_class, value));
}

// ---- Health examination ----------------------------------------------------------------

ZAL_API gval *zal_ipod_health_examine(zal_ipod_handle *h, const char *name, gval *extra) {
    gval *arg = zal_arg_array({zal_arg_string(name)});
    if (arg != nullptr && extra != nullptr && serialize_array_add(arg, extra) != 0) {
        extra = nullptr;  // freed by the failed add
        serialize_free(arg);
        arg = nullptr;
    } else if (arg == nullptr) {
        serialize_free(extra);
    }
    if (h == nullptr) {
        serialize_free(arg);
        return nullptr;
    }
    int tid = zal_cmd_send(h, ZAL_OP_HEALTH_EXAMINE, arg, __func__, nullptr, false);
    zal_ipod_reply *reply = zal_ipod_wait_for_tid_ex(h, static_cast<uint16_t>(tid));
    gval *value = reply_value(reply);
    reply_record_free(reply);
    return value;
}

// ---- Last known library revision -------------------------------------------------------

ZAL_API void zal_ipod_set_last_known_librevision(zal_ipod_handle *h, const char *revision) {
    if (h != nullptr) zal_replace_text(&h->playback.last_known_librevision, revision);
}
ZAL_API void zal_ipod_free_last_known_librevision(zal_ipod_handle *h) {
    if (h != nullptr) zal_replace_text(&h->playback.last_known_librevision, nullptr);
}

// ---- Getters ---------------------------------------------------------------------------

GETTER(const char *, current_track_title, title, nullptr)
GETTER(const char *, current_track_chapter, chapter_name, nullptr)
GETTER(const char *, current_track_artist, artist, nullptr)
GETTER(const char *, current_track_album, album, nullptr)
GETTER(const char *, last_known_librevision, last_known_librevision, nullptr)
GETTER(const char *, current_track_artwork_name, artwork_name, nullptr)
GETTER(int, current_track_length, track_length, -1)
GETTER(int, current_track_position, track_position, -1)
GETTER(int, current_track_state, play_state, -1)
GETTER(int, init_state, init_state, -1)
GETTER(const char *, playing_app, playing_app, nullptr)
GETTER(int, current_number_of_tracks, number_of_tracks, -1)
GETTER(int, current_track_index, track_index, -1)
GETTER(int, current_chapter_index, chapter_index, -1)
GETTER(int, current_chapter_count, chapter_count, -1)
GETTER(int, current_chapter_length, chapter_length, -1)
GETTER(int, current_chapter_position, chapter_position, -1)
GETTER(int, current_sample_rate, sample_rate, -1)
GETTER(int, current_track_timestamp, timestamp, -1)
GETTER(int, current_track_timestamp_usec, timestamp_usec, -1)
GETTER(int, current_track_has_artwork, has_artwork, -1)
GETTER(int, current_track_has_chapters, has_chapters, -1)
GETTER(int, current_shuffle_state, shuffle_state, -1)
GETTER(int, current_repeat_state, repeat_state, -1)
GETTER(int, get_color_display_image_limits_maxImageWidth, max_image_width, -1)
GETTER(int, get_color_display_image_limits_maxImageHeigh, max_image_height, -1)
GETTER(int, get_color_display_image_limits_pixelFormat, image_pixel_format, -1)

}  // extern "C"
