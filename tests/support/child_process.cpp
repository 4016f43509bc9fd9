// Spawning, waiting for and reading the output of the tests' child processes.
#include "child_process.h"

#include <fcntl.h>
#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>

#include <chrono>
#include <fstream>
#include <sstream>
#include <thread>

extern char **environ;

namespace zaltest {

pid_t spawn_child(const std::string &program, const std::vector<std::string> &args,
                  const std::map<std::string, std::string> &env, const std::string &out_path,
                  const std::string &err_path, const std::string &stdin_path) {
    // In a cross build the program runs through the emulator named at configure time.
    std::vector<std::string> argv_text;
    std::istringstream emulator(ZAL_TEST_EMULATOR);
    for (std::string word; emulator >> word;) argv_text.push_back(word);
    argv_text.push_back(program);
    argv_text.insert(argv_text.end(), args.begin(), args.end());
    std::vector<char *> argv;
    for (auto &a : argv_text) argv.push_back(a.data());
    argv.push_back(nullptr);
    // The environment of this process with the overrides applied.
    std::vector<std::string> env_text;
    for (char **e = environ; *e != nullptr; ++e) {
        const std::string entry(*e);
        if (!env.count(entry.substr(0, entry.find('=')))) env_text.push_back(entry);
    }
    for (const auto &[key, value] : env) env_text.push_back(key + "=" + value);
    std::vector<char *> envp;
    for (auto &e : env_text) envp.push_back(e.data());
    envp.push_back(nullptr);

    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, 0, stdin_path.c_str(), O_RDONLY, 0);
    posix_spawn_file_actions_addopen(&actions, 1, out_path.c_str(), O_WRONLY | O_CREAT | O_TRUNC,
                                     0600);
    posix_spawn_file_actions_addopen(&actions, 2, err_path.c_str(), O_WRONLY | O_CREAT | O_TRUNC,
                                     0600);
    pid_t pid = -1;
    const int failed = posix_spawnp(&pid, argv[0], &actions, nullptr, argv.data(), envp.data());
    posix_spawn_file_actions_destroy(&actions);
    return failed == 0 ? pid : -1;
}

int wait_child(pid_t pid, int timeout_ms) {
    for (int waited = 0;; waited += 5) {
        int status = 0;
        if (waitpid(pid, &status, WNOHANG) == pid)
            return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
        if (waited >= timeout_ms) {
            kill(pid, SIGKILL);
            waitpid(pid, &status, 0);
            return -1;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
}

std::string read_file(const std::string &path) {
    std::ifstream in(path);
    std::stringstream text;
    text << in.rdbuf();
    return text.str();
}

}  // namespace zaltest
