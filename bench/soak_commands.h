// The commands the soak run draws from: a _sync command of every family, as an
// application would issue them. Each family adds its rows in soak_commands.cpp.
#pragma once

#include <vector>

#include "zal-ipod-2/zal-ipod-2.h"

struct SoakCommand {
    const char *name;
    int opcode;  // the request's opcode, for the faults drawn against it
    void (*run)(zal_ipod_handle *h);
};

const std::vector<SoakCommand> &soak_commands();
