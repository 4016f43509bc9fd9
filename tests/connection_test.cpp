// Connecting, the HELLO exchange, the connection accessors and reconnecting to every kind
// of target.
#include <android/log.h>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <string>

#include "client_helpers.h"
#include "fake_daemon.h"
#include "log_capture.h"
#include "zal-ipod-2/connection.h"
#include "zal-ipod-2/packet.h"

using namespace zaltest;

namespace {

// Loses the handle's connection the way a failed read does.
void lose_connection(zal_ipod_handle *h) {
    pthread_mutex_lock(&h->read_lock);
    zal_connection_drop_locked(h);
    pthread_mutex_unlock(&h->read_lock);
}

std::string socket_file(const char *tag) {
    return "/tmp/zal-core-test-" + std::to_string(getpid()) + "-" + tag;
}

}  // namespace

TEST(Connect, HelloReplyBecomesTheDeviceList) {
    FakeDaemon d;
    d.expect(ZAL_OP_HELLO).reply(device_list({device_entry("A1", 1, 1), device_entry("B2", 0, 2)}));
    zal_ipod_handle *h = zal_ipod_connect(nullptr);
    ASSERT_NE(h, nullptr);
    EXPECT_TRUE(d.finish()) << d.report();
    EXPECT_EQ(d.requests().at(0).tid, 1);
    EXPECT_EQ(zal_ipod_device_count(h), 2);
    EXPECT_STREQ(zal_ipod_device_serial(h, 1), "B2");
    EXPECT_EQ(zal_ipod_is_remote(h), 0);
    EXPECT_GE(zal_ipod_fd(h), 0);
    EXPECT_EQ(zal_ipod_is_ready(h), 0);
    zal_ipod_close(h);
}

TEST(Connect, HelloReplyWithoutPayloadLeavesNoList) {
    FakeDaemon d;
    d.expect(ZAL_OP_HELLO).reply(nullptr);
    zal_ipod_handle *h = zal_ipod_connect("ignored:1");
    ASSERT_NE(h, nullptr);
    EXPECT_EQ(zal_ipod_device_count(h), 0);
    EXPECT_EQ(zal_ipod_device_serial(h, 0), nullptr);
    zal_ipod_close(h);
}

TEST(Connect, NoDaemonFailsWithBothReports) {
    isolate_daemon_socket();
    LogCapture log;
    EXPECT_EQ(zal_ipod_connect(nullptr), nullptr);
    auto errors = log.texts(ANDROID_LOG_ERROR);
    ASSERT_GE(errors.size(), 4u);
    EXPECT_EQ(errors[0], "connect_android_socket: Client connect error\n");
    EXPECT_EQ(errors[1].rfind("  connect_android_socket:", 0), 0u);
    EXPECT_EQ(errors[2], "Could not connect zald-2.\n");
    EXPECT_EQ(errors[3].rfind("  zal_ipod_connect:", 0), 0u);
}

TEST(Connect, NotifyAttachedWritesOneBareOpcode133) {
    FakeDaemon d;
    d.expect(ZAL_OP_HELLO).reply(serialize_array()).expect(ZAL_OP_NOTIFY_ATTACHED);
    zal_ipod_handle *h = zal_ipod_connect(nullptr);
    ASSERT_NE(h, nullptr);
    EXPECT_EQ(zal_ipod_notify_attached(h), 12);
    EXPECT_TRUE(d.finish()) << d.report();
    zal_ipod_close(h);
}

TEST(Connect, ReadyReflectsConnectionSessionAndFlag) {
    zal_ipod_handle *h = offline_handle();
    EXPECT_EQ(zal_ipod_is_ready(h), -1);
    h->fd = 1000;  // never used: only the accessor reads it
    EXPECT_EQ(zal_ipod_is_ready(h), 0);
    h->session_opened = 1;
    EXPECT_EQ(zal_ipod_is_ready(h), 0);
    h->ready = 1;
    EXPECT_EQ(zal_ipod_is_ready(h), 1);
    h->fd = -1;
    zal_ipod_close(h);
}

// Reconnect targets: each row names where the second daemon listens and the target text.
struct TargetCase {
    const char *name;
    FakeDaemon::Endpoint endpoint;
    // Target from the daemon's port or path.
    std::string (*target)(int port, const std::string &path);
    int remote;
    bool needs_fixed_port;
};

void PrintTo(const TargetCase &c, std::ostream *out) {
    *out << c.name;
}

class Reconnect : public ::testing::TestWithParam<TargetCase> {};

