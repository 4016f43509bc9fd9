// Playback state queries and setters: what the device plays, where, and how.
#include <sys/time.h>

#include "handlers.h"
#include "preferences.h"
#include "zal-ipod-2/opcodes.h"

namespace sim {

namespace {

constexpr int32_t kSampleRate = 44100;
constexpr int32_t kCurrentDrawMa = 500;
// What the head unit's display may receive as artwork.
constexpr int32_t kMaxImageSide = 320;

void current_track_info(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    const Track *t = d->current_track();
    timeval now{};
    gettimeofday(&now, nullptr);
    HashBuilder info;
    info.add("current_track_info", t != nullptr ? 1 : 0);
    if (t != nullptr) {
        const int32_t chapter = d->current_chapter();
        info.add("title", t->title)
            .add("chapter",
                 chapter >= 0 ? t->chapters[static_cast<size_t>(chapter)].title : std::string())
            .add("artist", t->artist)
            .add("album", t->album)
            .add("artworkName", t->album);
        info.add("artwork", 1)
            .add("has_chapters", t->chapters.empty() ? 0 : 1)
            .add("length", t->length_ms);
        info.add("position", d->player.position_ms).add("track_index", d->player.track);
    } else {
        info.add("length", 0);
    }
    info.add("timestamp", static_cast<int32_t>(now.tv_sec))
        .add("timestamp_usec", static_cast<int32_t>(now.tv_usec));
    info.add("state", d->player.state)
        .add("number_of_tracks", static_cast<int32_t>(d->spec.tracks.size()));
    c.reply(info.take());
}

void get_play_state(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    const Track *t = d->current_track();
    HashBuilder state;
    state.add("current_play_status", d->player.state);
    if (t != nullptr) state.add("length", t->length_ms).add("position", d->player.position_ms);
    c.reply(state.take());
}

void sample_rate(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    const Track *t = d->current_track();
    c.reply(HashBuilder().add("sample_rate", t != nullptr ? t->sample_rate : kSampleRate).take());
}

void current_track_index(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    c.reply_int(d->current_track() != nullptr ? d->player.track : -1);
}

void get_shuffle(Call &c) {
    if (Device *d = c.require_session()) c.reply_int(d->player.shuffle);
}

void get_repeat(Call &c) {
    if (Device *d = c.require_session()) c.reply_int(d->player.repeat);
}

using Setter = bool (World::*)(Device &, int32_t);

// Integer argument; 0 on success, ERROR naming a refused value. The server holds the events
// of a request until its reply is queued, so the change can be made first.
template <Setter set>
void set_integer(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    int32_t value = 0;
    if (!value_as_int(c.arg, &value)) return c.fail("the request needs an integer argument");
    if (!(c.world.*set)(*d, value))
        return c.fail("value " + std::to_string(value) + " is out of range");
    c.reply_int(0);
}

// Flags of the current track, answered under the key the query names.
template <auto flag, const char *key>  // flag: a bool member of Track or of its tags
void track_flag(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    const Track *t = d->current_track();
    c.reply(HashBuilder().add(key, t != nullptr && t->*flag ? 1 : 0).take());
}
constexpr char kAudiobookKey[] = "is_audiobook_explicitly";
constexpr char kVideoKey[] = "contains_video_explicitly";

template <const char *key, int32_t value>
void power_fact(Call &c) {
    if (c.require_session() == nullptr) return;
    c.reply(HashBuilder().add(key, value).take());
}
constexpr char kCurrentDrawKey[] = "current_draw";
constexpr char kChargeKey[] = "if_charge";

// Chapters of the current track: index -1 and count 0 for a track without any.
void chapter_index(Call &c) {
    if (Device *d = c.require_session()) c.reply_int(d->current_chapter());
}
void chapter_count(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    const Track *t = d->current_track();
    c.reply_int(t != nullptr ? static_cast<int32_t>(t->chapters.size()) : 0);
}

// The chapter named by the integer argument, or null after answering ERROR.
const Chapter *requested_chapter(Call &c, Device &d, int32_t *index) {
    const Track *t = d.current_track();
    if (t == nullptr || t->chapters.empty()) {
        c.fail("the current track has no chapters");
        return nullptr;
    }
    if (!value_as_int(c.arg, index)) {
        c.fail("the request needs the chapter index as an integer");
        return nullptr;
    }
    if (*index < 0 || *index >= static_cast<int32_t>(t->chapters.size())) {
        c.fail("chapter " + std::to_string(*index) + " does not exist");
        return nullptr;
    }
    return &t->chapters[static_cast<size_t>(*index)];
}

void set_chapter(Call &c) {
    Device *d = c.require_session();
    int32_t index = 0;
    if (d == nullptr || requested_chapter(c, *d, &index) == nullptr) return;
    c.world.set_chapter(*d, index);
    c.reply_int(0);
}

// Length of the chapter and the position in it (0 for a chapter that is not playing).
void chapter_play_status(Call &c) {
    Device *d = c.require_session();
    int32_t index = 0;
    const Chapter *chapter = d != nullptr ? requested_chapter(c, *d, &index) : nullptr;
    if (chapter == nullptr) return;
    const int32_t position = d->current_chapter() == index
                                 ? d->player.position_ms - chapter_start(*d->current_track(), index)
                                 : 0;
    c.reply(HashBuilder()
                .add("chapter_length", chapter->length_ms)
                .add("chapter_position", position)
                .take());
}

void write_tag(Call &c) {
    if (c.require_session() != nullptr) c.reply_int(0);
}

// The pixel format is the one the device's pictures come in.
void image_limits(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    c.reply(HashBuilder()
                .add("maxImageWidth", kMaxImageSide)
                .add("maxImageHeigh", kMaxImageSide)  // the key is spelt so on the wire
                .add("pixelFormat", d->spec.artwork.pixel_format)
                .take());
}

// Payload: array (class, value).
void set_preference(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    int32_t preference_class = 0, value = 0;
    if (!value_as_int(array_item(c.arg, 0), &preference_class) ||
        !value_as_int(array_item(c.arg, 1), &value))
        return c.fail("SET_PREFERENCE needs an array of two integers: class, value");
    if (!preference_valid(preference_class, value))
        return c.fail("preference class " + std::to_string(preference_class) + " does not take " +
                      std::to_string(value));
    d->preferences[preference_class] = value;
    c.reply_int(0);
}

// Payload: the class; the answer is its raw value.
void get_preference(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    int32_t preference_class = 0;
    if (!value_as_int(c.arg, &preference_class))
        return c.fail("GET_PREFERENCE needs the class as an integer");
    if (!preference_class_known(preference_class))
        return c.fail("unknown preference class " + std::to_string(preference_class));
    c.reply_int(d->preferences[preference_class]);
}

// Payload: array (name, optional extra value). Served without a session: it reports on the
// daemon itself, echoing what it was given.
void health_examine(Call &c) {
    std::string name;
    if (!value_as_string(array_item(c.arg, 0), &name))
        return c.fail("HEALTH_EXAMINE needs an array starting with a name");
    HashBuilder report;
    report.add("name", name).add("status", std::string("ok"));
    report.add("devices", static_cast<int32_t>(c.world.present().size()));
    if (const gval *extra = array_item(c.arg, 1)) report.add("extra", serialize_dup(extra));
    c.reply(report.take());
}

}  // namespace

void register_playback_handlers(HandlerTable &table) {
    table[ZAL_OP_CURRENT_TRACK_INFO] = current_track_info;
    table[ZAL_OP_GET_PLAY_STATE] = get_play_state;
    table[ZAL_OP_CURRENT_TRACK_SAMPLE_RATE] = sample_rate;
    table[ZAL_OP_GET_CURRENT_TRACK_INDEX] = current_track_index;
    table[ZAL_OP_GET_SHUFFLE] = get_shuffle;
    table[ZAL_OP_GET_REPEAT] = get_repeat;
    table[ZAL_OP_SET_POSITION] = set_integer<&World::set_position>;
    table[ZAL_OP_SET_TRACK] = set_integer<&World::set_track>;
    table[ZAL_OP_SET_SHUFFLE] = set_integer<&World::set_shuffle>;
    table[ZAL_OP_SET_REPEAT] = set_integer<&World::set_repeat>;
    table[ZAL_OP_CURRENT_TRACK_IS_AUDIOBOOK] = track_flag<&Track::audiobook, kAudiobookKey>;
    table[ZAL_OP_CURRENT_TRACK_CONTAINS_VIDEO] = track_flag<&Track::video, kVideoKey>;
    table[ZAL_OP_GET_CURRENT_DRAW] = power_fact<kCurrentDrawKey, kCurrentDrawMa>;
    table[ZAL_OP_GET_IF_CHARGE] = power_fact<kChargeKey, 1>;
    table[ZAL_OP_GET_CURRENT_PLAYING_TRACK_CHAPTER_INDEX] = chapter_index;
    table[ZAL_OP_GET_CURRENT_PLAYING_TRACK_CHAPTER_COUNT] = chapter_count;
    table[ZAL_OP_SET_CURRENT_PLAYING_TRACK_CHAPTER] = set_chapter;
    table[ZAL_OP_GET_CURRENT_PLAYING_TRACK_CHAPTER_PLAY_STATUS] = chapter_play_status;
    table[ZAL_OP_WRITE_TAG] = write_tag;
    table[ZAL_OP_GET_COLOR_DISPLAY_IMAGE_LIMITS] = image_limits;
    table[ZAL_OP_SET_PREFERENCE] = set_preference;
    table[ZAL_OP_GET_PREFERENCE] = get_preference;
    table[ZAL_OP_HEALTH_EXAMINE] = health_examine;
}

}  // namespace sim
