// Child process control for the zald-sim tests.
#include "sim_process.h"

#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <cstdlib>
#include <thread>

#include "child_process.h"

namespace zaltest {

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
    pid_ = spawn_child(program_, args, env_, out_path_, err_path_);
    return pid_ > 0;
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
    if (pid_ <= 0) return -1;
    const int status = wait_child(pid_, timeout_ms);
    pid_ = -1;
    return status;
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
