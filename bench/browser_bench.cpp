// Media browser page: caching one page of 8000 item names (12 to 40 characters) from the
// GET_ITEMS_CURRENT_CATEGORY reply and reading every name through zal_ipod_record, against
// decoding the same reply bytes with unserialize alone (and freeing the value), in the same
// run. Target <= 1.5x.
#include <android/log.h>
#include <benchmark/benchmark.h>

#include <string>

#include "bench_support.h"
#include "zal-ipod-2/browser_state.h"
#include "zal-ipod-2/handle.h"
#include "zal-ipod-2/zal-ipod-2.h"

namespace {

constexpr int kNames = 8000;

// A name of 12 to 40 characters, different for each item.
std::string item_name(int i) {
    std::string name = "Item " + std::to_string(i) + " ";
    const size_t length = 12 + static_cast<size_t>((i * 7919) % 29);
    while (name.size() < length) name += static_cast<char>('a' + (i + name.size()) % 26);
    name.resize(length);
    return name;
}

// The reply: [total, names...].
zalbench::Bytes encoded_reply() {
    gval *reply = serialize_array_reserve(1 + kNames);
    serialize_array_add(reply, serialize_int(kNames));
    for (int i = 0; i < kNames; ++i)
        serialize_array_add(reply, serialize_string(item_name(i).c_str()));
    return zalbench::encode_and_free(reply);
}

const zalbench::Bytes &reply_bytes() {
    static const zalbench::Bytes bytes = encoded_reply();
    return bytes;
}

void cache_and_read(benchmark::State &state) {
    zal_ipod_reply reply = zalbench::reply_of(reply_bytes());
    auto *h = new zal_ipod_handle();
    for (auto _ : state) {
        if (zal_browser_cache_items(h, &reply, 0) != kNames + 1)
            state.SkipWithError("cache failed");
        size_t total = 0;
        for (int i = 0; i < kNames; ++i) {
            const char *name = zal_ipod_record(h, i);
            benchmark::DoNotOptimize(name);
            total += name[0] != '\0' ? 1 : 0;
        }
        if (total != kNames) state.SkipWithError("a name is missing");
    }
    delete h;  // frees the last cache
    state.SetItemsProcessed(static_cast<int64_t>(state.iterations()) * kNames);
}

void unserialize_only(benchmark::State &state) {
    zalbench::unserialize_and_free(state, reply_bytes(), kNames);
}

}  // namespace

int main(int argc, char **argv) {
    __android_log_set_minimum_priority(ANDROID_LOG_WARN);
    benchmark::RegisterBenchmark("browser_page/cache_and_read_all", cache_and_read)
        ->Unit(benchmark::kMicrosecond);
    benchmark::RegisterBenchmark("browser_page/unserialize_only", unserialize_only)
        ->Unit(benchmark::kMicrosecond);
    const zalbench::Times times = zalbench::run_benchmarks(&argc, argv);
    const int missed = zalbench::print_ratios(
        times,
        {{"8000 names cached vs unserialize", "browser_page/cache_and_read_all",
          "browser_page/unserialize_only", false, 1.5}},
        36);
    benchmark::Shutdown();
    return missed;
}
