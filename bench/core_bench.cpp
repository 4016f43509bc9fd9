// Client core against raw socket floors measured in the same run, over the same kind of
// socket and the same minimal daemon:
//  - round trip of zal_ipod_keep_alive_sync vs a raw AF_UNIX ping-pong of the same bytes
//    with the same poll-then-read pattern (target <= 1.5x);
//  - one 16 MiB reply taken by the reply wait vs a raw read of the same bytes (<= 2x);
//  - events delivered to an event callback vs a floor that splits the same stream into
//    frames and decodes and frees each payload (target >= 0.5x the floor's rate); the
//    ratio against a bare frame split is shown too.
// Info-priority log records (the dispatcher's event trace) are filtered out through
// liblog's minimum priority, as a quiet production build would have them.
#include <android/log.h>
#include <benchmark/benchmark.h>
#include <poll.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <vector>

#include "bench_support.h"
#include "zal-ipod-2/connection.h"
#include "zal-ipod-2/packet.h"
#include "zal-ipod-2/zal-ipod-2.h"

namespace {

using namespace zalbench;

Bytes int_reply() {
    gval *v = serialize_int(0);
    Bytes b = frame(0, ZAL_OP_RETURN, v);
    serialize_free(v);
    return b;
}

Bytes keep_alive_request() {
    Bytes b(kPacketHeaderSize);
    zal_packet_header(b.data(), 1, ZAL_OP_KEEP_ALIVE, 0);
    return b;
}

// ---- round trip ------------------------------------------------------------------------

void round_trip_library(benchmark::State &state) {
    MiniDaemon daemon(int_reply());
    zal_ipod_handle *h = zal_ipod_connect(nullptr);
    if (h == nullptr) return state.SkipWithError("no connection");
    for (auto _ : state)
        if (zal_ipod_keep_alive_sync(h) != 0) state.SkipWithError("bad reply");
    zal_ipod_close(h);
}

void round_trip_raw(benchmark::State &state) {
    raw_round_trips(state, keep_alive_request(), int_reply());
}

// ---- one large reply -------------------------------------------------------------------

constexpr uint32_t kLargeReply = 16u << 20;

Bytes large_reply() {
    Bytes blob(kLargeReply - 16, 0x5A);
    gval *v = serialize_bytes(blob.data(), static_cast<uint32_t>(blob.size()));
    Bytes b = frame(0, ZAL_OP_RETURN, v);
    serialize_free(v);
    return b;
}

void large_reply_library(benchmark::State &state) {
    MiniDaemon daemon(large_reply());
    zal_ipod_handle *h = zal_ipod_connect(nullptr);
    if (h == nullptr) return state.SkipWithError("no connection");
    for (auto _ : state) {
        zal_ipod_reply *r = zal_ipod_wait_for_tid(h, static_cast<uint16_t>(zal_ipod_keep_alive(h)));
        if (r == nullptr) state.SkipWithError("no reply");
        zal_ipod_reply_free(r);
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * kLargeReply);
    zal_ipod_close(h);
}

void large_reply_raw(benchmark::State &state) {
    raw_round_trips(state, keep_alive_request(), large_reply());
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * kLargeReply);
}

// ---- event delivery --------------------------------------------------------------------

constexpr int kEventsPerBurst = 2000;

Bytes event_burst() {
    Bytes out;
    for (int i = 0; i < kEventsPerBurst; ++i) {
        gval *e = serialize_hash();
        serialize_hash_add(e, "event", serialize_string("play_state_changed"));
        serialize_hash_add(e, "session", serialize_int(1));
        serialize_hash_add(e, "serial", serialize_string("F2LXK01000HG7Q"));
        serialize_hash_add(e, "data", serialize_int(i & 3));
        Bytes b = frame(0, ZAL_OP_EVENT, e);
        serialize_free(e);
        out.insert(out.end(), b.begin(), b.end());
    }
    return out;
}

