// The process-wide log stream and its time stamps "[nnnnn]HH:MM:SS-mmm".
#include <sys/time.h>

#include <cstdint>
#include <cstdio>
#include <ctime>

#include "zal-ipod-2/common.h"

extern "C" {

ZAL_API FILE *_log_fp = nullptr;

}  // extern "C"

namespace {
// Plain global like _log_fp: stamps come from the daemon's main thread or a client's
// connect path; a lost increment under a race only repeats a number in a trace.
uint32_t stamp_counter = 0;
}  // namespace

extern "C" {

ZAL_API FILE **common_log_init(void) {
    _log_fp = stdout;
    return &_log_fp;
}

ZAL_API FILE **common_init(void) {
    return common_log_init();
}

// Without a stream (before common_log_init(), or when the daemon's log file could not be
// opened) a stamp writes nothing and does not use up a number, so the numbers a reader
// sees in a log are consecutive from the first stamp that reached it.
ZAL_API void print_time_stamp(void) {
    FILE *out = _log_fp;
    if (out == nullptr) return;

    time_t now = time(nullptr);
    struct tm local {};
    localtime_r(&now, &local);

    fprintf(out, "[%05u]", static_cast<unsigned>(stamp_counter));
    ++stamp_counter;

    char clock[80];
    if (strftime(clock, sizeof clock, "%H:%M:%S", &local) == 0) clock[0] = '\0';
    struct timeval tv {};
    gettimeofday(&tv, nullptr);
    fprintf(out, "%s-%03ld", clock, static_cast<long>(tv.tv_usec / 1000));
}

}  // extern "C"
