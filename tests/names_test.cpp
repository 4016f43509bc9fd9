// Name tables of opcodes and events, and the opcode constants that index them.
#include <gtest/gtest.h>

#include <cstdlib>
#include <set>
#include <string>

#include "zal-ipod-2/common.h"
#include "zal-ipod-2/opcodes.h"

namespace {

TEST(Names, OpcodeNames) {
    struct {
        uint32_t opcode;
        const char *name;
    } cases[] = {
        {ZAL_OP_HELLO, "HELLO =  0"},
        {ZAL_OP_KEEP_ALIVE, "KEEP_ALIVE"},
        {ZAL_OP_EVENT, "EVENT"},
        {ZAL_OP_RETURN, "RETURN"},
        {ZAL_OP_ERROR, "ERROR"},
        {ZAL_OP_PLAY_CURRENT_SELECTION, "PLAY_CURRENT_SELECTION"},
        {ZAL_OP_ROTAION_IPNUT, "ROTAION_IPNUT"},
        {ZAL_OP_GET_TRACK_ARTWORK_BY_UID, "GET_TRACK_ARTWORK_BY_UID"},
        {ZAL_OP_SET_CONFIG, "SET_CONFIG"},
        {ZAL_OP_GET_CONFIG, "GET_CONFIG"},
        {ZAL_OP_NOTIFY_ATTACHED, "None"},
        {ZAL_OP_SEND_ACCESSORY_WIFI_CONFIGURATION, "None"},
        {0xFFFFFFFFu, "None"},
    };
    for (const auto &c : cases) EXPECT_STREQ(get_function_string(c.opcode), c.name) << c.opcode;
    EXPECT_EQ(ZAL_OP_GET_CONFIG, 132);
    EXPECT_EQ(ZAL_OP_NAMED_COUNT, 133);
    EXPECT_EQ(ZAL_OP_NOTIFY_ATTACHED, 133);
}

TEST(Names, EveryOpcodeHasADistinctName) {
    std::set<std::string> seen;
    for (uint32_t op = 0; op < ZAL_OP_NAMED_COUNT; ++op) {
        std::string name = get_function_string(op);
        EXPECT_NE(name, "None") << op;
        EXPECT_TRUE(seen.insert(name).second) << name;
    }
}

TEST(Names, SessionEvents) {
    const char *expected[] = {"DEVICE_ADDED", "DEVICE_REMOVED", "SESSION_OPENED",
                              "PLAYED",       "STOPPED",        "PAUSED"};
    for (uint32_t i = 0; i < 6; ++i) EXPECT_STREQ(get_event_string(i), expected[i]);
    EXPECT_STREQ(get_event_string(6), "None");
}

TEST(Names, DeviceEventMasks) {
    struct {
        uint32_t mask;
        const char *name;
    } cases[] = {
        {1u << 0, "ZALIPOD_EVENT_CONNECTED"},
        {1u << 24, "ZALIPOD_EVENT_TRACK_IS_AUDIOBOOK"},
        {1u << 25, "ZALIPOD_EVENT_TRACK_CONTAINS_VIDEO"},
        {1u << 26, "ZALIPOD_EVENT_SHUFFLE_MODE_CHANGED"},
        {1u << 31, "ZALIPOD_EVENT_DEVICE_NAME"},
        {0, "None"},
        {3, "None"},
        {0x80000001u, "None"},
    };
    for (const auto &c : cases) EXPECT_STREQ(get_device_event_string(c.mask), c.name) << c.mask;
    for (int k = 0; k < 32; ++k) {
        EXPECT_STRNE(get_device_event_string(1u << k), "ZALIPOD_EVENT_WIRELESS_CARPLAY_UPDATE");
        EXPECT_STRNE(get_device_event_string(1u << k), "None");
    }
}

TEST(Version, ReleaseAndIds) {
    int a = -1, b = -1, c = -1;
    getReleaseVersion(&a, &b, &c);
    EXPECT_EQ(a, 2);
    EXPECT_EQ(b, 0);
    EXPECT_EQ(c, 10);
    EXPECT_EQ(getVersionLevel0() * 10000 + getVersionLevel1() * 100 + getVersionLevel2(), 20010);
    getReleaseVersion(nullptr, nullptr, nullptr);  // tolerated
    int first = get_next_id();
    EXPECT_EQ(get_next_id(), first + 1);
}

TEST(Version, FirstIdOfAProcessIsOne) {
    // The threadsafe style runs the statement in a freshly started process.
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_EXIT(std::exit(get_next_id()), testing::ExitedWithCode(1), "");
}

}  // namespace
