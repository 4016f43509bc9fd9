// Command-line glue: the shared parser fills the daemon context; zald-sim reads its
// settings from there.
#include "cli.h"

#include <cstring>

#include "zal-ipod-2/common.h"

namespace sim {

namespace {

context the_context;
bool destination_chosen = false;

// -d as getopt sees it: "-d value" or "-dvalue" (zald-sim's options take no grouping).
bool names_log_destination(int argc, char **argv) {
    for (int i = 1; i < argc; ++i) {
        if (strcmp(argv[i], "--") == 0) return false;
        if (strncmp(argv[i], "-d", 2) == 0) return true;
    }
    return false;
}

}  // namespace

context &daemon_context() {
    return the_context;
}

void release_daemon_context() {
    zal_context_release(&the_context);
}

bool log_destination_chosen() {
    return destination_chosen;
}

bool parse_command_line(int argc, char **argv, Options *options) {
    memset(&the_context, 0, sizeof the_context);
    common_init();
    if (parse_arguments(argc, argv, &the_context) != 0) return false;
    destination_chosen = names_log_destination(argc, argv);
    options->socket_name = the_context.socket_name;
    options->scenario_path = the_context.config_path;
    // The parser leaves the mode alone without -i; the daemon's own default is 2.
    options->protocol_mode = the_context.highest_protocol_mode;
    if (the_context.highest_protocol_mode == 0) the_context.highest_protocol_mode = 2;
    return true;
}

}  // namespace sim
