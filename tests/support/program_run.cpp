// Runs a program of the build to its end for the end-to-end tests.
#include "program_run.h"

#include <unistd.h>

#include <chrono>

#include "child_process.h"
#include "sim_process.h"

namespace zaltest {

ProgramResult run_program(const std::string &program, const std::vector<std::string> &args,
                          int timeout_ms, const std::map<std::string, std::string> &env,
                          const std::string &stdin_path) {
    ProgramResult result;
    const std::string base = "/tmp/" + SimProcess::unique_name("zal-program");
    const std::string out_path = base + ".out", err_path = base + ".err";
    const auto started = std::chrono::steady_clock::now();
    const pid_t pid = spawn_child(program, args, env, out_path, err_path, stdin_path);
    if (pid > 0) result.status = wait_child(pid, timeout_ms);
    result.seconds =
        std::chrono::duration<double>(std::chrono::steady_clock::now() - started).count();
    result.out = read_file(out_path);
    result.err = read_file(err_path);
    unlink(out_path.c_str());
    unlink(err_path.c_str());
    return result;
}

}  // namespace zaltest
