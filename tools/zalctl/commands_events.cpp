// events: prints the daemon's events, one line each, for a while, up to a count, or until
// interrupted; follows the connection through a reconnect.
#include <signal.h>

#include <atomic>
#include <cstdio>
#include <thread>

#include "zalctl.h"

namespace zalctl {

namespace {

using Clock = std::chrono::steady_clock;

std::atomic<bool> interrupted{false};

extern "C" void on_interrupt(int) {
    interrupted = true;
}

struct EventOptions {
    bool follow = false;
    int count = 0;         // 0: no limit
    double seconds = 5.0;  // how long to listen without --follow
    bool open_session = false;
};

void print_event(const Session &s, const zal_ipod_event &e) {
    const int kind = zal_ipod_event_type(&e);
    const char *serial = zal_ipod_event_get_serial(&e);
    if (serial == nullptr) serial = "";
    if (s.options.json) {
        print_json(Json{{"kind", event_kind_name(kind)},
                        {"kind_id", kind},
                        {"session", e.session},
                        {"serial", serial},
                        {"data", to_json(e.data)}});
        return;
    }
    std::string line = std::string(event_kind_name(kind)) +
                       " session=" + std::to_string(e.session) + " serial=" + serial;
    if (e.data != nullptr) {
        const bool fields = serialize_type(e.data) == SERIALIZE_HASH;
        line += fields ? " " + to_text(e.data) : " value=" + to_text(e.data);
    }
    printf("%s\n", line.c_str());
    fflush(stdout);
}

// After a lost connection the library reconnects (to --daemon or ZALIPODDAEMON) on the
// next read once a send failed: a keep-alive provides both. True once one is answered.
bool reconnect(Session &s, Clock::time_point give_up) {
    zal_ipod_handle *h = s.handle();
    while (Clock::now() < give_up && !interrupted) {
        if (zal_ipod_keep_alive_sync(h) >= 0) return true;
        std::this_thread::sleep_for(std::chrono::milliseconds(200));
    }
    return false;
}

void listen(Session &s, const EventOptions &o) {
    int seen = 0;
    s.on_event([&s, &seen](const zal_ipod_event &e) {
        print_event(s, e);
        ++seen;
    });
    zal_ipod_handle *h = s.handle();
    if (o.open_session) s.with_session();

    struct sigaction action = {};
    action.sa_handler = on_interrupt;
    sigaction(SIGINT, &action, nullptr);
    sigaction(SIGTERM, &action, nullptr);

    const auto end =
        o.follow ? Clock::time_point::max()
                 : Clock::now() + std::chrono::milliseconds(static_cast<int64_t>(o.seconds * 1000));
    const auto reached = [&] { return o.count > 0 && seen >= o.count; };
    zal_ipod_pending_event(h);
    while (!reached() && !interrupted && Clock::now() < end) {
        if (zal_ipod_read(h) >= 0) continue;
        fprintf(stderr, "zalctl: the connection to the daemon was lost; reconnecting\n");
        const auto give_up =
            std::min(end, Clock::now() + std::chrono::seconds(s.options.timeout_s));
        if (!reconnect(s, give_up)) {
            if (interrupted) break;
            throw Failure("events: the connection to the daemon was lost");
        }
        fprintf(stderr, "zalctl: reconnected\n");
    }
    if (o.count > 0 && seen < o.count && !interrupted)
        throw Failure("events: " + std::to_string(seen) + " of " + std::to_string(o.count) +
                      " events arrived in " + std::to_string(static_cast<int>(o.seconds)) + " s");
}

}  // namespace

void add_event_commands(CLI::App &app, Session &s) {
    static EventOptions options;  // lives as long as the App, as CLI11 requires
    CLI::App *events = app.add_subcommand(
        "events", "Print the daemon's events, one line each: kind, session, serial, fields");
    events->add_flag("-f,--follow", options.follow, "Keep printing until interrupted");
    events->add_option("-n,--count", options.count, "Stop after N events (fail if fewer came)")
        ->check(CLI::PositiveNumber);
    events->add_option("--for", options.seconds, "Listen this many seconds (default 5)")
        ->check(CLI::Range(0.1, 86400.0));
    events->add_flag("-s,--session", options.open_session,
                     "Open a session on --device first (its events come too)");
    on_run(events, s, [&s] { listen(s, options); });
}

}  // namespace zalctl
