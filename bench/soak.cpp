// Soak run: zald-sim with a scenario of faults drawn from a seed (late, refused, lost,
// split and malformed replies, dropped connections), several clients issuing commands of
// every family while events stream, connections drop and come back. Checks that every
// call returns within its bound, that resident memory stays flat after warm-up and that
// no descriptor leaks. Prints the figures; exits 1 when a check fails.
//
//   soak [--seconds N] [--clients N] [--seed N] [--sim PATH]
#include <android/log.h>
#include <dirent.h>
#include <fcntl.h>
#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <functional>
#include <random>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "soak_commands.h"
#include "zal-ipod-2/connection.h"
#include "zal-ipod-2/zal-ipod-2.h"

extern char **environ;

namespace {

using Clock = std::chrono::steady_clock;

struct Options {
    int seconds = 30;
    int clients = 4;
    unsigned seed = 1;
    std::string sim = ZALD_SIM_PATH;
};

// Reply time-out of the clients; a call may take the wait's whole-second rounding, a
// reconnect and the longest injected delay on top.
constexpr unsigned kReadTimeoutSec = 1;
constexpr double kCallBoundSec = kReadTimeoutSec + 1 + 0.5 + 1.0 + 1.0;

long resident_kib() {
    std::ifstream status("/proc/self/status");
    std::string line;
    while (std::getline(status, line))
        if (line.rfind("VmRSS:", 0) == 0) return std::atol(line.c_str() + 6);
    return -1;
}

int open_descriptors() {
    int n = 0;
    if (DIR *d = opendir("/proc/self/fd")) {
        while (readdir(d) != nullptr) ++n;
        closedir(d);
    }
    return n - 3;  // ".", ".." and the folder's own descriptor
}

// Faults drawn from the seed: each opcode of the table gets a rule or none, and the
// connections are dropped (and once a malformed packet sent) at times spread over the run.
std::string scenario_text(const Options &o, const std::vector<int> &opcodes) {
    std::mt19937 random(o.seed);
    const char *actions[] = {"delay", "error", "no_reply", "split", "malformed", "drop"};
    std::ostringstream s;
    s << R"({"name": "soak", "position_interval_ms": 100,
  "devices": [{"serial": "SOAK0001", "name": "Soak iPhone", "protocol": 2,
               "tracks": [{"title": "One"}, {"title": "Two"}, {"title": "Three"}],
               "playback": {"state": "playing", "track": 0, "position_ms": 0}},
              {"serial": "SOAK0002", "name": "Soak iPod", "protocol": 1, "transport": "bluetooth",
               "tracks": [{"title": "Four"}, {"title": "Five"}]}],
  "faults": [)";
    bool first = true;
    auto rule = [&](const std::string &body) {
        s << (first ? "" : ",\n             ") << "{" << body << "}";
        first = false;
    };
    for (int opcode : opcodes) {
        if (random() % 3 == 0) continue;  // a third of the commands are never disturbed
        const char *action = actions[random() % 6];
        std::ostringstream r;
        r << R"("opcode": )" << opcode << R"(, "action": ")" << action << R"(", "skip": )"
          << 3 + random() % 20 << R"(, "count": )" << 1 + random() % 3;
        if (std::strcmp(action, "delay") == 0) r << R"(, "delay_ms": )" << 50 + random() % 900;
        if (std::strcmp(action, "split") == 0) r << R"(, "split_at": )" << 1 + random() % 20;
        rule(r.str());
    }
    for (int at = 2000; at < o.seconds * 1000; at += 2000 + static_cast<int>(random() % 3000))
        rule(R"("at_ms": )" + std::to_string(at) + R"(, "action": ")" +
             (random() % 4 == 0 ? "malformed" : "drop") + "\"");
    s << "]}\n";
    return s.str();
}

struct Totals {
    std::atomic<long> calls{0};
    std::atomic<long> slow{0};
    std::atomic<long> events{0};
    std::atomic<long> lost{0};
    std::atomic<long> restored{0};
    std::atomic<long> connect_failures{0};
    std::atomic<long> longest_ms{0};
};

