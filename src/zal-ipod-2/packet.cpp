// Packet layer: sender, reader with reassembly, and the wait for one transaction's reply.
#include "zal-ipod-2/packet.h"

#include <poll.h>
#include <sys/socket.h>
#include <sys/uio.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <ctime>

#include "common/log.h"
#include "zal-ipod-2/connection.h"
#include "zal-ipod-2/dispatch.h"
#include "zal-ipod-2/opcodes.h"

namespace {

uint16_t next_tid(uint16_t last) {
    uint16_t next = static_cast<uint16_t>(last + 1);
    if (next == 0) next = static_cast<uint16_t>(last + 2);
    if (next == 0xFFFF) next = 1;
    return next;
}

uint32_t read_be32(const unsigned char *p) {
    return (uint32_t{p[0]} << 24) | (uint32_t{p[1]} << 16) | (uint32_t{p[2]} << 8) | p[3];
}

uint32_t now_seconds() {
    return static_cast<uint32_t>(time(nullptr));
}

// Makes room for `extra` more bytes after the unconsumed data. Growth is geometric, so a
// reply of n bytes costs O(n) copies in total however many reads bring it.
bool rx_reserve(zal_ipod_handle *h, uint32_t extra) {
    uint64_t need = uint64_t{h->rx_length} + extra;
    if (need <= h->rx_capacity) return true;
    uint64_t capacity = h->rx_capacity ? h->rx_capacity : kReadChunk;
    while (capacity < need) capacity *= 2;
    auto *grown = static_cast<unsigned char *>(realloc(h->rx_buffer, capacity));
    if (grown == nullptr) return false;
    h->rx_buffer = grown;
    h->rx_capacity = static_cast<uint32_t>(capacity);
    return true;
}

// Appends a chain of count records (first .. last) under one holding of send_lock.
void queue_append(zal_ipod_handle *h, zal_ipod_reply *first, zal_ipod_reply *last, int count) {
    if (count == 0) return;
    pthread_mutex_lock(&h->send_lock);
    h->queue_tail->next = first;
    h->queue_tail = last;
    h->queue_count.fetch_add(count);
    pthread_mutex_unlock(&h->send_lock);
}

// Splits whole packets off the front of rx_buffer onto the queue. Returns the number
// queued, or -1 when a header announces an impossible length.
int split_packets(zal_ipod_handle *h) {
    int queued = 0;
    uint32_t pos = 0;
    zal_ipod_reply *first = nullptr;
    zal_ipod_reply *last = nullptr;
    bool broken = false;
    while (h->rx_length - pos >= kPacketHeaderSize) {
        const unsigned char *p = h->rx_buffer + pos;
        uint32_t length = read_be32(p + 8);
        if (length > kMaxPayloadLength) {
            // The whole packets before it are still queued; the caller drops the stream.
            broken = true;
            break;
        }
        if (length > h->rx_length - pos - kPacketHeaderSize) {
            // Reserve the whole packet now: the reads that complete it append in place.
            rx_reserve(h, length - (h->rx_length - pos - static_cast<uint32_t>(kPacketHeaderSize)));
            break;
        }
        uint16_t tid = static_cast<uint16_t>((p[2] << 8) | p[3]);
        pos += static_cast<uint32_t>(kPacketHeaderSize) + length;
        if (tid == 0 && h->event_cb.load() == nullptr) continue;  // nobody listens
        zal_ipod_reply *r = reply_record_with_payload(p + kPacketHeaderSize, length);
        if (r == nullptr) {
            ZAL_LOGE("%s: out of memory for a %u-byte packet\n", __func__, length);
            continue;
        }
        r->tid = tid;
        r->opcode = p[4];
        if (first == nullptr)
            first = r;
        else
            last->next = r;
        last = r;
        ++queued;
    }
    queue_append(h, first, last, queued);
    if (broken) return -1;
    if (pos > 0) {
        h->rx_length -= pos;
        if (h->rx_length > 0) memmove(h->rx_buffer, h->rx_buffer + pos, h->rx_length);
    }
    if (h->rx_length == 0 && h->rx_capacity > 4 * kReadChunk) {
        // Give back what a large reply made us hold.
        free(h->rx_buffer);
        h->rx_buffer = nullptr;
        h->rx_capacity = 0;
    }
    return queued;
}

}  // namespace

