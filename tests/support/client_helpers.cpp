// Helpers for client tests (see client_helpers.h).
#include "client_helpers.h"

#include <cstdlib>
#include <cstring>

#include "fake_daemon.h"
#include "zal-ipod-2/packet.h"
#include "zal-ipod-2/playback_state.h"

namespace zaltest {

zal_ipod_handle *offline_handle() {
    auto *h = new zal_ipod_handle();
    h->queue = reply_record_new();
    h->queue_tail = h->queue;
    zal_playback_cache_reset(h);
    return h;
}

zal_ipod_reply *make_reply(uint16_t tid, uint8_t opcode, gval *value) {
    zal_ipod_reply *r = reply_record_new();
    r->tid = tid;
    r->opcode = opcode;
    if (value != nullptr) {
        r->payload = serialize(value, &r->length);
        serialize_free(value);
    }
    return r;
}

void queue_record(zal_ipod_handle *h, zal_ipod_reply *r) {
    pthread_mutex_lock(&h->send_lock);
    h->queue_tail->next = r;
    h->queue_tail = r;
    h->queue_count.fetch_add(1);
    pthread_mutex_unlock(&h->send_lock);
}

void queue_event(zal_ipod_handle *h, const char *type, gval *data, const char *serial,
                 int session) {
    Bytes bytes = event_frame(type, data, serial, session);
    zal_ipod_reply *r = reply_record_new();
    r->opcode = bytes[4];
    r->length = static_cast<uint32_t>(bytes.size() - 12);
    r->payload = static_cast<unsigned char *>(malloc(r->length));
    memcpy(r->payload, bytes.data() + 12, r->length);
    queue_record(h, r);
}

gval *device_entry(const char *serial, int authenticated, int protocol, int extended) {
    return hash_of({{"serial", serialize_string(serial)},
                    {"name", serialize_string("Phone")},
                    {"authenticated", serialize_int(authenticated)},
                    {"used", serialize_int(1)},
                    {"extended", serialize_int(extended)},
                    {"protocolinuse", serialize_int(protocol)},
                    {"transport", serialize_int(0)},
                    {"bus", serialize_int(3)},
                    {"address", serialize_int(7)},
                    {"rfcommId", serialize_int(-1)}});
}

gval *device_list(std::initializer_list<gval *> entries) {
    gval *list = serialize_array();
    for (gval *e : entries) serialize_array_add(list, e);
    return list;
}

zal_ipod_handle *connect_with_session(FakeDaemon &d, int protocol) {
    d.expect(ZAL_OP_HELLO)
        .reply(device_list({device_entry("P", 1, protocol)}))
        .expect(ZAL_OP_OPEN_SESSION, serialize_int(0))
        .reply(hash_of({{"result", serialize_int(1)},
                        {"devices", device_list({device_entry("P", 1, protocol)})}}));
    zal_ipod_handle *h = zal_ipod_connect(nullptr);
    if (h != nullptr && zal_ipod_open_session_sync(h, 0) != 1) {
        zal_ipod_close(h);
        return nullptr;
    }
    return h;
}

gval *hash_of(std::initializer_list<std::pair<const char *, gval *>> items) {
    gval *h = serialize_hash();
    for (const auto &item : items) serialize_hash_add(h, item.first, item.second);
    return h;
}

}  // namespace zaltest
