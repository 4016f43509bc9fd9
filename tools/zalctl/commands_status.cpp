// status: the device, the session and what is playing, with the track position as a bar.
#include <cstdio>

#include "zalctl.h"

namespace zalctl {

namespace {

const char *play_state_name(int32_t state) {
    static constexpr const char *kNames[] = {"stopped", "playing", "paused", "seeking forward",
                                             "seeking backward"};
    return state >= 0 && state < 5 ? kNames[state] : "unknown";
}

std::string text_at(const gval *hash, const char *key) {
    const gval *v = serialize_hash_get(hash, key);
    return v != nullptr && serialize_type(v) == SERIALIZE_STRING ? serialize_get_string(v) : "";
}

int32_t int_at(const gval *hash, const char *key, int32_t fallback) {
    const gval *v = serialize_hash_get(hash, key);
    return v != nullptr && serialize_type(v) == SERIALIZE_INT ? serialize_get_int(v) : fallback;
}

void show_status(Session &s) {
    zal_ipod_handle *h = s.with_session();
    const int index = zal_ipod_current_session(h);
    const char *serial = zal_ipod_device_serial(h, index);
    const Json np = now_playing(s);  // its reply follows the device-name event
    const char *name = zal_ipod_device_name(h);
    const Json device{{"index", index},
                      {"serial", serial != nullptr ? serial : ""},
                      {"name", name != nullptr ? name : ""},
                      {"protocol", zal_ipod_device_protocol(h, index)}};
    if (s.options.json) {
        print_json(Json{
            {"device", device},
            {"session",
             {{"open", zal_ipod_is_session_opened(h) == 1}, {"ready", zal_ipod_is_ready(h) == 1}}},
            {"now_playing", np}});
        return;
    }
    printf("device:   %d  %s (%s, iAP%d)\n", index, device["name"].get<std::string>().c_str(),
           device["serial"].get<std::string>().c_str(), device["protocol"].get<int>());
    printf("session:  %s\n", zal_ipod_is_ready(h) == 1 ? "open, ready" : "open, not ready");
    printf("playing:  %s\n", now_playing_line(np).c_str());
}

}  // namespace

// Today the public API has no current-track command, so this asks with the packet
// interface; the reply is the daemon's track-info hash.
Json now_playing(Session &s) {
    s.with_session();
    gval *info = s.request(ZAL_OP_CURRENT_TRACK_INFO, nullptr, "status");
    Json np = Json::object();
    if (serialize_type(info) == SERIALIZE_HASH) {
        const int32_t state = int_at(info, "state", -1);
        np = Json{{"has_track", int_at(info, "current_track_info", 0) == 1},
                  {"title", text_at(info, "title")},
                  {"artist", text_at(info, "artist")},
                  {"album", text_at(info, "album")},
                  {"state", play_state_name(state)},
                  {"track_index", int_at(info, "track_index", -1)},
                  {"number_of_tracks", int_at(info, "number_of_tracks", 0)},
                  {"position_ms", int_at(info, "position", -1)},
                  {"length_ms", int_at(info, "length", -1)}};
    }
    serialize_free(info);
    if (np.empty()) throw Failure("status: the daemon's track information is not a hash");
    return np;
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

void add_status_commands(CLI::App &app, Session &s) {
    on_run(app.add_subcommand("status", "Show the device, the session and what is playing"), s,
           [&s] { show_status(s); });
}

}  // namespace zalctl
