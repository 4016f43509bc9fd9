// What the benchmark programs share: a minimal daemon on a private socket with the raw
// socket helpers of the floors measured against it, and the run that records every
// benchmark's time for the ratio table printed after the console report.
#pragma once

#include <benchmark/benchmark.h>

#include <cstddef>
#include <cstdint>
#include <map>
#include <string>
#include <thread>
#include <vector>

#include "zal-ipod-2/serialize.h"
#include "zal-ipod-2/zal-ipod-2.h"

namespace zalbench {

using Bytes = std::vector<unsigned char>;

// One packet: header with tid and opcode, then the encoded value (none when null).
Bytes frame(uint16_t tid, uint8_t opcode, const gval *value);

// The encoding of value, which is freed.
Bytes encode_and_free(gval *value);

// A reply record (opcode RETURN) whose payload is bytes, which must outlive it.
zal_ipod_reply reply_of(const Bytes &bytes);

// The floor of the decoders' benchmarks: unserialize the bytes and free the value, per
// iteration; items_per_iteration is reported as the items processed.
void unserialize_and_free(benchmark::State &state, const Bytes &bytes, int64_t items_per_iteration);

bool read_exact(int fd, unsigned char *p, std::size_t n);
bool write_all(int fd, const unsigned char *p, std::size_t n);
// Same wait as the library's reader: poll, then read what is there.
bool poll_read(int fd, unsigned char *p, std::size_t n);

// A daemon that answers HELLO with an empty list and every other request with `answer`
// (its first 12 bytes' tid patched to the request's), for one client at a time. Points the
// library at its socket name.
class MiniDaemon {
  public:
    explicit MiniDaemon(Bytes answer);
    ~MiniDaemon();
    MiniDaemon(const MiniDaemon &) = delete;
    MiniDaemon &operator=(const MiniDaemon &) = delete;
    // A raw client connected like the library (socket file in the abstract namespace).
    int connect_raw() const;

  private:
    void serve();
    Bytes answer_;
    std::string name_;
    int listener_ = -1;
    std::thread thread_;
};

// The floor of a request and its reply: a MiniDaemon answering `answer`, and per iteration
// `request` written and the whole reply read over a raw socket, the way the library's reader
// reads (poll, then what is there).
void raw_round_trips(benchmark::State &state, const Bytes &request, const Bytes &answer);

// Time per iteration (real time, in each benchmark's unit) by benchmark name.
using Times = std::map<std::string, double>;

// Initializes Google Benchmark from the command line, runs the registered benchmarks with
// the console report and returns the times of the runs that did not fail.
Times run_benchmarks(int *argc, char **argv);

// A row of the ratio table: `ours` against the `floor` measured in the same run. A time
// ratio (ours / floor) must stay at or under the target; a rate ratio (floor / ours) at or
// over it. A target of 0 shows the ratio for information only.
struct Ratio {
    const char *name, *ours, *floor;
    bool rate;
    double target;
};

// Prints the table (rows whose runs are missing are left out); returns how many missed.
int print_ratios(const Times &times, const std::vector<Ratio> &rows, int width = 28);

}  // namespace zalbench
