// The zald-sim suites' fixture.
#include "sim_fixture.h"

namespace zaltest {

Value int_value(int32_t v) {
    return Value(serialize_int(v));
}

Value string_array(const std::vector<std::string> &items) {
    Value array(serialize_array());
    for (const auto &item : items) serialize_array_add(array.get(), serialize_string(item.c_str()));
    return array;
}

std::string string_at(const RawPacket &packet, const char *key) {
    Value v = packet.value();
    if (!v || serialize_type(v.get()) != SERIALIZE_HASH) return "";
    gval *item = serialize_hash_get(v.get(), key);
    return item && serialize_type(item) == SERIALIZE_STRING ? serialize_get_string(item) : "";
}

void SimTest::start(const std::vector<std::string> &args) {
    ASSERT_TRUE(sim->start_listening(args)) << "zald-sim did not start:\n"
                                            << sim->output() << sim->errors();
    client = connect();
    ASSERT_NE(client, nullptr);
}

std::unique_ptr<RawClient> SimTest::connect() {
    auto c = std::make_unique<RawClient>();
    if (!c->connect_abstract(sim->socket_name())) return nullptr;
    return c;
}

void SimTest::open_session(RawClient &c, int32_t index) {
    auto reply = c.call(kOpOpenSession, int_value(index).get());
    ASSERT_TRUE(reply.has_value());
    ASSERT_EQ(reply->opcode, kOpReturn);
    ASSERT_EQ(reply->int_at("result"), 1);
}

void SimTest::expect_answer(uint8_t opcode, const gval *arg, uint8_t answer, const char *key,
                            int32_t expected) {
    auto reply = client->call(opcode, arg);
    ASSERT_TRUE(reply.has_value());
    ASSERT_EQ(reply->opcode, answer) << string_at(*reply, "error");
    if (answer == kOpError) {
        EXPECT_FALSE(string_at(*reply, "error").empty());
    } else if (key != nullptr) {
        EXPECT_EQ(reply->int_at(key), expected);
    } else {
        Value v = reply->value();
        ASSERT_TRUE(v);
        ASSERT_EQ(serialize_type(v.get()), SERIALIZE_INT);
        EXPECT_EQ(serialize_get_int(v.get()), expected);
    }
}

}  // namespace zaltest

#include <unistd.h>

#include <fstream>

namespace zaltest {

ScenarioFile::ScenarioFile(const std::string &json)
    : path_("/tmp/" + SimProcess::unique_name("scenario") + ".json") {
    std::ofstream(path_) << json;
}

ScenarioFile::~ScenarioFile() {
    unlink(path_.c_str());
}

}  // namespace zaltest
