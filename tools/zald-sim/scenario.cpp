// Scenario loading: JSON syntax errors are reported by line and column, every other problem
// by the JSON pointer of the offending value. Unknown keys are errors, so that a misspelt
// key cannot silently fall back to a default.
#include "scenario.h"

#include <cerrno>
#include <cstring>
#include <fstream>
#include <set>
#include <sstream>

#include <nlohmann/json.hpp>

#include "zal-ipod-2/common.h"
#include "zal-ipod-2/daemon.h"
#include "zal-ipod-2/zal-ipod-2.h"

namespace sim {

using nlohmann::json;

namespace {

constexpr int32_t kNamedOpcodes = 133;

class Reader;

// Context shared by every reader of one scenario text.
struct Source {
    std::string origin;
    [[noreturn]] void fail(const std::string &place, const std::string &problem) const {
        throw ScenarioError(origin + ": at " + (place.empty() ? "/" : place) + ": " + problem);
    }
};

const char *kind_name(const json &j) {
    switch (j.type()) {
        case json::value_t::object:
            return "an object";
        case json::value_t::array:
            return "an array";
        case json::value_t::string:
            return "a string";
        case json::value_t::boolean:
            return "a boolean";
        case json::value_t::number_float:
            return "a fraction";
        case json::value_t::null:
            return "null";
        default:
            return "a number";
    }
}

// Reads one JSON object, remembering which keys were used so that the rest can be refused.
class Reader {
  public:
    Reader(const Source &src, const json &j, std::string place)
        : src_(src), j_(j), place_(std::move(place)) {
        if (!j_.is_object())
            src_.fail(place_, std::string("expected an object, found ") + kind_name(j_));
    }

    bool has(const char *key) const { return j_.contains(key); }
    std::string place(const char *key) const { return place_ + "/" + key; }
    const json &raw(const char *key) {
        used_.insert(key);
        return j_.at(key);
    }

    int64_t integer(const char *key, int64_t fallback, int64_t min, int64_t max) {
        if (!has(key)) return fallback;
        const json &v = raw(key);
        if (!v.is_number_integer())
            src_.fail(place(key), std::string("expected an integer, found ") + kind_name(v));
        int64_t n = v.get<int64_t>();
        if (n < min || n > max)
            src_.fail(place(key), "value " + std::to_string(n) + " is outside " +
                                      std::to_string(min) + ".." + std::to_string(max));
        return n;
    }

    std::string text(const char *key, const std::string &fallback, size_t max_length = 255) {
        if (!has(key)) return fallback;
        const json &v = raw(key);
        if (!v.is_string())
            src_.fail(place(key), std::string("expected a string, found ") + kind_name(v));
        std::string s = v.get<std::string>();
        if (s.size() > max_length)
            src_.fail(place(key), "text longer than " + std::to_string(max_length) + " characters");
        return s;
    }

    std::string required_text(const char *key) {
        if (!has(key)) src_.fail(place_, std::string("missing required key \"") + key + "\"");
        std::string s = text(key, "");
        if (s.empty()) src_.fail(place(key), "must not be empty");
        return s;
    }

    bool flag(const char *key, bool fallback) {
        if (!has(key)) return fallback;
        const json &v = raw(key);
        if (!v.is_boolean())
            src_.fail(place(key), std::string("expected true or false, found ") + kind_name(v));
        return v.get<bool>();
    }

    // One of the given words; returns its index.
    size_t choice(const char *key, const std::vector<const char *> &words, size_t fallback) {
        if (!has(key)) return fallback;
        std::string word = text(key, "");
        for (size_t i = 0; i < words.size(); ++i)
            if (word == words[i]) return i;
        std::string list;
        for (const char *w : words) list += std::string(list.empty() ? "" : ", ") + "\"" + w + "\"";
        src_.fail(place(key), "\"" + word + "\" is not one of " + list);
    }

    const json *array(const char *key) {
        if (!has(key)) return nullptr;
        const json &v = raw(key);
        if (!v.is_array())
            src_.fail(place(key), std::string("expected an array, found ") + kind_name(v));
        return &v;
    }

