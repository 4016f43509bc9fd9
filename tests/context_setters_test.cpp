// The set_context_ setters called directly: field capacities, refusals, replacement of
// owned parts, number parsing, and the Bluetooth reads through a private sysfs tree.
#include <android/log.h>
#include <gtest/gtest.h>

#include <climits>
#include <cstring>
#include <string>

#include "common/daemon/context_internal.h"
#include "daemon_support.h"
#include "log_capture.h"
#include "zal-ipod-2/daemon.h"

namespace {

using zaltest::OwnedContext;
using Lines = std::vector<std::string>;

struct TextSetter {
    const char *field;
    void (*set)(context *, const char *);
    char *(*of)(context &);
};

#define ZAL_TEXT_SETTER(field)                                                     \
    {                                                                              \
#field, set_context_##field, [](context & c) -> char * { return c.field; } \
    }
const TextSetter kTextSetters[] = {
    ZAL_TEXT_SETTER(media_library_db_path),
    ZAL_TEXT_SETTER(artwork_path),
    ZAL_TEXT_SETTER(vehicle_information_component_name),
    ZAL_TEXT_SETTER(vehicle_information_component_displayName),
    ZAL_TEXT_SETTER(accessory_wifi_ssid),
    ZAL_TEXT_SETTER(accessory_wifi_passphrase),
};
#undef ZAL_TEXT_SETTER

void PrintTo(const TextSetter &s, std::ostream *os) {
    *os << s.field;
}

class TextField : public testing::TestWithParam<TextSetter> {};

TEST_P(TextField, TakesTextThatFitsWithItsTerminator) {
    OwnedContext owned;
    const std::string fits(ZAL_CONTEXT_TEXT_SIZE - 1, 'p');
    GetParam().set(&owned.ctx, fits.c_str());
    EXPECT_EQ(GetParam().of(owned.ctx), fits);
    GetParam().set(&owned.ctx, "");
    EXPECT_STREQ(GetParam().of(owned.ctx), "");
}

TEST_P(TextField, RefusesLongerTextWithoutRevealingIt) {
    OwnedContext owned;
    GetParam().set(&owned.ctx, "before");
    const std::string secret(ZAL_CONTEXT_TEXT_SIZE, 'k');
    zaltest::LogCapture log;
    GetParam().set(&owned.ctx, secret.c_str());
    GetParam().set(&owned.ctx, nullptr);
    EXPECT_STREQ(GetParam().of(owned.ctx), "before");
    Lines errors = log.texts(ANDROID_LOG_ERROR);
    ASSERT_EQ(errors.size(), 4u);  // two reports, each with its location record
    EXPECT_NE(errors[0].find(GetParam().field), std::string::npos) << errors[0];
    EXPECT_EQ(errors[0].find("kkkk"), std::string::npos) << "the text itself is not logged";
    EXPECT_EQ(errors[1].rfind(std::string("  set_context_") + GetParam().field + ":", 0), 0u)
        << errors[1];
}

INSTANTIATE_TEST_SUITE_P(Setters, TextField, testing::ValuesIn(kTextSetters),
                         [](const testing::TestParamInfo<TextSetter> &info) {
                             return std::string(info.param.field);
                         });

TEST(TeamId, NewValueClearAndRefusalEachReplaceThePreviousOne) {
    OwnedContext owned;
    context &ctx = owned.ctx;
    zaltest::LogCapture log;
    EXPECT_EQ(set_context_app_match_team_id(&ctx, "ABCDE12345"), 1);
    EXPECT_EQ(set_context_app_match_team_id(&ctx, "ZYXWV98765"), 1);
    EXPECT_STREQ(ctx.app_match_team_id, "ZYXWV98765");
    EXPECT_EQ(set_context_app_match_team_id(&ctx, "ABCDE123456"), 0);
    EXPECT_EQ(ctx.app_match_team_id, nullptr);
    EXPECT_EQ(set_context_app_match_team_id(&ctx, "ABCDE12345"), 1);
    EXPECT_EQ(set_context_app_match_team_id(&ctx, nullptr), 1);
    EXPECT_EQ(ctx.app_match_team_id, nullptr);
    EXPECT_EQ(log.texts(ANDROID_LOG_ERROR).size(), 2u);
    // Characters are not checked: any ten bytes are an ID.
    EXPECT_EQ(set_context_app_match_team_id(&ctx, "  !!  ..  "), 1);
}

TEST(EapList, OnlyCommasGiveOneNullNode) {
    OwnedContext owned;
    char list[] = ",,,";
    EXPECT_EQ(set_context_eap(&owned.ctx, list), 1);
    ASSERT_NE(owned.ctx.eap, nullptr);
    EXPECT_EQ(owned.ctx.eap->name, nullptr);
    EXPECT_EQ(owned.ctx.eap->next, nullptr);
}

TEST(EapList, NullListEmptiesIt) {
    OwnedContext owned;
    char list[] = "a,b";
    set_context_eap(&owned.ctx, list);
    EXPECT_EQ(set_context_eap(&owned.ctx, nullptr), 1);
    EXPECT_EQ(owned.ctx.eap, nullptr);
}

TEST(EapList, NamesAreCopiesOfThePieces) {
    OwnedContext owned;
    char list[] = "com.example.one,com.example.two";
    set_context_eap(&owned.ctx, list);
    std::memset(list, 'x', sizeof list - 1);
    ASSERT_NE(owned.ctx.eap, nullptr);
    ASSERT_NE(owned.ctx.eap->next, nullptr);
    EXPECT_STREQ(owned.ctx.eap->name, "com.example.one");
    EXPECT_STREQ(owned.ctx.eap->next->name, "com.example.two");
}

struct NumberRow {
    const char *text;
    int32_t protocol_mode;  // stored by set_context_highest_protocol_mode
    int32_t engine_type;    // stored by the engine type setter
};

const NumberRow kNumberRows[] = {
    {"2", 2, 2},
    {" 2", 2, 2},
    {"2abc", 2, 2},
    {"-4", 1, -4},
    {"abc", 1, 0},
    {"99999999999", INT32_MAX, INT32_MAX},
    {"-99999999999", 1, INT32_MIN},
};

class DecimalText : public testing::TestWithParam<NumberRow> {};

TEST_P(DecimalText, IsReadLikeAtoiWithoutOverflow) {
    OwnedContext owned;
    EXPECT_EQ(set_context_highest_protocol_mode(&owned.ctx, GetParam().text), 1);
    EXPECT_EQ(owned.ctx.highest_protocol_mode, GetParam().protocol_mode);
    set_context_vehicle_information_component_engine_type(&owned.ctx, GetParam().text);
    EXPECT_EQ(owned.ctx.vehicle_information_component_engine_type, GetParam().engine_type);
}

INSTANTIATE_TEST_SUITE_P(Rows, DecimalText, testing::ValuesIn(kNumberRows));

TEST(DecimalText, NullOrEmptyChangesNothing) {
    OwnedContext owned;
    owned.ctx.highest_protocol_mode = 2;
    owned.ctx.vehicle_information_component_engine_type = 5;
    for (const char *text : {static_cast<const char *>(nullptr), ""}) {
        EXPECT_EQ(set_context_highest_protocol_mode(&owned.ctx, text), 0);
        set_context_vehicle_information_component_engine_type(&owned.ctx, text);
    }
    EXPECT_EQ(owned.ctx.highest_protocol_mode, 2);
    EXPECT_EQ(owned.ctx.vehicle_information_component_engine_type, 5);
}

TEST(CpServer, ChangesNothing) {
    EXPECT_EQ(set_context_cp_server(), 1);
}

TEST(Bluetooth, LongTextIsCutToTheField) {
    OwnedContext owned;
    const std::string word(400, 'a');
    EXPECT_EQ(set_context_bt_address(&owned.ctx, word.c_str()), 1);
    EXPECT_EQ(std::string(owned.ctx.bt_address), word.substr(0, 255));

    zaltest::FakeSysfs sysfs((word + "\n").c_str(), (word + " tail\n").c_str());
    zaltest::StdoutCapture out;
    EXPECT_EQ(set_context_bt_address(&owned.ctx, "localhost"), 1);
    EXPECT_EQ(std::string(owned.ctx.bt_address), word.substr(0, 255));
    EXPECT_EQ(set_context_bt_name(&owned.ctx), 1);
    EXPECT_EQ(std::string(owned.ctx.bt_name), word.substr(0, 255));
}

TEST(Bluetooth, AdapterFilesWithoutAWordFail) {
    OwnedContext owned;
    std::snprintf(owned.ctx.bt_name, sizeof owned.ctx.bt_name, "kept");
    zaltest::FakeSysfs sysfs("  \n", "\n");
    zaltest::StdoutCapture out;
    EXPECT_EQ(set_context_bt_address(&owned.ctx, "localhost"), 0);
    EXPECT_EQ(set_context_bt_name(&owned.ctx), 0);
    EXPECT_STREQ(owned.ctx.bt_name, "kept");
    EXPECT_EQ(out.lines().size(), 3u);
}

TEST(Bluetooth, ProductionReadsTheRealSysfs) {
    zal::daemon::set_sysfs_root(nullptr);
    char path[PATH_MAX];
    ASSERT_TRUE(zal::daemon::sysfs_path("/sys/class/bluetooth/hci0/name", path, sizeof path));
    EXPECT_STREQ(path, "/sys/class/bluetooth/hci0/name");
    EXPECT_FALSE(zal::daemon::sysfs_path("/sys/class/bluetooth/hci0/name", path, 8));
}

}  // namespace
