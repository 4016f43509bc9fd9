/*
 * Services shared by the library and the daemon: the log stream with its time stamps,
 * the name tables of opcodes and events, the release version and the id counter.
 */
#ifndef ZAL_IPOD_2_COMMON_H
#define ZAL_IPOD_2_COMMON_H

#include <stdint.h>
#include <stdio.h>

#include "zal_export.h"

ZAL_BEGIN_DECLS

/* Tag of every record the library writes to the Android log. */
#define ZAL_LOG_TAG "carplay-zald-2"

/* Stream that receives time stamps: NULL until common_log_init(), then stdout, or the
 * daemon's -d file. */
extern ZAL_API FILE *_log_fp;

/* Common start-up step; runs common_log_init() and returns its result. */
ZAL_API FILE **common_init(void);
/* Points _log_fp at stdout and returns &_log_fp. */
ZAL_API FILE **common_log_init(void);
/* Writes "[nnnnn]HH:MM:SS-mmm" to _log_fp (nothing when there is no stream). */
ZAL_API void print_time_stamp(void);

/* Name lookups; they return constant strings, "None" when there is no name. */
ZAL_API const char *get_function_string(uint32_t opcode);
ZAL_API const char *get_event_string(uint32_t index);
ZAL_API const char *get_device_event_string(uint32_t mask);

/* Release 2.0.10. */
ZAL_API int getVersionLevel0(void);
ZAL_API int getVersionLevel1(void);
ZAL_API int getVersionLevel2(void);
ZAL_API void getReleaseVersion(int *level0, int *level1, int *level2);

/* Process-wide counter: 1 on the first call, then 2, 3, ... (not thread-safe). */
ZAL_API int get_next_id(void);

ZAL_END_DECLS

#endif /* ZAL_IPOD_2_COMMON_H */
