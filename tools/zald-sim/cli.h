// The command line of zald-sim, which is the daemon's, read by the shared parser into the
// daemon context: -u socket name, -f scenario file, -d log destination, -i protocol mode of
// the first device, and -t/-b/-e/-a/-l/-m as the daemon takes them.
#pragma once

#include <string>

#include "zal-ipod-2/daemon.h"

namespace sim {

struct Options {
    std::string socket_name;
    std::string scenario_path;  // empty: the built-in scenario
    int protocol_mode = 0;      // 0: -i not given
};

// Fills the context and options; false after the usage text was printed (exit status 1).
bool parse_command_line(int argc, char **argv, Options *options);

// The context of this run (valid after parse_command_line, until release).
context &daemon_context();
void release_daemon_context();

// True when -d named a destination: the log then gets a time-stamped copy there.
bool log_destination_chosen();

}  // namespace sim