    // Refuses keys that no getter asked for.
    void finish() const {
        for (const auto &[key, value] : j_.items()) {
            (void)value;
            if (!used_.count(key)) src_.fail(place_ + "/" + key, "unknown key \"" + key + "\"");
        }
    }

    const Source &source() const { return src_; }

  private:
    const Source &src_;
    const json &j_;
    std::string place_;
    std::set<std::string> used_;
};

std::string item_place(const std::string &place, size_t index) {
    return place + "/" + std::to_string(index);
}

// The keys of a play-queue track and of a library track alike.
void read_tags(Reader &r, TrackTags *t) {
    t->title = r.required_text("title");
    t->artist = r.text("artist", "Unknown Artist");
    t->album = r.text("album", "Unknown Album");
    t->genre = r.text("genre", "");
    t->composer = r.text("composer", "");
    t->length_ms = static_cast<int32_t>(r.integer("length_ms", 180000, 1, INT32_MAX));
    t->audiobook = r.flag("audiobook", false);
}

Track read_track(const Source &src, const json &j, const std::string &place) {
    Reader r(src, j, place);
    Track t;
    read_tags(r, &t);
    t.video = r.flag("video", false);
    t.sample_rate = static_cast<int32_t>(r.integer("sample_rate", 44100, 8000, 192000));
    t.uid = static_cast<uint64_t>(r.integer("uid", 0, 1, INT64_MAX));
    if (r.has("album_color")) {
        const std::string color = r.text("album_color", "");
        if (color.size() != 7 || color[0] != '#' ||
            color.find_first_not_of("0123456789abcdefABCDEF", 1) != std::string::npos)
            src.fail(r.place("album_color"), "expected a colour \"#rrggbb\"");
        t.album_color = static_cast<uint32_t>(std::stoul(color.substr(1), nullptr, 16));
    }
    if (const json *chapters = r.array("chapters")) {
        int64_t total = 0;
        for (size_t i = 0; i < chapters->size(); ++i) {
            const std::string place = item_place(r.place("chapters"), i);
            Reader c(src, (*chapters)[i], place);
            Chapter chapter;
            chapter.title = c.required_text("title");
            chapter.length_ms = static_cast<int32_t>(c.integer("length_ms", 60000, 1, INT32_MAX));
            c.finish();
            total += chapter.length_ms;
            if (total > t.length_ms) src.fail(place, "the chapters run past the track's length_ms");
            t.chapters.push_back(chapter);
        }
    }
    if (const json *times = r.array("artwork_times_ms")) {
        for (size_t i = 0; i < times->size(); ++i) {
            const json &v = (*times)[i];
            const std::string place = item_place(r.place("artwork_times_ms"), i);
            if (!v.is_number_integer() || v.get<int64_t>() < 0 || v.get<int64_t>() >= t.length_ms)
                src.fail(place, "expected a time inside the track (0.." +
                                    std::to_string(t.length_ms - 1) + ")");
            t.artwork_times_ms.push_back(static_cast<int32_t>(v.get<int64_t>()));
        }
    }
    r.finish();
    return t;
}

LibraryTrack read_library_track(const Source &src, const json &j, const std::string &place) {
    Reader r(src, j, place);
    LibraryTrack t;
    read_tags(r, &t);
    t.podcast = r.flag("podcast", false);
    t.itunes_u = r.flag("itunes_u", false);
    r.finish();
    return t;
}

std::vector<LibraryTrack> read_library_tracks(const Source &src, Reader &r, const char *key) {
    std::vector<LibraryTrack> tracks;
    if (const json *list = r.array(key))
        for (size_t i = 0; i < list->size(); ++i)
            tracks.push_back(read_library_track(src, (*list)[i], item_place(r.place(key), i)));
    return tracks;
}

std::vector<std::string> read_titles(const Source &src, Reader &r, const char *key) {
    std::vector<std::string> titles;
    if (const json *list = r.array(key)) {
        for (size_t i = 0; i < list->size(); ++i) {
            const json &t = (*list)[i];
            if (!t.is_string())
                src.fail(item_place(r.place(key), i),
                         std::string("expected a track title, found ") + kind_name(t));
            titles.push_back(t.get<std::string>());
        }
    }
    return titles;
}

// Stable seed of a generated library: the same serial always gets the same library.
uint32_t serial_seed(const std::string &serial) {
    uint32_t h = 2166136261u;
    for (unsigned char c : serial) h = (h ^ c) * 16777619u;
    return h;
}

constexpr int32_t kDefaultLibraryTracks = 300;

// The library and its timed changes (the play queue's tracks join it in the world, with
// their identifiers).
void read_library(const Source &src, const json *j, const std::string &place, DeviceSpec &d) {
    std::optional<Reader> r;
    if (j != nullptr) r.emplace(src, *j, place);
    const uint32_t seed =
        r ? static_cast<uint32_t>(r->integer("seed", serial_seed(d.serial), 0, UINT32_MAX))
          : serial_seed(d.serial);
    const int32_t generated =
        r ? static_cast<int32_t>(
                r->integer("generate", j->contains("tracks") ? 0 : kDefaultLibraryTracks, 0, 20000))
          : kDefaultLibraryTracks;
    d.library = MediaLibrary::generate(seed, generated);
    d.library.mlid =
        r ? r->text("mlid", "SIMLIB-" + d.serial, MAXIMUM_MLID_LENGTH - 1) : "SIMLIB-" + d.serial;
    if (r) d.library.genius_available = r->flag("genius", true);
    if (!r) return;
    for (LibraryTrack &t : read_library_tracks(src, *r, "tracks"))
        d.library.add_track(std::move(t));
    if (const json *lists = r->array("playlists")) {
        for (size_t i = 0; i < lists->size(); ++i) {
            const std::string list_place = item_place(r->place("playlists"), i);
            Reader pr(src, (*lists)[i], list_place);
            Playlist p;
            p.name = pr.required_text("name");
            p.genius = pr.flag("genius", false);
            for (const std::string &title : read_titles(src, pr, "tracks")) {
                uint64_t uid = d.library.identifier(kCategoryTrack, title);
                if (uid == 0) src.fail(pr.place("tracks"), "no track titled \"" + title + "\"");
                p.tracks.push_back(uid);
            }
            pr.finish();
            d.library.add_playlist(std::move(p));
        }
    }
    if (const json *changes = r->array("changes")) {
        for (size_t i = 0; i < changes->size(); ++i) {
            Reader cr(src, (*changes)[i], item_place(r->place("changes"), i));
            TimedLibraryChange change;
            change.at_ms = cr.integer("at_ms", 0, 0, INT64_MAX / 4);
            change.insert = read_library_tracks(src, cr, "insert");
            change.remove = read_titles(src, cr, "delete");
            cr.finish();
            d.library_changes.push_back(std::move(change));
        }
    }
    r->finish();
}

ArtworkSpec read_artwork(const Source &src, const json &j, const std::string &place) {
    Reader r(src, j, place);
    ArtworkSpec a;
    static const std::vector<const char *> kDelivery = {"file", "inline"};
    a.shared_file = r.choice("delivery", kDelivery, 0) == 0;
    a.width = static_cast<int32_t>(r.integer("width", 240, 1, 1024));
    a.height = static_cast<int32_t>(r.integer("height", 240, 1, 1024));
    a.pixel_format = static_cast<int32_t>(r.integer("pixel_format", 2, 2, 3));
    r.finish();
    return a;
}

PlayerState read_playback(const Source &src, const json &j, const std::string &place,
                          const std::vector<Track> &tracks) {
    Reader r(src, j, place);
    PlayerState p;
    static const std::vector<const char *> kStates = {"stopped", "playing", "paused"};
    p.state = static_cast<int32_t>(r.choice("state", kStates, 0));
    const int64_t last = tracks.empty() ? 0 : static_cast<int64_t>(tracks.size()) - 1;
    p.track = static_cast<int32_t>(r.integer("track", 0, 0, last));
    const int64_t length = tracks.empty() ? 0 : tracks[static_cast<size_t>(p.track)].length_ms - 1;
    p.position_ms = static_cast<int32_t>(r.integer("position_ms", 0, 0, length));
    p.shuffle = static_cast<int32_t>(r.integer("shuffle", 0, 0, 2));
    p.repeat = static_cast<int32_t>(r.integer("repeat", 0, 0, 2));
    p.volume = static_cast<int32_t>(r.integer("volume", 50, 0, 100));
    p.muted = r.flag("muted", false);
    r.finish();
    if (p.state != kStopped && tracks.empty())
        src.fail(place + "/state", "a device without tracks cannot play");
    return p;
}

// A list of 1..max texts of 1..63 characters each.
std::vector<std::string> read_texts(Reader &r, const char *key, std::vector<std::string> fallback,
                                    size_t min_count, size_t max_count) {
    const json *list = r.array(key);
    if (list == nullptr) return fallback;
    if (list->size() < min_count || list->size() > max_count)
        r.source().fail(r.place(key), "expected " + std::to_string(min_count) + " to " +
                                          std::to_string(max_count) + " texts");
    std::vector<std::string> texts;
    for (size_t i = 0; i < list->size(); ++i) {
        const json &item = (*list)[i];
        const std::string place = item_place(r.place(key), i);
        if (!item.is_string())
            r.source().fail(place, std::string("expected a string, found ") + kind_name(item));
        texts.push_back(item.get<std::string>());
        if (texts.back().empty() || texts.back().size() > 63)
            r.source().fail(place, "a text needs 1 to 63 characters");
    }
    return texts;
}

void read_accessory(Reader &r, AccessorySpec &a) {
    if (r.has("battery")) {
        Reader battery(r.source(), r.raw("battery"), r.place("battery"));
        a.battery_level = static_cast<int32_t>(battery.integer("level", 80, 0, 100));
        a.battery_interval_ms = battery.integer("interval_ms", 10000, 10, 3600000);
        battery.finish();
    }
    a.eq_profiles = read_texts(r, "eq_profiles", a.eq_profiles, 1, 64);
    a.localization = read_texts(r, "localization", a.localization, 2, 2);
}

DeviceSpec read_device(const Source &src, const json &j, const std::string &place) {
    Reader r(src, j, place);
    DeviceSpec d;
    d.serial = r.required_text("serial");
    if (d.serial.size() >= ZAL_DEVICE_SERIAL_SIZE)
        src.fail(r.place("serial"), "a serial has at most " +
                                        std::to_string(ZAL_DEVICE_SERIAL_SIZE - 1) + " characters");
    d.name = r.text("name", d.serial);
    d.protocol = static_cast<int32_t>(r.integer("protocol", 2, 1, 2));
    static const std::vector<const char *> kLinks = {"usb", "usb_role", "bluetooth", "other"};
    d.link = static_cast<Link>(r.choice("transport", kLinks, 0));
    d.bus = static_cast<int32_t>(r.integer("bus", 1, 0, 255));
    d.address = static_cast<int32_t>(r.integer("address", 2, 0, 255));
    d.rfcomm = static_cast<int32_t>(r.integer("rfcomm", 1, 0, 255));
    d.authenticated = r.flag("authenticated", true);
    d.extended = r.flag("extended", false);
    d.present = r.flag("present", true);
    d.auth_delay_ms = r.integer("auth_delay_ms", 300, 0, 3600000);
    d.auth_succeeds = r.flag("auth_succeeds", true);
    d.playing_app = r.text("playing_app", "Music");
    if (const json *tracks = r.array("tracks")) {
        for (size_t i = 0; i < tracks->size(); ++i)
            d.tracks.push_back(read_track(src, (*tracks)[i], item_place(r.place("tracks"), i)));
    }
    if (r.has("playback"))
        d.player = read_playback(src, r.raw("playback"), r.place("playback"), d.tracks);
    if (r.has("artwork")) d.artwork = read_artwork(src, r.raw("artwork"), r.place("artwork"));
    read_accessory(r, d.accessory);
    read_library(src, r.has("library") ? &r.raw("library") : nullptr, r.place("library"), d);
    r.finish();
    return d;
}

SharedValue to_shared(ValuePtr v) {
    return SharedValue(v.release(), ValueDeleter());
}

ScriptStep read_step(const Source &src, const json &j, const std::string &place,
                     const Scenario &s) {
    Reader r(src, j, place);
    ScriptStep step;
    step.at_ms = r.integer("at_ms", 0, 0, INT64_MAX / 4);
    static const std::vector<const char *> kActions = {
        "connect", "disconnect", "event", "play", "pause", "playpause", "stop", "next", "previous"};
    if (!r.has("do")) src.fail(place, "missing required key \"do\"");
    step.action = static_cast<StepAction>(r.choice("do", kActions, 0));
    step.device = r.text("device", "");
    if (step.action == StepAction::kEvent) {
        step.event = r.required_text("event");
        if (r.has("data")) {
            const json &data = r.raw("data");
            if (!data.is_null()) {
                try {
                    step.data = to_shared(json_to_value(data));
                } catch (const std::invalid_argument &e) {
                    src.fail(r.place("data"), e.what());
                }
            }
        }
    } else if (step.device.empty()) {
        src.fail(place, "missing required key \"device\"");
    }
    if (!step.device.empty()) {
        bool known = false;
        for (const auto &d : s.devices) known = known || d.serial == step.device;
        if (!known) src.fail(r.place("device"), "no device with serial \"" + step.device + "\"");
    }
    r.finish();
    return step;
}

FaultRule read_fault(const Source &src, const json &j, const std::string &place) {
    Reader r(src, j, place);
    FaultRule f;
    static const std::vector<const char *> kActions = {"delay", "error", "no_reply",
                                                       "drop",  "split", "malformed"};
    if (!r.has("action")) src.fail(place, "missing required key \"action\"");
    f.action = static_cast<FaultAction>(r.choice("action", kActions, 0));
    if (r.has("opcode")) {
        const json &op = r.raw("opcode");
        if (op.is_number_integer()) {
            int64_t n = op.get<int64_t>();
            if (n < 0 || n > 255)
                src.fail(r.place("opcode"), "opcode " + std::to_string(n) + " is outside 0..255");
            f.opcode = static_cast<int32_t>(n);
        } else if (op.is_string()) {
            f.opcode = opcode_by_name(op.get<std::string>());
            if (f.opcode < 0)
                src.fail(r.place("opcode"),
                         "unknown opcode name \"" + op.get<std::string>() + "\"");
        } else {
            src.fail(r.place("opcode"),
                     std::string("expected an opcode name or number, found ") + kind_name(op));
        }
    }
    if (r.has("at_ms")) {
        f.at_ms = r.integer("at_ms", 0, 0, INT64_MAX / 4);
        if (f.opcode >= 0)
            src.fail(r.place("opcode"), "a timed fault (\"at_ms\") applies to no opcode");
        if (f.action != FaultAction::kDrop && f.action != FaultAction::kMalformed)
            src.fail(r.place("action"), "a timed fault can only be \"drop\" or \"malformed\"");
    }
    f.from_ms = r.integer("from_ms", 0, 0, INT64_MAX / 4);
    f.until_ms = r.integer("until_ms", -1, -1, INT64_MAX / 4);
    if (f.until_ms >= 0 && f.until_ms < f.from_ms)
        src.fail(r.place("until_ms"), "ends before \"from_ms\"");
    f.skip = static_cast<int32_t>(r.integer("skip", 0, 0, INT32_MAX));
    f.count = static_cast<int32_t>(r.integer("count", -1, -1, INT32_MAX));
    if (f.count == 0)
        src.fail(r.place("count"), "a fault applied 0 times is no fault; use -1 for always");
    f.delay_ms = r.integer("delay_ms", 500, 0, 3600000);
    f.message = r.text("message", f.message, 4096);
    f.split_at = static_cast<size_t>(r.integer("split_at", 6, 1, 1 << 20));
    f.split_gap_ms = r.integer("split_gap_ms", 100, 0, 3600000);
    r.finish();
    return f;
}

void read_config(const Source &src, const json &j, const std::string &place, Scenario &s) {
    if (!j.is_object()) src.fail(place, std::string("expected an object, found ") + kind_name(j));
    for (const auto &[key, value] : j.items()) {
        const std::string key_place = place + "/" + key;
        if (key.empty() || key.size() > 255) src.fail(key_place, "a key needs 1 to 255 characters");
        ConfigSeed seed{key, "", false};
        if (value.is_string()) {
            seed.value = value.get<std::string>();
        } else {
            Reader r(src, value, key_place);
            seed.value = r.text("value", "");
            seed.read_only = r.flag("read_only", false);
            r.finish();
        }
        if (seed.value.size() > 255) src.fail(key_place, "value longer than 255 characters");
        s.config.push_back(seed);
    }
}

Scenario read_scenario(const Source &src, const json &root) {
    Reader r(src, root, "");
    Scenario s;
    s.name = r.text("name", "unnamed");
    s.position_interval_ms = r.integer("position_interval_ms", 1000, 10, 60000);
    if (r.has("listen")) {
        Reader listen(src, r.raw("listen"), "/listen");
        if (listen.has("tcp"))
            s.tcp_port = static_cast<uint16_t>(listen.integer("tcp", 0, 0, 65535));
        s.socket_path = listen.text("path", "", 107);
        listen.finish();
    }
    if (const json *devices = r.array("devices")) {
        std::set<std::string> serials;
        for (size_t i = 0; i < devices->size(); ++i) {
            const std::string place = item_place("/devices", i);
            s.devices.push_back(read_device(src, (*devices)[i], place));
            if (!serials.insert(s.devices.back().serial).second)
                src.fail(place + "/serial",
                         "serial \"" + s.devices.back().serial + "\" is used twice");
        }
    }
    if (r.has("config")) read_config(src, r.raw("config"), "/config", s);
    if (const json *script = r.array("script")) {
        for (size_t i = 0; i < script->size(); ++i)
            s.script.push_back(read_step(src, (*script)[i], item_place("/script", i), s));
    }
    if (const json *faults = r.array("faults")) {
        for (size_t i = 0; i < faults->size(); ++i)
            s.faults.push_back(read_fault(src, (*faults)[i], item_place("/faults", i)));
    }
    r.finish();
    return s;
}

// Line and column (from 1) of a byte offset, for syntax errors.
std::string line_and_column(const std::string &text, size_t byte) {
    size_t line = 1, column = 1;
    for (size_t i = 0; i < byte && i < text.size(); ++i) {
        if (text[i] == '\n') {
            ++line;
            column = 1;
        } else {
            ++column;
        }
    }
    return std::to_string(line) + ":" + std::to_string(column);
}

// nlohmann's message without its "[json.exception...] parse error at line n, column m: " head.
std::string syntax_problem(const char *what) {
    std::string text(what);
    size_t at = text.find("column");
    if (at != std::string::npos) {
        size_t colon = text.find(": ", at);
        if (colon != std::string::npos) return text.substr(colon + 2);
    }
    return text;
}

}  // namespace

int32_t opcode_by_name(const std::string &name) {
    if (name.empty()) return -1;
    if (name.find_first_not_of("0123456789") == std::string::npos) {
        long n = std::strtol(name.c_str(), nullptr, 10);
        return n <= 255 ? static_cast<int32_t>(n) : -1;
    }
    if (name == "HELLO") return 0;
    for (int32_t op = 0; op < kNamedOpcodes; ++op)
        if (name == get_function_string(static_cast<uint32_t>(op))) return op;
    return -1;
}

Scenario parse_scenario(const std::string &text, const std::string &origin) {
    Source src{origin};
    json root;
    try {
        root = json::parse(text);
    } catch (const json::parse_error &e) {
        throw ScenarioError(origin + ":" + line_and_column(text, e.byte > 0 ? e.byte - 1 : 0) +
                            ": " + syntax_problem(e.what()));
    }
    return read_scenario(src, root);
}

Scenario load_scenario_file(const std::string &path) {
    std::ifstream in(path, std::ios::binary);
    if (!in) throw ScenarioError(path + ": cannot open: " + std::strerror(errno));
    std::ostringstream text;
    text << in.rdbuf();
    if (in.bad()) throw ScenarioError(path + ": cannot read: " + std::strerror(errno));
    return parse_scenario(text.str(), path);
}

}  // namespace sim
