// Child process control for the zald-sim tests.
#include "sim_process.h"

#include <fcntl.h>
#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <cstdlib>
#include <fstream>
#include <sstream>
#include <thread>

extern char **environ;

namespace zaltest {

namespace {

std::string read_file(const std::string &path) {
    std::ifstream in(path);
    std::stringstream text;
    text << in.rdbuf();
    return text.str();
}

}  // namespace

SimProcess::SimProcess(std::string program) : program_(std::move(program)) {
    const std::string base = "/tmp/" + unique_name("zald-sim-test");
    out_path_ = base + ".out";
    err_path_ = base + ".err";
}

SimProcess::~SimProcess() {
    if (pid_ > 0) stop(SIGKILL);
    unlink(out_path_.c_str());
    unlink(err_path_.c_str());
}

std::string SimProcess::unique_name(const char *what) {
    static std::atomic<int> counter{0};
    return std::string(what) + "." + std::to_string(getpid()) + "." + std::to_string(counter++);
}

bool SimProcess::spawn(const std::vector<std::string> &args) {
    // In a cross build the program runs through the emulator named at configure time.
    std::vector<std::string> argv_text;
    std::istringstream emulator(ZAL_TEST_EMULATOR);
    for (std::string word; emulator >> word;) argv_text.push_back(word);
    argv_text.push_back(program_);
    argv_text.insert(argv_text.end(), args.begin(), args.end());
    std::vector<char *> argv;
    for (auto &a : argv_text) argv.push_back(a.data());
    argv.push_back(nullptr);
    // The environment of this process with the overrides applied.
    std::vector<std::string> env_text;
    for (char **e = environ; *e != nullptr; ++e) {
        const std::string entry(*e);
        if (!env_.count(entry.substr(0, entry.find('=')))) env_text.push_back(entry);
    }
    for (const auto &[key, value] : env_) env_text.push_back(key + "=" + value);
    std::vector<char *> envp;
    for (auto &e : env_text) envp.push_back(e.data());
    envp.push_back(nullptr);
    // posix_spawn rather than fork: no fork handlers run in the child, which matters under
    // the user-mode emulator of cross builds.
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, 1, out_path_.c_str(), O_WRONLY | O_CREAT | O_TRUNC,
                                     0600);
    posix_spawn_file_actions_addopen(&actions, 2, err_path_.c_str(), O_WRONLY | O_CREAT | O_TRUNC,
                                     0600);
    const int failed = posix_spawnp(&pid_, argv[0], &actions, nullptr, argv.data(), envp.data());
    posix_spawn_file_actions_destroy(&actions);
    if (failed != 0) {
        pid_ = -1;
        return false;
    }
    return true;
}

bool SimProcess::start_listening(const std::vector<std::string> &args) {
    return start_on(unique_name("zal.sim.test"), args);
}

bool SimProcess::start_on(const std::string &name, const std::vector<std::string> &args) {
    socket_name_ = name;
    std::vector<std::string> all{"-u", socket_name_};
    all.insert(all.end(), args.begin(), args.end());
    if (!spawn(all)) return false;
    // Readiness, not timing: poll the output for the ready line while the child lives.
    for (int i = 0; i < 1000; ++i) {
        if (output().find("zald-sim: ready") != std::string::npos) return true;
        int status = 0;
        if (waitpid(pid_, &status, WNOHANG) == pid_) {
            pid_ = -1;
            return false;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
    return false;
}

int SimProcess::run_to_exit(const std::vector<std::string> &args, int timeout_ms) {
    if (!spawn(args)) return -1;
    return wait_exit(timeout_ms);
}

int SimProcess::wait_exit(int timeout_ms) {
    for (int waited = 0; pid_ > 0; waited += 10) {
        int status = 0;
        if (waitpid(pid_, &status, WNOHANG) == pid_) {
            pid_ = -1;
            return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
        }
        if (waited >= timeout_ms) {
            kill(pid_, SIGKILL);
            waitpid(pid_, &status, 0);
            pid_ = -1;
            return -1;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
    return -1;
}

int SimProcess::stop(int sig) {
    if (pid_ <= 0) return -1;
    kill(pid_, sig);
    return wait_exit(10000);
}

std::string SimProcess::output() const {
    return read_file(out_path_);
}
std::string SimProcess::errors() const {
    return read_file(err_path_);
}

int SimProcess::tcp_port() const {
    const std::string marker = "listening on tcp 127.0.0.1:";
    const std::string text = output();
    size_t at = text.find(marker);
    return at == std::string::npos ? 0 : atoi(text.c_str() + at + marker.size());
}

}  // namespace zaltest
