/**
 * @file
 * Services shared by the library and the daemon: the log stream with its time stamps,
 * the name tables of opcodes and events, the release version and the id counter.
 *
 * Threads: the name lookups and version functions are pure and may be called from any
 * thread, callbacks included. common_init(), common_log_init() and get_next_id() write
 * process-wide state without a lock: call them from one thread at a time (start-up).
 */
#ifndef ZAL_IPOD_2_COMMON_H
#define ZAL_IPOD_2_COMMON_H

#include <stdint.h>
#include <stdio.h>

#include "zal_export.h"

ZAL_BEGIN_DECLS

/** Tag of every record the library writes to the Android log. */
#define ZAL_LOG_TAG "carplay-zald-2"

/** Stream that receives time stamps: NULL until common_log_init(), then stdout, or the
 * daemon's -d file. */
extern ZAL_API FILE *_log_fp;

/** Common start-up step; runs common_log_init() and returns its result. */
ZAL_API FILE **common_init(void);
/** Points _log_fp at stdout and returns &_log_fp. */
ZAL_API FILE **common_log_init(void);
/** Writes "[nnnnn]HH:MM:SS-mmm" to _log_fp (nothing when there is no stream). */
ZAL_API void print_time_stamp(void);

/** @name Name lookups
 * They return constant strings, "None" when there is no name.
 * @{ */
/** Name of an opcode (ZAL_OP_*), e.g. "GET_CONFIG" for 132; "None" when it has none. */
ZAL_API const char *get_function_string(uint32_t opcode);
/** Name of the session event at index of the daemon's event table; "None" past its end. */
ZAL_API const char *get_event_string(uint32_t index);
/** Name of a device event mask with exactly one bit set; "None" for any other mask. */
ZAL_API const char *get_device_event_string(uint32_t mask);
/** @} */

/** @name Release version
 * Release 2.0.10: level 0 is the major, 1 the minor, 2 the patch number.
 * @{ */
/** Major number of the release. */
ZAL_API int getVersionLevel0(void);
/** Minor number of the release. */
ZAL_API int getVersionLevel1(void);
/** Patch number of the release. */
ZAL_API int getVersionLevel2(void);
/** The three numbers at once; each pointer may be NULL. */
ZAL_API void getReleaseVersion(int *level0, int *level1, int *level2);
/** @} */

/** Process-wide counter: 1 on the first call, then 2, 3, ... (not thread-safe). */
ZAL_API int get_next_id(void);

ZAL_END_DECLS

#endif /* ZAL_IPOD_2_COMMON_H */
