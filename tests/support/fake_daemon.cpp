// The scripted fake daemon (see fake_daemon.h).
#include "fake_daemon.h"

#include <arpa/inet.h>
#include <net/if.h>
#include <netinet/in.h>
#include <poll.h>
#include <sched.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstring>
#include <sstream>

#include "zal-ipod-2/connection.h"
#include "zal-ipod-2/opcodes.h"

namespace zaltest {

namespace {

void bring_loopback_up() {
    int so = socket(AF_INET, SOCK_DGRAM, 0);
    if (so < 0) return;
    struct ifreq request = {};
    strncpy(request.ifr_name, "lo", IFNAMSIZ - 1);
    if (ioctl(so, SIOCGIFFLAGS, &request) == 0) {
        request.ifr_flags = static_cast<short>(request.ifr_flags | IFF_UP);
        ioctl(so, SIOCSIFFLAGS, &request);
    }
    close(so);
}

Bytes header(uint16_t tid, uint8_t opcode, uint32_t length) {
    return {0xFE,
            0,
            static_cast<unsigned char>(tid >> 8),
            static_cast<unsigned char>(tid),
            opcode,
            0,
            0,
            0,
            static_cast<unsigned char>(length >> 24),
            static_cast<unsigned char>(length >> 16),
            static_cast<unsigned char>(length >> 8),
            static_cast<unsigned char>(length)};
}

Bytes frame_of(uint16_t tid, uint8_t opcode, const Bytes &payload) {
    Bytes out = header(tid, opcode, static_cast<uint32_t>(payload.size()));
    out.insert(out.end(), payload.begin(), payload.end());
    return out;
}

Bytes take_encoding(gval *value) {
    Bytes out = value != nullptr ? encode(value) : Bytes{};
    serialize_free(value);
    return out;
}

std::string hex_of(const Bytes &b) {
    std::ostringstream out;
    for (unsigned char c : b) {
        char text[4];
        snprintf(text, sizeof text, "%02x ", c);
        out << text;
    }
    return out.str();
}

}  // namespace

namespace {
bool in_private_namespace = false;
}

bool isolated_namespace() {
    return in_private_namespace;
}

void isolate_daemon_socket() {
    static std::once_flag once;
    std::call_once(once, [] {
        if (unshare(CLONE_NEWNET) == 0) {
            in_private_namespace = true;
            bring_loopback_up();
            return;
        }
        static char name[64];
        snprintf(name, sizeof name, "zal.ipod.IPodDaemon.test.%d", static_cast<int>(getpid()));
        zal_set_daemon_socket_name(name);
        fprintf(stderr, "fake daemon: no private network namespace (%s); using \"%s\"\n",
                strerror(errno), name);
    });
}

Bytes frame(uint16_t tid, uint8_t opcode, const gval *value) {
    return frame_of(tid, opcode, value != nullptr ? encode(value) : Bytes{});
}

Bytes event_frame(const char *type, gval *data, const char *serial, int session) {
    gval *h = serialize_hash();
    serialize_hash_add(h, "event", serialize_string(type));
    serialize_hash_add(h, "session", serialize_int(session));
    if (serial != nullptr) serialize_hash_add(h, "serial", serialize_string(serial));
    if (data != nullptr) serialize_hash_add(h, "data", data);
    Bytes out = frame(0, ZAL_OP_EVENT, h);
    serialize_free(h);
    return out;
}

FakeDaemon::FakeDaemon(Endpoint endpoint, const std::string &path, int tcp_port) : path_(path) {
    isolate_daemon_socket();
    if (endpoint == Endpoint::tcp) {
        listener_ = socket(AF_INET, SOCK_STREAM, 0);
        int on = 1;
        setsockopt(listener_, SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
        struct sockaddr_in address = {};
        address.sin_family = AF_INET;
        address.sin_addr.s_addr = htonl(INADDR_ANY);
        address.sin_port = htons(static_cast<uint16_t>(tcp_port));
        if (bind(listener_, reinterpret_cast<struct sockaddr *>(&address), sizeof address) != 0)
            failures_.push_back(std::string("bind: ") + strerror(errno));
        socklen_t size = sizeof address;
        getsockname(listener_, reinterpret_cast<struct sockaddr *>(&address), &size);
        port_ = ntohs(address.sin_port);
    } else {
        listener_ = socket(AF_UNIX, SOCK_STREAM, 0);
        struct sockaddr_un address = {};
        address.sun_family = AF_UNIX;
        socklen_t size;
        if (endpoint == Endpoint::abstract) {
            const char *name = zal_daemon_socket_name();
            memcpy(address.sun_path + 1, name, strlen(name));
            size =
                static_cast<socklen_t>(offsetof(struct sockaddr_un, sun_path) + 1 + strlen(name));
        } else {
            unlink(path.c_str());
            memcpy(address.sun_path, path.c_str(), path.size());
            size = static_cast<socklen_t>(offsetof(struct sockaddr_un, sun_path) + path.size() + 1);
        }
        if (bind(listener_, reinterpret_cast<struct sockaddr *>(&address), size) != 0)
            failures_.push_back(std::string("bind: ") + strerror(errno));
    }
    listen(listener_, 4);
    thread_ = std::thread([this] { run(); });
}

FakeDaemon::~FakeDaemon() {
    {
        std::lock_guard<std::mutex> hold(lock_);
        stop_ = true;
    }
    changed_.notify_all();
    thread_.join();
    if (client_ >= 0) close(client_);
    close(listener_);
    if (!path_.empty()) unlink(path_.c_str());
}

FakeDaemon &FakeDaemon::add(Step step) {
    {
        std::lock_guard<std::mutex> hold(lock_);
        steps_.push_back(std::move(step));
    }
    changed_.notify_all();
    return *this;
}

FakeDaemon &FakeDaemon::expect(uint8_t opcode, gval *value) {
    Step s;
    s.kind = Step::expect;
    s.opcode = opcode;
    s.has_payload = value != nullptr;
    s.payload = take_encoding(value);
    return add(std::move(s));
}

FakeDaemon &FakeDaemon::reply(gval *value) {
    Bytes payload = take_encoding(value);
    return send([payload](uint16_t tid) { return frame_of(tid, ZAL_OP_RETURN, payload); });
}

FakeDaemon &FakeDaemon::error(gval *value) {
    Bytes payload = take_encoding(value);
    return send([payload](uint16_t tid) { return frame_of(tid, ZAL_OP_ERROR, payload); });
}

FakeDaemon &FakeDaemon::event(const char *type, gval *data, const char *serial, int session) {
    Bytes bytes = event_frame(type, data, serial, session);
    return send([bytes](uint16_t) { return bytes; });
}

FakeDaemon &FakeDaemon::send(std::function<Bytes(uint16_t)> make) {
    return send_split(std::move(make), {}, 0);
}

FakeDaemon &FakeDaemon::send_split(std::function<Bytes(uint16_t)> make,
                                   std::vector<std::size_t> cuts, int gap_ms) {
    Step s;
    s.kind = Step::write;
    s.make = std::move(make);
    s.cuts = std::move(cuts);
    s.ms = gap_ms;
    return add(std::move(s));
}

FakeDaemon &FakeDaemon::sleep(int ms) {
    Step s;
    s.kind = Step::sleep;
    s.ms = ms;
    return add(std::move(s));
}

FakeDaemon &FakeDaemon::drop() {
    Step s;
    s.kind = Step::drop;
    return add(std::move(s));
}

FakeDaemon &FakeDaemon::serve(std::function<Bytes(const Request &)> handler) {
    Step s;
    s.kind = Step::serve;
    s.handler = std::move(handler);
    return add(std::move(s));
}

bool FakeDaemon::stopping() {
    std::lock_guard<std::mutex> hold(lock_);
    return stop_;
}

void FakeDaemon::fail(const std::string &what) {
    std::lock_guard<std::mutex> hold(lock_);
    failures_.push_back(what);
}

bool FakeDaemon::ensure_client() {
    while (client_ < 0) {
        if (stopping()) return false;
        struct pollfd waiter = {listener_, POLLIN, 0};
        if (poll(&waiter, 1, 20) > 0) client_ = accept(listener_, nullptr, nullptr);
    }
    return true;
}

int FakeDaemon::read_request(Request &out, int timeout_ms) {
    auto read_exact = [this](unsigned char *p, std::size_t n, int wait_ms) -> int {
        std::size_t got = 0;
        auto deadline = std::chrono::steady_clock::now() + std::chrono::milliseconds(wait_ms);
        while (got < n) {
            struct pollfd waiter = {client_, POLLIN, 0};
            if (poll(&waiter, 1, 20) == 0) {
                if (stopping() || std::chrono::steady_clock::now() > deadline) return got ? -1 : 0;
                continue;
            }
            ssize_t r = ::read(client_, p + got, n - got);
            if (r <= 0) return -1;
            got += static_cast<std::size_t>(r);
        }
        return 1;
    };
    out.header.assign(12, 0);
    int r = read_exact(out.header.data(), 12, timeout_ms);
    if (r <= 0) return r;
    uint32_t length = (uint32_t{out.header[8]} << 24) | (uint32_t{out.header[9]} << 16) |
                      (uint32_t{out.header[10]} << 8) | out.header[11];
    out.tid = static_cast<uint16_t>((out.header[2] << 8) | out.header[3]);
    out.opcode = out.header[4];
    out.payload.assign(length, 0);
    if (length > 0 && read_exact(out.payload.data(), length, 5000) <= 0) return -1;
    std::lock_guard<std::mutex> hold(lock_);
    requests_.push_back(out);
    return 1;
}

void FakeDaemon::write_all(const Bytes &bytes) {
    std::lock_guard<std::mutex> hold(write_lock_);
    std::size_t done = 0;
    while (done < bytes.size()) {
        ssize_t n = ::send(client_, bytes.data() + done, bytes.size() - done, MSG_NOSIGNAL);
        if (n <= 0) {
            if (errno == EAGAIN || errno == EINTR) continue;
            fail(std::string("write: ") + strerror(errno));
            return;
        }
        done += static_cast<std::size_t>(n);
    }
}

void FakeDaemon::write_now(const Bytes &bytes) {
    write_all(bytes);
}

void FakeDaemon::run_step(Step &step) {
    switch (step.kind) {
        case Step::expect: {
            Request request;
            int r = read_request(request, 10000);
            if (r <= 0) {
                fail("expected opcode " + std::to_string(step.opcode) + ", got " +
                     (r == 0 ? "nothing" : "a closed connection"));
                return;
            }
            last_tid_ = request.tid;
            Bytes want =
                header(request.tid, step.opcode, static_cast<uint32_t>(step.payload.size()));
            if (request.header != want || request.payload != step.payload)
                fail("request differs: want " + hex_of(want) + "| " + hex_of(step.payload) +
                     " got " + hex_of(request.header) + "| " + hex_of(request.payload));
            return;
        }
        case Step::write: {
            Bytes bytes = step.make(last_tid_);
            std::size_t from = 0;
            for (std::size_t cut : step.cuts) {
                write_all(Bytes(bytes.begin() + static_cast<long>(from),
                                bytes.begin() + static_cast<long>(cut)));
                std::this_thread::sleep_for(std::chrono::milliseconds(step.ms));
                from = cut;
            }
            write_all(Bytes(bytes.begin() + static_cast<long>(from), bytes.end()));
            return;
        }
        case Step::sleep:
            std::this_thread::sleep_for(std::chrono::milliseconds(step.ms));
            return;
        case Step::drop:
            close(client_);
            client_ = -1;
            return;
        case Step::serve:
            while (!stopping()) {
                Request request;
                int r = read_request(request, 50);
                if (r < 0) return;
                if (r == 1) {
                    Bytes out = step.handler(request);
                    if (!out.empty()) write_all(out);
                }
            }
            return;
    }
}

void FakeDaemon::run() {
    for (;;) {
        Step step;
        {
            std::unique_lock<std::mutex> hold(lock_);
            changed_.wait(hold, [this] { return stop_ || next_step_ < steps_.size(); });
            if (next_step_ >= steps_.size()) return;  // stopped with nothing left
            step = steps_[next_step_];
            busy_ = true;
        }
        if (ensure_client()) run_step(step);
        {
            std::lock_guard<std::mutex> hold(lock_);
            ++next_step_;
            busy_ = false;
            if (stop_ && next_step_ >= steps_.size()) {
                changed_.notify_all();
                return;
            }
        }
        changed_.notify_all();
    }
}

bool FakeDaemon::finish(int timeout_ms) {
    std::unique_lock<std::mutex> hold(lock_);
    bool ran = changed_.wait_for(hold, std::chrono::milliseconds(timeout_ms),
                                 [this] { return next_step_ >= steps_.size() && !busy_; });
    if (!ran) failures_.push_back("script did not run to its end");
    hold.unlock();
    // Anything the library wrote beyond the script is a failure too.
    if (client_ >= 0) {
        struct pollfd waiter = {client_, POLLIN, 0};
        if (poll(&waiter, 1, 0) > 0) {
            unsigned char byte;
            if (recv(client_, &byte, 1, MSG_PEEK | MSG_DONTWAIT) == 1)
                fail("unexpected bytes from the library");
        }
    }
    hold.lock();
    return failures_.empty();
}

std::string FakeDaemon::report() const {
    std::lock_guard<std::mutex> hold(lock_);
    std::string out;
    for (const auto &f : failures_) out += f + "\n";
    return out;
}

std::vector<Request> FakeDaemon::requests() const {
    std::lock_guard<std::mutex> hold(lock_);
    return requests_;
}

}  // namespace zaltest
