// Transport: play, pause, playpause, stop, next, prev. Each prints what plays afterwards.
#include <cstdio>

#include "zalctl.h"

namespace zalctl {

namespace {

struct TransportCommand {
    const char *name;
    const char *help;
    int (*sync)(zal_ipod_handle *);
};

constexpr TransportCommand kTransportCommands[] = {
    {"play", "Start playing", zal_ipod_play_sync},
    {"pause", "Pause", zal_ipod_pause_sync},
    {"playpause", "Toggle between playing and paused", zal_ipod_playpause_sync},
    {"stop", "Stop (the position goes back to the start)", zal_ipod_stop_sync},
    {"next", "Skip to the next track", zal_ipod_next_track_sync},
    {"prev", "Go back to the previous track (or the start of this one)", zal_ipod_prev_track_sync},
};

void run_transport(Session &s, const TransportCommand &c) {
    zal_ipod_handle *h = s.with_session();
    const int32_t result = s.expect(c.sync(h), c.name);
    const Json np = now_playing(s);
    if (s.options.json)
        print_json(Json{{"command", c.name}, {"result", result}, {"now_playing", np}});
    else
        printf("%s\n", now_playing_line(np).c_str());
}

}  // namespace

void add_transport_commands(CLI::App &app, Session &s) {
    for (const TransportCommand &c : kTransportCommands)
        on_run(app.add_subcommand(c.name, c.help), s, [&s, &c] { run_transport(s, c); });
}

}  // namespace zalctl
