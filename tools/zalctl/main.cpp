// zalctl: a command-line client of zald-2 (and zald-sim) built on the public API.
#include <android/log.h>
#include <signal.h>

#include <cstdio>

#include "zalctl.h"

namespace {

void add_global_options(CLI::App &app, zalctl::Options &o) {
    app.add_flag("--json", o.json, "Print JSON (one document, or one line per event)");
    app.add_option("-d,--device", o.device, "Device index a session is opened on")
        ->check(CLI::NonNegativeNumber);
    app.add_option("--daemon", o.daemon,
                   "Where to reconnect after the connection was lost: host:port or a socket "
                   "file (default: $ZALIPODDAEMON). The first connection always goes to the "
                   "daemon's local socket");
    app.add_option("-t,--timeout", o.timeout_s, "Longest wait for a reply, in seconds")
        ->check(CLI::Range(1u, 600u));
    app.add_flag("-v,--verbose", o.verbose, "Show the library's log on stderr");
}

}  // namespace

int main(int argc, char **argv) {
    using namespace zalctl;
    // A daemon that goes away mid-write must not kill us; the library reports it.
    signal(SIGPIPE, SIG_IGN);

    Session session;
    CLI::App app{"zalctl: control zald-2 (or zald-sim) from the command line"};
    app.name("zalctl");
    // Global options may also follow the subcommand ("zalctl events --json").
    app.fallthrough();
    app.require_subcommand(1);
    add_global_options(app, session.options);

    add_device_commands(app, session);
    add_status_commands(app, session);
    add_transport_commands(app, session);
    add_config_commands(app, session);
    add_event_commands(app, session);
    add_playback_commands(app, session);
    add_device_info_commands(app, session);
    add_media_commands(app, session);
    add_browse_commands(app, session);

    try {
        app.parse(argc, argv);
    } catch (const CLI::CallForHelp &e) {
        return app.exit(e);
    } catch (const CLI::CallForAllHelp &e) {
        return app.exit(e);
    } catch (const CLI::ParseError &e) {
        // "zalctl bogus" would otherwise only hear that a command is required.
        const std::vector<std::string> left = app.remaining();
        if (app.get_subcommands().empty() && !left.empty()) {
            fprintf(stderr, "zalctl: unknown command: %s (see zalctl --help)\n", left[0].c_str());
            return kExitUsage;
        }
        app.exit(e);
        return kExitUsage;
    }
    // The library logs through liblog, which goes to stderr on a Linux host; keep stderr
    // for our own one-line messages unless asked.
    if (!session.options.verbose) __android_log_set_minimum_priority(ANDROID_LOG_SILENT);

    if (!session.action) {
        fprintf(stderr, "zalctl: nothing to do (see zalctl --help)\n");
        return kExitUsage;
    }
    try {
        session.action();
    } catch (const Failure &e) {
        fflush(stdout);
        fprintf(stderr, "zalctl: %s\n", e.what());
        return kExitFailure;
    } catch (const std::exception &e) {
        fflush(stdout);
        fprintf(stderr, "zalctl: %s\n", e.what());
        return kExitFailure;
    }
    return kExitOk;
}
