// The log stream: no stream until initialised, then numbered time stamps.
#include <gtest/gtest.h>

#include <cstdio>
#include <regex>
#include <string>

#include "zal-ipod-2/common.h"

namespace {

std::string stamp_into(FILE *f) {
    FILE *saved = _log_fp;
    _log_fp = f;
    print_time_stamp();
    _log_fp = saved;
    fflush(f);
    rewind(f);
    char buf[128] = {};
    size_t n = fread(buf, 1, sizeof buf - 1, f);
    fclose(f);
    return std::string(buf, n);
}

unsigned counter_of(const std::string &stamp) {
    return static_cast<unsigned>(std::stoul(stamp.substr(1, stamp.find(']') - 1)));
}

// Runs first in this program (one process per test under ctest, and in file order when the
// program runs alone): the stream starts out null.
TEST(LogStream, NullUntilInitialisedAndStampsWithoutStreamAreSkipped) {
    EXPECT_EQ(_log_fp, nullptr);
    print_time_stamp();  // writes nothing and must not crash
    print_time_stamp();
    // no number was used up by the skipped stamps
    EXPECT_EQ(stamp_into(tmpfile()).substr(0, 7), "[00000]");
}

TEST(LogStream, InitPointsAtStdout) {
    FILE **slot = common_init();
    EXPECT_EQ(slot, &_log_fp);
    EXPECT_EQ(_log_fp, stdout);
    EXPECT_EQ(common_log_init(), &_log_fp);
}

TEST(LogStream, StampsAreNumberedConsecutively) {
    const std::regex shape(R"(\[\d{5,}\]\d\d:\d\d:\d\d-\d{3})");
    std::string first = stamp_into(tmpfile());
    std::string second = stamp_into(tmpfile());
    EXPECT_TRUE(std::regex_match(first, shape)) << first;
    EXPECT_TRUE(std::regex_match(second, shape)) << second;
    EXPECT_EQ(counter_of(second), counter_of(first) + 1);
}

}  // namespace
