// Allocation failure: the Nth allocation of an operation fails, for every N until the
// operation runs through without reaching N. Whatever fails, nothing crashes or leaks
// (AddressSanitizer checks the leaks at exit), and an operation that reports failure has
// written an error record saying why.
#include <android/log.h>
#include <gtest/gtest.h>

#include <atomic>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <new>
#include <string>
#include <vector>

#include "client_helpers.h"
#include "fake_daemon.h"
#include "zal-ipod-2/daemon.h"
#include "zal-ipod-2/dispatch.h"
#include "zal-ipod-2/zal-ipod-2.h"

// ---- The interposed allocator (see tests/cmake/alloc_failure.cmake) ---------------------
// Only the thread that armed the countdown counts and fails: the fake daemon's thread and
// the logger keep allocating normally.
namespace {
thread_local long fail_at = 0;  // 0: disarmed
thread_local long seen = 0;     // allocations since arming
thread_local bool injected = false;

bool fail_now() {
    if (fail_at == 0) return false;
    if (++seen != fail_at) return false;
    injected = true;
    return true;
}
}  // namespace

#if SIZE_MAX == UINT32_MAX
#define ZAL_NEW(suffix) _Znwj##suffix
#define ZAL_NEW_ARRAY(suffix) _Znaj##suffix
#else
#define ZAL_NEW(suffix) _Znwm##suffix
#define ZAL_NEW_ARRAY(suffix) _Znam##suffix
#endif
#define ZAL_CAT(a, b) a##b
#define ZAL_WRAP(name) ZAL_CAT(__wrap_, name)
#define ZAL_REAL(name) ZAL_CAT(__real_, name)

extern "C" {
void *__real_malloc(size_t);
void *__real_calloc(size_t, size_t);
void *__real_realloc(void *, size_t);
char *__real_strdup(const char *);
char *__real_strndup(const char *, size_t);
void *ZAL_REAL(ZAL_NEW())(size_t);
void *ZAL_REAL(ZAL_NEW_ARRAY())(size_t);
void *ZAL_REAL(ZAL_NEW(RKSt9nothrow_t))(size_t, const std::nothrow_t &);
void *ZAL_REAL(ZAL_NEW_ARRAY(RKSt9nothrow_t))(size_t, const std::nothrow_t &);

void *__wrap_malloc(size_t n) {
    return fail_now() ? nullptr : __real_malloc(n);
}
void *__wrap_calloc(size_t n, size_t size) {
    return fail_now() ? nullptr : __real_calloc(n, size);
}
void *__wrap_realloc(void *p, size_t n) {
    return fail_now() ? nullptr : __real_realloc(p, n);
}
char *__wrap_strdup(const char *s) {
    return fail_now() ? nullptr : __real_strdup(s);
}
char *__wrap_strndup(const char *s, size_t n) {
    return fail_now() ? nullptr : __real_strndup(s, n);
}
void *ZAL_WRAP(ZAL_NEW())(size_t n) {
    if (fail_now()) throw std::bad_alloc();
    return ZAL_REAL(ZAL_NEW())(n);
}
void *ZAL_WRAP(ZAL_NEW_ARRAY())(size_t n) {
    if (fail_now()) throw std::bad_alloc();
    return ZAL_REAL(ZAL_NEW_ARRAY())(n);
}
void *ZAL_WRAP(ZAL_NEW(RKSt9nothrow_t))(size_t n, const std::nothrow_t &t) {
    return fail_now() ? nullptr : ZAL_REAL(ZAL_NEW(RKSt9nothrow_t))(n, t);
}
void *ZAL_WRAP(ZAL_NEW_ARRAY(RKSt9nothrow_t))(size_t n, const std::nothrow_t &t) {
    return fail_now() ? nullptr : ZAL_REAL(ZAL_NEW_ARRAY(RKSt9nothrow_t))(n, t);
}
}  // extern "C"

using namespace zaltest;

namespace {

// Error records counted by a logger that allocates nothing itself.
std::atomic<int> error_records{0};
void counting_logger(const struct __android_logger_data *data, const char *) {
    if (data->priority >= ANDROID_LOG_ERROR) ++error_records;
}

class AllocationFailure : public ::testing::Test {
  protected:
    void SetUp() override {
        __android_log_set_logger(counting_logger);
        __android_log_set_minimum_priority(ANDROID_LOG_VERBOSE);
    }
    void TearDown() override {
        __android_log_set_logger(__android_log_stderr_logger);
        __android_log_set_minimum_priority(ANDROID_LOG_INFO);
    }