void zal_packet_header(unsigned char *header, uint16_t tid, uint16_t opcode, uint32_t length) {
    header[0] = kPacketMarker;
    header[1] = 0;
    header[2] = static_cast<unsigned char>(tid >> 8);
    header[3] = static_cast<unsigned char>(tid);
    header[4] = static_cast<unsigned char>(opcode);
    header[5] = header[6] = header[7] = 0;
    header[8] = static_cast<unsigned char>(length >> 24);
    header[9] = static_cast<unsigned char>(length >> 16);
    header[10] = static_cast<unsigned char>(length >> 8);
    header[11] = static_cast<unsigned char>(length);
}

zal_ipod_reply *reply_record_new() {
    return static_cast<zal_ipod_reply *>(calloc(1, sizeof(zal_ipod_reply)));
}

zal_ipod_reply *reply_record_with_payload(const unsigned char *payload, uint32_t length) {
    // One block: the record, then its payload.
    auto *r = static_cast<zal_ipod_reply *>(malloc(sizeof(zal_ipod_reply) + length));
    if (r == nullptr) return nullptr;
    r->tid = 0;
    r->opcode = 0;
    r->length = length;
    r->payload = length > 0 ? reinterpret_cast<unsigned char *>(r + 1) : nullptr;
    r->next = nullptr;
    if (length > 0) memcpy(r->payload, payload, length);
    return r;
}

void reply_record_free(zal_ipod_reply *reply) {
    if (reply == nullptr) return;
    if (reply->payload != reinterpret_cast<unsigned char *>(reply + 1)) free(reply->payload);
    free(reply);
}

int safesend(int fd, const void *bytes, std::size_t size) {
    const auto *p = static_cast<const unsigned char *>(bytes);
    std::size_t total = 0;
    while (total < size) {
        // No retry, not even for EAGAIN: a full buffer on the non-blocking reconnected
        // socket ends the connection.
        ssize_t n = send(fd, p + total, size - total, MSG_NOSIGNAL);
        if (n < 1) {
            ZAL_LOGE("send error: %s\n", strerror(n == 0 ? EPIPE : errno));
            return -1;
        }
        total += static_cast<std::size_t>(n);
    }
    return static_cast<int>(total);
}

namespace {
// Header and payload in one call, so that the daemon wakes once per request instead of
// twice (a separate write of the payload costs a whole extra scheduling round trip).
int send_parts(int fd, const unsigned char *header, std::size_t header_size,
               const unsigned char *payload, std::size_t payload_size) {
    struct iovec parts[2] = {{const_cast<unsigned char *>(header), header_size},
                             {const_cast<unsigned char *>(payload), payload_size}};
    const std::size_t size = header_size + payload_size;
    std::size_t total = 0;
    while (total < size) {
        struct msghdr message = {};
        struct iovec rest[2];
        int count = 0;
        std::size_t offset = total;
        for (const iovec &part : parts) {
            if (offset >= part.iov_len) {
                offset -= part.iov_len;
                continue;
            }
            rest[count].iov_base = static_cast<unsigned char *>(part.iov_base) + offset;
            rest[count].iov_len = part.iov_len - offset;
            offset = 0;
            ++count;
        }
        message.msg_iov = rest;
        message.msg_iovlen = static_cast<decltype(message.msg_iovlen)>(count);
        // No retry, not even for EAGAIN, as in safesend.
        ssize_t n = sendmsg(fd, &message, MSG_NOSIGNAL);
        if (n < 1) {
            ZAL_LOGE("send error: %s\n", strerror(n == 0 ? EPIPE : errno));
            return -1;
        }
        total += static_cast<std::size_t>(n);
    }
    return static_cast<int>(total);
}
}  // namespace

