// Child processes of the end-to-end tests (zald-sim, zalctl, the examples), started with
// posix_spawn: no fork handlers run in the child, which matters under the user-mode
// emulator of cross builds.
#pragma once

#include <sys/types.h>

#include <map>
#include <string>
#include <vector>

namespace zaltest {

// Starts program with args, through the emulator named at configure time in cross builds,
// with this process's environment and the env overrides applied; standard input reads
// stdin_path, standard output and error go to (truncated) files at out_path and err_path.
// Returns the child's pid, or -1 when it could not be started.
pid_t spawn_child(const std::string &program, const std::vector<std::string> &args,
                  const std::map<std::string, std::string> &env, const std::string &out_path,
                  const std::string &err_path, const std::string &stdin_path = "/dev/null");

// Waits at most timeout_ms for the child to exit and reaps it. Returns its exit status
// (128 + signal when a signal ended it), or -1 when it was still running: it is then killed.
int wait_child(pid_t pid, int timeout_ms);

// The whole text of a file; "" when it cannot be read.
std::string read_file(const std::string &path);

}  // namespace zaltest
