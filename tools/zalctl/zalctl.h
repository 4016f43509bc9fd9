// zalctl: what every command family shares. The connection to the daemon (Session), the
// global options, output in plain text or JSON, and the exit-code conventions. A family
// lives in commands_<family>.cpp with one add_<family>_commands function, listed in main.cpp.
#pragma once

#include <CLI/CLI.hpp>
#include <chrono>
#include <functional>
#include <nlohmann/json.hpp>
#include <stdexcept>
#include <string>

#include "zal-ipod-2/zal-ipod-2.h"

namespace zalctl {

// Exit codes: 0 success, 1 the daemon is unreachable or a command failed (one line on
// stderr), 2 the command line is wrong.
enum ExitCode : int { kExitOk = 0, kExitFailure = 1, kExitUsage = 2 };

// Thrown by commands; main prints "zalctl: <message>" and exits with 1.
class Failure : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

using Json = nlohmann::ordered_json;

struct Options {
    bool json = false;       // --json: one JSON document (or one per line for streams)
    int device = 0;          // --device: index of the device a session is opened on
    std::string daemon;      // --daemon: where the library reconnects after a lost connection
    unsigned timeout_s = 5;  // --timeout: bound of every wait for a reply, in seconds
    bool verbose = false;    // --verbose: let the library's log through to stderr
};

// The connection of one zalctl run. Each run is a connection of its own, and sessions
// belong to a connection, so commands that need one open it themselves (with_session).
class Session {
  public:
    using EventHandler = std::function<void(const zal_ipod_event &)>;

    Session() = default;
    ~Session();
    Session(const Session &) = delete;
    Session &operator=(const Session &) = delete;

    Options options;

    // The connected handle; connects on first use. Throws Failure when unreachable.
    zal_ipod_handle *handle();
    // The handle with a session open on options.device and ready for commands.
    zal_ipod_handle *with_session();
    bool connected() const { return h_ != nullptr; }

    // Events go to this handler from now on (while any call below reads the socket).
    void on_event(EventHandler handler) { event_handler_ = std::move(handler); }
    // Reads and dispatches until the deadline or until done() says so; false when the
    // connection failed meanwhile.
    bool pump_until(std::chrono::steady_clock::time_point deadline,
                    const std::function<bool()> &done = {});

    // Checks the result of a _sync call: a negative result throws Failure "<what>: <why>",
    // why being the daemon's error text, a lost connection or the time-out.
    int32_t expect(int32_t result, const char *what);
    // Sends opcode with arg (taken; may be null) through the packet interface and returns
    // the decoded reply payload (caller frees; null for an empty payload). An ERROR reply
    // or no reply throws Failure. For requests the public API has no command for yet.
    gval *request(uint16_t opcode, gval *arg, const char *what);

    // The action of the subcommand the command line chose (set while parsing).
    std::function<void()> action;

  private:
    static int dispatch_event(zal_ipod_handle *h, zal_ipod_event *event, void *user);
    [[noreturn]] void fail_without_reply(const char *what,
                                         std::chrono::steady_clock::time_point started);

    zal_ipod_handle *h_ = nullptr;
    EventHandler event_handler_;
    const char *last_error_ = nullptr;  // error text pointer before the current command
};

// Registers what a subcommand does once the whole command line parsed without error.
void on_run(CLI::App *sub, Session &s, std::function<void()> action);

// ---- Output ------------------------------------------------------------------------------
// Prints a JSON document on one line.
void print_json(const Json &doc);
// A value tree as JSON: hashes become objects, arrays arrays, bytes a hex string.
Json to_json(const gval *value);
// A value tree as a compact text: `key=value key2=value2`, nested in braces.
std::string to_text(const gval *value);
// Short name of an event kind ("playstate_changed", ...), "unknown" out of range.
const char *event_kind_name(int kind);
// "3:05" for 185000 ms; "-:--" for a negative time.
std::string format_time(int32_t ms);
// "[#####.....]" with width cells filled in proportion to position/length.
std::string progress_bar(int32_t position_ms, int32_t length_ms, int width = 30);

// ---- Command families --------------------------------------------------------------------
void add_device_commands(CLI::App &app, Session &s);     // devices, session, keepalive
void add_status_commands(CLI::App &app, Session &s);     // status
void add_transport_commands(CLI::App &app, Session &s);  // play, pause, ..., next, prev
void add_config_commands(CLI::App &app, Session &s);     // config get / set
void add_event_commands(CLI::App &app, Session &s);      // events
// shuffle, repeat, seek, track, prefs get / set, artwork
void add_playback_commands(CLI::App &app, Session &s);
// info, eq, button, voiceover, call-state, eap (commands_device.cpp)
void add_device_info_commands(CLI::App &app, Session &s);
void add_media_commands(CLI::App &app, Session &s);      // db, library, playlist, play-items
void add_browse_commands(CLI::App &app, Session &s);     // browse

// Shared by status, transport and playback: the current track, as JSON (has_track, title,
// artist, album, chapter, state, track_index, number_of_tracks, position_ms, length_ms,
// shuffle, repeat).
Json now_playing(Session &s);
// One line for people: "paused  Title - Artist  [###...] 0:42 / 3:35  (1/4)".
std::string now_playing_line(const Json &np);
// The block status shows: one "label: value" line each for title, artist, album, chapter,
// position (bar, time / length, track of tracks), state, shuffle and repeat.
std::string now_playing_block(const Json &np);

}  // namespace zalctl
