// Client handle life cycle: connect, reconnect, close and the connection accessors.
#include "zal-ipod-2/connection.h"

#include <arpa/inet.h>
#include <cutils/sockets.h>
#include <netdb.h>
#include <netinet/in.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>
#include <string>

#include "common/log.h"
#include "zal-ipod-2/dispatch.h"
#include "zal-ipod-2/opcodes.h"
#include "zal-ipod-2/packet.h"

namespace {

std::string daemon_socket_name_override;

int connect_android_socket() {
    int so = socket(AF_UNIX, SOCK_STREAM, 0);
    if (so < 0) {
        ZAL_LOGE("%s: so < 0\n", __func__);
        return -1;
    }
    if (socket_local_client_connect(so, zal_daemon_socket_name(), ANDROID_SOCKET_NAMESPACE_ABSTRACT,
                                    SOCK_STREAM) < 0) {
        ZAL_LOGE("%s: Client connect error\n", __func__);
        close(so);
        return -1;
    }
    return so;
}

void set_nonblocking(int fd) {
    int on = 1;
    ioctl(fd, FIONBIO, &on);
}

int connect_inetsocket(const char *host, int port) {
    struct addrinfo hints = {};
    hints.ai_family = AF_INET;
    hints.ai_socktype = SOCK_STREAM;
    struct addrinfo *found = nullptr;
    // getaddrinfo rather than gethostbyname: the reader may reconnect on any thread.
    if (getaddrinfo(host, nullptr, &hints, &found) != 0 || found == nullptr) {
        ZAL_LOGE("Could not find the zald-2 host\n");
        return -1;
    }
    int result = -1;
    for (struct addrinfo *a = found; a != nullptr; a = a->ai_next) {
        int so = socket(AF_INET, SOCK_STREAM, 0);
        if (so < 0) {
            ZAL_LOGE("Cannot create socket\n");
            break;
        }
        struct sockaddr_in target;
        memcpy(&target, a->ai_addr, sizeof target);
        target.sin_port = htons(static_cast<uint16_t>(port));
        if (connect(so, reinterpret_cast<struct sockaddr *>(&target), sizeof target) == 0) {
            result = so;
            break;
        }
        close(so);
    }
    freeaddrinfo(found);
    return result;
}

// Connects the local socket file at path; -1 when it cannot.
int connect_path_socket(const char *path) {
    struct sockaddr_un target = {};
    std::size_t length = strlen(path);
    if (length >= sizeof target.sun_path) return -1;  // longer names would be cut
    target.sun_family = AF_UNIX;
    memcpy(target.sun_path, path, length);
    int so = socket(AF_UNIX, SOCK_STREAM, 0);
    if (so < 0) return -1;
    auto size = static_cast<socklen_t>(offsetof(struct sockaddr_un, sun_path) + length);
    int rc = connect(so, reinterpret_cast<struct sockaddr *>(&target), size);
    set_nonblocking(so);
    if (rc != 0) {
        close(so);
        return -1;
    }
    return so;
}

// HELLO and its reply: the daemon answers with the device list.
void hello_exchange(zal_ipod_handle *h) {
    uint16_t tid = zal_ipod_hello(h);
    zal_ipod_reply *reply = zal_ipod_wait_for_tid_ex(h, tid);
    if (reply != nullptr && reply->length > 0) {
        gval *devices = unserialize(reply->payload, reply->length);
        pthread_mutex_lock(&h->state_lock);
        serialize_free(h->devices);
        h->devices = devices;
        pthread_mutex_unlock(&h->state_lock);
    }
    reply_record_free(reply);
}

const char *reconnect_target(const zal_ipod_handle *h) {
    if (h->address != nullptr) return h->address;
    const char *env = getenv("ZALIPODDAEMON");
    return env != nullptr ? env : kDaemonSocketName;
}

constexpr int kTargetMissing = -2;

// Opens the socket named by target; sets *remote for TCP targets. -1 when it cannot.
int open_target(const char *target, int *remote) {
    const char *colon = strchr(target, ':');
    if (colon == nullptr) {
        if (access(target, F_OK) != 0) return kTargetMissing;
        return connect_path_socket(target);
    }
    int port = atoi(colon + 1);
    if (port == -1) return connect_path_socket(target);  // the whole text is the path
    if (port == 0) port = kDefaultDaemonPort;
    std::string host(target, static_cast<std::size_t>(colon - target));
    if (host.empty()) host = "0.0.0.0";
    *remote = 1;
    int so = connect_inetsocket(host.c_str(), port);
    if (so >= 0) set_nonblocking(so);
    return so;
}

}  // namespace

void zal_set_daemon_socket_name(const char *name) {
    daemon_socket_name_override = name != nullptr ? name : "";
}

