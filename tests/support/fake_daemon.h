// A scripted stand-in for the daemon: it listens where the library connects, checks the
// exact bytes of every request against the script and answers with replies, errors and
// events (split across writes or several in one write), silence, or a dropped connection.
//
//   zaltest::FakeDaemon d;
//   d.expect(ZAL_OP_HELLO).reply(devices)          // HELLO -> device list
//    .expect(ZAL_OP_PLAY).reply(serialize_int(0));
//   zal_ipod_handle *h = zal_ipod_connect(nullptr);
//   ...
//   EXPECT_TRUE(d.finish()) << d.report();
//
// Values given to the script are owned by it. Several FakeDaemons in one process must not
// live at the same time on the same kind of endpoint.
#pragma once

#include <condition_variable>
#include <cstdint>
#include <functional>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "value_builders.h"
#include "zal-ipod-2/serialize.h"

namespace zaltest {

// Puts the test process in a private network namespace (so the daemon's fixed abstract
// socket name is ours alone, and loopback TCP works), once. Where that is not permitted,
// points the library's connect at a name unique to the process instead.
void isolate_daemon_socket();
// True when isolate_daemon_socket() got a private network namespace.
bool isolated_namespace();

// One request as the daemon read it.
struct Request {
    uint16_t tid = 0;
    uint8_t opcode = 0;
    Bytes header;
    Bytes payload;
};

// A 12-byte header and payload as the daemon writes them (payload: encoding of value).
Bytes frame(uint16_t tid, uint8_t opcode, const gval *value);
// An event packet: hash {"event": type, "session": session, "serial": serial, "data": data}
// (serial and data left out when null). Takes data.
Bytes event_frame(const char *type, gval *data, const char *serial = nullptr, int session = 1);

class FakeDaemon {
  public:
    enum class Endpoint { abstract, tcp, path };
    // Listens on the library's abstract name (default), on a TCP port of every local
    // address (`tcp_port`, or one the system picks when 0), or on a socket file at `path`.
    explicit FakeDaemon(Endpoint endpoint = Endpoint::abstract, const std::string &path = "",
                        int tcp_port = 0);
    ~FakeDaemon();
    FakeDaemon(const FakeDaemon &) = delete;
    FakeDaemon &operator=(const FakeDaemon &) = delete;

    int port() const { return port_; }

    // Script steps, run in order on the daemon's thread once a client connected.
    // The next request must have this opcode and payload (the encoding of value, or none).
    FakeDaemon &expect(uint8_t opcode, gval *value = nullptr);
    // RETURN / ERROR for the last expected request, with the encoding of value (or none).
    FakeDaemon &reply(gval *value);
    FakeDaemon &error(gval *value);
    // An event packet (see event_frame).
    FakeDaemon &event(const char *type, gval *data, const char *serial = nullptr, int session = 1);
    // Arbitrary bytes in one write; `make` gets the tid of the last expected request.
    FakeDaemon &send(std::function<Bytes(uint16_t last_tid)> make);
    // Bytes in several writes: the pieces are written apart, `gap_ms` between them.
    FakeDaemon &send_split(std::function<Bytes(uint16_t last_tid)> make,
                           std::vector<std::size_t> cuts, int gap_ms = 20);
    FakeDaemon &sleep(int ms);
    // Closes the connection; the next step (if any) waits for a new one.
    FakeDaemon &drop();
    // Answers every further request with handler(request) until stopped (concurrency tests).
    FakeDaemon &serve(std::function<Bytes(const Request &)> handler);

    // Waits (up to timeout_ms) until the script ran to its end; false if it did not or a
    // request differed from the script.
    bool finish(int timeout_ms = 10000);
    // What went wrong, for the test's failure message.
    std::string report() const;
    // Every request read so far, scripted or not.
    std::vector<Request> requests() const;
    // Writes bytes on the current connection from the test's thread.
    void write_now(const Bytes &bytes);

  private:
    struct Step {
        enum Kind { expect, write, sleep, drop, serve } kind = expect;
        uint8_t opcode = 0;
        bool has_payload = false;
        Bytes payload;
        std::function<Bytes(uint16_t)> make;
        std::vector<std::size_t> cuts;
        int ms = 0;
        std::function<Bytes(const Request &)> handler;
    };
    FakeDaemon &add(Step step);
    void run();
    void run_step(Step &step);
    bool ensure_client();
    // 1: a request was read; 0: nothing within timeout_ms; -1: the client went away.
    int read_request(Request &out, int timeout_ms);
    void fail(const std::string &what);
    void write_all(const Bytes &bytes);
    bool stopping();

    int listener_ = -1;
    int client_ = -1;
    int port_ = 0;
    std::string path_;
    std::thread thread_;
    mutable std::mutex lock_;
    std::condition_variable changed_;
    std::vector<Step> steps_;
    std::size_t next_step_ = 0;
    bool busy_ = false;
    bool stop_ = false;
    std::vector<Request> requests_;
    std::vector<std::string> failures_;
    uint16_t last_tid_ = 0;
    std::mutex write_lock_;
};

}  // namespace zaltest
