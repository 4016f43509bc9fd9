// The client handle: one per connection to the daemon. Every exported zal_ipod_ function
// takes it first. Sections: connection, session and devices, pending-reply slots, the
// cached state of each command family (one struct member per family, declared in the
// family's own header), the event thread, the reader and its locks, the transaction tables.
#pragma once

#include <pthread.h>

#include <atomic>
#include <cstdint>

#include "zal-ipod-2/zal-ipod-2.h"
#include "zal-ipod-2/browser_state.h"
#include "zal-ipod-2/device_control_state.h"
#include "zal-ipod-2/device_info_state.h"
#include "zal-ipod-2/family_state.h"
#include "zal-ipod-2/media_db_state.h"
#include "zal-ipod-2/playback_state.h"

// Transaction ids of the last request of each kind whose reply needs a decoder of its own.
// The order of comparison is the decoder table's (reply_decoders.cpp). 0 is never a tid.
struct zal_pending_slots {
    uint16_t track_info_tid = 0;
    uint16_t artwork_tid = 0;
    uint16_t artwork_by_uid_tid = 0;
    uint16_t play_state_tid = 0;
    uint16_t chapter_index_tid = 0;
    uint16_t chapter_status_tid = 0;
    uint16_t track_index_tid = 0;
    uint16_t session_tid = 0;
    uint16_t category_tid = 0;
    uint16_t records_tid = 0;
    uint16_t select_db_tid = 0;
    uint16_t preference_tid = 0;
    uint16_t indexed_track_info_tid = 0;
    uint16_t itunes_info_tid = 0;
    uint16_t db_track_info_tid = 0;
    uint16_t pb_track_info_tid = 0;
    uint16_t uid_list_tid = 0;
    uint16_t lingo_version_tid = 0;
    uint16_t localization_tid = 0;
    uint16_t voiceover_item_tid = 0;
    uint16_t sample_rate_tid = 0;
    uint32_t preference_class = 0;
};

// Bits of zal_ipod_handle::connection_changes.
constexpr unsigned kConnectionLost = 1u;
constexpr unsigned kConnectionRestored = 2u;

// Every 16-bit transaction id has an entry, so lookups need no range check.
constexpr std::size_t kTransactionTableSize = 65536;
// request_opcodes entry of a request whose wait gave up.
constexpr uint16_t kTimedOutOpcode = 0xDEAD;

struct zal_ipod_handle {
    // Connection. fd is -1 exactly while there is no usable socket.
    std::atomic<int> fd{-1};
    char *address = nullptr;
    std::atomic<int> is_remote{0};
    uint16_t last_tid = 0;
    unsigned char *rx_buffer = nullptr;
    uint32_t rx_length = 0;
    uint32_t rx_capacity = 0;
    std::atomic<zal_ipod_event_cb> event_cb{nullptr};
    std::atomic<void *> event_cb_data{nullptr};
    std::atomic<zal_ipod_reply_cb> reply_cb{nullptr};
    std::atomic<void *> reply_cb_data{nullptr};
    zal_ipod_reply *queue = nullptr;       // dummy head; records follow through next
    zal_ipod_reply *queue_tail = nullptr;  // last record (the head while empty)
    std::atomic<int32_t> queue_count{0};
    // True while a reconnect runs: the HELLO inside it runs the reader, which must not
    // start another reconnect (nested or from a second thread).
    std::atomic<bool> reconnecting{false};
    // Set by a sender whose write failed: the socket was shut down and the reader closes
    // it (under both locks) before it reconnects, so the number is never reused while
    // another thread still waits on it.
    std::atomic<bool> send_failed{false};
    // Set when the daemon closed its end (a read returned 0). The descriptor stays, as
    // with any other read error that is not a reset, but it would now poll readable
    // forever: the reader waits out its half second instead of spinning, until a failed
    // send marks the socket broken and the next read reconnects.
    std::atomic<bool> peer_closed{false};

    // Connection state reports (opt-in): the application's callback, and the changes the
    // reader noticed that the dispatcher has not reported yet (kConnectionLost /
    // kConnectionRestored bits). Reported by the dispatcher, never from inside the reader.
    std::atomic<zal_ipod_connection_cb> connection_cb{nullptr};
    std::atomic<void *> connection_cb_data{nullptr};
    std::atomic<unsigned> connection_changes{0};
    // True while the connection callback runs: a change noticed meanwhile waits until it
    // returns instead of calling it again from within.
    std::atomic<bool> reporting_connection{false};
    // The state the application was last told (connected at first).
    std::atomic<bool> reported_up{true};

    // Session and devices.
    std::atomic<uint32_t> ready{0};
    std::atomic<int32_t> current_session{0};
    std::atomic<int32_t> session_opened{0};
    gval *devices = nullptr;
    char *device_name = nullptr;
    // Swapped atomically: several threads' decoders and dispatchers replace it.
    std::atomic<char *> error_message{nullptr};
    // Held while an event or a session reply is applied to the device list and the cached
    // state, so that dispatchers on two threads never write the same field at once. Taken
    // alone, never together with the two locks below, and never across a callback.
    pthread_mutex_t state_lock = PTHREAD_MUTEX_INITIALIZER;

    // Pending-reply slots.
    zal_pending_slots slots;

    // Cached state of the command families. A family declares its state struct in its own
    // internal header and adds one member here; the struct's destructor releases what it
    // owns (zal_ipod_close destroys the handle) and its reset() joins the cache reset of
    // connect and session open (zal_playback_cache_reset).
    zal_playback_state playback;
    int32_t protocol = 0;
    zal_artwork_state artwork;
    zal_records_state records;
    zal_browser_state browser;
    zal_voiceover_state voiceover;
    zal_device_info_state device_info;

    // Event thread.
    pthread_t loop_thread{};
    bool loop_started = false;
    std::atomic<int> loop_stop{0};

    // Reader and locks. Lock order: read_lock before send_lock.
    pthread_mutex_t send_lock = PTHREAD_MUTEX_INITIALIZER;
    pthread_mutex_t read_lock = PTHREAD_MUTEX_INITIALIZER;

    // Transaction tables, indexed by tid.
    uint32_t start_times[kTransactionTableSize] = {};
    uint16_t request_opcodes[kTransactionTableSize] = {};

    // Reply time-out; the wait counts whole seconds only.
    std::atomic<uint32_t> read_timeout_sec{5};
    uint32_t read_timeout_usec = 0;

    zal_ipod_handle() = default;
    zal_ipod_handle(const zal_ipod_handle &) = delete;
    zal_ipod_handle &operator=(const zal_ipod_handle &) = delete;
    ~zal_ipod_handle();
};

// Replaces the handle's error text by a copy of text (NULL clears it).
void zal_set_error_message(zal_ipod_handle *h, const char *text);
