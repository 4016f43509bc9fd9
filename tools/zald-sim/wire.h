// Packet framing on the daemon side: the 12-byte header (marker 0xFE, reserved byte,
// big-endian 16-bit transaction id, opcode byte, three reserved bytes, big-endian 32-bit
// payload length) followed by one encoded value or nothing.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "zal-ipod-2/serialize.h"

namespace sim {

constexpr size_t kHeaderSize = 12;
constexpr uint8_t kMarker = 0xFE;
// Requests above this are treated as a broken stream; nothing a client sends comes close.
constexpr uint32_t kMaxRequestPayload = 16u * 1024 * 1024;

struct Packet {
    uint16_t tid = 0;
    uint8_t opcode = 0;
    std::string payload;  // still encoded; empty when the packet has none
};

std::string encode_header(uint16_t tid, uint8_t opcode, uint32_t payload_length);
// Header plus the encoding of value (no payload when value is null).
std::string encode_packet(uint16_t tid, uint8_t opcode, const gval *value);

// Reassembles packets from a byte stream.
class PacketReader {
  public:
    void feed(const char *bytes, size_t count) { buffer_.append(bytes, count); }
    // The next whole packet, or nothing when more bytes are needed. Sets broken() when a
    // header announces more than kMaxRequestPayload.
    std::optional<Packet> next();
    bool broken() const { return broken_; }

  private:
    std::string buffer_;
    size_t offset_ = 0;
    bool broken_ = false;
};

}  // namespace sim