int count_event(zal_ipod_handle *, zal_ipod_event *, void *user) {
    ++static_cast<Totals *>(user)->events;
    return 0;
}

struct ClientState {
    Totals *totals;
};

void on_connection(zal_ipod_handle *h, int state, void *user) {
    auto *t = static_cast<Totals *>(user);
    if (state == ZALIPOD_CONNECTION_LOST) {
        ++t->lost;
    } else {
        ++t->restored;
        zal_ipod_open_session(h, 0);  // resubscribe; the reply arrives as any other
    }
}

void run_client(int index, const std::string &path, Clock::time_point end, unsigned seed,
                Totals &totals) {
    std::mt19937 random(seed + static_cast<unsigned>(index));
    const std::vector<SoakCommand> &commands = soak_commands();
    while (Clock::now() < end) {
        zal_ipod_handle *h = zal_ipod_connect(path.c_str());
        if (h == nullptr) {
            // The first connect can meet a drop; try again shortly.
            ++totals.connect_failures;
            std::this_thread::sleep_for(std::chrono::milliseconds(100));
            continue;
        }
        zal_ipod_set_read_timeout(h, kReadTimeoutSec, 0);
        zal_ipod_set_event_cb(h, count_event, &totals);
        zal_ipod_set_connection_cb(h, on_connection, &totals);
        zal_ipod_set_loopthread(h, 1);
        zal_ipod_open_session_sync(h, static_cast<int>(random() % 2));
        // Now and then a client leaves and comes back, as applications do.
        const auto leave = Clock::now() + std::chrono::seconds(3 + random() % 8);
        while (Clock::now() < end && Clock::now() < leave) {
            const SoakCommand &c = commands[random() % commands.size()];
            const auto started = Clock::now();
            c.run(h);
            const double took = std::chrono::duration<double>(Clock::now() - started).count();
            ++totals.calls;
            long ms = static_cast<long>(took * 1000);
            long seen = totals.longest_ms.load();
            while (ms > seen && !totals.longest_ms.compare_exchange_weak(seen, ms)) {
            }
            if (took > kCallBoundSec) {
                ++totals.slow;
                fprintf(stderr, "soak: %s took %.2f s\n", c.name, took);
            }
        }
        zal_ipod_set_loopthread(h, 0);
        zal_ipod_close(h);
    }
}

bool parse(int argc, char **argv, Options &o) {
    for (int i = 1; i < argc; ++i) {
        std::string a = argv[i];
        if (i + 1 >= argc) return false;
        if (a == "--seconds")
            o.seconds = std::atoi(argv[++i]);
        else if (a == "--clients")
            o.clients = std::atoi(argv[++i]);
        else if (a == "--seed")
            o.seed = static_cast<unsigned>(std::atol(argv[++i]));
        else if (a == "--sim")
            o.sim = argv[++i];
        else
            return false;
    }
    return o.seconds > 0 && o.clients > 0;
}

}  // namespace

