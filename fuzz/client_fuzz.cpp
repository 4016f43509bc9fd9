// Fuzzes the client side of the socket: the input is what a broken or hostile daemon
// writes, cut into segments, one per command. For each segment the harness gives the
// handle a fresh socket pair, writes the segment as the daemon's output, closes that end
// and runs one _sync command, whose wait reads and dispatches whatever arrived. Replies
// that no wait takes go to the reply callback through the decoder table; events go to an
// event callback that reads every accessor and copies the event. No crash, no leak, no
// read past a buffer, and every wait ends (the closed end makes every read finish).
//
// Segment: [command selector: 1 byte][length: 2 bytes, little-endian][that many bytes].
// Transaction ids are numbered from 1 in the order of the commands, so a reply for the
// n-th segment carries tid n.
#include <android/log.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>

#include "client_fuzz_commands.h"
#include "zal-ipod-2/handle.h"
#include "zal-ipod-2/packet.h"
#include "zal-ipod-2/playback_state.h"
#include "zal-ipod-2/zal-ipod-2.h"

namespace {

int read_event(zal_ipod_handle *h, zal_ipod_event *event, void *) {
    zal_fuzz_read_event(event);
    zal_ipod_event *copy = zal_ipod_event_clone_data(event);
    if (copy != nullptr) {
        zal_fuzz_read_event(copy);
        zal_ipod_event_free(copy);
    }
    zal_fuzz_read_handle(h);
    return 0;
}

int read_reply(zal_ipod_handle *h, uint16_t, int32_t, const char *text, void *) {
    if (text != nullptr) (void)strlen(text);
    zal_fuzz_read_handle(h);
    return 0;
}

void on_connection(zal_ipod_handle *, int, void *) {}

// A handle as connect leaves it, but on the given socket and without the HELLO.
zal_ipod_handle *make_handle() {
    auto *h = new zal_ipod_handle();
    h->queue = reply_record_new();
    h->queue_tail = h->queue;
    zal_playback_cache_reset(h);
    // Reconnects find nothing (no file there) and fail at once, without the network.
    h->address = strdup("/nonexistent/zal-client-fuzz");
    zal_ipod_set_read_timeout(h, 0, 0);
    zal_ipod_set_event_cb(h, read_event, nullptr);
    zal_ipod_set_reply_cb(h, read_reply, nullptr);
    // With a connection callback the closed end counts as a loss at once, so a wait
    // never sits out its time-out on a socket that can say nothing more.
    zal_ipod_set_connection_cb(h, on_connection, nullptr);
    return h;
}

// Gives h a new connection whose daemon side has written bytes and closed.
bool feed(zal_ipod_handle *h, const uint8_t *bytes, size_t size) {
    int pair[2];
    if (socketpair(AF_UNIX, SOCK_STREAM, 0, pair) != 0) return false;
    int big = 1 << 20;
    setsockopt(pair[1], SOL_SOCKET, SO_SNDBUF, &big, sizeof big);
    size_t done = 0;
    while (done < size) {
        ssize_t n = write(pair[1], bytes + done, size - done);
        if (n <= 0) break;
        done += static_cast<size_t>(n);
    }
    // The daemon reads nothing: the library's requests land in a buffer that is dropped.
    shutdown(pair[1], SHUT_WR);
    pthread_mutex_lock(&h->read_lock);
    zal_connection_drop_locked(h);
    pthread_mutex_unlock(&h->read_lock);
    zal_connection_install(h, pair[0], 0);
    close(pair[1]);
    return true;
}

}  // namespace

extern "C" int LLVMFuzzerInitialize(int *, char ***) {
    // Hostile input makes the library log a lot; the records themselves are not under test.
    __android_log_set_minimum_priority(ANDROID_LOG_SILENT);
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    zal_ipod_handle *h = make_handle();
    size_t at = 0;
    // Bounded: a few segments reach every decoder; more only repeat them.
    for (int segment = 0; segment < 16 && at + 3 <= size; ++segment) {
        const uint8_t selector = data[at];
        size_t length = static_cast<size_t>(data[at + 1]) | static_cast<size_t>(data[at + 2]) << 8;
        at += 3;
        if (length > size - at) length = size - at;
        if (!feed(h, data + at, length)) break;
        at += length;
        // Commands are refused until a session reply made the handle ready; let the
        // input decide, as the daemon's session reply would.
        if ((selector & 0x80) != 0) {
            h->session_opened = 1;
            h->ready = 1;
        }
        zal_fuzz_run_command(h, selector & 0x7f);
        zal_ipod_events_iterate(h);
        zal_fuzz_read_handle(h);
    }
    zal_ipod_close(h);
    return 0;
}
