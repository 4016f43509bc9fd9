/* The C compiler's view of the records callers build (see layout_test.cpp). */
#include <string.h>

#include "layout_test_records.h"
#include "zal-ipod-2/serialize.h"

static const struct {
    const char *name;
    layout_record layout;
} records[] = {
    {"gval", {sizeof(gval), {offsetof(gval, type), offsetof(gval, data), offsetof(gval, len), 0}}},
    {"gval_array",
     {sizeof(gval_array),
      {offsetof(gval_array, items), offsetof(gval_array, capacity), offsetof(gval_array, count),
       0}}},
    {"gval_hash",
     {sizeof(gval_hash),
      {offsetof(gval_hash, keys), offsetof(gval_hash, values), offsetof(gval_hash, capacity),
       offsetof(gval_hash, count)}}},
};

int layout_test_c_record(const char *name, layout_record *out) {
    for (size_t i = 0; i < sizeof records / sizeof records[0]; ++i) {
        if (strcmp(records[i].name, name) == 0) {
            *out = records[i].layout;
            return 1;
        }
    }
    return 0;
}