int main(int argc, char **argv) {
    Options o;
    if (!parse(argc, argv, o)) {
        fprintf(stderr, "usage: %s [--seconds N] [--clients N] [--seed N] [--sim PATH]\n", argv[0]);
        return 2;
    }
    // The library's messages about every injected fault are expected; keep the output to
    // the figures.
    if (freopen("/dev/null", "w", stdout) == nullptr) return 1;
    __android_log_set_minimum_priority(ANDROID_LOG_SILENT);

    const std::string tag = std::to_string(getpid());
    const std::string name = "zal.soak." + tag;
    const std::string path = "/tmp/zal-soak-" + tag + ".sock";
    const std::string scenario = "/tmp/zal-soak-" + tag + ".json";
    std::vector<int> opcodes;
    for (const SoakCommand &c : soak_commands()) opcodes.push_back(c.opcode);
    std::sort(opcodes.begin(), opcodes.end());
    opcodes.erase(std::unique(opcodes.begin(), opcodes.end()), opcodes.end());
    std::ofstream(scenario) << scenario_text(o, opcodes);
    if (getenv("ZAL_SOAK_SHOW_SCENARIO") != nullptr)
        fprintf(stderr, "%s", scenario_text(o, opcodes).c_str());

    setenv("ZALD_SIM_SOCKET_PATH", path.c_str(), 1);
    std::vector<std::string> args = {o.sim, "-u", name, "-f", scenario};
    std::vector<char *> argv_sim;
    for (auto &a : args) argv_sim.push_back(a.data());
    argv_sim.push_back(nullptr);
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    const std::string sim_log = "/tmp/zal-soak-" + tag + ".log";
    posix_spawn_file_actions_addopen(&actions, 1, "/dev/null", O_WRONLY, 0);
    posix_spawn_file_actions_addopen(&actions, 2, sim_log.c_str(), O_WRONLY | O_CREAT | O_TRUNC,
                                     0600);
    pid_t sim = -1;
    if (posix_spawn(&sim, o.sim.c_str(), &actions, nullptr, argv_sim.data(), environ) != 0) {
        fprintf(stderr, "soak: cannot start %s\n", o.sim.c_str());
        return 1;
    }
    posix_spawn_file_actions_destroy(&actions);
    for (int i = 0; i < 100 && access(path.c_str(), F_OK) != 0; ++i)
        std::this_thread::sleep_for(std::chrono::milliseconds(50));
    if (access(path.c_str(), F_OK) != 0) {
        fprintf(stderr, "soak: zald-sim did not come up (scenario %s, its log %s)\n",
                scenario.c_str(), sim_log.c_str());
        kill(sim, SIGKILL);
        return 1;
    }
    zal_set_daemon_socket_name(name.c_str());
    // Descriptors the process keeps for good once the library ran (the log, ...): one
    // client's whole life before the run.
    zal_ipod_close(zal_ipod_connect(path.c_str()));
    const int fds_start = open_descriptors();

    Totals totals;
    const auto start = Clock::now();
    const auto end = start + std::chrono::seconds(o.seconds);
    std::vector<std::thread> clients;
    for (int i = 0; i < o.clients; ++i)
        clients.emplace_back(run_client, i, path, end, o.seed, std::ref(totals));

    // Memory and descriptors after a warm-up of a fifth of the run (at most 10 s), then
    // at the end once every client closed.
    std::this_thread::sleep_for(std::chrono::seconds(std::min(10, std::max(1, o.seconds / 5))));
    const long rss_start = resident_kib();
    for (auto &t : clients) t.join();
    const long rss_end = resident_kib();
    const int fds_end = open_descriptors();

    kill(sim, SIGTERM);
    int status = 0;
    waitpid(sim, &status, 0);
    unlink(scenario.c_str());
    unlink(sim_log.c_str());

    const double seconds = std::chrono::duration<double>(Clock::now() - start).count();
    const bool memory_flat = rss_end <= rss_start + rss_start / 5 + 4096;
    const bool fds_ok = fds_end <= fds_start;
    fprintf(stderr,
            "soak: %d clients, %.0f s, seed %u\n"
            "  calls          %ld (%.0f per second), longest %ld ms, over %.1f s: %ld\n"
            "  events         %ld\n"
            "  connections    lost %ld, restored %ld, first connects refused %ld\n"
            "  resident KiB   %ld after warm-up, %ld at the end%s\n"
            "  descriptors    %d before the clients, %d at the end%s\n",
            o.clients, seconds, o.seed, totals.calls.load(), totals.calls.load() / seconds,
            totals.longest_ms.load(), kCallBoundSec, totals.slow.load(), totals.events.load(),
            totals.lost.load(), totals.restored.load(), totals.connect_failures.load(), rss_start,
            rss_end, memory_flat ? "" : "  <- grew", fds_start, fds_end,
            fds_ok ? "" : "  <- leaked");
    const bool ok = totals.slow.load() == 0 && memory_flat && fds_ok && totals.calls.load() > 0 &&
                    WIFEXITED(status) && WEXITSTATUS(status) == 0;
    fprintf(stderr, "soak: %s\n", ok ? "passed" : "FAILED");
    return ok ? 0 : 1;
}
