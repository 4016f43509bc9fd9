// Decoding of the runtime configuration replies, on decoded values: results, the reports
// of refused writes, and what reaches the caller's buffer.
#include <android/log.h>
#include <gtest/gtest.h>

#include <cstring>
#include <optional>
#include <string>
#include <variant>
#include <vector>

#include "config_reply.h"
#include "log_capture.h"
#include "value_builders.h"
#include "zal-ipod-2/zal-ipod-2.h"

namespace {

using zaltest::GvalPtr;
using Field = std::pair<const char *, std::variant<int32_t, const char *>>;

GvalPtr make_hash(const std::vector<Field> &fields) {
    GvalPtr hash(serialize_hash());
    for (const auto &[key, value] : fields) {
        gval *v = std::holds_alternative<int32_t>(value)
                      ? serialize_int(std::get<int32_t>(value))
                      : serialize_string(std::get<const char *>(value));
        serialize_hash_add(hash.get(), key, v);
    }
    return hash;
}

const std::string kCfgRefused = "config could not be updated for key 'volume' and value '7'!\n";
const std::string kCfgUnsupported = "the config does not support key 'volume'!\n";
const std::string kCfgReadOnly = "Error: key 'volume' is read-only!\n";
const std::string kCtxRefused =
    "the context could not be updated for key 'volume' and value '7'!\n";

struct SetRow {
    const char *what;
    std::vector<Field> reply;
    int32_t result;
    std::vector<std::string> reports;
};

const SetRow kSetRows[] = {
    {"both updated", {{"config_updated_cfg", 1}, {"config_updated_ctx", 1}}, 1, {}},
    {"config only", {{"config_updated_cfg", 1}, {"config_updated_ctx", 0}}, 1, {kCtxRefused}},
    {"context only", {{"config_updated_cfg", 0}, {"config_updated_ctx", 1}}, 1, {kCfgRefused}},
    {"neither",
     {{"config_updated_cfg", 0}, {"config_updated_ctx", 0}},
     0,
     {kCfgRefused, kCtxRefused}},
    {"unsupported key",
     {{"config_updated_cfg", -1}, {"config_updated_ctx", 1}},
     1,
     {kCfgUnsupported}},
    {"read-only key",
     {{"config_updated_cfg", -10}, {"config_updated_ctx", 0}},
     0,
     {kCfgReadOnly, kCtxRefused}},
    {"unknown outcomes", {{"config_updated_cfg", 5}, {"config_updated_ctx", 2}}, 0, {}},
    {"outcomes missing", {}, 0, {}},
    {"outcome of another kind", {{"config_updated_cfg", "1"}, {"config_updated_ctx", "0"}}, 0, {}},
    {"context missing", {{"config_updated_cfg", 1}}, 1, {}},
};

void PrintTo(const SetRow &row, std::ostream *os) {
    *os << row.what;
}

class SetConfigReply : public testing::TestWithParam<SetRow> {};

TEST_P(SetConfigReply, GivesResultAndReports) {
    const SetRow &row = GetParam();
    GvalPtr reply = make_hash(row.reply);
    zaltest::LogCapture log;
    EXPECT_EQ(zal::config::set_reply_result(reply.get(), "volume", "7"), row.result);
    std::vector<std::string> errors = log.texts(ANDROID_LOG_ERROR);
    ASSERT_EQ(errors.size(), 2 * row.reports.size());
    for (size_t i = 0; i < row.reports.size(); ++i) {
        EXPECT_EQ(errors[2 * i], row.reports[i]);
        EXPECT_EQ(errors[2 * i + 1].rfind("  zal_ipod_set_config_sync:", 0), 0u)
            << errors[2 * i + 1];
    }
}

INSTANTIATE_TEST_SUITE_P(Rows, SetConfigReply, testing::ValuesIn(kSetRows),
                         [](const testing::TestParamInfo<SetRow> &info) {
                             return "row" + std::to_string(info.index);
                         });

TEST(SetConfigReplyShape, NoHashMeansNoReply) {
    GvalPtr number(serialize_int(1));
    EXPECT_EQ(zal::config::set_reply_result(nullptr, "k", "v"), -1);
    EXPECT_EQ(zal::config::set_reply_result(number.get(), "k", "v"), -1);
}

struct GetRow {
    const char *what;
    std::vector<Field> reply;
    int32_t result;
    std::optional<std::string> out;  // nullopt: the buffer is untouched
};

// The caller's buffer holds ZAL_IPOD_CONFIG_VALUE_SIZE bytes, terminator included.
const std::string kLongestValue(ZAL_IPOD_CONFIG_VALUE_SIZE - 1, 'v');
const std::string kTooLongValue(ZAL_IPOD_CONFIG_VALUE_SIZE, 'v');

const GetRow kGetRows[] = {
    {"value", {{"config_val", "zal.ipod.IPodDaemon"}}, 1, "zal.ipod.IPodDaemon"},
    {"empty value", {{"config_val", ""}}, 1, ""},
    {"value wins over error code", {{"config_val_errorcode", -4}, {"config_val", "2"}}, 1, "2"},
    {"error code", {{"config_val_errorcode", -4}}, -4, std::nullopt},
    {"error code 1 passes through", {{"config_val_errorcode", 1}}, 1, std::nullopt},
    {"neither", {{"other", 3}}, -2, std::nullopt},
    {"value of another kind", {{"config_val", 3}, {"config_val_errorcode", -7}}, -7, std::nullopt},
    {"error code of another kind", {{"config_val_errorcode", "-4"}}, -2, std::nullopt},
    {"longest value that fits", {{"config_val", kLongestValue.c_str()}}, 1, kLongestValue},
    {"value one byte too long", {{"config_val", kTooLongValue.c_str()}}, -2, std::nullopt},
};

void PrintTo(const GetRow &row, std::ostream *os) {
    *os << row.what;
}

class GetConfigReply : public testing::TestWithParam<GetRow> {};

TEST_P(GetConfigReply, GivesResultAndValue) {
    const GetRow &row = GetParam();
    GvalPtr reply = make_hash(row.reply);
    char out[ZAL_IPOD_CONFIG_VALUE_SIZE];
    std::memset(out, '#', sizeof out);
    out[sizeof out - 1] = '\0';
    const std::string untouched(out);
    EXPECT_EQ(zal::config::get_reply_result(reply.get(), out), row.result);
    EXPECT_EQ(std::string(out), row.out.value_or(untouched));
}

INSTANTIATE_TEST_SUITE_P(Rows, GetConfigReply, testing::ValuesIn(kGetRows),
                         [](const testing::TestParamInfo<GetRow> &info) {
                             return "row" + std::to_string(info.index);
                         });

TEST(GetConfigReplyShape, NoHashOrNoBufferGivesNoValue) {
    GvalPtr value = make_hash({{"config_val", "x"}});
    GvalPtr text(serialize_string("x"));
    char out[8] = "keep";
    EXPECT_EQ(zal::config::get_reply_result(nullptr, out), -2);
    EXPECT_EQ(zal::config::get_reply_result(text.get(), out), -2);
    EXPECT_EQ(zal::config::get_reply_result(value.get(), nullptr), -2);
    EXPECT_STREQ(out, "keep");
}

}  // namespace
