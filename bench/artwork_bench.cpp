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
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "bench_support.h"
#include "zal-ipod-2/connection.h"
#include "zal-ipod-2/handle.h"
#include "zal-ipod-2/packet.h"
#include "zal-ipod-2/zal-ipod-2.h"

namespace {

using namespace zalbench;

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
    raw_round_trips(state, artwork_request(), artwork_reply(shared ? &file.path() : nullptr));
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * kPixelBytes);
}

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
    const Times times = run_benchmarks(&argc, argv);

    const std::vector<Ratio> rows = {
        {"shared file vs small reply", "artwork_file/library", "artwork_file/raw_small_reply",
         false, 1.5},
        {"inline vs raw transfer", "artwork_inline/library", "artwork_inline/raw_transfer", false,
         2.0},
    };
    const int missed = print_ratios(times, rows);
    benchmark::Shutdown();
    return missed == 0 ? 0 : 1;
}
