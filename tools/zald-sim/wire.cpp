// Packet header encoding and stream reassembly.
#include "wire.h"

#include <cstdlib>
#include <new>

namespace sim {

namespace {

void put_be16(std::string &out, size_t at, uint16_t v) {
    out[at] = static_cast<char>(v >> 8);
    out[at + 1] = static_cast<char>(v & 0xFF);
}

void put_be32(std::string &out, size_t at, uint32_t v) {
    for (int i = 0; i < 4; ++i) out[at + i] = static_cast<char>((v >> (24 - 8 * i)) & 0xFF);
}

uint32_t get_be32(const unsigned char *p) {
    return (uint32_t{p[0]} << 24) | (uint32_t{p[1]} << 16) | (uint32_t{p[2]} << 8) | uint32_t{p[3]};
}

}  // namespace

std::string encode_header(uint16_t tid, uint8_t opcode, uint32_t payload_length) {
    std::string header(kHeaderSize, '\0');
    header[0] = static_cast<char>(kMarker);
    put_be16(header, 2, tid);
    header[4] = static_cast<char>(opcode);
    put_be32(header, 8, payload_length);
    return header;
}

std::string encode_packet(uint16_t tid, uint8_t opcode, const gval *value) {
    if (value == nullptr) return encode_header(tid, opcode, 0);
    uint32_t length = 0;
    unsigned char *encoded = serialize(value, &length);
    if (encoded == nullptr) throw std::bad_alloc();
    std::string packet = encode_header(tid, opcode, length);
    packet.append(reinterpret_cast<const char *>(encoded), length);
    free(encoded);
    return packet;
}

std::optional<Packet> PacketReader::next() {
    if (broken_ || buffer_.size() - offset_ < kHeaderSize) return std::nullopt;
    const auto *head = reinterpret_cast<const unsigned char *>(buffer_.data() + offset_);
    uint32_t length = get_be32(head + 8);
    if (length > kMaxRequestPayload) {
        broken_ = true;
        return std::nullopt;
    }
    if (buffer_.size() - offset_ - kHeaderSize < length) return std::nullopt;
    Packet packet;
    packet.tid = static_cast<uint16_t>((head[2] << 8) | head[3]);
    packet.opcode = head[4];
    packet.payload.assign(buffer_, offset_ + kHeaderSize, length);
    offset_ += kHeaderSize + length;
    // Compact once the consumed prefix dominates, so a long stream stays linear.
    if (offset_ == buffer_.size()) {
        buffer_.clear();
        offset_ = 0;
    } else if (offset_ > 65536 && offset_ * 2 > buffer_.size()) {
        buffer_.erase(0, offset_);
        offset_ = 0;
    }
    return packet;
}

}  // namespace sim
