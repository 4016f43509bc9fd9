/* Record layouts as the C compiler sees them, for comparison with the C++ side. */
#ifndef ZAL_LAYOUT_TEST_RECORDS_H
#define ZAL_LAYOUT_TEST_RECORDS_H

#include <stddef.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef struct layout_record {
    size_t size;
    size_t offsets[4]; /* field offsets in declaration order, 0 past the last field */
} layout_record;

/* Fills *out for the named record; 1 when the record is known, 0 otherwise. */
int layout_test_c_record(const char *name, layout_record *out);

#ifdef __cplusplus
}
#endif

#endif