const char *zal_daemon_socket_name() {
    return daemon_socket_name_override.empty() ? kDaemonSocketName
                                               : daemon_socket_name_override.c_str();
}

int zal_ipod_reconnect(zal_ipod_handle *h) {
    // One reconnect at a time per handle. The HELLO below runs the reader, which would
    // otherwise reconnect again (without bound) when the new connection fails at once.
    bool idle = false;
    if (!h->reconnecting.compare_exchange_strong(idle, true)) return -1;
    int fd = -1;
    int remote = 0;
    try {
        const char *target = reconnect_target(h);
        if (strlen(target) > kMaxTargetLength) {
            ZAL_LOGE("%s: target of %zu characters refused\n", __func__, strlen(target));
        } else {
            fd = open_target(target, &remote);
        }
    } catch (...) {
        fd = -1;
    }
    if (fd == kTargetMissing) {
        ZAL_LOGE("Could not find to %s\n", reconnect_target(h));
        h->reconnecting = false;
        return -1;
    }
    if (fd < 0) {
        if (remote) h->is_remote = 1;
        ZAL_LOGE("Could not connect zald-2.\n");
        h->reconnecting = false;
        return -1;
    }
    zal_connection_install(h, fd, remote);
    // Before the HELLO: a connection that fails again inside it is then reported as lost
    // after this, so the last report matches the state.
    h->connection_changes.fetch_or(kConnectionRestored);
    hello_exchange(h);
    h->reconnecting = false;
    return fd;
}

zal_ipod_handle::~zal_ipod_handle() {
    int so = fd.exchange(-1);
    if (so >= 0) close(so);
    free(rx_buffer);
    free(error_message.exchange(nullptr));
    free(device_name);
    free(address);
    serialize_free(devices);
    for (zal_ipod_reply *r = queue; r != nullptr;) {
        zal_ipod_reply *next = r->next;
        reply_record_free(r);
        r = next;
    }
    queue_count = 0;
    pthread_mutex_destroy(&send_lock);
    pthread_mutex_destroy(&read_lock);
    pthread_mutex_destroy(&state_lock);
}

void zal_set_error_message(zal_ipod_handle *h, const char *text) {
    char *copy = text != nullptr ? strdup(text) : nullptr;
    free(h->error_message.exchange(copy));
}

extern "C" {

ZAL_API zal_ipod_handle *zal_ipod_connect(const char *address) {
    common_init();
    auto *h = new (std::nothrow) zal_ipod_handle();
    if (h == nullptr) {
        ZAL_LOGE("Could not connect zald-2.\n");
        return nullptr;
    }
    if (address != nullptr) h->address = strdup(address);
    h->queue = reply_record_new();
    h->queue_tail = h->queue;
    zal_playback_cache_reset(h);
    int so = h->queue != nullptr ? connect_android_socket() : -1;
    if (so < 0) {
        ZAL_LOGE("Could not connect zald-2.\n");
        delete h;
        return nullptr;
    }
    zal_connection_install(h, so, 0);
    hello_exchange(h);
    return h;
}

ZAL_API void zal_ipod_close(zal_ipod_handle *h) {
    puts("zal_ipod_close ");
    if (h == nullptr) return;
    // A loop thread left running would use the handle after it is gone.
    if (h->loop_started) zal_ipod_set_loopthread(h, 0);
    delete h;
}

ZAL_API int zal_ipod_fd(zal_ipod_handle *h) {
    return h != nullptr ? h->fd.load() : -1;
}

ZAL_API int zal_ipod_is_remote(zal_ipod_handle *h) {
    return h != nullptr ? h->is_remote.load() : 0;
}

ZAL_API int zal_ipod_is_ready(zal_ipod_handle *h) {
    if (h == nullptr || h->fd.load() == -1) return -1;
    if (h->session_opened == 0) return 0;
    return h->ready.load() != 0 ? 1 : 0;
}

ZAL_API void zal_ipod_set_read_timeout(zal_ipod_handle *h, unsigned int seconds,
                                       unsigned int microseconds) {
    if (h == nullptr) return;
    h->read_timeout_sec = seconds;
    h->read_timeout_usec = microseconds;
}

ZAL_API int zal_ipod_notify_attached(zal_ipod_handle *h) {
    zal_ipod_send_record record{};
    record.opcode = ZAL_OP_NOTIFY_ATTACHED;  // no reply expected
    return zal_ipod_send_packet(h, &record);
}

}  // extern "C"

extern "C" ZAL_API const char *zal_ipod_get_error_message(zal_ipod_handle *h) {
    return h != nullptr ? h->error_message.load() : nullptr;
}
