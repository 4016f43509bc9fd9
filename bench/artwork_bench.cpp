// Artwork fetch against socket floors measured in the same run, over the same kind of socket
// and the same minimal daemon, for a 600x600 picture of 2 bytes per pixel:
//  - through the shared file: zal_ipod_current_track_artwork_sync (reply with "image_path",
//    the mapping kept between calls, no pixel copied) vs a raw round trip of the same small
//    reply (target <= 1.5x);
//  - inline: the same call with the pixels in the reply vs a raw round trip carrying the
//    same bytes (target <= 2x).
#include <android/log.h>
#include <benchmark/benchmark.h>
#include <fcntl.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <map>
#include <string>
#include <thread>
#include <vector>

#include "zal-ipod-2/connection.h"
#include "zal-ipod-2/handle.h"
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
        name_ = "zal.ipod.IPodDaemon.artbench." + std::to_string(getpid()) + "." +
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

constexpr int kSide = 600;
constexpr int kRowStride = kSide * 2;
constexpr uint32_t kPixelBytes = uint32_t{kSide} * kRowStride;

// The shared file the daemon would write, filled once.
class PictureFile {
  public:
    PictureFile() {
        char name[] = "/tmp/zal-artwork-bench-XXXXXX";
        int fd = mkstemp(name);
        path_ = name;
        std::vector<unsigned char> pixels(kPixelBytes, 0x5A);
        if (write(fd, pixels.data(), pixels.size()) != static_cast<ssize_t>(pixels.size()))
            perror("artwork bench: write");
        close(fd);
    }
    ~PictureFile() { unlink(path_.c_str()); }
    const std::string &path() const { return path_; }

  private:
    std::string path_;
};

Bytes artwork_reply(const std::string *path) {
    gval *h = serialize_hash();
    serialize_hash_add(h, "width", serialize_int(kSide));
    serialize_hash_add(h, "height", serialize_int(kSide));
    serialize_hash_add(h, "rowstride", serialize_int(kRowStride));
    serialize_hash_add(h, "pixel_format", serialize_int(2));
    if (path != nullptr) {
        serialize_hash_add(h, "image_path", serialize_string(path->c_str()));
    } else {
        std::vector<unsigned char> pixels(kPixelBytes, 0x5A);
        serialize_hash_add(h, "image", serialize_bytes(pixels.data(), kPixelBytes));
    }
    Bytes b = frame(0, ZAL_OP_RETURN, h);
    serialize_free(h);
    return b;
}

Bytes artwork_request() {
    gval *v = serialize_int(0);
    Bytes b = frame(1, ZAL_OP_CURRENT_TRACK_ARTWORK, v);
    serialize_free(v);
    return b;
}

void artwork_library(benchmark::State &state, bool shared) {
    PictureFile file;
    MiniDaemon daemon(artwork_reply(shared ? &file.path() : nullptr));
    zal_ipod_handle *h = zal_ipod_connect(nullptr);
    if (h == nullptr) return state.SkipWithError("no connection");
    h->ready = 1;  // the minimal daemon has no sessions
    for (auto _ : state) {
        if (zal_ipod_current_track_artwork_sync(h, 0) != 1) state.SkipWithError("no picture");
        benchmark::DoNotOptimize(zal_ipod_current_track_artwork_data(h));
    }
    if (zal_ipod_current_track_artwork_length(h) != kPixelBytes)
        state.SkipWithError("wrong picture length");
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * kPixelBytes);
    zal_ipod_close(h);
}

// The floor: the same request and reply bytes over a raw socket, read like the library's
// reader reads (poll, then what is there).
void artwork_raw(benchmark::State &state, bool shared) {
    PictureFile file;
    Bytes answer = artwork_reply(shared ? &file.path() : nullptr);
    MiniDaemon daemon(answer);
    int so = daemon.connect_raw();
    Bytes request = artwork_request();
    Bytes reply(answer.size());
    for (auto _ : state) {
        write_all(so, request.data(), request.size());
        if (!poll_read(so, reply.data(), reply.size())) state.SkipWithError("no reply");
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * kPixelBytes);
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
    benchmark::RegisterBenchmark("artwork_file/library", artwork_library, true)
        ->Unit(benchmark::kMicrosecond);
    benchmark::RegisterBenchmark("artwork_file/raw_small_reply", artwork_raw, true)
        ->Unit(benchmark::kMicrosecond);
    benchmark::RegisterBenchmark("artwork_inline/library", artwork_library, false)
        ->Unit(benchmark::kMicrosecond);
    benchmark::RegisterBenchmark("artwork_inline/raw_transfer", artwork_raw, false)
        ->Unit(benchmark::kMicrosecond);
    benchmark::Initialize(&argc, argv);
    RecordingReporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);

    const struct {
        const char *name, *ours, *floor;
        double target;
    } rows[] = {
        {"shared file vs small reply", "artwork_file/library", "artwork_file/raw_small_reply", 1.5},
        {"inline vs raw transfer", "artwork_inline/library", "artwork_inline/raw_transfer", 2.0},
    };
    printf("\n%-28s %10s %s\n", "comparison", "ratio", "target");
    int missed = 0;
    for (const auto &row : rows) {
        auto ours = reporter.times.find(row.ours);
        auto floor = reporter.times.find(row.floor);
        if (ours == reporter.times.end() || floor == reporter.times.end()) continue;
        double ratio = ours->second / floor->second;
        bool ok = ratio <= row.target;
        printf("%-28s %9.2fx <= %.1fx %s\n", row.name, ratio, row.target, ok ? "ok" : "MISSED");
        missed += ok ? 0 : 1;
    }
    benchmark::Shutdown();
    return missed == 0 ? 0 : 1;
}
