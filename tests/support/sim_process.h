// Runs zald-sim as a child process for end-to-end tests: a private abstract socket name per
// instance, output captured in files, readiness taken from its "ready" line.
#pragma once

#include <sys/types.h>

#include <map>
#include <string>
#include <vector>

namespace zaltest {

class SimProcess {
  public:
    // program: path of zald-sim; args: its arguments after argv[0] (add -u yourself, or use
    // start_listening(), which adds -u with a unique name).
    explicit SimProcess(std::string program);
    ~SimProcess();
    SimProcess(const SimProcess &) = delete;
    SimProcess &operator=(const SimProcess &) = delete;

    // A name no other test process uses.
    static std::string unique_name(const char *what);

    void set_env(const std::string &key, const std::string &value) { env_[key] = value; }
    // Starts with "-u <unique name>" and args; true once it printed its ready line.
    bool start_listening(const std::vector<std::string> &args = {});
    // The same on a name of the caller's choice (the daemon's own name, in a test process
    // with a network namespace of its own).
    bool start_on(const std::string &name, const std::vector<std::string> &args = {});
    // Starts with exactly args and waits for it to exit; returns the exit status
    // (-1 when it did not exit within timeout_ms; it is then killed).
    int run_to_exit(const std::vector<std::string> &args, int timeout_ms = 10000);

    // SIGTERM (or sig), then the exit status; -1 when it had to be killed.
    int stop(int sig = 15);

    bool running() const { return pid_ > 0; }
    const std::string &socket_name() const { return socket_name_; }
    std::string output() const;  // standard output so far
    std::string errors() const;  // standard error so far
    // The number after "listening on tcp 127.0.0.1:" in the output, or 0.
    int tcp_port() const;

  private:
    bool spawn(const std::vector<std::string> &args);
    int wait_exit(int timeout_ms);

    std::string program_;
    std::string socket_name_;
    std::string out_path_, err_path_;
    std::map<std::string, std::string> env_;
    pid_t pid_ = -1;
};

}  // namespace zaltest
