// zald-sim playback queries and setters, against the built-in phone: session on device 0,
// paused 42 s into "Morning Drive" (215 s), track 0 of 4.
#include <gtest/gtest.h>

#include "sim_fixture.h"

namespace zaltest {
namespace {

struct QueryCase {
    const char *name;
    uint8_t opcode;
    std::vector<int32_t> args;  // none, one int, or an array of ints
    uint8_t answer;             // kOpReturn or kOpError
    const char *key;            // hash key of the answer; null: the answer is an int
    int32_t expected;
    const char *event;  // event that must follow, or null
};

void PrintTo(const QueryCase &c, std::ostream *os) {
    *os << c.name;
}

Value payload(const std::vector<int32_t> &args) {
    if (args.empty()) return nullptr;
    if (args.size() == 1) return int_value(args[0]);
    Value array(serialize_array());
    for (int32_t a : args) serialize_array_add(array.get(), serialize_int(a));
    return array;
}

const QueryCase kQueries[] = {
    {"sample_rate", 40, {}, kOpReturn, "sample_rate", 44100, nullptr},
    {"audiobook", 41, {}, kOpReturn, "is_audiobook_explicitly", 0, nullptr},
    {"video", 42, {}, kOpReturn, "contains_video_explicitly", 0, nullptr},
    {"play_state", 46, {}, kOpReturn, "current_play_status", 2, nullptr},
    {"play_position", 46, {}, kOpReturn, "position", 42000, nullptr},
    {"current_draw", 47, {}, kOpReturn, "current_draw", 500, nullptr},
    {"charge", 48, {}, kOpReturn, "if_charge", 1, nullptr},
    {"track_index", 50, {}, kOpReturn, nullptr, 0, nullptr},
    {"shuffle", 52, {}, kOpReturn, nullptr, 0, nullptr},
    {"repeat", 54, {}, kOpReturn, nullptr, 0, nullptr},
    {"image_limits", 71, {}, kOpReturn, "maxImageHeigh", 320, nullptr},
    {"chapter_index", 125, {}, kOpReturn, nullptr, -1, nullptr},
    {"chapter_count", 126, {}, kOpReturn, nullptr, 0, nullptr},
    {"set_chapter", 127, {0}, kOpError, nullptr, 0, nullptr},
    {"preference", 61, {8}, kOpReturn, nullptr, 1, nullptr},
    {"preference_unknown_class", 61, {5}, kOpError, nullptr, 0, nullptr},
    {"set_preference_out_of_range", 60, {8, 4}, kOpError, nullptr, 0, nullptr},
    {"set_position", 37, {1000}, kOpReturn, nullptr, 0, "track_position_changed"},
    {"set_position_past_end", 37, {215000}, kOpError, nullptr, 0, nullptr},
    {"set_track", 38, {2}, kOpReturn, nullptr, 0, "track_index_changed"},
    {"set_track_missing", 38, {4}, kOpError, nullptr, 0, nullptr},
    {"set_shuffle", 51, {1}, kOpReturn, nullptr, 0, "shuffle_mode_changed"},
    {"set_repeat", 53, {2}, kOpReturn, nullptr, 0, "repeat_mode_changed"},
    {"write_tag", 63, {}, kOpReturn, nullptr, 0, nullptr},
};

class SimQueryTest : public SimTest, public ::testing::WithParamInterface<QueryCase> {};

TEST_P(SimQueryTest, AnswersFromThePlayer) {
    const QueryCase &c = GetParam();
    start();
    open_session(*client, 0);
    expect_answer(c.opcode, payload(c.args).get(), c.answer, c.key, c.expected);
    if (HasFatalFailure() || c.answer == kOpError || c.event == nullptr) return;
    auto event = client->event(c.event);
    ASSERT_TRUE(event.has_value());
    EXPECT_EQ(event->int_at("data"), c.args.at(0));
}

INSTANTIATE_TEST_SUITE_P(Playback, SimQueryTest, ::testing::ValuesIn(kQueries),
                         [](const auto &info) { return std::string(info.param.name); });

TEST_F(SimTest, PreferenceKeepsWhatWasSet) {
    start();
    open_session(*client, 0);
    auto set = client->call(60, payload({8, 3}).get());
    ASSERT_TRUE(set.has_value());
    ASSERT_EQ(set->opcode, kOpReturn);
    auto get = client->call(61, int_value(8).get());
    ASSERT_TRUE(get.has_value());
    EXPECT_EQ(serialize_get_int(get->value().get()), 3);
}

TEST_F(SimTest, HealthExamineNeedsNoSessionAndEchoesItsArguments) {
    start();
    Value args(serialize_array());
    serialize_array_add(args.get(), serialize_string("probe"));
    serialize_array_add(args.get(), serialize_int(7));
    auto reply = client->call(62, args.get());
    ASSERT_TRUE(reply.has_value());
    ASSERT_EQ(reply->opcode, kOpReturn);
    EXPECT_EQ(string_at(*reply, "name"), "probe");
    EXPECT_EQ(reply->int_at("extra"), 7);
    EXPECT_EQ(reply->int_at("devices"), 2);
}

}  // namespace
}  // namespace zaltest
