// zald-sim's log: every record goes to the Android log under the project's tag and, when
// the command line chose a destination (-d), also to that stream with a time stamp.
#pragma once

#include <cstdio>

#include <android/log.h>

#include "zal-ipod-2/common.h"

namespace sim {

void log_print(int priority, const char *fmt, ...) __attribute__((format(printf, 2, 3)));
// Error convention of the project: the message, then a location record.
void log_error_at(const char *function, int line, const char *fmt, ...)
    __attribute__((format(printf, 3, 4)));

}  // namespace sim

#define SIM_LOGE(...) ::sim::log_error_at(__func__, __LINE__, __VA_ARGS__)
#define SIM_LOGW(...) ::sim::log_print(ANDROID_LOG_WARN, __VA_ARGS__)
#define SIM_LOGI(...) ::sim::log_print(ANDROID_LOG_INFO, __VA_ARGS__)
#define SIM_LOGD(...) ::sim::log_print(ANDROID_LOG_DEBUG, __VA_ARGS__)
