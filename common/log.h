// Internal logging helpers: every record goes through liblog with the library's tag.
// An error is two records at priority error: the message, then "  <function>:<line>".
#pragma once

#include <android/log.h>

#include "zal-ipod-2/common.h"

#ifdef __cplusplus
extern "C" {
#endif

void zal_log_error_at(const char *function, int line, const char *fmt, ...) ZAL_PRINTF(3, 4);

#ifdef __cplusplus
}
#endif

#define ZAL_LOGE(...) zal_log_error_at(__func__, __LINE__, __VA_ARGS__)
#define ZAL_LOGW(...) __android_log_print(ANDROID_LOG_WARN, ZAL_LOG_TAG, __VA_ARGS__)
#define ZAL_LOGI(...) __android_log_print(ANDROID_LOG_INFO, ZAL_LOG_TAG, __VA_ARGS__)
#define ZAL_LOGD(...) __android_log_print(ANDROID_LOG_DEBUG, ZAL_LOG_TAG, __VA_ARGS__)
#define ZAL_LOGV(...) __android_log_print(ANDROID_LOG_VERBOSE, ZAL_LOG_TAG, __VA_ARGS__)
// Function-name trace at verbose priority.
#define ZAL_TRACE() __android_log_print(ANDROID_LOG_VERBOSE, ZAL_LOG_TAG, "%s", __func__)
