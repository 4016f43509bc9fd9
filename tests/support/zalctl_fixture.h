// Shared set-up of the zalctl suites: running zalctl against the simulator, the table of
// commands with the output and exit code each must give, and the --json checks.
#pragma once

#include <gtest/gtest.h>

#include <map>
#include <nlohmann/json.hpp>
#include <ostream>
#include <sstream>
#include <string>
#include <vector>

#include "e2e_fixture.h"

namespace zaltest {

// Everything below is inline on purpose: ZALCTL_PATH is defined for the suites, not for the
// support library.

// Runs zalctl to its end (bounds stretched under the emulator); an empty result when the
// program is not built.
inline ProgramResult zalctl(const std::vector<std::string> &args, int timeout_ms = 20000,
                            const std::map<std::string, std::string> &env = {}) {
#ifdef ZALCTL_PATH
    return run_program(ZALCTL_PATH, args, timeout_ms * kSlowdown, env);
#else
    (void)args, (void)timeout_ms, (void)env;
    return {};
#endif
}

// The command line as a user would type it, for failure messages.
inline std::string joined(const std::vector<std::string> &args) {
    std::string out = "zalctl";
    for (const auto &a : args) out += " " + a;
    return out;
}

inline std::vector<std::string> lines_of(const std::string &text) {
    std::vector<std::string> lines;
    std::istringstream in(text);
    for (std::string line; std::getline(in, line);) lines.push_back(line);
    return lines;
}

// The end-to-end fixture, skipped when zalctl is not built.
class ZalctlSuite : public EndToEndTest {
  protected:
    void SetUp() override {
#ifndef ZALCTL_PATH
        GTEST_SKIP() << "zalctl is not built";
#endif
        EndToEndTest::SetUp();
    }
};

// One command line and what it must give.
struct CommandCase {
    const char *name;
    std::vector<std::string> args;
    int status;
    std::vector<std::string> out;  // texts standard output must hold
    const char *err;               // text standard error must hold, or null: empty stderr
};

inline void PrintTo(const CommandCase &c, std::ostream *os) {
    *os << c.name;
}

// Runs the command and checks its exit status and output. A failure (status 1) is one line
// on stderr, starting with the program's name; a usage error (status 2) may show the usage.
inline void expect_command(const CommandCase &c) {
    const ProgramResult r = zalctl(c.args);
    ASSERT_EQ(r.status, c.status) << joined(c.args) << "\nstdout:\n"
                                  << r.out << "stderr:\n"
                                  << r.err;
    for (const std::string &text : c.out)
        EXPECT_NE(r.out.find(text), std::string::npos) << text << " in\n" << r.out;
    if (c.err == nullptr) {
        EXPECT_EQ(r.err, "");
        return;
    }
    EXPECT_NE(r.err.find(c.err), std::string::npos) << r.err;
    if (c.status == 1) {
        EXPECT_EQ(lines_of(r.err).size(), 1u) << r.err;
        EXPECT_EQ(r.err.rfind("zalctl: ", 0), 0u) << r.err;
    }
}

// A --json run and one value of its document.
struct JsonCase {
    std::vector<std::string> args;
    const char *pointer;
    nlohmann::json expected;
};

// --json gives exactly one JSON document on standard output, holding the expected value.
inline void expect_json(const JsonCase &c) {
    const ProgramResult r = zalctl(c.args);
    ASSERT_EQ(r.status, 0) << joined(c.args) << "\n" << r.err;
    ASSERT_EQ(lines_of(r.out).size(), 1u) << r.out;
    const nlohmann::json doc = nlohmann::json::parse(r.out, nullptr, false);
    ASSERT_FALSE(doc.is_discarded()) << r.out;
    EXPECT_EQ(doc.at(nlohmann::json::json_pointer(c.pointer)), c.expected) << joined(c.args);
}

}  // namespace zaltest
