// Track records: decoding a result of 8000 full records into the handle and reading every
// field of every track through the accessors, against decoding the same reply bytes with
// unserialize alone (and freeing the value), in the same run. Target <= 2x.
#include <android/log.h>
#include <benchmark/benchmark.h>

#include <cstdio>
#include <string>
#include <vector>

#include "bench_support.h"
#include "zal-ipod-2/handle.h"
#include "zal-ipod-2/media_db_state.h"
#include "zal-ipod-2/zal-ipod-2.h"

namespace {

constexpr int kTracks = 8000;

// The reply to GET_DB_TRACK_INFO: [count, then eight fields per track].
zalbench::Bytes encoded_reply() {
    gval *reply = serialize_array_reserve(1 + kTracks * 8);
    serialize_array_add(reply, serialize_int(kTracks));
    for (int i = 0; i < kTracks; ++i) {
        const std::string n = std::to_string(i);
        serialize_array_add(reply, serialize_int(i & 7));
        serialize_array_add(reply, serialize_string(("Track title number " + n).c_str()));
        serialize_array_add(reply, serialize_string(("Artist " + std::to_string(i / 40)).c_str()));
        serialize_array_add(reply, serialize_string(("Album " + std::to_string(i / 10)).c_str()));
        serialize_array_add(reply, serialize_string("Electronic"));
        serialize_array_add(reply,
                            serialize_string(("Composer " + std::to_string(i % 13)).c_str()));
        serialize_array_add(reply, serialize_int(180000 + i));
        unsigned char uid[8];
        for (int b = 0; b < 8; ++b)
            uid[b] = static_cast<unsigned char>((0x5100000000000000ull + i) >> (56 - 8 * b));
        serialize_array_add(reply, serialize_bytes(uid, 8));
    }
    return zalbench::encode_and_free(reply);
}

const zalbench::Bytes &reply_bytes() {
    static const zalbench::Bytes bytes = encoded_reply();
    return bytes;
}

void decode_and_read(benchmark::State &state) {
    zal_ipod_reply reply = zalbench::reply_of(reply_bytes());
    auto *h = new zal_ipod_handle();
    for (auto _ : state) {
        if (zal_db_track_info_decode(h, &reply) != 1) state.SkipWithError("decode failed");
        const gval *r = zal_ipod_get_result_db_track_info(h);
        const int count = zal_ipod_get_result_db_track_info_count(r);
        int64_t sum = 0;
        for (int i = 0; i < count; ++i) {
            int capability = 0, duration = 0;
            const char *name, *artist, *album, *genre, *composer;
            const uint8_t *uid;
            sum += zal_ipod_get_result_db_track_info_capability(r, i, &capability);
            sum += zal_ipod_get_result_db_track_info_name(r, i, &name);
            sum += zal_ipod_get_result_db_track_info_artist(r, i, &artist);
            sum += zal_ipod_get_result_db_track_info_album(r, i, &album);
            sum += zal_ipod_get_result_db_track_info_genre(r, i, &genre);
            sum += zal_ipod_get_result_db_track_info_composer(r, i, &composer);
            sum += zal_ipod_get_result_db_track_info_duration(r, i, &duration);
            sum += zal_ipod_get_result_db_track_info_uid(r, i, &uid);
            benchmark::DoNotOptimize(name);
            benchmark::DoNotOptimize(uid);
            sum += capability + duration;
        }
        benchmark::DoNotOptimize(sum);
    }
    delete h;  // frees the last result
    state.SetItemsProcessed(static_cast<int64_t>(state.iterations()) * kTracks);
}

void unserialize_only(benchmark::State &state) {
    zalbench::unserialize_and_free(state, reply_bytes(), kTracks);
}

}  // namespace

int main(int argc, char **argv) {
    __android_log_set_minimum_priority(ANDROID_LOG_WARN);
    benchmark::RegisterBenchmark("track_records/decode_and_read_all", decode_and_read)
        ->Unit(benchmark::kMillisecond);
    benchmark::RegisterBenchmark("track_records/unserialize_only", unserialize_only)
        ->Unit(benchmark::kMillisecond);
    const zalbench::Times times = zalbench::run_benchmarks(&argc, argv);
    const int missed = zalbench::print_ratios(
        times,
        {{"8000 track records vs unserialize", "track_records/decode_and_read_all",
          "track_records/unserialize_only", false, 2.0}},
        36);
    benchmark::Shutdown();
    return missed;
}
