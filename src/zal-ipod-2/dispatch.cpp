// Dispatcher: applies events to the handle and hands them to the event callback; hands
// replies no wait took to the reply callback after their slot's decoder. Also the ways to
// drive it: zal_ipod_read, zal_ipod_events_iterate and the loop thread.
#include "zal-ipod-2/dispatch.h"

#include <pthread.h>
#include <sched.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>

#include "common/log.h"
#include "common/value_internal.h"
#include "zal-ipod-2/command.h"
#include "zal-ipod-2/devices.h"
#include "zal-ipod-2/event.h"
#include "zal-ipod-2/packet.h"
#include "zal-ipod-2/reply_decoders.h"

namespace {

int32_t data_int(const zal_ipod_event *e) {
    return serialize_get_int(e->data);
}
bool data_is(const zal_ipod_event *e, int kind) {
    return zal_kind(e->data) == kind;
}

// Gives every device entry whose "serial" is the event's a copy of the event's data under
// key. Calls after(h) once per updated entry.
void update_matching(zal_ipod_handle *h, const zal_ipod_event *e, const char *key,
                     void (*after)(zal_ipod_handle *) = nullptr) {
    if (zal_kind(h->devices) != SERIALIZE_ARRAY || e->data == nullptr) return;
    int count = serialize_array_count(h->devices);
    for (int i = 0; i < count; ++i) {
        gval *entry = zal_device_entry(h, i);
        const char *serial = zal_hash_string(entry, "serial");
        if (serial == nullptr || strcmp(serial, e->serial) != 0) continue;
        gval *copy = serialize_dup(e->data);
        if (copy != nullptr) serialize_hash_add(entry, key, copy);
        if (after != nullptr) after(h);
    }
}

void ready_if_extended(zal_ipod_handle *h) {
    gval *entry = zal_device_entry(h, h->current_session);
    if (zal_hash_int(entry, "authenticated", 0) == 1 && zal_hash_int(entry, "extended", 0) == 1)
        h->ready = 1;
}

void on_connected(zal_ipod_handle *h, const zal_ipod_event *e) {
    if (!data_is(e, SERIALIZE_HASH)) return;
    // A handle whose HELLO got no reply has no list yet: the new device starts one.
    if (h->devices == nullptr) h->devices = serialize_array();
    if (zal_kind(h->devices) == SERIALIZE_ARRAY)
        serialize_array_add(h->devices, serialize_dup(e->data));
}

void on_disconnected(zal_ipod_handle *h, const zal_ipod_event *e) {
    const char *serial = data_is(e, SERIALIZE_STRING) ? serialize_get_string(e->data) : nullptr;
    int count = zal_ipod_device_count(h);
    for (int i = 0; serial != nullptr && i < count; ++i) {
        const char *entry_serial = zal_hash_string(zal_device_entry(h, i), "serial");
        if (entry_serial == nullptr || strcmp(entry_serial, serial) != 0) continue;
        serialize_array_del(h->devices, static_cast<uint32_t>(i));
        int current = h->current_session;
        if (i == current) {
            h->session_opened = 0;
            h->current_session = -1;
        } else if (i < current) {
            // The device in session moved down one place; its index follows it so that
            // the session keeps naming the same device.
            h->current_session = current - 1;
        }
        break;
    }
    h->playback.forget_track();
}

void on_authenticated(zal_ipod_handle *h, const zal_ipod_event *e) {
    update_matching(h, e, "authenticated");
}
void on_mode_changed(zal_ipod_handle *h, const zal_ipod_event *e) {
    update_matching(h, e, "extended", ready_if_extended);
}
void on_protocol_in_use(zal_ipod_handle *h, const zal_ipod_event *e) {
    update_matching(h, e, "protocolinuse");
    h->ready = 1;
}

template <int32_t zal_playback_state::*Field>
void set_playback_int(zal_ipod_handle *h, const zal_ipod_event *e) {
    if (data_is(e, SERIALIZE_INT)) h->playback.*Field = data_int(e);
}

void on_chapter_changed(zal_ipod_handle *h, const zal_ipod_event *e) {
    if (!data_is(e, SERIALIZE_HASH)) return;
    zal_playback_state &p = h->playback;
    p.track_index = zal_hash_int(e->data, "track_index", p.track_index);
    p.chapter_index = zal_hash_int(e->data, "chapter_index", p.chapter_index);
    p.chapter_count = zal_hash_int(e->data, "chapter_count", p.chapter_count);
}

void on_artwork_done(zal_ipod_handle *h, const zal_ipod_event *e) {
    if (data_is(e, SERIALIZE_STRING))
        zal_replace_text(&h->playback.artwork_name, serialize_get_string(e->data));
}

void on_playing_app(zal_ipod_handle *h, const zal_ipod_event *e) {
    if (!data_is(e, SERIALIZE_STRING)) return;
    // The buffer holds 255 characters: a longer name is cut there, always terminated.
    char *app = h->playback.playing_app;
    strncpy(app, serialize_get_string(e->data), sizeof h->playback.playing_app - 1);
    app[sizeof h->playback.playing_app - 1] = '\0';
}

void on_device_name(zal_ipod_handle *h, const zal_ipod_event *e) {
    if (data_is(e, SERIALIZE_STRING))
        zal_replace_text(&h->device_name, serialize_get_string(e->data));
}

struct event_row {
    const char *type;
    int32_t kind;
    void (*apply)(zal_ipod_handle *h, const zal_ipod_event *e);
};

using P = zal_playback_state;

constexpr event_row kEventTable[] = {
    {"connected_ipod", ZALIPOD_EVENT_CONNECTED, on_connected},
    {"disconnected_ipod", ZALIPOD_EVENT_DISCONNECTED, on_disconnected},
    {"fail_to_detect", ZALIPOD_EVENT_DETECTION_FAILED, nullptr},
    {"authenticated", ZALIPOD_EVENT_AUTHENTICATED, on_authenticated},
    {"mode_changed", ZALIPOD_EVENT_MODE_CHANGED, on_mode_changed},
    {"play_state_changed", ZALIPOD_EVENT_PLAYSTATE_CHANGED, set_playback_int<&P::play_state>},
    {"track_index_changed", ZALIPOD_EVENT_TRACK_CHANGED, set_playback_int<&P::track_index>},
    {"samplerate_retrived", ZALIPOD_EVENT_SAMPLERATE_RETRIEVED, set_playback_int<&P::sample_rate>},
    {"track_position_changed", ZALIPOD_EVENT_TRACK_POSITION_CHANGED,
     set_playback_int<&P::track_position>},
    {"chapter_index_changed", ZALIPOD_EVENT_CHAPTER_CHANGED, on_chapter_changed},
    {"init_state", ZALIPOD_EVENT_INITSTATE, set_playback_int<&P::init_state>},
    {"protocolinuse", ZALIPOD_EVENT_IAP2_INUSE, on_protocol_in_use},
    {"medialibrary_update", ZALIPOD_EVENT_MEDIALIBRARYUPDATE, nullptr},
    {"media_changed", ZALIPOD_EVENT_MEDIA_CHANGED, nullptr},
    {"artwork_transfer_done", ZALIPOD_EVENT_ARTWORK_TRANSFER_DONE, on_artwork_done},
    {"bluetooth_connection_update", ZALIPOD_EVENT_BT_CONNECTION_UPDATE, nullptr},
    {"data_session", ZALIPOD_EVENT_EAP_DATAGRAM, nullptr},
    {"location_information", ZALIPOD_EVENT_LOCATION_INFORMATION, nullptr},
    {"playing_app", ZALIPOD_EVENT_PLAYING_APP, on_playing_app},
    {"telephony_callstate_information", ZALIPOD_EVENT_TELEPHONY_CALLSTATE_INFORMATION, nullptr},
    {"vehicle_status_updates", ZALIPOD_EVENT_VEHICLE_STATUS_UPDATE, nullptr},
    {"wifi_information", ZALIPOD_EVENT_WIFI_INFORMATION, nullptr},
    {"telephony_update", ZALIPOD_EVENT_TELEPHONY_UPDATE, nullptr},
    {"track_is_audiobook", ZALIPOD_EVENT_TRACK_IS_AUDIOBOOK, nullptr},
    {"track_contains_video", ZALIPOD_EVENT_TRACK_IS_AUDIOBOOK, nullptr},
    {"shuffle_mode_changed", ZALIPOD_EVENT_SHUFFLE_MODE_CHANGED,
     set_playback_int<&P::shuffle_state>},
    {"repeat_mode_changed", ZALIPOD_EVENT_REPEAT_MODE_CHANGED, set_playback_int<&P::repeat_state>},
    {"disconnected_ipod_hostmode", ZALIPOD_EVENT_DISCONNECTED_HOSTMODE, nullptr},
    {"role_switched", ZALIPOD_EVENT_ROLE_SWITCHED, nullptr},
    {"telephony_vcard_information", ZALIPOD_EVENT_TELEPHONY_VCARD_INFORMATION, nullptr},
    {"ipod_device_name", ZALIPOD_EVENT_DEVICE_NAME, on_device_name},
    {"wireless_carplay_update", ZALIPOD_EVENT_WIRELESS_CARPLAY_UPDATE, nullptr},
};

constexpr std::size_t kEventTypes = sizeof kEventTable / sizeof kEventTable[0];

// The table's rows sorted by type text, for a binary search per event.
struct sorted_event_rows {
    const event_row *rows[kEventTypes];
    sorted_event_rows() {
        for (std::size_t i = 0; i < kEventTypes; ++i) rows[i] = &kEventTable[i];
        std::sort(rows, rows + kEventTypes, [](const event_row *a, const event_row *b) {
            return strcmp(a->type, b->type) < 0;
        });
    }
};

const event_row *event_row_of(const char *type) {
    if (type == nullptr) return nullptr;
    static const sorted_event_rows sorted;
    auto at = std::lower_bound(
        sorted.rows, sorted.rows + kEventTypes, type,
        [](const event_row *row, const char *t) { return strcmp(row->type, t) < 0; });
    return at != sorted.rows + kEventTypes && strcmp((*at)->type, type) == 0 ? *at : nullptr;
}

void process_event(zal_ipod_handle *h, const zal_ipod_reply *r) {
    // The record lives on this stack frame for the callback; only the data is allocated.
    zal_ipod_event event;
    event.serial[0] = '\0';
    gval *payload = r->length > 0 ? unserialize(r->payload, r->length) : nullptr;
    const char *type = zal_hash_string(payload, "event");
    const event_row *row = event_row_of(type);
    if (row == nullptr || row->kind != ZALIPOD_EVENT_MEDIALIBRARYUPDATE)
        ZAL_LOGI("process event type=[%s]\n", type != nullptr ? type : "");
    event.session = static_cast<uint16_t>(zal_hash_int(payload, "session", 0));
    const char *serial = zal_hash_string(payload, "serial");
    if (serial != nullptr) {
        std::size_t n = strnlen(serial, sizeof event.serial - 1);
        memcpy(event.serial, serial, n);
        event.serial[n] = '\0';
    }
    event.data = value_hash_take(payload, "data");
    if (h->error_message.load() != nullptr) zal_set_error_message(h, nullptr);
    event.kind = row != nullptr ? row->kind : ZALIPOD_EVENT_UNKNOWN;
    if (row != nullptr && row->apply != nullptr) {
        pthread_mutex_lock(&h->state_lock);
        row->apply(h, &event);
        pthread_mutex_unlock(&h->state_lock);
    }
    if (payload != nullptr) serialize_free(payload);
    zal_ipod_event_cb cb = h->event_cb.load();
    if (cb != nullptr) cb(h, &event, h->event_cb_data.load());
    if (event.data != nullptr) serialize_free(event.data);
}

void process_reply(zal_ipod_handle *h, const zal_ipod_reply *r) {
    zal_ipod_reply_cb cb = h->reply_cb.load();
    if (cb == nullptr) {
        pthread_mutex_lock(&h->send_lock);
        auto original = static_cast<int16_t>(h->request_opcodes[r->tid]);
        pthread_mutex_unlock(&h->send_lock);
        zal_log_error_at("zal_ipod_pending_event", __LINE__,
                         "Packet not handled: %p tid(%d), original-opcode(%d), ret-opcode(%d);\n",
                         static_cast<const void *>(r), r->tid, original, r->opcode);
        return;
    }
    zal_set_error_message(h, nullptr);
    const zal_reply_tables tables = zal_reply_decoder_tables();
    const zal_reply_decoder_row *matched = nullptr;
    for (std::size_t i = 0; i < tables.decoder_count && matched == nullptr; ++i)
        if (h->slots.*(tables.decoders[i].slot) == r->tid) matched = &tables.decoders[i];
    int32_t result;
    const char *text = nullptr;
    if (matched != nullptr && matched->decode != nullptr) {
        result = matched->decode(h, r);
        if (matched->passes_error_text) text = h->error_message.load();
    } else {
        result = zal_generic_reply_result(h, r, &text);
        for (std::size_t i = 0; i < tables.adjuster_count; ++i) {
            if (h->slots.*(tables.adjusters[i].slot) != r->tid) continue;
            result = tables.adjusters[i].adjust(h, result);
            break;
        }
    }
    cb(h, r->tid, result, text, h->reply_cb_data.load());
}

// Most records one dispatcher pass takes under one holding of send_lock.
constexpr int kDispatchBatch = 32;

// Unlinks the records the dispatcher may handle next, in order, into a chain; nullptr
// when there is none. Each record is taken by exactly one dispatcher.
zal_ipod_reply *take_dispatchable(zal_ipod_handle *h) {
    zal_ipod_reply *taken = nullptr;
    zal_ipod_reply **tail = &taken;
    pthread_mutex_lock(&h->send_lock);
    bool replies_too = h->reply_cb.load() != nullptr;
    for (int n = 0; n < kDispatchBatch; ++n) {
        zal_ipod_reply *prev = h->queue;
        zal_ipod_reply *first = prev->next;
        if (first == nullptr) break;
        zal_ipod_reply *chosen = nullptr;
        if (first->opcode == ZAL_OP_EVENT || replies_too) {
            chosen = first;
        } else {
            // Replies stay for the waits; events behind them are still delivered.
            for (prev = first; prev->next != nullptr; prev = prev->next) {
                if (prev->next->opcode == ZAL_OP_EVENT) {
                    chosen = prev->next;
                    break;
                }
            }
        }
        if (chosen == nullptr) break;
        prev->next = chosen->next;
        if (h->queue_tail == chosen) h->queue_tail = prev;
        chosen->next = nullptr;
        h->queue_count.fetch_sub(1);
        *tail = chosen;
        tail = &chosen->next;
    }
    pthread_mutex_unlock(&h->send_lock);
    return taken;
}

// Pause of the loop thread between passes while there is no connection, so that a
// daemon that is gone costs a reconnect attempt per pause rather than a busy loop.
constexpr int kLoopRetryMillis = 500;
constexpr int kLoopStopCheckMillis = 50;

void *callbackThread(void *arg) {
    auto *h = static_cast<zal_ipod_handle *>(arg);
    while (h->loop_stop.load() == 0) {
        zal_ipod_events_iterate(h);
        for (int waited = 0;
             waited < kLoopRetryMillis && h->fd.load() < 0 && h->loop_stop.load() == 0;
             waited += kLoopStopCheckMillis)
            usleep(kLoopStopCheckMillis * 1000);
    }
    return nullptr;
}

// Tells the connection callback what changed since the last report: a loss when the
// application still believes it is connected, a reconnect when the connection is up now.
void report_connection_changes(zal_ipod_handle *h) {
    if (h->connection_changes.load() == 0) return;
    bool idle = false;
    if (!h->reporting_connection.compare_exchange_strong(idle, true)) return;
    unsigned changes;
    while ((changes = h->connection_changes.exchange(0)) != 0) {
        zal_ipod_connection_cb cb = h->connection_cb.load();
        void *user = h->connection_cb_data.load();
        if ((changes & kConnectionLost) != 0 && h->reported_up.load()) {
            h->reported_up = false;
            if (cb != nullptr) cb(h, ZALIPOD_CONNECTION_LOST, user);
        }
        if ((changes & kConnectionRestored) != 0 && h->fd.load() >= 0 && !h->reported_up.load()) {
            h->reported_up = true;
            if (cb != nullptr) cb(h, ZALIPOD_CONNECTION_RESTORED, user);
        }
    }
    h->reporting_connection = false;
}

}  // namespace