TEST_P(Reconnect, ReachesTheTargetAndSaysHelloAgain) {
    const TargetCase &c = GetParam();
    FakeDaemon first;
    first.expect(ZAL_OP_HELLO).reply(device_list({device_entry("OLD", 1, 1)}));
    zal_ipod_handle *h = zal_ipod_connect(nullptr);
    ASSERT_NE(h, nullptr);
    ASSERT_TRUE(first.finish()) << first.report();

    std::string path = socket_file(c.name);
    if (c.endpoint == FakeDaemon::Endpoint::path && std::string(c.name) == "path_minus_one")
        path += ":-1";
    FakeDaemon second(c.endpoint, path, c.needs_fixed_port ? 1910 : 0);
    if (c.needs_fixed_port && (!isolated_namespace() || second.port() != 1910))
        GTEST_SKIP() << "port 1910 is not ours outside a private network namespace";
    second.expect(ZAL_OP_HELLO).reply(device_list({device_entry("NEW", 1, 2)}));
    std::string target = c.target(second.port(), path);
    free(h->address);
    h->address = strdup(target.c_str());

    lose_connection(h);
    EXPECT_EQ(zal_ipod_read(h), -1);  // a read on a lost connection reconnects
    EXPECT_TRUE(second.finish()) << second.report();
    EXPECT_GE(zal_ipod_fd(h), 0);
    EXPECT_EQ(zal_ipod_is_remote(h), c.remote);
    EXPECT_STREQ(zal_ipod_device_serial(h, 0), "NEW");
    EXPECT_NE(fcntl(zal_ipod_fd(h), F_GETFL) & O_NONBLOCK, 0);
    zal_ipod_close(h);
}

INSTANTIATE_TEST_SUITE_P(
    Targets, Reconnect,
    ::testing::Values(
        TargetCase{
            "tcp", FakeDaemon::Endpoint::tcp,
            [](int port, const std::string &) { return "127.0.0.1:" + std::to_string(port); }, 1,
            false},
        TargetCase{"empty_host", FakeDaemon::Endpoint::tcp,
                   [](int port, const std::string &) { return ":" + std::to_string(port); }, 1,
                   false},
        TargetCase{"port_zero", FakeDaemon::Endpoint::tcp,
                   [](int, const std::string &) { return std::string("localhost:0"); }, 1, true},
        TargetCase{"path", FakeDaemon::Endpoint::path,
                   [](int, const std::string &path) { return path; }, 0, false},
        TargetCase{"path_minus_one", FakeDaemon::Endpoint::path,
                   [](int, const std::string &path) { return path; }, 0, false}),
    [](const auto &info) { return std::string(info.param.name); });

// Targets that cannot work: the reconnect fails with its report and fd stays -1.
struct FailedTargetCase {
    const char *name;
    std::string target;
    const char *report;
    int remote;
};

void PrintTo(const FailedTargetCase &c, std::ostream *out) {
    *out << c.name;
}

class FailedReconnect : public ::testing::TestWithParam<FailedTargetCase> {};

TEST_P(FailedReconnect, LeavesTheHandleDisconnected) {
    const FailedTargetCase &c = GetParam();
    zal_ipod_handle *h = offline_handle();
    h->address = strdup(c.target.c_str());
    LogCapture log;
    EXPECT_EQ(zal_ipod_reconnect(h), -1);
    EXPECT_EQ(zal_ipod_fd(h), -1);
    EXPECT_EQ(zal_ipod_is_remote(h), c.remote);
    auto errors = log.texts(ANDROID_LOG_ERROR);
    ASSERT_FALSE(errors.empty());
    EXPECT_NE(std::find(errors.begin(), errors.end(), c.report), errors.end()) << errors[0];
    zal_ipod_close(h);
}

INSTANTIATE_TEST_SUITE_P(
    Targets, FailedReconnect,
    ::testing::Values(FailedTargetCase{"missing_path", "/tmp/zal-core-test-no-such-socket",
                                       "Could not find to /tmp/zal-core-test-no-such-socket\n", 0},
                      FailedTargetCase{"unknown_host", "no-such-host.invalid:5",
                                       "Could not find the zald-2 host\n", 1},
                      FailedTargetCase{"over_long_target", std::string(300, 'x'),
                                       "Could not connect zald-2.\n", 0},
                      FailedTargetCase{"over_long_path", "/tmp/" + std::string(150, 'p') + ":-1",
                                       "Could not connect zald-2.\n", 0}),
    [](const auto &info) { return std::string(info.param.name); });

TEST(ReconnectTarget, EnvironmentIsUsedWithoutAnAddress) {
    std::string path = socket_file("env");
    FakeDaemon d(FakeDaemon::Endpoint::path, path);
    d.expect(ZAL_OP_HELLO).reply(device_list({device_entry("ENV", 1, 1)}));
    zal_ipod_handle *h = offline_handle();
    setenv("ZALIPODDAEMON", path.c_str(), 1);
    EXPECT_GE(zal_ipod_reconnect(h), 0);
    unsetenv("ZALIPODDAEMON");
    EXPECT_TRUE(d.finish()) << d.report();
    EXPECT_STREQ(zal_ipod_device_serial(h, 0), "ENV");
    zal_ipod_close(h);
}

TEST(ReconnectTarget, ADaemonThatHangsUpAtOnceEndsWithoutNesting) {
    std::string path = socket_file("hangup");
    FakeDaemon d(FakeDaemon::Endpoint::path, path);
    d.drop().drop().drop();
    zal_ipod_handle *h = offline_handle();
    h->address = strdup(path.c_str());
    zal_ipod_set_read_timeout(h, 0, 0);
    zal_ipod_reconnect(h);
    // The HELLO inside the reconnect found the socket dead; no second reconnect ran
    // inside it, and the flag is free again for the next read.
    EXPECT_FALSE(h->reconnecting.load());
    zal_ipod_close(h);
}
