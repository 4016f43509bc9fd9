// Records to liblog, with a time-stamped copy on the -d stream when one was chosen.
#include "sim_log.h"

#include <android/log.h>

#include <cstdarg>
#include <cstring>

#include "cli.h"

namespace sim {

namespace {

char priority_letter(int priority) {
    static const char kLetters[] = "??VDIWEF";
    return priority >= 0 && priority < 8 ? kLetters[priority] : '?';
}

void emit(int priority, const char *fmt, va_list args) {
    char text[1024];
    vsnprintf(text, sizeof text, fmt, args);
    __android_log_write(priority, ZAL_LOG_TAG, text);
    // liblog already shows records on the terminal; the -d stream gets its own copy only
    // when the command line asked for one.
    if (log_destination_chosen() && _log_fp != nullptr) {
        print_time_stamp();
        fprintf(_log_fp, " %c %s%s", priority_letter(priority), text,
                text[0] != '\0' && text[strlen(text) - 1] == '\n' ? "" : "\n");
        fflush(_log_fp);
    }
}

}  // namespace

void log_print(int priority, const char *fmt, ...) {
    va_list args;
    va_start(args, fmt);
    emit(priority, fmt, args);
    va_end(args);
}

void log_error_at(const char *function, int line, const char *fmt, ...) {
    va_list args;
    va_start(args, fmt);
    emit(ANDROID_LOG_ERROR, fmt, args);
    va_end(args);
    log_print(ANDROID_LOG_ERROR, "  %s:%d", function, line);
}

}  // namespace sim
