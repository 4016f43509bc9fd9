// Now playing: the now-playing block that status and the transport commands show, the
// shuffle and repeat modes, seek, track, device preferences, and the artwork written as PNG.
#include <png.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <algorithm>
#include <memory>
#include <string>
#include <vector>

#include "zalctl.h"

namespace zalctl {

namespace {

const char *play_state_name(int32_t state) {
    static constexpr const char *kNames[] = {"stopped", "playing", "paused", "seeking forward",
                                             "seeking backward"};
    return state >= 0 && state < 5 ? kNames[state] : "unknown";
}

// Mode words and the device's numbers (0, 1, 2); a number is accepted as well.
const char *const kShuffleNames[] = {"off", "songs", "albums"};
const char *const kRepeatNames[] = {"off", "one", "all"};

std::string mode_name(const char *const (&names)[3], int32_t mode) {
    return mode >= 0 && mode < 3 ? names[mode] : std::to_string(mode);
}

int32_t parse_mode(const char *const (&names)[3], const std::string &word, const char *what) {
    for (int32_t i = 0; i < 3; ++i)
        if (word == names[i] || word == std::to_string(i)) return i;
    throw CLI::ValidationError(what, "\"" + word + "\" is not one of " + names[0] + ", " +
                                         names[1] + ", " + names[2] + " (or 0, 1, 2)");
}

std::string text_or_empty(const char *s) {
    return s != nullptr ? s : "";
}

// "83", "83.5" (seconds) or "1:23" / "1:02:03" -> milliseconds.
int32_t parse_position(const std::string &text) {
    double seconds = 0;
    std::size_t start = 0;
    for (;;) {
        std::size_t colon = text.find(':', start);
        const std::string part =
            text.substr(start, colon == std::string::npos ? colon : colon - start);
        char *end = nullptr;
        errno = 0;
        const double v = std::strtod(part.c_str(), &end);
        if (part.empty() || *end != '\0' || errno != 0 || v < 0)
            throw CLI::ValidationError("POSITION",
                                       "\"" + text + "\" is not a time like 83 or 1:23");
        seconds = seconds * 60 + v;
        if (colon == std::string::npos) break;
        start = colon + 1;
    }
    if (seconds * 1000 > 2147483647.0)
        throw CLI::ValidationError("POSITION", "\"" + text + "\" is too far");
    return static_cast<int32_t>(seconds * 1000 + 0.5);
}

// ---- PNG ---------------------------------------------------------------------------------

// 16-bit RGB 5-6-5 pixel formats of the devices: 2 least significant byte first, 3 most.
constexpr uint8_t kRgb565Little = 2;
constexpr uint8_t kRgb565Big = 3;
// Data whose length the reply gave explicitly: an encoded picture, written as it comes.
constexpr uint8_t kExplicitData = 255;

struct FileCloser {
    void operator()(FILE *f) const { fclose(f); }
};
using File = std::unique_ptr<FILE, FileCloser>;

File open_output(const std::string &path) {
    File f(fopen(path.c_str(), "wb"));
    if (!f) throw Failure("artwork: cannot write " + path + ": " + strerror(errno));
    return f;
}

// Writes width x height 16-bit pixels (rows stride bytes apart) as an 8-bit RGB PNG.
void write_png(const std::string &path, const unsigned char *pixels, uint32_t width,
               uint32_t height, uint32_t stride, bool big_endian) {
    if (width == 0 || height == 0) throw Failure("artwork: the picture is empty");
    if (stride < width * 2) throw Failure("artwork: the rows are shorter than the picture");
    File f = open_output(path);
    png_structp png = png_create_write_struct(PNG_LIBPNG_VER_STRING, nullptr, nullptr, nullptr);
    png_infop info = png != nullptr ? png_create_info_struct(png) : nullptr;
    if (info == nullptr) {
        png_destroy_write_struct(&png, nullptr);
        throw Failure("artwork: out of memory for the PNG writer");
    }
    std::vector<unsigned char> row(static_cast<std::size_t>(width) * 3);
    // libpng reports its errors by longjmp: nothing with a destructor is made below it.
    if (setjmp(png_jmpbuf(png))) {
        png_destroy_write_struct(&png, &info);
        throw Failure("artwork: cannot write the PNG " + path);
    }
    png_init_io(png, f.get());
    png_set_IHDR(png, info, width, height, 8, PNG_COLOR_TYPE_RGB, PNG_INTERLACE_NONE,
                 PNG_COMPRESSION_TYPE_DEFAULT, PNG_FILTER_TYPE_DEFAULT);
    png_write_info(png, info);
    for (uint32_t y = 0; y < height; ++y) {
        const unsigned char *in = pixels + static_cast<std::size_t>(y) * stride;
        for (uint32_t x = 0; x < width; ++x) {
            const unsigned lo = in[2 * x + (big_endian ? 1 : 0)];
            const unsigned hi = in[2 * x + (big_endian ? 0 : 1)];
            const unsigned pixel = (hi << 8) | lo;
            const unsigned r = (pixel >> 11) & 0x1F, g = (pixel >> 5) & 0x3F, b = pixel & 0x1F;
            row[3 * x] = static_cast<unsigned char>((r << 3) | (r >> 2));
            row[3 * x + 1] = static_cast<unsigned char>((g << 2) | (g >> 4));
            row[3 * x + 2] = static_cast<unsigned char>((b << 3) | (b >> 2));
        }
        png_write_row(png, row.data());
    }
    png_write_end(png, nullptr);
    png_destroy_write_struct(&png, &info);
    if (fflush(f.get()) != 0)
        throw Failure("artwork: cannot write " + path + ": " + strerror(errno));
}

void write_raw(const std::string &path, const unsigned char *bytes, uint32_t length) {
    File f = open_output(path);
    if (length > 0 && fwrite(bytes, 1, length, f.get()) != length)
        throw Failure("artwork: cannot write " + path + ": " + strerror(errno));
}

uint64_t parse_uid(const std::string &text) {
    char *end = nullptr;
    errno = 0;
    const unsigned long long v = std::strtoull(text.c_str(), &end, 0);  // 0x... or decimal
    if (text.empty() || *end != '\0' || errno != 0 || text[0] == '-')
        throw CLI::ValidationError("--uid", "\"" + text + "\" is not a track identifier");
    return v;
}

// A validator that runs parse on the option's text, so that a wrong value is a usage error.
template <class Parse>
CLI::Validator parsed_by(Parse parse, const char *name) {
    return CLI::Validator(
        [parse](std::string &text) {
            try {
                parse(text);
                return std::string();
            } catch (const CLI::ValidationError &e) {
                return std::string(e.what());
            }
        },
        name);
}

// ---- Commands ----------------------------------------------------------------------------

void show_or_set_mode(Session &s, const char *what, const char *const (&names)[3],
                      const std::string &word, int (*get)(zal_ipod_handle *),
                      int (*set)(zal_ipod_handle *, int)) {
    zal_ipod_handle *h = s.with_session();
    if (!word.empty()) s.expect(set(h, parse_mode(names, word, what)), what);
    const int32_t mode = s.expect(get(h), what);
    if (s.options.json)
        print_json(Json{{what, mode_name(names, mode)}, {"value", mode}});
    else
        printf("%s: %s\n", what, mode_name(names, mode).c_str());
}

void run_artwork(Session &s, const std::string &uid_text, const std::string &out) {
    zal_ipod_handle *h = s.with_session();
    if (uid_text.empty())
        s.expect(zal_ipod_current_track_artwork_sync(h, 0), "artwork");
    else
        s.expect(zal_ipod_track_artwork_by_uid_sync(h, parse_uid(uid_text)), "artwork");
    const unsigned char *data = zal_ipod_current_track_artwork_data(h);
    const uint32_t width = zal_ipod_current_track_artwork_width(h);
    const uint32_t height = zal_ipod_current_track_artwork_height(h);
    const uint32_t stride = zal_ipod_current_track_artwork_rowstride(h);
    const uint32_t length = zal_ipod_current_track_artwork_length(h);
    uint8_t format = zal_ipod_current_track_artwork_pixel_format(h);
    if (data == nullptr) throw Failure("artwork: the daemon sent no pixels");
    // Pixels shared through the daemon's file come without a format: they are in the one
    // the display asked for, which the colour display limits name.
    if (format == 0 && zal_ipod_get_color_display_image_limits_sync(h) == 1)
        format = static_cast<uint8_t>(zal_ipod_get_color_display_image_limits_pixelFormat(h));
    if (format == kExplicitData)
        write_raw(out, data, length);
    else if (format == kRgb565Little || format == kRgb565Big)
        write_png(out, data, width, height, stride, format == kRgb565Big);
    else
        throw Failure("artwork: pixel format " + std::to_string(format) + " is not supported");
    if (s.options.json)
        print_json(Json{{"file", out},
                        {"width", width},
                        {"height", height},
                        {"pixel_format", format},
                        {"bytes", length}});
    else
        printf("%s: %ux%u, pixel format %u\n", out.c_str(), width, height, format);
}

void run_prefs(Session &s, int preference_class, const std::vector<int> &value) {
    zal_ipod_handle *h = s.with_session();
    const auto c = static_cast<uint32_t>(preference_class);
    if (!value.empty()) s.expect(zal_ipod_set_ipod_preference_sync(h, c, value[0]), "prefs set");
    const int32_t v = zal_ipod_get_ipod_preference_sync(h, c);
    if (v == 255)
        throw Failure("prefs get: class " + std::to_string(preference_class) + ": " +
                      text_or_empty(zal_ipod_get_error_message(h)));
    if (s.options.json)
        print_json(Json{{"class", preference_class}, {"value", v}});
    else
        printf("preference class %d: %d\n", preference_class, v);
}

}  // namespace

Json now_playing(Session &s) {
    zal_ipod_handle *h = s.with_session();
    const bool has_track = s.expect(zal_ipod_current_track_info_sync(h), "status") == 1;
    const int32_t shuffle = zal_ipod_get_shuffle_sync(h);
    const int32_t repeat = zal_ipod_get_repeat_sync(h);
    return Json{{"has_track", has_track},
                {"title", has_track ? text_or_empty(zal_ipod_current_track_title(h)) : ""},
                {"artist", has_track ? text_or_empty(zal_ipod_current_track_artist(h)) : ""},
                {"album", has_track ? text_or_empty(zal_ipod_current_track_album(h)) : ""},
                {"chapter", has_track ? text_or_empty(zal_ipod_current_track_chapter(h)) : ""},
                {"state", play_state_name(zal_ipod_current_track_state(h))},
                {"track_index", zal_ipod_current_track_index(h)},
                {"number_of_tracks", std::max(zal_ipod_current_number_of_tracks(h), 0)},
                {"position_ms", zal_ipod_current_track_position(h)},
                {"length_ms", zal_ipod_current_track_length(h)},
                {"shuffle", mode_name(kShuffleNames, shuffle)},
                {"repeat", mode_name(kRepeatNames, repeat)}};
}

std::string now_playing_line(const Json &np) {
    if (!np.value("has_track", false))
        return np.value("state", std::string("unknown")) + ", no track";
    const int32_t position = np["position_ms"].get<int32_t>();
    const int32_t length = np["length_ms"].get<int32_t>();
    std::string line = np["state"].get<std::string>() + "  " + np["title"].get<std::string>();
    const std::string artist = np["artist"].get<std::string>();
    if (!artist.empty()) line += " - " + artist;
    line += "  " + progress_bar(position, length) + " " + format_time(position) + " / " +
            format_time(length);
    line += "  (" + std::to_string(np["track_index"].get<int32_t>() + 1) + "/" +
            std::to_string(np["number_of_tracks"].get<int32_t>()) + ")";
    return line;
}

std::string now_playing_block(const Json &np) {
    if (!np.value("has_track", false))
        return "state:    " + np.value("state", std::string("unknown")) + ", no track\n";
    auto row = [](const char *label, const std::string &value) {
        return std::string(label) + (value.empty() ? "-" : value) + "\n";
    };
    const int32_t position = np["position_ms"].get<int32_t>();
    const int32_t length = np["length_ms"].get<int32_t>();
    return row("title:    ", np["title"].get<std::string>()) +
           row("artist:   ", np["artist"].get<std::string>()) +
           row("album:    ", np["album"].get<std::string>()) +
           row("chapter:  ", np["chapter"].get<std::string>()) +
           row("position: ", progress_bar(position, length) + " " + format_time(position) + " / " +
                                 format_time(length) + "  (" +
                                 std::to_string(np["track_index"].get<int32_t>() + 1) + "/" +
                                 std::to_string(np["number_of_tracks"].get<int32_t>()) + ")") +
           row("state:    ", np["state"].get<std::string>()) +
           row("shuffle:  ", np["shuffle"].get<std::string>()) +
           row("repeat:   ", np["repeat"].get<std::string>());
}

void add_playback_commands(CLI::App &app, Session &s) {
    static std::string shuffle_word, repeat_word, position_text, uid_text, out_path;
    static int track_number = 0, preference_class = 0;
    static std::vector<int> preference_value;

    CLI::App *shuffle = app.add_subcommand("shuffle", "Show or set the shuffle mode");
    shuffle->add_option("MODE", shuffle_word, "off, songs or albums (0, 1, 2)")
        ->check(CLI::IsMember({"off", "songs", "albums", "0", "1", "2"}));
    on_run(shuffle, s, [&s] {
        show_or_set_mode(s, "shuffle", kShuffleNames, shuffle_word, zal_ipod_get_shuffle_sync,
                         zal_ipod_set_shuffle_sync);
    });

    CLI::App *repeat = app.add_subcommand("repeat", "Show or set the repeat mode");
    repeat->add_option("MODE", repeat_word, "off, one or all (0, 1, 2)")
        ->check(CLI::IsMember({"off", "one", "all", "0", "1", "2"}));
    on_run(repeat, s, [&s] {
        show_or_set_mode(s, "repeat", kRepeatNames, repeat_word, zal_ipod_get_repeat_sync,
                         zal_ipod_set_repeat_sync);
    });

    CLI::App *seek = app.add_subcommand("seek", "Move to a position of the current track");
    seek->add_option("POSITION", position_text, "seconds (83, 83.5) or minutes:seconds (1:23)")
        ->required()
        ->check(parsed_by(parse_position, "TIME"));
    on_run(seek, s, [&s] {
        const int32_t ms = parse_position(position_text);
        s.expect(zal_ipod_set_position_sync(s.with_session(), ms), "seek");
        const Json np = now_playing(s);
        if (s.options.json)
            print_json(Json{{"command", "seek"}, {"position_ms", ms}, {"now_playing", np}});
        else
            printf("%s\n", now_playing_line(np).c_str());
    });

    CLI::App *track = app.add_subcommand("track", "Play track N of the current list (from 1)");
    track->add_option("N", track_number, "track number, 1 for the first")
        ->required()
        ->check(CLI::PositiveNumber);
    on_run(track, s, [&s] {
        s.expect(zal_ipod_set_track_sync(s.with_session(), track_number - 1), "track");
        const Json np = now_playing(s);
        if (s.options.json)
            print_json(Json{{"command", "track"}, {"track", track_number}, {"now_playing", np}});
        else
            printf("%s\n", now_playing_line(np).c_str());
    });

    CLI::App *prefs = app.add_subcommand("prefs", "Device preferences");
    prefs->require_subcommand(1);
    CLI::App *get = prefs->add_subcommand("get", "Show the value of a preference class");
    get->add_option("CLASS", preference_class, "preference class number")->required();
    on_run(get, s, [&s] { run_prefs(s, preference_class, {}); });
    CLI::App *set = prefs->add_subcommand("set", "Set a preference class to a value");
    set->add_option("CLASS", preference_class, "preference class number")->required();
    set->add_option("VALUE", preference_value, "the value")->required()->expected(1);
    on_run(set, s, [&s] { run_prefs(s, preference_class, preference_value); });

    CLI::App *artwork =
        app.add_subcommand("artwork", "Write the current (or a given) track's picture as PNG");
    artwork->add_option("--uid", uid_text, "persistent identifier of the track (0x... or decimal)")
        ->check(parsed_by(parse_uid, "ID"));
    artwork->add_option("-o,--out", out_path, "the PNG file to write")->required();
    on_run(artwork, s, [&s] { run_artwork(s, uid_text, out_path); });
}

}  // namespace zalctl
