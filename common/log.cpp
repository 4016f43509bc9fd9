// The error convention of the Android log: message record, then location record.
#include "common/log.h"

#include <cstdarg>

extern "C" void zal_log_error_at(const char *function, int line, const char *fmt, ...) {
    va_list args;
    va_start(args, fmt);
    __android_log_vprint(ANDROID_LOG_ERROR, ZAL_LOG_TAG, fmt, args);
    va_end(args);
    __android_log_print(ANDROID_LOG_ERROR, ZAL_LOG_TAG, "  %s:%d", function, line);
}
