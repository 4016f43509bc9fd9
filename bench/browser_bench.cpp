// Media browser page: caching one page of 8000 item names (12 to 40 characters) from the
// GET_ITEMS_CURRENT_CATEGORY reply and reading every name through zal_ipod_record, against
// decoding the same reply bytes with unserialize alone (and freeing the value), in the same
// run. Target <= 1.5x.
#include <android/log.h>
#include <benchmark/benchmark.h>

#include <cstdio>
#include <cstring>
#include <map>
#include <string>
#include <vector>

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
std::vector<unsigned char> encoded_reply() {
    gval *reply = serialize_array_reserve(1 + kNames);
    serialize_array_add(reply, serialize_int(kNames));
    for (int i = 0; i < kNames; ++i)
        serialize_array_add(reply, serialize_string(item_name(i).c_str()));
    uint32_t length = 0;
    unsigned char *bytes = serialize(reply, &length);
    std::vector<unsigned char> out(bytes, bytes + length);
    free(bytes);
    serialize_free(reply);
    return out;
}

const std::vector<unsigned char> &reply_bytes() {
    static const std::vector<unsigned char> bytes = encoded_reply();
    return bytes;
}

void cache_and_read(benchmark::State &state) {
    const auto &bytes = reply_bytes();
    zal_ipod_reply reply{};
    reply.opcode = ZAL_OP_RETURN;
    reply.length = static_cast<uint32_t>(bytes.size());
    reply.payload = const_cast<unsigned char *>(bytes.data());
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
    const auto &bytes = reply_bytes();
    for (auto _ : state) {
        gval *v = unserialize(bytes.data(), static_cast<uint32_t>(bytes.size()));
        benchmark::DoNotOptimize(v);
        serialize_free(v);
    }
    state.SetItemsProcessed(static_cast<int64_t>(state.iterations()) * kNames);
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
    benchmark::RegisterBenchmark("browser_page/cache_and_read_all", cache_and_read)
        ->Unit(benchmark::kMicrosecond);
    benchmark::RegisterBenchmark("browser_page/unserialize_only", unserialize_only)
        ->Unit(benchmark::kMicrosecond);
    benchmark::Initialize(&argc, argv);
    RecordingReporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
    int missed = 0;
    auto ours = reporter.times.find("browser_page/cache_and_read_all");
    auto floor = reporter.times.find("browser_page/unserialize_only");
    if (ours != reporter.times.end() && floor != reporter.times.end()) {
        const double ratio = ours->second / floor->second;
        const bool ok = ratio <= 1.5;
        printf("\n%-36s %10s %s\n", "comparison", "ratio", "target");
        printf("%-36s %9.2fx <= 1.5x %s\n", "8000 names cached vs unserialize", ratio,
               ok ? "ok" : "MISSED");
        missed = ok ? 0 : 1;
    }
    benchmark::Shutdown();
    return missed;
}
