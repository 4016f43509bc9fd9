// A minimal protocol client for tests that talk to a daemon byte by byte: it frames requests
// with the 12-byte header, reassembles packets, and sorts what arrives into replies and
// events.
#pragma once

#include <cstdint>
#include <deque>
#include <memory>
#include <optional>
#include <string>

#include "zal-ipod-2/serialize.h"

namespace zaltest {

struct ValueFree {
    void operator()(gval *v) const { serialize_free(v); }
};
using Value = std::unique_ptr<gval, ValueFree>;

struct RawPacket {
    uint16_t tid = 0;
    uint8_t opcode = 0;
    std::string payload;
    // The decoded payload (null without one, or when it does not decode).
    Value value() const;
    // For events: the "event" text of the payload hash.
    std::string event_type() const;
    // The integer under key of a hash payload, or fallback.
    int32_t int_at(const char *key, int32_t fallback = -9999) const;
};

class RawClient {
  public:
    RawClient() = default;
    ~RawClient();
    RawClient(const RawClient &) = delete;
    RawClient &operator=(const RawClient &) = delete;

    bool connect_abstract(const std::string &name);
    bool connect_tcp(int port);
    bool connect_path(const std::string &path);

    // Sends a request (payload may be null) and returns its transaction id.
    uint16_t send(uint8_t opcode, const gval *payload = nullptr);
    bool send_raw(const std::string &bytes);

    // The next packet from the socket (or from what was set aside), within timeout_ms.
    std::optional<RawPacket> next(int timeout_ms = 5000);
    // The reply (RETURN or ERROR) to tid; events met on the way are kept for wait_event.
    std::optional<RawPacket> reply(uint16_t tid, int timeout_ms = 5000);
    // The first event of this type; other events before it are dropped, replies kept.
    std::optional<RawPacket> event(const std::string &type, int timeout_ms = 5000);
    // True when the daemon closed the connection within timeout_ms (packets before the
    // close are kept).
    bool closed(int timeout_ms = 5000);
    // Sends and waits; convenience for the common case.
    std::optional<RawPacket> call(uint8_t opcode, const gval *payload = nullptr,
                                  int timeout_ms = 5000);

  private:
    std::optional<RawPacket> read_packet(int timeout_ms);

    int fd_ = -1;
    uint16_t last_tid_ = 0;
    std::string buffer_;
    bool eof_ = false;
    std::deque<RawPacket> replies_;
    std::deque<RawPacket> events_;
};

}  // namespace zaltest
