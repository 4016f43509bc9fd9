// Child processes for the end-to-end tests, started with posix_spawn (no fork handlers in
// the child, which matters under the user-mode emulator of cross builds).
#include "program_run.h"

#include <fcntl.h>
#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <fstream>
#include <sstream>
#include <thread>

#include "sim_process.h"

extern char **environ;

namespace zaltest {

namespace {

std::string slurp(const std::string &path) {
    std::ifstream in(path);
    std::stringstream text;
    text << in.rdbuf();
    return text.str();
}

}  // namespace

ProgramResult run_program(const std::string &program, const std::vector<std::string> &args,
                          int timeout_ms, const std::map<std::string, std::string> &env,
                          const std::string &stdin_path) {
    ProgramResult result;
    std::vector<std::string> argv_text;
    std::istringstream emulator(ZAL_TEST_EMULATOR);
    for (std::string word; emulator >> word;) argv_text.push_back(word);
    argv_text.push_back(program);
    argv_text.insert(argv_text.end(), args.begin(), args.end());
    std::vector<char *> argv;
    for (auto &a : argv_text) argv.push_back(a.data());
    argv.push_back(nullptr);

    std::vector<std::string> env_text;
    for (char **e = environ; *e != nullptr; ++e) {
        const std::string entry(*e);
        if (!env.count(entry.substr(0, entry.find('=')))) env_text.push_back(entry);
    }
    for (const auto &[key, value] : env) env_text.push_back(key + "=" + value);
    std::vector<char *> envp;
    for (auto &e : env_text) envp.push_back(e.data());
    envp.push_back(nullptr);

    const std::string base = "/tmp/" + SimProcess::unique_name("zal-program");
    const std::string out_path = base + ".out", err_path = base + ".err";
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, 0, stdin_path.c_str(), O_RDONLY, 0);
    posix_spawn_file_actions_addopen(&actions, 1, out_path.c_str(), O_WRONLY | O_CREAT | O_TRUNC,
                                     0600);
    posix_spawn_file_actions_addopen(&actions, 2, err_path.c_str(), O_WRONLY | O_CREAT | O_TRUNC,
                                     0600);
    pid_t pid = -1;
    const auto started = std::chrono::steady_clock::now();
    const int failed = posix_spawnp(&pid, argv[0], &actions, nullptr, argv.data(), envp.data());
    posix_spawn_file_actions_destroy(&actions);
    if (failed == 0) {
        int status = 0;
        for (int waited = 0;; waited += 5) {
            if (waitpid(pid, &status, WNOHANG) == pid) {
                result.status = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
                break;
            }
            if (waited >= timeout_ms) {
                kill(pid, SIGKILL);
                waitpid(pid, &status, 0);
                break;
            }
            std::this_thread::sleep_for(std::chrono::milliseconds(5));
        }
    }
    result.seconds =
        std::chrono::duration<double>(std::chrono::steady_clock::now() - started).count();
    result.out = slurp(out_path);
    result.err = slurp(err_path);
    unlink(out_path.c_str());
    unlink(err_path.c_str());
    return result;
}

}  // namespace zaltest
