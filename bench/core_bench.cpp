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
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <map>
#include <string>
#include <thread>
#include <vector>

#include "zal-ipod-2/connection.h"
#include "zal-ipod-2/packet.h"
#include "zal-ipod-2/zal-ipod-2.h"

namespace {

using Bytes = std::vector<unsigned char>;

Bytes frame(uint16_t tid, uint8_t opcode, const gval *value) {
    uint32_t length = 0;
    unsigned char *encoded = value != nullptr ? serialize(value, &length) : nullptr;
    Bytes out(kPacketHeaderSize + length);
    zal_packet_header(out.data(), tid, opcode, length);
    if (length > 0) memcpy(out.data() + kPacketHeaderSize, encoded, length);
    free(encoded);
    return out;
}

bool read_exact(int fd, unsigned char *p, std::size_t n) {
    std::size_t got = 0;
    while (got < n) {
        ssize_t r = read(fd, p + got, n - got);
        if (r <= 0) return false;
        got += static_cast<std::size_t>(r);
    }
    return true;
}

bool write_all(int fd, const unsigned char *p, std::size_t n) {
    std::size_t done = 0;
    while (done < n) {
        ssize_t w = send(fd, p + done, n - done, MSG_NOSIGNAL);
        if (w <= 0) return false;
        done += static_cast<std::size_t>(w);
    }
    return true;
}

// A daemon that answers HELLO with an empty list and every other request with `answer`
// (its first 12 bytes' tid patched to the request's), for one client at a time.
class MiniDaemon {
  public:
    explicit MiniDaemon(Bytes answer) : answer_(std::move(answer)) {
        name_ = "zal.ipod.IPodDaemon.bench." + std::to_string(getpid()) + "." +
                std::to_string(++counter_);
        zal_set_daemon_socket_name(name_.c_str());
        listener_ = socket(AF_UNIX, SOCK_STREAM, 0);
        struct sockaddr_un a = {};
        a.sun_family = AF_UNIX;
        memcpy(a.sun_path + 1, name_.data(), name_.size());
        bind(listener_, reinterpret_cast<sockaddr *>(&a),
             static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + 1 + name_.size()));
        listen(listener_, 2);
        thread_ = std::thread([this] { serve(); });
    }
    ~MiniDaemon() {
        shutdown(listener_, SHUT_RDWR);
        close(listener_);
        thread_.join();
    }
    // A raw client connected like the library (socket file in the abstract namespace).
    int connect_raw() const {
        int so = socket(AF_UNIX, SOCK_STREAM, 0);
        struct sockaddr_un a = {};
        a.sun_family = AF_UNIX;
        memcpy(a.sun_path + 1, name_.data(), name_.size());
        connect(so, reinterpret_cast<sockaddr *>(&a),
                static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + 1 + name_.size()));
        return so;
    }

  private:
    void serve() {
        for (;;) {
            int client = accept(listener_, nullptr, nullptr);
            if (client < 0) return;
            unsigned char header[kPacketHeaderSize];
            Bytes payload;
            gval *empty = serialize_array();
            while (read_exact(client, header, sizeof header)) {
                uint32_t length = (uint32_t{header[8]} << 24) | (uint32_t{header[9]} << 16) |
                                  (uint32_t{header[10]} << 8) | header[11];
                payload.resize(length);
                if (length > 0 && !read_exact(client, payload.data(), length)) break;
                if (header[4] == 0) {
                    Bytes hello =
                        frame(static_cast<uint16_t>((header[2] << 8) | header[3]), 3, empty);
                    write_all(client, hello.data(), hello.size());
                    continue;
                }
                answer_[2] = header[2];
                answer_[3] = header[3];
                if (!write_all(client, answer_.data(), answer_.size())) break;
            }
            serialize_free(empty);
            close(client);
        }
    }
    static inline int counter_ = 0;
    Bytes answer_;
    std::string name_;
    int listener_ = -1;
    std::thread thread_;
};

// Same wait as the library's reader: poll, then read what is there.
bool poll_read(int fd, unsigned char *p, std::size_t n) {
    std::size_t got = 0;
    while (got < n) {
        struct pollfd w = {fd, POLLIN, 0};
        if (poll(&w, 1, 500) <= 0) return false;
        std::size_t chunk = n - got < kReadChunk ? n - got : kReadChunk;
        ssize_t r = read(fd, p + got, chunk);
        if (r <= 0) return false;
        got += static_cast<std::size_t>(r);
    }
    return true;
}

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
    MiniDaemon daemon(int_reply());
    int so = daemon.connect_raw();
    Bytes request = keep_alive_request();
    Bytes reply(int_reply().size());
    for (auto _ : state) {
        write_all(so, request.data(), request.size());
        if (!poll_read(so, reply.data(), reply.size())) state.SkipWithError("no reply");
    }
    close(so);
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
    Bytes answer = large_reply();
    MiniDaemon daemon(answer);
    int so = daemon.connect_raw();
    Bytes request = keep_alive_request();
    Bytes reply(answer.size());
    for (auto _ : state) {
        write_all(so, request.data(), request.size());
        if (!poll_read(so, reply.data(), reply.size())) state.SkipWithError("no reply");
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * kLargeReply);
    close(so);
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

class RecordingReporter : public benchmark::ConsoleReporter {
  public:
    void ReportRuns(const std::vector<Run> &runs) override {
        for (const Run &r : runs)
            if (r.run_type == Run::RT_Iteration && !r.error_occurred)
                times[r.benchmark_name()] = r.GetAdjustedRealTime();
        ConsoleReporter::ReportRuns(runs);
    }
    std::map<std::string, double> times;
};

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
    benchmark::Initialize(&argc, argv);
    RecordingReporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);

    // Time ratios (library / floor); for events the rate ratio is the inverse.
    const struct {
        const char *name, *ours, *floor;
        bool rate;
        double target;
    } rows[] = {
        {"round trip", "round_trip/library", "round_trip/raw", false, 1.5},
        {"16 MiB reply", "large_reply/library", "large_reply/raw", false, 2.0},
        {"event rate vs split+decode", "events/library", "events/raw_decode", true, 0.5},
        {"event rate vs bare split", "events/library", "events/raw_split", true, 0.0},
    };
    printf("\n%-28s %10s %s\n", "comparison", "ratio", "target");
    int missed = 0;
    for (const auto &row : rows) {
        auto ours = reporter.times.find(row.ours);
        auto floor = reporter.times.find(row.floor);
        if (ours == reporter.times.end() || floor == reporter.times.end()) continue;
        double ratio = row.rate ? floor->second / ours->second : ours->second / floor->second;
        bool ok = row.rate ? ratio >= row.target : ratio <= row.target;
        if (row.target == 0.0) {
            printf("%-28s %9.2fx (information)\n", row.name, ratio);
            continue;
        }
        printf("%-28s %9.2fx %s %.1fx %s\n", row.name, ratio, row.rate ? ">=" : "<=", row.target,
               ok ? "ok" : "MISSED");
        missed += ok ? 0 : 1;
    }
    benchmark::Shutdown();
    return missed == 0 ? 0 : 1;
}
