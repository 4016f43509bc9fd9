// zald-sim fault injection: replies that never come, ERROR replies, dropped connections,
// delayed, split and malformed replies, and timed faults.
#include <gtest/gtest.h>

#include <chrono>
#include <thread>

#include "sim_fixture.h"

namespace zaltest {
namespace {

std::string scenario_with_faults(const std::string &faults) {
    return R"({"devices": [{"serial": "F1", "tracks": [{"title": "t"}]}], "faults": )" + faults +
           "}";
}

class SimFaultTest : public SimTest {
  protected:
    void start_with(const std::string &faults) {
        file = std::make_unique<ScenarioFile>(scenario_with_faults(faults));
        start({"-f", file->path()});
    }
    std::unique_ptr<ScenarioFile> file;
};

TEST_F(SimFaultTest, NoReplyLosesOnlyTheChosenRequests) {
    start_with(R"([{"opcode": "KEEP_ALIVE", "action": "no_reply", "count": 1}])");
    const uint16_t lost = client->send(kOpKeepAlive);
    // Requests are answered in order, so once the HELLO answer is in, the lost one never comes.
    ASSERT_TRUE(client->call(kOpHello).has_value());
    EXPECT_FALSE(client->reply(lost, 0).has_value());
    auto second = client->call(kOpKeepAlive);
    ASSERT_TRUE(second.has_value()) << "count 1 applies once";
    EXPECT_EQ(second->opcode, kOpReturn);
}

TEST_F(SimFaultTest, ErrorFaultAnswersErrorWithItsMessage) {
    start_with(R"([{"opcode": 5, "action": "error", "message": "device busy"}])");
    auto reply = client->call(kOpOpenSession, int_value(0).get());
    ASSERT_TRUE(reply.has_value());
    EXPECT_EQ(reply->opcode, kOpError);
    EXPECT_EQ(string_at(*reply, "error"), "device busy");
}

TEST_F(SimFaultTest, SkipLetsRequestsThroughBeforeTheFaultApplies) {
    start_with(R"([{"opcode": "HELLO", "action": "drop", "skip": 1}])");
    ASSERT_TRUE(client->call(kOpHello).has_value());
    client->send(kOpHello);
    EXPECT_TRUE(client->closed());
    // The simulator itself keeps serving new connections.
    auto again = connect();
    ASSERT_NE(again, nullptr);
    EXPECT_TRUE(again->call(kOpKeepAlive).has_value());
}

TEST_F(SimFaultTest, DelayedReplyComesAfterALaterOne) {
    start_with(R"([{"opcode": "KEEP_ALIVE", "action": "delay", "delay_ms": 300}])");
    const uint16_t delayed = client->send(kOpKeepAlive);
    const uint16_t prompt = client->send(kOpHello);
    auto first = client->next();
    ASSERT_TRUE(first.has_value());
    EXPECT_EQ(first->tid, prompt);
    auto late = client->reply(delayed);
    ASSERT_TRUE(late.has_value());
    EXPECT_EQ(late->opcode, kOpReturn);
}

TEST_F(SimFaultTest, SplitReplyStillFormsOnePacket) {
    start_with(R"([{"opcode": "HELLO", "action": "split", "split_at": 5, "split_gap_ms": 50}])");
    auto reply = client->call(kOpHello);
    ASSERT_TRUE(reply.has_value());
    EXPECT_EQ(reply->opcode, kOpReturn);
    Value list = reply->value();
    ASSERT_TRUE(list);
    EXPECT_EQ(serialize_array_count(list.get()), 1);
}

TEST_F(SimFaultTest, MalformedReplyKeepsTheHeaderButNotTheValue) {
    start_with(R"([{"opcode": "KEEP_ALIVE", "action": "malformed"}])");
    auto reply = client->call(kOpKeepAlive);
    ASSERT_TRUE(reply.has_value());
    EXPECT_EQ(reply->opcode, kOpReturn);
    EXPECT_FALSE(reply->payload.empty());
    EXPECT_FALSE(reply->value());
}

TEST_F(SimFaultTest, TimedDropClosesEveryClient) {
    start_with(R"([{"at_ms": 1500, "action": "drop"}])");
    auto second = connect();
    ASSERT_NE(second, nullptr);
    EXPECT_TRUE(client->closed());
    EXPECT_TRUE(second->closed());
}

TEST_F(SimFaultTest, WindowedFaultEndsWithItsWindow) {
    start_with(R"([{"action": "error", "until_ms": 1}])");
    // The window is counted from the simulator's start; let it close for certain.
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
    auto reply = client->call(kOpKeepAlive);
    ASSERT_TRUE(reply.has_value());
    EXPECT_EQ(reply->opcode, kOpReturn);
}

}  // namespace
}  // namespace zaltest
