// The daemon's command line: defaults, options read in order with getopt(), the usage
// text, and the log destination of -d.
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>

#include "common/daemon/context_internal.h"
#include "zal-ipod-2/common.h"
#include "zal-ipod-2/daemon.h"

namespace {

constexpr const char *kOptions = "hu:t:d:b:i:e:a:l:m:f:";

// Lines 4 to 21 of the usage text, each printed with puts().
constexpr const char *kUsageOptionLines[] = {
    "Options",
    " -t device            Set target device (default is 'general')",
    "                      supported target devices",
    " -b mac_address       The mac address of the bluetooth component",
    " -i [1|2]             iAP protocol version to use",
    "                      Default value is 2",
    "                      If accessory does not support iAP2, the daemon will fallback to iAP1",
    " -e protocolName1,protocolName2,...   List of EAP protocol names",
    "                        - Example: com.example.remote,com.example.telemetry",
    " -a app_ID            App match team ID",
    "                        - Example: A1B2C3D4E5",
    " -l path              Path to a shared library implementing the USB host plugin header",
    " -m path              Path to a shared library implementing the Media Library plugin header",
    " -u                   Set unix domain socket path",
    " -d path              dump log message into specific destination",
    "                        - stdout (default)",
    "                        - /path/to/log-file",
    " -f path               Path to configuration file implementing for zald-2",
};

void print_usage(const char *program) {
    std::puts("");
    std::puts("zald-2: accessory daemon for media devices over iAP1 and iAP2");
    std::puts("\nUsage:");
    std::printf(" %s [options]\n", program);
    for (const char *line : kUsageOptionLines) std::puts(line);
    std::printf("Example\n %s -v\n", program);
}

// The log file that an earlier -d opened; closed when a later -d replaces it.
FILE *opened_log_file = nullptr;

// -d: "stdout" or a file created or truncated. A file that cannot be opened leaves the
// daemon logging to standard output, with a message saying so: its traces are worth more
// than a refusal to start, and the stream is never left dangling.
void set_log_destination(const char *destination) {
    FILE *previous = opened_log_file;
    opened_log_file = nullptr;
    if (std::strcmp(destination, "stdout") == 0) {
        _log_fp = stdout;
    } else if (FILE *file = std::fopen(destination, "w")) {
        setvbuf(file, nullptr, _IOLBF, 0);  // a daemon that dies keeps its last lines
        opened_log_file = file;
        _log_fp = file;
    } else {
        std::printf("CONFIG ERROR: Unable to open log file %s (%s), logging to stdout\n",
                    destination, std::strerror(errno));
        _log_fp = stdout;
    }
    if (previous != nullptr) std::fclose(previous);
}

// Takes one option; false when it makes the command line fail.
bool apply_option(context *ctx, int option, char *argument) {
    switch (option) {
        case 'u':
            zal::daemon::copy_cut(ctx->socket_name, sizeof ctx->socket_name, argument);
            return true;
        case 't':
            zal::daemon::copy_cut(ctx->device, sizeof ctx->device, argument);
            return true;
        case 'f':
            zal::daemon::copy_cut(ctx->config_path, sizeof ctx->config_path, argument);
            return true;
        case 'd':
            set_log_destination(argument);
            return true;
        case 'b':
            if (set_context_bt_address(ctx, argument) == 0) return false;
            set_context_bt_name(ctx);  // a missing name is reported and tolerated
            return true;
        case 'i':
            set_context_highest_protocol_mode(ctx, argument);
            return true;
        case 'e':
            return set_context_eap(ctx, argument) != 0;
        case 'a':
            return set_context_app_match_team_id(ctx, argument) != 0;
        case 'l':
            return set_context_usb_host_plugin(ctx, argument) != 0;
        case 'm':
            return set_context_media_library_plugin(ctx, argument) != 0;
        default:  // -h, and '?' after getopt's own diagnostic
            return false;
    }
}

}  // namespace

extern "C" {

// Each call restarts getopt() (optind 0 is the full reset on glibc and bionic), so the
// daemon and the tests may parse more than one command line in a process.
ZAL_API int parse_arguments(int argc, char **argv, context *ctx) {
    const char *program = argc > 0 && argv != nullptr && argv[0] != nullptr ? argv[0] : "zald-2";
    if (ctx == nullptr) {
        print_usage(program);
        return 1;
    }
    zal::daemon::copy_cut(ctx->device, sizeof ctx->device, ZAL_CONTEXT_DEFAULT_DEVICE);
    zal::daemon::copy_cut(ctx->socket_name, sizeof ctx->socket_name,
                          ZAL_CONTEXT_DEFAULT_SOCKET_NAME);
    ctx->config_path[0] = '\0';
    ctx->bt_address[0] = '\0';
    ctx->vehicle_information_component_engine_type = ZAL_CONTEXT_DEFAULT_ENGINE_TYPE;
    if (argc <= 0 || argv == nullptr) return 0;

    optind = 0;
    int option;
    while ((option = getopt(argc, argv, kOptions)) != -1) {
        if (!apply_option(ctx, option, optarg)) {
            print_usage(program);
            return 1;
        }
    }
    return 0;
}

}  // extern "C"
