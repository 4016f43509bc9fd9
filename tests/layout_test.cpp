// Layout of the records callers build, pinned for both data models we ship on: ILP32
// (32-bit ARM, the head unit) and LP64 (the development host). Callers compiled as C and
// prebuilt plug-ins depend on these offsets, so a change here is an ABI break.
#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>

#include "layout_test_records.h"
#include "zal-ipod-2/serialize.h"

namespace {

constexpr bool kIlp32 = sizeof(void *) == 4;
static_assert(sizeof(void *) == 4 || sizeof(void *) == 8, "only ILP32 and LP64 are supported");

// Expected value by data model.
constexpr std::size_t by_model(std::size_t ilp32, std::size_t lp64) {
    return kIlp32 ? ilp32 : lp64;
}

// --- Values -------------------------------------------------------------------------------
static_assert(sizeof(gval) == by_model(12, 24));
static_assert(alignof(gval) == by_model(4, 8));
static_assert(offsetof(gval, type) == 0);
static_assert(offsetof(gval, data) == by_model(4, 8));
static_assert(offsetof(gval, len) == by_model(8, 16));

static_assert(sizeof(gval_array) == by_model(12, 16));
static_assert(offsetof(gval_array, items) == 0);
static_assert(offsetof(gval_array, capacity) == by_model(4, 8));
static_assert(offsetof(gval_array, count) == by_model(8, 12));

static_assert(sizeof(gval_hash) == by_model(16, 24));
static_assert(offsetof(gval_hash, keys) == 0);
static_assert(offsetof(gval_hash, values) == by_model(4, 8));
static_assert(offsetof(gval_hash, capacity) == by_model(8, 16));
static_assert(offsetof(gval_hash, count) == by_model(12, 20));

// --- Records still to be pinned ----------------------------------------------------------
// TODO(layout): add the send record, the event records and the daemon context here when
// their headers land, with the same by_model(ilp32, lp64) form, and add their C-side
// numbers to layout_test_records.c.

// Expected layout of one record, as (size, offsets...) in declaration order.
struct RecordLayout {
    const char *name;
    std::size_t size;
    std::size_t offsets[4];
};

const RecordLayout kCppLayouts[] = {
    {"gval", sizeof(gval), {offsetof(gval, type), offsetof(gval, data), offsetof(gval, len), 0}},
    {"gval_array",
     sizeof(gval_array),
     {offsetof(gval_array, items), offsetof(gval_array, capacity), offsetof(gval_array, count), 0}},
    {"gval_hash",
     sizeof(gval_hash),
     {offsetof(gval_hash, keys), offsetof(gval_hash, values), offsetof(gval_hash, capacity),
      offsetof(gval_hash, count)}},
};

// The public headers are C headers: a C compiler must lay the records out exactly as C++
// does, or a C caller and the library disagree about every field after the first.
TEST(Layout, CAndCppAgree) {
    for (const RecordLayout &cpp : kCppLayouts) {
        SCOPED_TRACE(cpp.name);
        layout_record c{};
        ASSERT_EQ(layout_test_c_record(cpp.name, &c), 1) << "no C-side numbers for this record";
        EXPECT_EQ(c.size, cpp.size);
        for (int i = 0; i < 4; ++i) EXPECT_EQ(c.offsets[i], cpp.offsets[i]) << "field " << i;
    }
}

}  // namespace
