// 64-bit values through the library's printf-style log path. On 32-bit ARM a 64-bit
// vararg takes an aligned register pair (or an 8-aligned stack slot), so a format that
// does not match the argument's width misprints it and every argument after it.
#include <gtest/gtest.h>

#include <android/log.h>

#include <cinttypes>
#include <cstdint>
#include <string>

#include "common/log.h"
#include "log_capture.h"

namespace {

constexpr uint64_t kPersistentId = 0x0123456789ABCDEFull;

TEST(LogFormat, SixtyFourBitValuesInErrorRecords) {
    zaltest::LogCapture capture;
    // A 32-bit argument before the 64-bit one forces the padding slot on ARM; the string
    // after it shows whether the arguments that follow stay in step.
    ZAL_LOGE("device %d id %" PRIu64 " (0x%016" PRIX64 ") %s", 7, kPersistentId, kPersistentId,
             "attached");
    ZAL_LOGE("offset %" PRId64 " then %u", static_cast<int64_t>(-2), 0xFFFFFFFFu);

    auto errors = capture.texts(ANDROID_LOG_ERROR);
    ASSERT_EQ(errors.size(), 4u);  // each error is a message and a location record
    EXPECT_EQ(errors[0], "device 7 id 81985529216486895 (0x0123456789ABCDEF) attached");
    EXPECT_EQ(errors[2], "offset -2 then 4294967295");
    EXPECT_EQ(errors[1].rfind("  TestBody:", 0), 0u) << errors[1];
}

TEST(LogFormat, SixtyFourBitValuesInPlainRecords) {
    zaltest::LogCapture capture;
    ZAL_LOGI("%s=%" PRIX64 ":%" PRIu64, "pid", kPersistentId, UINT64_MAX);
    EXPECT_TRUE(capture.contains(ANDROID_LOG_INFO, "pid=123456789ABCDEF:18446744073709551615"));
}

}  // namespace
