// Framing, reassembly and sorting of packets for the raw test client.
#include "raw_client.h"

#include <arpa/inet.h>
#include <cutils/sockets.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <chrono>
#include <cstring>

namespace zaltest {

namespace {

constexpr uint8_t kEvent = 2;

using Clock = std::chrono::steady_clock;

int remaining_ms(Clock::time_point deadline) {
    auto left =
        std::chrono::duration_cast<std::chrono::milliseconds>(deadline - Clock::now()).count();
    return left > 0 ? static_cast<int>(left) : 0;
}

}  // namespace

Value RawPacket::value() const {
    if (payload.empty()) return nullptr;
    return Value(unserialize(reinterpret_cast<const unsigned char *>(payload.data()),
                             static_cast<uint32_t>(payload.size())));
}

std::string RawPacket::event_type() const {
    Value v = value();
    if (!v || serialize_type(v.get()) != SERIALIZE_HASH) return "";
    gval *type = serialize_hash_get(v.get(), "event");
    return type && serialize_type(type) == SERIALIZE_STRING ? serialize_get_string(type) : "";
}

int32_t RawPacket::int_at(const char *key, int32_t fallback) const {
    Value v = value();
    if (!v || serialize_type(v.get()) != SERIALIZE_HASH) return fallback;
    gval *item = serialize_hash_get(v.get(), key);
    return item && serialize_type(item) == SERIALIZE_INT ? serialize_get_int(item) : fallback;
}

RawClient::~RawClient() {
    if (fd_ >= 0) close(fd_);
}

bool RawClient::connect_abstract(const std::string &name) {
    fd_ = socket_local_client(name.c_str(), ANDROID_SOCKET_NAMESPACE_ABSTRACT, SOCK_STREAM);
    return fd_ >= 0;
}

bool RawClient::connect_tcp(int port) {
    fd_ = socket(AF_INET, SOCK_STREAM, 0);
    sockaddr_in addr{};
    addr.sin_family = AF_INET;
    addr.sin_port = htons(static_cast<uint16_t>(port));
    addr.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    return fd_ >= 0 && connect(fd_, reinterpret_cast<sockaddr *>(&addr), sizeof addr) == 0;
}

bool RawClient::connect_path(const std::string &path) {
    fd_ = socket(AF_UNIX, SOCK_STREAM, 0);
    sockaddr_un addr{};
    addr.sun_family = AF_UNIX;
    strncpy(addr.sun_path, path.c_str(), sizeof addr.sun_path - 1);
    return fd_ >= 0 && connect(fd_, reinterpret_cast<sockaddr *>(&addr), sizeof addr) == 0;
}

uint16_t RawClient::send(uint8_t opcode, const gval *payload) {
    last_tid_ = static_cast<uint16_t>(last_tid_ % 65534 + 1);
    uint32_t length = 0;
    unsigned char *encoded = payload ? serialize(payload, &length) : nullptr;
    std::string packet(12, '\0');
    packet[0] = static_cast<char>(0xFE);
    packet[2] = static_cast<char>(last_tid_ >> 8);
    packet[3] = static_cast<char>(last_tid_ & 0xFF);
    packet[4] = static_cast<char>(opcode);
    for (int i = 0; i < 4; ++i) packet[8 + i] = static_cast<char>((length >> (24 - 8 * i)) & 0xFF);
    if (encoded) packet.append(reinterpret_cast<char *>(encoded), length);
    free(encoded);
    send_raw(packet);
    return last_tid_;
}

bool RawClient::send_raw(const std::string &bytes) {
    size_t done = 0;
    while (done < bytes.size()) {
        ssize_t n = ::send(fd_, bytes.data() + done, bytes.size() - done, MSG_NOSIGNAL);
        if (n <= 0) return false;
        done += static_cast<size_t>(n);
    }
    return true;
}

std::optional<RawPacket> RawClient::read_packet(int timeout_ms) {
    const auto deadline = Clock::now() + std::chrono::milliseconds(timeout_ms);
    for (;;) {
        if (buffer_.size() >= 12) {
            const auto *h = reinterpret_cast<const unsigned char *>(buffer_.data());
            const uint32_t length =
                (uint32_t{h[8]} << 24) | (uint32_t{h[9]} << 16) | (uint32_t{h[10]} << 8) | h[11];
            if (buffer_.size() - 12 >= length) {
                RawPacket p;
                p.tid = static_cast<uint16_t>((h[2] << 8) | h[3]);
                p.opcode = h[4];
                p.payload = buffer_.substr(12, length);
                buffer_.erase(0, 12 + length);
                return p;
            }
        }
        if (eof_ || fd_ < 0) return std::nullopt;
        pollfd pfd{fd_, POLLIN, 0};
        if (poll(&pfd, 1, remaining_ms(deadline)) <= 0) return std::nullopt;
        char chunk[65536];
        ssize_t n = read(fd_, chunk, sizeof chunk);
        if (n <= 0) {
            eof_ = true;
            continue;
        }
        buffer_.append(chunk, static_cast<size_t>(n));
    }
}

std::optional<RawPacket> RawClient::next(int timeout_ms) {
    if (!replies_.empty()) {
        RawPacket p = std::move(replies_.front());
        replies_.pop_front();
        return p;
    }
    if (!events_.empty()) {
        RawPacket p = std::move(events_.front());
        events_.pop_front();
        return p;
    }
    return read_packet(timeout_ms);
}

std::optional<RawPacket> RawClient::reply(uint16_t tid, int timeout_ms) {
    for (auto it = replies_.begin(); it != replies_.end(); ++it) {
        if (it->tid == tid) {
            RawPacket p = std::move(*it);
            replies_.erase(it);
            return p;
        }
    }
    const auto deadline = Clock::now() + std::chrono::milliseconds(timeout_ms);
    while (auto p = read_packet(remaining_ms(deadline))) {
        if (p->opcode == kEvent && p->tid == 0)
            events_.push_back(std::move(*p));
        else if (p->tid == tid)
            return p;
        else
            replies_.push_back(std::move(*p));
    }
    return std::nullopt;
}

std::optional<RawPacket> RawClient::event(const std::string &type, int timeout_ms) {
    while (!events_.empty()) {
        RawPacket p = std::move(events_.front());
        events_.pop_front();
        if (p.event_type() == type) return p;
    }
    const auto deadline = Clock::now() + std::chrono::milliseconds(timeout_ms);
    while (auto p = read_packet(remaining_ms(deadline))) {
        if (p->opcode != kEvent || p->tid != 0)
            replies_.push_back(std::move(*p));
        else if (p->event_type() == type)
            return p;
    }
    return std::nullopt;
}

bool RawClient::closed(int timeout_ms) {
    const auto deadline = Clock::now() + std::chrono::milliseconds(timeout_ms);
    while (!eof_) {
        auto p = read_packet(remaining_ms(deadline));
        if (p) {
            (p->opcode == kEvent ? events_ : replies_).push_back(std::move(*p));
        } else if (!eof_) {
            return false;  // time is up
        }
    }
    return true;
}

std::optional<RawPacket> RawClient::call(uint8_t opcode, const gval *payload, int timeout_ms) {
    return reply(send(opcode, payload), timeout_ms);
}

}  // namespace zaltest
