// Packet layer: the 12-byte header, transaction ids, the sender, the reader that
// reassembles packets into reply records on the handle's queue, and the wait for a reply.
#pragma once

#include <cstddef>
#include <cstdint>

#include "zal-ipod-2/handle.h"

constexpr std::size_t kPacketHeaderSize = 12;
constexpr unsigned char kPacketMarker = 0xFE;
// Largest payload the reader accepts. A header announcing more means the stream lost its
// framing (or the peer is hostile): the connection is dropped and made again.
constexpr uint32_t kMaxPayloadLength = 64u * 1024u * 1024u;
// Bytes taken by one read.
constexpr std::size_t kReadChunk = 65536;
// Longest the reader blocks waiting for bytes.
constexpr int kReadPollMillis = 500;

// Fills header[12] for a packet.
void zal_packet_header(unsigned char *header, uint16_t tid, uint16_t opcode, uint32_t length);

// A zero-filled record (payload added separately, with malloc) or one that carries a copy
// of payload in the same block; reply_record_free releases either kind.
zal_ipod_reply *reply_record_new();
zal_ipod_reply *reply_record_with_payload(const unsigned char *payload, uint32_t length);
void reply_record_free(zal_ipod_reply *reply);

// Writes all bytes; -1 on failure (logged "send error: ..."). Never raises SIGPIPE.
int safesend(int fd, const void *bytes, std::size_t size);

// One reader pass: number of records queued, or -1 when the connection failed.
int zal_ipod_receive(zal_ipod_handle *h);
// Waits for the reply to tid; the caller releases the record.
zal_ipod_reply *zal_ipod_wait_for_tid_ex(zal_ipod_handle *h, uint16_t tid);

// Closes the socket and marks the handle disconnected. Call with read_lock held.
void zal_connection_drop_locked(zal_ipod_handle *h);
// Installs a freshly connected socket (takes both locks).
void zal_connection_install(zal_ipod_handle *h, int fd, int is_remote);