int count_events(zal_ipod_handle *, zal_ipod_event *, void *user) {
    ++*static_cast<int *>(user);
    return 0;
}

void events_library(benchmark::State &state) {
    MiniDaemon daemon(event_burst());
    zal_ipod_handle *h = zal_ipod_connect(nullptr);
    if (h == nullptr) return state.SkipWithError("no connection");
    int seen = 0;
    zal_ipod_set_event_cb(h, count_events, &seen);
    for (auto _ : state) {
        seen = 0;
        zal_ipod_keep_alive(h);  // the trigger: the daemon answers with a burst of events
        while (seen < kEventsPerBurst)
            if (zal_ipod_read(h) < 0) return state.SkipWithError("connection lost");
    }
    state.SetItemsProcessed(static_cast<int64_t>(state.iterations()) * kEventsPerBurst);
    zal_ipod_close(h);
}

// Reads the burst and splits it into frames; decode_payloads also decodes and frees each.
void events_raw(benchmark::State &state, bool decode_payloads) {
    Bytes burst = event_burst();
    MiniDaemon daemon(burst);
    int so = daemon.connect_raw();
    Bytes request = keep_alive_request();
    Bytes buffer(burst.size() + kReadChunk);
    for (auto _ : state) {
        write_all(so, request.data(), request.size());
        std::size_t have = 0, pos = 0;
        int frames = 0;
        while (frames < kEventsPerBurst) {
            struct pollfd w = {so, POLLIN, 0};
            if (poll(&w, 1, 500) <= 0) return state.SkipWithError("no events");
            ssize_t r = read(so, buffer.data() + have, kReadChunk);
            if (r <= 0) return state.SkipWithError("connection lost");
            have += static_cast<std::size_t>(r);
            while (have - pos >= kPacketHeaderSize) {
                const unsigned char *p = buffer.data() + pos;
                uint32_t length = (uint32_t{p[8]} << 24) | (uint32_t{p[9]} << 16) |
                                  (uint32_t{p[10]} << 8) | p[11];
                if (have - pos - kPacketHeaderSize < length) break;
                if (decode_payloads) serialize_free(unserialize(p + kPacketHeaderSize, length));
                benchmark::DoNotOptimize(p);
                pos += kPacketHeaderSize + length;
                ++frames;
            }
        }
    }
    state.SetItemsProcessed(static_cast<int64_t>(state.iterations()) * kEventsPerBurst);
    close(so);
}

}  // namespace

int main(int argc, char **argv) {
    __android_log_set_minimum_priority(ANDROID_LOG_WARN);
    benchmark::RegisterBenchmark("round_trip/library", round_trip_library);
    benchmark::RegisterBenchmark("round_trip/raw", round_trip_raw);
    benchmark::RegisterBenchmark("large_reply/library", large_reply_library)
        ->Unit(benchmark::kMillisecond);
    benchmark::RegisterBenchmark("large_reply/raw", large_reply_raw)->Unit(benchmark::kMillisecond);
    benchmark::RegisterBenchmark("events/library", events_library)->Unit(benchmark::kMicrosecond);
    benchmark::RegisterBenchmark("events/raw_decode", events_raw, true)
        ->Unit(benchmark::kMicrosecond);
    benchmark::RegisterBenchmark("events/raw_split", events_raw, false)
        ->Unit(benchmark::kMicrosecond);
    const Times times = run_benchmarks(&argc, argv);

    // Time ratios (library / floor); for events the rate ratio is the inverse.
    const std::vector<Ratio> rows = {
        {"round trip", "round_trip/library", "round_trip/raw", false, 1.5},
        {"16 MiB reply", "large_reply/library", "large_reply/raw", false, 2.0},
        {"event rate vs split+decode", "events/library", "events/raw_decode", true, 0.5},
        {"event rate vs bare split", "events/library", "events/raw_split", true, 0.0},
    };
    const int missed = print_ratios(times, rows);
    benchmark::Shutdown();
    return missed == 0 ? 0 : 1;
}