void zal_connection_drop_locked(zal_ipod_handle *h) {
    pthread_mutex_lock(&h->send_lock);
    int fd = h->fd.exchange(-1);
    if (fd >= 0) {
        close(fd);
        h->connection_changes.fetch_or(kConnectionLost);
    }
    h->send_failed = false;
    h->peer_closed = false;
    h->rx_length = 0;
    pthread_mutex_unlock(&h->send_lock);
}

void zal_connection_install(zal_ipod_handle *h, int fd, int is_remote) {
    pthread_mutex_lock(&h->read_lock);
    pthread_mutex_lock(&h->send_lock);
    h->fd = fd;
    h->is_remote = is_remote;
    h->send_failed = false;
    h->peer_closed = false;
    h->rx_length = 0;
    pthread_mutex_unlock(&h->send_lock);
    pthread_mutex_unlock(&h->read_lock);
}

extern "C" ZAL_API int zal_ipod_send_packet(zal_ipod_handle *h, zal_ipod_send_record *record) {
    if (h == nullptr || record == nullptr) return -1;
    unsigned char *encoded = nullptr;
    uint32_t length = 0;
    if (record->payload != nullptr) {
        // Encoding needs no lock; only the id and the write do.
        encoded = serialize(record->payload, &length);
        if (encoded == nullptr) {
            ZAL_LOGE("%s: cannot encode the payload of opcode %u\n", __func__, record->opcode);
            length = 0;
        }
    }
    unsigned char header[kPacketHeaderSize];
    pthread_mutex_lock(&h->send_lock);
    uint16_t tid = next_tid(h->last_tid);
    h->last_tid = tid;
    record->tid = tid;
    h->start_times[tid] = now_seconds();
    h->request_opcodes[tid] = record->opcode;
    zal_packet_header(header, tid, record->opcode, length);
    int sent = -1;
    int fd = h->fd.load();
    // A socket that failed a write is never written again: the reader closes it.
    if (fd >= 0 && !h->send_failed) {
        sent = send_parts(fd, header, sizeof header, encoded, length);
        if (sent < 0) {
            h->send_failed = true;
            shutdown(fd, SHUT_RDWR);  // wakes a reader that waits on it
        }
    }
    pthread_mutex_unlock(&h->send_lock);
    free(encoded);
    return sent;
}

extern "C" ZAL_API uint16_t zal_ipod_hello(zal_ipod_handle *h) {
    zal_ipod_send_record record{};
    record.opcode = ZAL_OP_HELLO;
    zal_ipod_send_packet(h, &record);
    return record.tid;
}

int zal_ipod_receive(zal_ipod_handle *h) {
    if (h->fd.load() < 0) {
        zal_ipod_reconnect(h);
        return -1;
    }
    int32_t seen = h->queue_count.load();
    pthread_mutex_lock(&h->read_lock);
    if (h->queue_count.load() != seen) {
        // Another thread queued or took packets meanwhile: look at the queue first.
        pthread_mutex_unlock(&h->read_lock);
        return 0;
    }
    int fd = h->fd.load();
    if (fd < 0) {
        pthread_mutex_unlock(&h->read_lock);
        return -1;
    }
    if (h->send_failed.load()) {
        zal_connection_drop_locked(h);
        pthread_mutex_unlock(&h->read_lock);
        zal_ipod_reconnect(h);
        return -1;
    }
    // poll rather than select: the same wait without select's limit on descriptor numbers.
    // A socket whose peer closed is not polled: it would wake us at once, every time.
    struct pollfd waiter = {fd, POLLIN, 0};
    nfds_t watched = h->peer_closed.load() ? 0 : 1;
    int ready = poll(watched ? &waiter : nullptr, watched, kReadPollMillis);
    if (ready == 0 || (ready < 0 && errno == EINTR)) {
        pthread_mutex_unlock(&h->read_lock);
        return 0;
    }
    ssize_t n = -1;
    int error = 0;
    if (rx_reserve(h, kReadChunk)) {
        n = read(fd, h->rx_buffer + h->rx_length, kReadChunk);
        error = errno;
    } else {
        error = ENOMEM;
        ZAL_LOGE("%s: out of memory for the receive buffer\n", __func__);
    }
    if (n <= 0) {
        // An orderly close keeps the socket until a send fails, unless the application
        // asked to hear about lost connections: then the close is a loss at once.
        bool broken = h->send_failed.load() || error == ECONNRESET || error == ENOTCONN ||
                      error == EBADF || (n == 0 && h->connection_cb.load() != nullptr);
        if (n == 0 && !broken) h->peer_closed = true;
        if (broken) zal_connection_drop_locked(h);
        pthread_mutex_unlock(&h->read_lock);
        if (broken) zal_ipod_reconnect(h);
        return -1;
    }
    h->rx_length += static_cast<uint32_t>(n);
    int queued = split_packets(h);
    if (queued < 0) {
        ZAL_LOGE("%p: packet length above %u bytes, the stream is broken\n", static_cast<void *>(h),
                 kMaxPayloadLength);
        zal_connection_drop_locked(h);
        pthread_mutex_unlock(&h->read_lock);
        zal_ipod_reconnect(h);
        return -1;
    }
    pthread_mutex_unlock(&h->read_lock);
    return queued;
}

