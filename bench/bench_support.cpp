// The benchmarks' minimal daemon, socket helpers and ratio table.
#include "bench_support.h"

#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "zal-ipod-2/connection.h"
#include "zal-ipod-2/packet.h"
#include "zal-ipod-2/zal-ipod-2.h"

namespace zalbench {

Bytes frame(uint16_t tid, uint8_t opcode, const gval *value) {
    uint32_t length = 0;
    unsigned char *encoded = value != nullptr ? serialize(value, &length) : nullptr;
    Bytes out(kPacketHeaderSize + length);
    zal_packet_header(out.data(), tid, opcode, length);
    if (length > 0) memcpy(out.data() + kPacketHeaderSize, encoded, length);
    free(encoded);
    return out;
}

Bytes encode_and_free(gval *value) {
    uint32_t length = 0;
    unsigned char *encoded = serialize(value, &length);
    Bytes out(encoded, encoded + length);
    free(encoded);
    serialize_free(value);
    return out;
}

zal_ipod_reply reply_of(const Bytes &bytes) {
    zal_ipod_reply reply{};
    reply.opcode = ZAL_OP_RETURN;
    reply.length = static_cast<uint32_t>(bytes.size());
    reply.payload = const_cast<unsigned char *>(bytes.data());
    return reply;
}

void unserialize_and_free(benchmark::State &state, const Bytes &bytes,
                          int64_t items_per_iteration) {
    for (auto _ : state) {
        gval *v = unserialize(bytes.data(), static_cast<uint32_t>(bytes.size()));
        benchmark::DoNotOptimize(v);
        serialize_free(v);
    }
    state.SetItemsProcessed(static_cast<int64_t>(state.iterations()) * items_per_iteration);
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

namespace {

// The address of an abstract socket name, and its length.
socklen_t abstract_address(const std::string &name, sockaddr_un *a) {
    *a = {};
    a->sun_family = AF_UNIX;
    memcpy(a->sun_path + 1, name.data(), name.size());
    return static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + 1 + name.size());
}

}  // namespace

MiniDaemon::MiniDaemon(Bytes answer) : answer_(std::move(answer)) {
    static int counter = 0;
    name_ =
        "zal.ipod.IPodDaemon.bench." + std::to_string(getpid()) + "." + std::to_string(++counter);
    zal_set_daemon_socket_name(name_.c_str());
    listener_ = socket(AF_UNIX, SOCK_STREAM, 0);
    struct sockaddr_un a;
    const socklen_t length = abstract_address(name_, &a);
    bind(listener_, reinterpret_cast<sockaddr *>(&a), length);
    listen(listener_, 2);
    thread_ = std::thread([this] { serve(); });
}

MiniDaemon::~MiniDaemon() {
    shutdown(listener_, SHUT_RDWR);
    close(listener_);
    thread_.join();
}

int MiniDaemon::connect_raw() const {
    int so = socket(AF_UNIX, SOCK_STREAM, 0);
    struct sockaddr_un a;
    const socklen_t length = abstract_address(name_, &a);
    connect(so, reinterpret_cast<sockaddr *>(&a), length);
    return so;
}

void MiniDaemon::serve() {
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
                Bytes hello = frame(static_cast<uint16_t>((header[2] << 8) | header[3]), 3, empty);
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

void raw_round_trips(benchmark::State &state, const Bytes &request, const Bytes &answer) {
    MiniDaemon daemon(answer);
    int so = daemon.connect_raw();
    Bytes reply(answer.size());
    for (auto _ : state) {
        write_all(so, request.data(), request.size());
        if (!poll_read(so, reply.data(), reply.size())) state.SkipWithError("no reply");
    }
    close(so);
}

namespace {

// Remembers the time per iteration of every run for the ratio table.
class RecordingReporter : public benchmark::ConsoleReporter {
  public:
    void ReportRuns(const std::vector<Run> &runs) override {
        for (const Run &r : runs)
            if (r.run_type == Run::RT_Iteration && !r.error_occurred)
                times[r.benchmark_name()] = r.GetAdjustedRealTime();
        ConsoleReporter::ReportRuns(runs);
    }
    Times times;
};

}  // namespace

Times run_benchmarks(int *argc, char **argv) {
    benchmark::Initialize(argc, argv);
    RecordingReporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
    return reporter.times;
}

int print_ratios(const Times &times, const std::vector<Ratio> &rows, int width) {
    printf("\n%-*s %10s %s\n", width, "comparison", "ratio", "target");
    int missed = 0;
    for (const Ratio &row : rows) {
        auto ours = times.find(row.ours);
        auto floor = times.find(row.floor);
        if (ours == times.end() || floor == times.end()) continue;
        double ratio = row.rate ? floor->second / ours->second : ours->second / floor->second;
        if (row.target == 0.0) {
            printf("%-*s %9.2fx (information)\n", width, row.name, ratio);
            continue;
        }
        bool ok = row.rate ? ratio >= row.target : ratio <= row.target;
        printf("%-*s %9.2fx %s %.1fx %s\n", width, row.name, ratio,
               row.rate ? ">=" : "<=", row.target, ok ? "ok" : "MISSED");
        missed += ok ? 0 : 1;
    }
    return missed;
}

}  // namespace zalbench
