// Runs a program of the build (zalctl, an example) to its end for end-to-end tests: through
// the emulator in cross builds, output captured, exit status and duration reported.
#pragma once

#include <map>
#include <string>
#include <vector>

namespace zaltest {

struct ProgramResult {
    int status = -1;  // exit status; 128 + signal when killed by one; -1 when it timed out
    std::string out;  // standard output
    std::string err;  // standard error
    double seconds = 0;
};

// Starts program with args (and env overrides), waits at most timeout_ms, kills it after.
// Standard input is read from stdin_path.
ProgramResult run_program(const std::string &program, const std::vector<std::string> &args,
                          int timeout_ms = 20000,
                          const std::map<std::string, std::string> &env = {},
                          const std::string &stdin_path = "/dev/null");

}  // namespace zaltest