    // One step of an operation: prepare() runs unarmed, run() armed and returns true when
    // the operation succeeded, finish() unarmed again (releases what prepare made).
    struct Step {
        std::function<void()> prepare;
        std::function<bool()> run;
        std::function<void()> finish;
    };

    // Sweeps N = 1, 2, ... until the operation no longer reaches its Nth allocation.
    // Returns the number of allocations the operation made.
    long sweep(const char *name, const Step &step) {
        for (long n = 1; n < 100000; ++n) {
            step.prepare();
            error_records = 0;
            seen = 0;
            injected = false;
            fail_at = n;
            bool ok = false;
            try {
                ok = step.run();
            } catch (...) {
                ADD_FAILURE() << name << ": an exception left the library at allocation " << n;
            }
            fail_at = 0;
            step.finish();
            if (!injected) {
                EXPECT_TRUE(ok) << name << " fails without any failed allocation";
                return n - 1;
            }
            if (!ok) {
                EXPECT_GT(error_records.load(), 0)
                    << name << " failed at allocation " << n << " without an error record";
            }
        }
        ADD_FAILURE() << name << ": the sweep did not end";
        return -1;
    }
};

TEST_F(AllocationFailure, Codec) {
    gval *tree =
        hash_of({{"title", serialize_string("Alpha")},
                 {"devices", device_list({device_entry("A", 1, 2), device_entry("B", 0, 1)})},
                 {"bytes", serialize_bytes("\x01\x02\x03", 3)}});
    uint32_t length = 0;
    unsigned char *encoded = serialize(tree, &length);
    ASSERT_NE(encoded, nullptr);
    const std::string reference(reinterpret_cast<char *>(encoded), length);

    gval *decoded = nullptr;
    long decoding =
        sweep("unserialize", {[] {},
                              [&] {
                                  decoded = unserialize(encoded, length);
                                  return decoded != nullptr;
                              },
                              [&] {
                                  // Whatever came back is whole or absent,
                                  // never a tree that encodes differently.
                                  if (decoded != nullptr && !injected) {
                                      uint32_t n = 0;
                                      unsigned char *again = serialize(decoded, &n);
                                      EXPECT_EQ(std::string(reinterpret_cast<char *>(again), n),
                                                reference);
                                      free(again);
                                  }
                                  serialize_free(decoded);
                                  decoded = nullptr;
                              }});
    EXPECT_GT(decoding, 5);

    unsigned char *out = nullptr;
    sweep("serialize", {[] {},
                        [&] {
                            uint32_t n = 0;
                            out = serialize(tree, &n);
                            return out != nullptr;
                        },
                        [&] {
                            free(out);
                            out = nullptr;
                        }});
    free(encoded);
    serialize_free(tree);
}

// A context filled afresh for every run and released after it.
struct OwnedContextHolder {
    context ctx{};
    bool live = false;
    context *fresh() {
        release();
        ctx = context{};
        live = true;
        return &ctx;
    }
    void release() {
        if (live) zal_context_release(&ctx);
        live = false;
    }
    ~OwnedContextHolder() { release(); }
};

TEST_F(AllocationFailure, CommandLine) {
    OwnedContextHolder holder;
    // parse_arguments may write into its arguments (the EAP list is cut in place), as a
    // daemon's own argv allows: every run gets fresh copies.
    const std::vector<std::string> words = {
        "zald-2", "-u", "zal.test", "-e", "com.example.one,com.example.two", "-a", "ABCDE12345"};
    std::vector<std::string> copies;
    std::vector<char *> argv;
    context *ctx = nullptr;
    sweep("parse_arguments",
          {[&] {
               ctx = holder.fresh();
               copies = words;
               argv.clear();
               for (auto &w : copies) argv.push_back(w.data());
               argv.push_back(nullptr);
           },
           [&] { return parse_arguments(static_cast<int>(words.size()), argv.data(), ctx) == 0; },
           [&] { holder.release(); }});
}

TEST_F(AllocationFailure, Connect) {
    std::unique_ptr<FakeDaemon> d;
    zal_ipod_handle *h = nullptr;
    long made = sweep("zal_ipod_connect",
                      {[&] {
                           d = std::make_unique<FakeDaemon>();
                           d->expect(ZAL_OP_HELLO).reply(device_list({device_entry("P", 1, 2)}));
                       },
                       [&] {
                           h = zal_ipod_connect(nullptr);
                           return h != nullptr && zal_ipod_device_count(h) == 1;
                       },
                       [&] {
                           zal_ipod_close(h);
                           h = nullptr;
                           d.reset();
                       }});
    EXPECT_GT(made, 2);
}

// A _sync command of each family, on a handle with an open session.
struct CommandCase {
    const char *name;
    uint8_t opcode;
    std::function<gval *()> reply;
    std::function<bool(zal_ipod_handle *)> run;
};

class AllocationFailureCommands : public AllocationFailure,
                                  public ::testing::WithParamInterface<CommandCase> {};

TEST_P(AllocationFailureCommands, SyncFormFailsCleanly) {
    const CommandCase &c = GetParam();
    std::unique_ptr<FakeDaemon> d;
    zal_ipod_handle *h = nullptr;
    sweep(c.name, {[&] {
                       d = std::make_unique<FakeDaemon>();
                       h = connect_with_session(*d);
                       ASSERT_NE(h, nullptr);
                       d->expect(c.opcode).reply(c.reply());
                   },
                   [&] { return h != nullptr && c.run(h); },
                   [&] {
                       zal_ipod_close(h);
                       h = nullptr;
                       d.reset();
                   }});
}

char config_value[ZAL_IPOD_CONFIG_VALUE_SIZE];

INSTANTIATE_TEST_SUITE_P(
    Families, AllocationFailureCommands,
    ::testing::Values(
        CommandCase{"play", ZAL_OP_PLAY, [] { return serialize_int(0); },
                    [](zal_ipod_handle *h) { return zal_ipod_play_sync(h) == 0; }},
        CommandCase{"get_config", ZAL_OP_GET_CONFIG,
                    [] {
                        return hash_of({{"config_val", serialize_string("zal.ipod.IPodDaemon")}});
                    },
                    [](zal_ipod_handle *h) {
                        return zal_ipod_get_config_sync(h, "socket_name", config_value) == 1;
                    }},
        CommandCase{"get_mode", ZAL_OP_GET_MODE, [] { return serialize_int(1); },
                    [](zal_ipod_handle *h) { return zal_ipod_get_mode_sync(h) == 1; }},
        CommandCase{"power_battery_state", ZAL_OP_GET_POWER_BATTERY_STATE,
                    [] {
                        return hash_of({{"get_power_battery_state", serialize_int(1)},
                                        {"state", serialize_int(2)},
                                        {"level", serialize_int(55)}});
                    },
                    [](zal_ipod_handle *h) {
                        int state = 0, level = 0;
                        return zal_ipod_get_power_battery_state_sync(h, &state, &level) == 1 &&
                               level == 55;
                    }},
        CommandCase{"bt_connection_status", ZAL_OP_GET_BT_CONNECTION_STATUS,
                    [] {
                        return hash_of({{"current_bt_status", serialize_string("connected")}});
                    },
                    [](zal_ipod_handle *h) {
                        char *status = zal_ipod_bt_connection_status_sync(h);
                        const bool ok = status != nullptr && strcmp(status, "connected") == 0;
                        free(status);
                        return ok;
                    }},
        CommandCase{
            "stop_telephony_update", ZAL_OP_STOP_TELEPHONY_UPDATE, [] { return serialize_int(0); },
            [](zal_ipod_handle *h) { return zal_ipod_stop_telephony_update_sync(h) == 0; }}),
    [](const auto &info) { return std::string(info.param.name); });

TEST_F(AllocationFailure, EventDispatch) {
    zal_ipod_handle *h = nullptr;
    int delivered = 0;
    sweep("event dispatch",
          {[&] {
               h = offline_handle();
               delivered = 0;
               zal_ipod_set_event_cb(
                   h,
                   [](zal_ipod_handle *, zal_ipod_event *e, void *user) {
                       zal_ipod_event *copy = zal_ipod_event_clone_data(e);
                       if (copy != nullptr) ++*static_cast<int *>(user);
                       zal_ipod_event_free(copy);
                       return 0;
                   },
                   &delivered);
               queue_event(h, "connected_ipod", hash_of({{"serial", serialize_string("NEW")}}));
               queue_event(h, "ipod_device_name", serialize_string("Kitchen"), "NEW");
           },
           [&] {
               zal_ipod_pending_event(h);
               return delivered == 2;
           },
           [&] {
               zal_ipod_close(h);
               h = nullptr;
           }});
}

}  // namespace
