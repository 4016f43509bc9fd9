// zald-sim: reads its command line and scenario, opens its sockets, and serves clients
// until SIGINT or SIGTERM.
#include <fcntl.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <exception>

#include "cli.h"
#include "context_keys.h"
#include "server.h"
#include "sim_log.h"

namespace {

int stop_pipe[2] = {-1, -1};

void on_stop_signal(int) {
    const char byte = 1;
    // Nothing to do when the pipe is full: a stop is already pending.
    ssize_t ignored = write(stop_pipe[1], &byte, 1);
    (void)ignored;
}

bool install_signals() {
    if (pipe2(stop_pipe, O_CLOEXEC | O_NONBLOCK) != 0) return false;
    struct sigaction sa {};
    sa.sa_handler = on_stop_signal;
    sigemptyset(&sa.sa_mask);
    signal(SIGPIPE, SIG_IGN);
    return sigaction(SIGINT, &sa, nullptr) == 0 && sigaction(SIGTERM, &sa, nullptr) == 0;
}

// Extra listeners: the scenario's "listen" settings, overridden by the environment.
bool read_listen_environment(sim::Listen *listen) {
    if (const char *port = getenv("ZALD_SIM_TCP_PORT"); port != nullptr && *port != '\0') {
        char *end = nullptr;
        long n = strtol(port, &end, 10);
        if (*end != '\0' || n < 0 || n > 65535) {
            fprintf(stderr, "zald-sim: ZALD_SIM_TCP_PORT=%s is not a port number (0..65535)\n",
                    port);
            return false;
        }
        listen->tcp_port = static_cast<uint16_t>(n);
    }
    if (const char *path = getenv("ZALD_SIM_SOCKET_PATH"); path != nullptr && *path != '\0')
        listen->socket_path = path;
    return true;
}

int run(int argc, char **argv) {
    sim::Options options;
    if (!sim::parse_command_line(argc, argv, &options)) return 1;

    sim::Scenario scenario;
    try {
        scenario = options.scenario_path.empty() ? sim::default_scenario()
                                                 : sim::load_scenario_file(options.scenario_path);
    } catch (const sim::ScenarioError &e) {
        fprintf(stderr, "zald-sim: scenario error: %s\n", e.what());
        return 2;
    }
    // -i sets the protocol the first device speaks.
    if (options.protocol_mode > 0 && !scenario.devices.empty())
        scenario.devices.front().protocol = options.protocol_mode >= 2 ? 2 : 1;

    sim::Listen listen{options.socket_name, scenario.tcp_port, scenario.socket_path};
    if (!read_listen_environment(&listen)) return 2;

    sim::ConfigStore config;
    sim::bind_context_keys(config, sim::daemon_context());
    for (const auto &key : scenario.config) config.define(key.key, key.value, key.read_only);

    if (!install_signals()) {
        perror("zald-sim: signals");
        return 1;
    }
    sim::Server server(scenario, std::move(config), listen);
    if (!server.open()) return 1;
    SIM_LOGI("zald-sim: scenario \"%s\" with %zu devices\n", scenario.name.c_str(),
             scenario.devices.size());
    server.run(stop_pipe[0]);
    SIM_LOGI("zald-sim: stopping\n");
    printf("zald-sim: stopped\n");
    return 0;
}

}  // namespace

int main(int argc, char **argv) {
    try {
        const int status = run(argc, argv);
        sim::release_daemon_context();
        return status;
    } catch (const std::exception &e) {
        fprintf(stderr, "zald-sim: fatal: %s\n", e.what());
        return 1;
    }
}