int zal_event_kind_of(const char *type) {
    const event_row *row = event_row_of(type);
    return row != nullptr ? row->kind : ZALIPOD_EVENT_UNKNOWN;
}

extern "C" {

ZAL_API void zal_ipod_pending_event(zal_ipod_handle *h) {
    if (h == nullptr) return;
    report_connection_changes(h);
    while (zal_ipod_reply *r = take_dispatchable(h)) {
        while (r != nullptr) {
            zal_ipod_reply *next = r->next;
            if (r->opcode == ZAL_OP_EVENT)
                process_event(h, r);
            else
                process_reply(h, r);
            reply_record_free(r);
            r = next;
        }
    }
}

ZAL_API void zal_ipod_set_event_cb(zal_ipod_handle *h, zal_ipod_event_cb cb, void *user) {
    if (h == nullptr) return;
    h->event_cb_data = user;
    h->event_cb = cb;
}

ZAL_API void zal_ipod_set_connection_cb(zal_ipod_handle *h, zal_ipod_connection_cb cb, void *user) {
    if (h == nullptr) return;
    h->connection_cb_data = user;
    h->connection_cb = cb;
}

ZAL_API void zal_ipod_set_reply_cb(zal_ipod_handle *h, zal_ipod_reply_cb cb, void *user) {
    if (h == nullptr) return;
    h->reply_cb_data = user;
    h->reply_cb = cb;
}

ZAL_API int zal_ipod_read(zal_ipod_handle *h) {
    if (h == nullptr) return -1;
    int queued = zal_ipod_receive(h);
    if (queued > 0)
        zal_ipod_pending_event(h);
    else
        report_connection_changes(h);
    return queued;
}

ZAL_API int zal_ipod_events_iterate(zal_ipod_handle *h) {
    if (h == nullptr) return 0;
    zal_ipod_receive(h);
    zal_ipod_pending_event(h);
    sched_yield();
    return 0;
}

ZAL_API int zal_ipod_set_loopthread(zal_ipod_handle *h, int run) {
    if (h == nullptr) return -1;
    if (run != 0) {
        if (h->loop_started) return 0;  // one loop thread per handle
        h->loop_stop = 0;
        int result = pthread_create(&h->loop_thread, nullptr, callbackThread, h);
        if (result != 0) {
            ZAL_LOGE("%s: cannot start the event thread: %s\n", __func__, strerror(result));
            return -1;
        }
        h->loop_started = true;
        pthread_setname_np(h->loop_thread, "IAP2EventThread");
        return 0;
    }
    if (!h->loop_started) return 0;
    h->loop_stop = 1;
    int result = pthread_join(h->loop_thread, nullptr);
    h->loop_started = false;
    return result;
}

}  // extern "C"