namespace {
// Unlinks the first reply (not an event) to tid from the queue, or returns nullptr.
zal_ipod_reply *take_reply(zal_ipod_handle *h, uint16_t tid) {
    zal_ipod_reply *found = nullptr;
    pthread_mutex_lock(&h->send_lock);
    for (zal_ipod_reply *prev = h->queue; prev->next != nullptr; prev = prev->next) {
        zal_ipod_reply *r = prev->next;
        if (r->tid != tid || r->opcode == ZAL_OP_EVENT) continue;
        prev->next = r->next;
        if (h->queue_tail == r) h->queue_tail = prev;
        r->next = nullptr;
        h->queue_count.fetch_sub(1);
        found = r;
        break;
    }
    pthread_mutex_unlock(&h->send_lock);
    return found;
}
}  // namespace

zal_ipod_reply *zal_ipod_wait_for_tid_ex(zal_ipod_handle *h, uint16_t tid) {
    // A reply that another thread's reader already queued is taken without a read pass
    // (which could otherwise block half a second in poll first).
    zal_ipod_reply *found = take_reply(h, tid);
    while (found == nullptr) {
        if (zal_ipod_receive(h) < 0) {
            zal_ipod_pending_event(h);
            return nullptr;
        }
        found = take_reply(h, tid);
        if (found != nullptr) break;
        uint32_t started = h->start_times[tid];
        if (now_seconds() - started <= h->read_timeout_sec.load() + 1) continue;
        ZAL_LOGE("%p Transaction timeout tid: %u, start-time: %lu, now: %lu, timeout: %lu\n",
                 static_cast<void *>(h), tid, static_cast<unsigned long>(started),
                 static_cast<unsigned long>(now_seconds()),
                 static_cast<unsigned long>(h->read_timeout_sec.load()));
        pthread_mutex_lock(&h->send_lock);
        h->request_opcodes[tid] = kTimedOutOpcode;
        pthread_mutex_unlock(&h->send_lock);
        zal_ipod_pending_event(h);
        return nullptr;
    }
    if (found->opcode == ZAL_OP_ERROR)
        ZAL_LOGE("%p Packet error: transaction id 0x%04x\n", static_cast<void *>(h), tid);
    zal_ipod_pending_event(h);
    return found;
}

extern "C" ZAL_API zal_ipod_reply *zal_ipod_wait_for_tid(zal_ipod_handle *h, uint16_t tid) {
    if (h == nullptr) return nullptr;
    return zal_ipod_wait_for_tid_ex(h, tid);
}

extern "C" ZAL_API void zal_ipod_reply_free(zal_ipod_reply *reply) {
    reply_record_free(reply);
}
