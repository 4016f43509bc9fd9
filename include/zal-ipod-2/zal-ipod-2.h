/**
 * @file
 * zal-ipod-2: the client API of the zald-2 accessory daemon.
 *
 * Connect with zal_ipod_connect(), list the attached devices, open a session on one of
 * them, then send commands. Every command has two forms:
 *   - zal_ipod_<command>(h, ...)       sends the request and returns its transaction id
 *                                      (1..65534), or 0 when nothing was sent;
 *   - zal_ipod_<command>_sync(h, ...)  sends, waits for the reply (5 s by default, see
 *                                      zal_ipod_set_read_timeout) and returns the decoded
 *                                      result, -1 on any failure.
 * Events pushed by the daemon reach the event callback, on the thread that runs the
 * dispatcher: your own loop (zal_ipod_read / zal_ipod_events_iterate), a _sync call, or
 * the library's loop thread (zal_ipod_set_loopthread).
 *
 * Threads: any thread may send and wait on a handle. Callbacks run with no library lock
 * held, so they may send commands themselves. Cached state (device list, error text,
 * playback cache) has no lock: serialise its readers with packet processing.
 *
 * In detail, unless a function's own comment says otherwise:
 *   - commands (both forms), zal_ipod_send_packet and zal_ipod_wait_for_tid may be called
 *     from any thread, several at once, and from inside the event and reply callbacks. A
 *     wait (a _sync form, zal_ipod_wait_for_tid) reads and dispatches while it waits, so
 *     other events may reach the callbacks, on the waiting thread, before it returns;
 *   - the dispatcher (zal_ipod_read, zal_ipod_events_iterate, zal_ipod_pending_event) may
 *     run on several threads at once: each packet is delivered once, but callbacks may then
 *     run on those threads at the same time. It may also be called from inside a callback;
 *   - cached state is written by whichever thread dispatches: read it on that thread (the
 *     event callback is the natural place) or while no other thread dispatches;
 *   - zal_ipod_close and zal_ipod_set_loopthread belong to the thread that owns the handle
 *     and are never called from inside a callback;
 *   - the event record accessors only read the record they are given: any thread.
 */
#ifndef ZAL_IPOD_2_H
#define ZAL_IPOD_2_H

#include <stdint.h>

#include "common.h"
#include "opcodes.h"
#include "serialize.h"
#include "zal_export.h"

ZAL_BEGIN_DECLS

/* ---------------------------------------------------------------------------------------
 * Records
 * ------------------------------------------------------------------------------------- */

/** A connection to the daemon. Opaque; made by zal_ipod_connect, ended by zal_ipod_close. */
typedef struct zal_ipod_handle zal_ipod_handle;

/** One received packet, payload still encoded. A record returned by zal_ipod_wait_for_tid
 * belongs to the caller, who releases it with zal_ipod_reply_free. */
typedef struct zal_ipod_reply {
    uint16_t tid;                /**< transaction id; 0 for events */
    uint16_t opcode;             /**< ZAL_OP_RETURN or ZAL_OP_ERROR for replies */
    uint32_t length;             /**< payload bytes */
    unsigned char *payload;      /**< the encoded value (unserialize()), NULL when empty */
    struct zal_ipod_reply *next; /**< the library's queue link; NULL in a returned record */
} zal_ipod_reply;

/** What a command hands to zal_ipod_send_packet; the sender fills in tid. The payload
 * stays the caller's. */
typedef struct zal_ipod_send_record {
    uint16_t tid;       /**< set by zal_ipod_send_packet */
    uint16_t opcode;    /**< ZAL_OP_* of the request */
    uint32_t reserved0; /**< unused, keep 0 */
    gval *payload;      /**< NULL: no payload */
    uint32_t reserved1; /**< unused, keep 0 */
    uint32_t reserved2; /**< unused, keep 0 */
} zal_ipod_send_record;

/** Event kinds, as zal_ipod_event_type() returns them. */
enum {
    ZALIPOD_EVENT_CONNECTED = 1,
    ZALIPOD_EVENT_DISCONNECTED = 2,
    ZALIPOD_EVENT_DETECTION_FAILED = 3,
    ZALIPOD_EVENT_AUTHENTICATED = 4,
    ZALIPOD_EVENT_MODE_CHANGED = 5,
    ZALIPOD_EVENT_PLAYSTATE_CHANGED = 6,
    ZALIPOD_EVENT_TRACK_CHANGED = 7,
    ZALIPOD_EVENT_TRACKINFO_RETRIEVED = 8, /**< never produced */
    ZALIPOD_EVENT_SAMPLERATE_RETRIEVED = 9,
    ZALIPOD_EVENT_TRACK_POSITION_CHANGED = 10,
    ZALIPOD_EVENT_CHAPTER_CHANGED = 11,
    ZALIPOD_EVENT_INITSTATE = 12,
    ZALIPOD_EVENT_IAP2_INUSE = 13,
    ZALIPOD_EVENT_MEDIALIBRARYUPDATE = 14,
    ZALIPOD_EVENT_MEDIA_CHANGED = 15,
    ZALIPOD_EVENT_ARTWORK_TRANSFER_DONE = 16,
    ZALIPOD_EVENT_BT_CONNECTION_UPDATE = 17,
    ZALIPOD_EVENT_EAP_DATAGRAM = 18,
    ZALIPOD_EVENT_LOCATION_INFORMATION = 19,
    ZALIPOD_EVENT_PLAYING_APP = 20,
    ZALIPOD_EVENT_TELEPHONY_CALLSTATE_INFORMATION = 21,
    ZALIPOD_EVENT_VEHICLE_STATUS_UPDATE = 22,
    ZALIPOD_EVENT_WIFI_INFORMATION = 23,
    ZALIPOD_EVENT_TELEPHONY_UPDATE = 24,
    ZALIPOD_EVENT_TRACK_IS_AUDIOBOOK = 25, /**< also "track contains video": same kind */
    ZALIPOD_EVENT_SHUFFLE_MODE_CHANGED = 26,
    ZALIPOD_EVENT_REPEAT_MODE_CHANGED = 27,
    ZALIPOD_EVENT_DISCONNECTED_HOSTMODE = 28,
    ZALIPOD_EVENT_ROLE_SWITCHED = 29,
    ZALIPOD_EVENT_TELEPHONY_VCARD_INFORMATION = 30,
    ZALIPOD_EVENT_DEVICE_NAME = 31,
    ZALIPOD_EVENT_WIRELESS_CARPLAY_UPDATE = 32,
    ZALIPOD_EVENT_UNKNOWN = 33
};

/** An event. The dispatcher's record lives only during the event callback; keep one with
 * zal_ipod_event_clone_data and release the clone with zal_ipod_event_free. */
typedef struct zal_ipod_event {
    int32_t kind;     /**< ZALIPOD_EVENT_* */
    uint16_t session; /**< the event's session number */
    char serial[256]; /**< serial of the device concerned, "" when none came */
    gval *data;       /**< owned copy of the event's data, or NULL */
} zal_ipod_event;

/** @name Callbacks
 * Their results are ignored. They run on the thread that dispatches, with no library lock
 * held: they may send commands, wait for replies and read the handle's cached state, but
 * must not close the handle or stop the loop thread.
 * @{ */
/** Receives every event. The event record is released when the callback returns. */
typedef int (*zal_ipod_event_cb)(zal_ipod_handle *h, zal_ipod_event *event, void *user);
/** Receives replies no wait took, with the decoded result of the request tid. `error` is
 * the handle's error text (owned by the handle) or NULL. */
typedef int (*zal_ipod_reply_cb)(zal_ipod_handle *h, uint16_t tid, int32_t result,
                                 const char *error, void *user);
/** @} */

/* ---------------------------------------------------------------------------------------
 * Connection
 * ------------------------------------------------------------------------------------- */

/** Connects to the daemon's local socket and fetches the device list. `address` (may be
 * NULL) is only used to connect again after the connection was lost: "host:port" (TCP;
 * port 0 means 1910, an empty host 0.0.0.0), "path:-1" or "path" (a local socket file).
 * Without it the environment variable ZALIPODDAEMON is read. NULL when unreachable. */
ZAL_API zal_ipod_handle *zal_ipod_connect(const char *address);
/** Releases the handle. Stop the loop thread first (zal_ipod_set_loopthread(h, 0)). Call
 * it on the thread that owns the handle once no other thread uses it, never from inside a
 * callback. */
ZAL_API void zal_ipod_close(zal_ipod_handle *h);
/** The socket, for applications that wait on it themselves and then call zal_ipod_read;
 * -1 while disconnected. */
ZAL_API int zal_ipod_fd(zal_ipod_handle *h);
/** 1 once a reconnection went over TCP, else 0. */
ZAL_API int zal_ipod_is_remote(zal_ipod_handle *h);
/** -1 disconnected, 0 no session open or not ready yet, 1 ready for commands. */
ZAL_API int zal_ipod_is_ready(zal_ipod_handle *h);
/** Reply time-out of the _sync forms (whole seconds count; default 5 s). Set it before
 * other threads wait on the handle. */
ZAL_API void zal_ipod_set_read_timeout(zal_ipod_handle *h, unsigned int seconds,
                                       unsigned int microseconds);
/** Tells the daemon that the application is attached (no reply expected); returns the
 * number of bytes written, -1 on failure. */
ZAL_API int zal_ipod_notify_attached(zal_ipod_handle *h);

/* ---------------------------------------------------------------------------------------
 * Packets and transactions (commands use these; applications rarely need them)
 * ------------------------------------------------------------------------------------- */

/** Sends one packet; fills record->tid; returns the number of bytes written or -1. */
ZAL_API int zal_ipod_send_packet(zal_ipod_handle *h, zal_ipod_send_record *record);
/** Sends HELLO; returns its transaction id. */
ZAL_API uint16_t zal_ipod_hello(zal_ipod_handle *h);
/** Waits for the reply to tid; NULL on time-out or lost connection. Release the record
 * with zal_ipod_reply_free. While it waits it reads and dispatches, so events may reach the
 * event callback on this thread before it returns. */
ZAL_API zal_ipod_reply *zal_ipod_wait_for_tid(zal_ipod_handle *h, uint16_t tid);
/** Releases a record that zal_ipod_wait_for_tid returned; NULL is ignored. */
ZAL_API void zal_ipod_reply_free(zal_ipod_reply *reply);
/** The "error" text of the last reply that carried one, or NULL; owned by the handle. */
ZAL_API const char *zal_ipod_get_error_message(zal_ipod_handle *h);

/* ---------------------------------------------------------------------------------------
 * Events, replies and the event loop
 * ------------------------------------------------------------------------------------- */

/** Sets the event callback and the pointer it receives; NULL removes the callback. Any
 * thread, also from inside a callback. The two are stored one after the other: a
 * dispatcher running on another thread at that moment may pair the old callback with the
 * new pointer once, so set callbacks before other threads dispatch. */
ZAL_API void zal_ipod_set_event_cb(zal_ipod_handle *h, zal_ipod_event_cb cb, void *user);
/** Sets the reply callback like zal_ipod_set_event_cb. With a reply callback set, replies
 * no _sync call took go to it (use the asynchronous forms then: a _sync wait may lose its
 * reply to the callback). */
ZAL_API void zal_ipod_set_reply_cb(zal_ipod_handle *h, zal_ipod_reply_cb cb, void *user);
/** Delivers what is queued: events, and replies while a reply callback is set. */
ZAL_API void zal_ipod_pending_event(zal_ipod_handle *h);
/** One read pass (at most 0.5 s); dispatches when it queued something. Returns the number
 * of packets read, -1 when the connection failed. */
ZAL_API int zal_ipod_read(zal_ipod_handle *h);
/** One read pass, then the dispatcher; returns 0. */
ZAL_API int zal_ipod_events_iterate(zal_ipod_handle *h);
/** run != 0 starts the loop thread "IAP2EventThread" (which runs zal_ipod_events_iterate
 * until stopped); run == 0 stops and joins it. 0 on success. Call it on the thread that
 * owns the handle, never from inside a callback (the loop thread cannot join itself). */
ZAL_API int zal_ipod_set_loopthread(zal_ipod_handle *h, int run);

/* ---------------------------------------------------------------------------------------
 * Devices and sessions
 * ------------------------------------------------------------------------------------- */

/** @name Device list
 * Index-based accessors on the cached device list, which events and the session replies
 * update on the thread that dispatches: read it there (e.g. in the event callback) or
 * while no other thread dispatches.
 * @{ */
/** Number of devices the daemon reported. */
ZAL_API int zal_ipod_device_count(zal_ipod_handle *h);
/** Field of the entry at index that the name says; an invalid index gives the default (0,
 * NULL, or -1 for the protocol). Strings stay valid until the list changes. */
ZAL_API const char *zal_ipod_device_serial(zal_ipod_handle *h, int index);
ZAL_API int zal_ipod_device_transport_mode(zal_ipod_handle *h, int index);
ZAL_API int zal_ipod_device_usb_bus(zal_ipod_handle *h, int index);
ZAL_API int zal_ipod_device_usb_address(zal_ipod_handle *h, int index);
ZAL_API int zal_ipod_device_rfcomm_id(zal_ipod_handle *h, int index);
ZAL_API int zal_ipod_device_used(zal_ipod_handle *h, int index);
ZAL_API int zal_ipod_device_authenticated(zal_ipod_handle *h, int index);
ZAL_API int zal_ipod_device_is_extended(zal_ipod_handle *h, int index);
/** "protocolinuse" of the entry: 2 for iAP2; -1 by default. */
ZAL_API int zal_ipod_device_protocol(zal_ipod_handle *h, int index);
/** Name from the last device-name event, or NULL. */
ZAL_API const char *zal_ipod_device_name(zal_ipod_handle *h);
/** @} */

/** Opens a session on the device at index; the reply makes the handle ready. Returns the
 * transaction id, 0 when nothing was sent. */
ZAL_API int zal_ipod_open_session(zal_ipod_handle *h, int device_index);
/** Opens a session and waits for the reply: the daemon's result, -1 on failure. */
ZAL_API int zal_ipod_open_session_sync(zal_ipod_handle *h, int device_index);
/** Closes the current session; returns the transaction id, 0 when nothing was sent. */
ZAL_API int zal_ipod_close_session(zal_ipod_handle *h);
/** Closes the current session and waits: the daemon's result, -1 on failure. */
ZAL_API int zal_ipod_close_session_sync(zal_ipod_handle *h);
/** Index of the device in session, -1 when it went away. */
ZAL_API int zal_ipod_current_session(zal_ipod_handle *h);
/** 1 while a session is open, else 0. */
ZAL_API int zal_ipod_is_session_opened(zal_ipod_handle *h);

/* ---------------------------------------------------------------------------------------
 * Event records
 * ------------------------------------------------------------------------------------- */

/** Kind of the event; ZALIPOD_EVENT_UNKNOWN for NULL. */
ZAL_API int zal_ipod_event_type(const zal_ipod_event *event);
/** Serial of the device concerned (from the data for CONNECTED and DISCONNECTED). */
ZAL_API const char *zal_ipod_event_get_serial(const zal_ipod_event *event);
/** A deep copy the caller releases with zal_ipod_event_free; NULL when out of memory. */
ZAL_API zal_ipod_event *zal_ipod_event_clone_data(const zal_ipod_event *event);
/** Releases a copy made by zal_ipod_event_clone_data, its data included; NULL is ignored. */
ZAL_API void zal_ipod_event_free(zal_ipod_event *event);
/** Releases only the data of a record (data becomes NULL); the record stays. */
ZAL_API void zal_ipod_event_free_data(zal_ipod_event *event);

/** @name Event accessors
 * Each returns its default (-1 for integers unless said, NULL for strings) when the event
 * is of another kind or lacks the field. Strings belong to the event record.
 * @{ */
/** The field of the event's data that the name says, for the kind the name says; the
 * default when the event is of another kind or lacks the field. */
ZAL_API const char *zal_ipod_event_connected_serial(const zal_ipod_event *event);
ZAL_API const char *zal_ipod_event_disconnected_serial(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_authenticated(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_mode_changed(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_time_position(const zal_ipod_event *event);
/** Progress of a media library update, in percent; default -2. */
ZAL_API int zal_ipod_event_get_media_lib_update_progress(const zal_ipod_event *event);
ZAL_API const char *zal_ipod_event_bluetooth_status(const zal_ipod_event *event);
ZAL_API const char *zal_ipod_event_get_playing_app(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_shuffle_status(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_role_switched(const zal_ipod_event *event);

ZAL_API int zal_ipod_event_eap_datagram_session_id(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_eap_datagram_protocol_index(const zal_ipod_event *event);
/** The datagram bytes; their count goes to *length (left unchanged on NULL). */
ZAL_API const void *zal_ipod_event_eap_datagram_data(const zal_ipod_event *event, uint32_t *length);

ZAL_API int zal_ipod_event_location_information_state(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_location_supported_NMEA(const zal_ipod_event *event);

ZAL_API const char *zal_ipod_event_telephony_callstate_remote_id(const zal_ipod_event *event);
ZAL_API const char *zal_ipod_event_telephony_callstate_display_name(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_telephony_callstate_status(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_telephony_callstate_direction(const zal_ipod_event *event);
ZAL_API const char *zal_ipod_event_telephony_callstate_call_uuid(const zal_ipod_event *event);
ZAL_API const char *zal_ipod_event_telephony_callstate_address_book_id(const zal_ipod_event *event);
ZAL_API const char *zal_ipod_event_telephony_callstate_label(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_telephony_callstate_service(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_telephony_callstate_is_conferenced(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_telephony_callstate_conference_group(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_telephony_callstate_disconnect_reason(const zal_ipod_event *event);

ZAL_API int zal_ipod_event_vehicle_status_update_is_started(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_vehicle_status_update_night_mode(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_vehicle_status_update_range(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_vehicle_status_update_outside_temperature(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_vehicle_status_update_inside_temperature(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_vehicle_status_update_range_warning(const zal_ipod_event *event);

ZAL_API int zal_ipod_event_wifi_information_status(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_wifi_information_type(const zal_ipod_event *event);
/** 1 with the SSID stored through `out`; -1 (out unchanged) when absent. */
ZAL_API int zal_ipod_event_wifi_information_ssid(const zal_ipod_event *event, const char **out);
/** 1 with the passphrase stored through `out`; -1 (out unchanged) when absent. */
ZAL_API int zal_ipod_event_wifi_information_passphrase(const zal_ipod_event *event,
                                                       const char **out);

ZAL_API int zal_ipod_event_telephony_update_strength(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_telephony_update_registration_status(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_telephony_update_airplane_mode(const zal_ipod_event *event);
ZAL_API const char *zal_ipod_event_telephony_update_carrier_name(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_telephony_update_cellular_supported(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_telephony_update_telephony_enabled(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_telephony_update_facetime_audio_enabled(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_telephony_update_facetime_video_enabled(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_telephony_update_mute_status(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_telephony_update_current_call_count(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_telephony_update_new_voicemail_count(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_telephony_update_initiate_call_available(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_telephony_update_end_and_accept_available(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_telephony_update_hold_and_accept_available(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_telephony_update_swap_available(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_telephony_update_merge_available(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_telephony_update_hold_available(const zal_ipod_event *event);

ZAL_API int zal_ipod_event_wireless_carplay_update_status(const zal_ipod_event *event);
/** @} */

/* ---------------------------------------------------------------------------------------
 * Simple commands (no argument; _sync returns the daemon's integer or -1)
 * Keep-alive is sent on any connected handle; the others need a ready handle.
 * ------------------------------------------------------------------------------------- */

/** Declares the two forms of a simple command. */
#define ZAL_IPOD_SIMPLE_COMMAND(name)                \
    ZAL_API int zal_ipod_##name(zal_ipod_handle *h); \
    ZAL_API int zal_ipod_##name##_sync(zal_ipod_handle *h);

/** @name Simple commands
 * @{ */
/** The command the name says. The plain form returns the transaction id (0 when nothing was
 * sent), the _sync form the daemon's integer, or -1. */
ZAL_IPOD_SIMPLE_COMMAND(keep_alive)
ZAL_IPOD_SIMPLE_COMMAND(play)
ZAL_IPOD_SIMPLE_COMMAND(playpause)
ZAL_IPOD_SIMPLE_COMMAND(stop)
ZAL_IPOD_SIMPLE_COMMAND(pause)
ZAL_IPOD_SIMPLE_COMMAND(next_track)
ZAL_IPOD_SIMPLE_COMMAND(prev_track)
ZAL_IPOD_SIMPLE_COMMAND(mute)
ZAL_IPOD_SIMPLE_COMMAND(inc)
ZAL_IPOD_SIMPLE_COMMAND(dec)
ZAL_IPOD_SIMPLE_COMMAND(start_device_audio_info)
ZAL_IPOD_SIMPLE_COMMAND(stop_device_audio_info)
ZAL_IPOD_SIMPLE_COMMAND(start_tracking_dec)
ZAL_IPOD_SIMPLE_COMMAND(start_tracking_inc)
ZAL_IPOD_SIMPLE_COMMAND(start_tracking_normal)
ZAL_IPOD_SIMPLE_COMMAND(start_ffw)
ZAL_IPOD_SIMPLE_COMMAND(start_rew)
ZAL_IPOD_SIMPLE_COMMAND(stop_ffwrew)
ZAL_IPOD_SIMPLE_COMMAND(voice_command)
ZAL_IPOD_SIMPLE_COMMAND(promote)
ZAL_IPOD_SIMPLE_COMMAND(demote)
ZAL_IPOD_SIMPLE_COMMAND(add_to_cart)
ZAL_IPOD_SIMPLE_COMMAND(start_bt_connection_updates)
ZAL_IPOD_SIMPLE_COMMAND(stop_bt_connection_updates)
/** @} */

#undef ZAL_IPOD_SIMPLE_COMMAND

/* ---- Runtime configuration ---------------------------------------------------------------
 * The daemon's configuration keys, read and written on any connected handle (no session
 * needed). The keys and their values are the daemon's; the library passes them through. */
/** SET_CONFIG with key and value; returns the request's transaction id. */
ZAL_API uint16_t zal_ipod_set_config(zal_ipod_handle *h, const char *key, const char *value);
/** 1 when the daemon updated its configuration or its running context, 0 when neither
 * (each refusal logged as an error), -1 without a reply. */
ZAL_API int zal_ipod_set_config_sync(zal_ipod_handle *h, const char *key, const char *value);
/** GET_CONFIG for key; returns the request's transaction id. */
ZAL_API uint16_t zal_ipod_get_config(zal_ipod_handle *h, const char *key);
/** Room that zal_ipod_get_config_sync needs in out, terminator included. */
#define ZAL_IPOD_CONFIG_VALUE_SIZE 1024
/** 1 with the value copied whole into out, which must hold ZAL_IPOD_CONFIG_VALUE_SIZE
 * bytes; else the daemon's error code; else -2 (no reply, neither in it, or a value too
 * long for that room, which is logged and never cut: out is then untouched). */
ZAL_API int zal_ipod_get_config_sync(zal_ipod_handle *h, const char *key, char *out);

/* ---- Now playing -------------------------------------------------------------------------
 * Playback state, the current-track cache and artwork.
 * ---------------------------------------------------------------------------------- */

/* Every command below has the asynchronous form (returns the transaction id, 0 when the
 * handle is not ready) and the _sync form (waits and returns the decoded result, -1 on any
 * failure unless said otherwise). Replies to the asynchronous forms of the track-info,
 * sample-rate, play-state, chapter-status, track-index, preference and artwork requests
 * update the same cache when a reply callback takes them. */

/** CURRENT_TRACK_INFO. _sync: the reply's "current_track_info" result (1 when a track is
 * current). Fills title, chapter, artist, album and artwork name (those present), and
 * length, position, state, track index, number of tracks, has artwork, has chapters and
 * the time stamp (-1, or 0 for the time stamp, when absent). */
ZAL_API int zal_ipod_current_track_info(zal_ipod_handle *h);
/** Synchronous form of zal_ipod_current_track_info. */
ZAL_API int zal_ipod_current_track_info_sync(zal_ipod_handle *h);
/** CURRENT_TRACK_SAMPLE_RATE. _sync: the sample rate, also cached. */
ZAL_API int zal_ipod_current_track_sample_rate(zal_ipod_handle *h);
/** Synchronous form of zal_ipod_current_track_sample_rate. */
ZAL_API int zal_ipod_current_track_sample_rate_sync(zal_ipod_handle *h);
/** CURRENT_TRACK_IS_AUDIOBOOK. _sync: the reply's "is_audiobook_explicitly" (not cached). */
ZAL_API int zal_ipod_current_track_is_audiobook(zal_ipod_handle *h);
/** Synchronous form of zal_ipod_current_track_is_audiobook. */
ZAL_API int zal_ipod_current_track_is_audiobook_sync(zal_ipod_handle *h);
/** CURRENT_TRACK_CONTAINS_VIDEO. _sync: the reply's "contains_video_explicitly". */
ZAL_API int zal_ipod_current_track_contains_video(zal_ipod_handle *h);
/** Synchronous form of zal_ipod_current_track_contains_video. */
ZAL_API int zal_ipod_current_track_contains_video_sync(zal_ipod_handle *h);
/** GET_PLAY_STATE. _sync: the play status, cached with the track length and position. */
ZAL_API int zal_ipod_get_play_state(zal_ipod_handle *h);
/** Synchronous form of zal_ipod_get_play_state. */
ZAL_API int zal_ipod_get_play_state_sync(zal_ipod_handle *h);
/** GET_CURRENT_DRAW. _sync: the device's current draw ("current_draw"). */
ZAL_API int zal_ipod_device_current_draw(zal_ipod_handle *h);
/** Synchronous form of zal_ipod_device_current_draw. */
ZAL_API int zal_ipod_device_current_draw_sync(zal_ipod_handle *h);
/** GET_IF_CHARGE. _sync: whether the device charges from its power ("if_charge"). */
ZAL_API int zal_ipod_device_charge_if_power(zal_ipod_handle *h);
/** Synchronous form of zal_ipod_device_charge_if_power. */
ZAL_API int zal_ipod_device_charge_if_power_sync(zal_ipod_handle *h);
/** GET_CURRENT_TRACK_INDEX. _sync: the index, also cached (-1 after any failure). */
ZAL_API int zal_ipod_get_current_track_index(zal_ipod_handle *h);
/** Synchronous form of zal_ipod_get_current_track_index. */
ZAL_API int zal_ipod_get_current_track_index_sync(zal_ipod_handle *h);
/** GET_SHUFFLE. _sync: the shuffle mode. */
ZAL_API int zal_ipod_get_shuffle(zal_ipod_handle *h);
/** Synchronous form of zal_ipod_get_shuffle. */
ZAL_API int zal_ipod_get_shuffle_sync(zal_ipod_handle *h);
/** Same as zal_ipod_get_shuffle_sync (kept for older applications). */
ZAL_API int _zal_ipod_get_shuffle_sync(zal_ipod_handle *h);
/** GET_REPEAT. _sync: the repeat mode. */
ZAL_API int zal_ipod_get_repeat(zal_ipod_handle *h);
/** Synchronous form of zal_ipod_get_repeat. */
ZAL_API int zal_ipod_get_repeat_sync(zal_ipod_handle *h);
/** Same as zal_ipod_get_repeat_sync (kept for older applications). */
ZAL_API int _zal_ipod_get_repeat_sync(zal_ipod_handle *h);
/** GET_CURRENT_PLAYING_TRACK_CHAPTER_INDEX. _sync: the chapter index. */
ZAL_API int zal_ipod_get_chapter_index(zal_ipod_handle *h);
/** Synchronous form of zal_ipod_get_chapter_index. */
ZAL_API int zal_ipod_get_chapter_index_sync(zal_ipod_handle *h);
/** Same as zal_ipod_get_chapter_index_sync (kept for older applications). */
ZAL_API int _zal_ipod_get_chapter_index_sync(zal_ipod_handle *h);
/** GET_CURRENT_PLAYING_TRACK_CHAPTER_COUNT. _sync: the number of chapters. */
ZAL_API int zal_ipod_get_chapter_count(zal_ipod_handle *h);
/** Synchronous form of zal_ipod_get_chapter_count. */
ZAL_API int zal_ipod_get_chapter_count_sync(zal_ipod_handle *h);
/** Same as zal_ipod_get_chapter_count_sync (kept for older applications). */
ZAL_API int _zal_ipod_get_chapter_count_sync(zal_ipod_handle *h);
/** SET_POSITION: moves to position (the device's unit, milliseconds in practice). */
ZAL_API int zal_ipod_set_position(zal_ipod_handle *h, int position);
/** Synchronous form of zal_ipod_set_position; the daemon's integer. */
ZAL_API int zal_ipod_set_position_sync(zal_ipod_handle *h, int position);
/** SET_TRACK: plays the track at index of the current play list. */
ZAL_API int zal_ipod_set_track(zal_ipod_handle *h, int index);
/** Synchronous form of zal_ipod_set_track. */
ZAL_API int zal_ipod_set_track_sync(zal_ipod_handle *h, int index);
/** SET_CURRENT_PLAYING_TRACK_CHAPTER: moves to a chapter of the current track. */
ZAL_API int zal_ipod_set_current_playing_track_chapter(zal_ipod_handle *h, int chapter);
/** Synchronous form of zal_ipod_set_current_playing_track_chapter. */
ZAL_API int zal_ipod_set_current_playing_track_chapter_sync(zal_ipod_handle *h, int chapter);
/** GET_CURRENT_PLAYING_TRACK_CHAPTER_PLAY_STATUS for a chapter. _sync: 0, with the chapter
 * length and position cached (-1 when absent). */
ZAL_API int zal_ipod_get_current_playing_track_chapter_play_status(zal_ipod_handle *h, int chapter);
/** Synchronous form of zal_ipod_get_current_playing_track_chapter_play_status. */
ZAL_API int zal_ipod_get_current_playing_track_chapter_play_status_sync(zal_ipod_handle *h,
                                                                        int chapter);
/** SET_SHUFFLE with the device's mode number. */
ZAL_API int zal_ipod_set_shuffle(zal_ipod_handle *h, int mode);
/** Synchronous form of zal_ipod_set_shuffle. */
ZAL_API int zal_ipod_set_shuffle_sync(zal_ipod_handle *h, int mode);
/** SET_REPEAT with the device's mode number. */
ZAL_API int zal_ipod_set_repeat(zal_ipod_handle *h, int mode);
/** Synchronous form of zal_ipod_set_repeat. */
ZAL_API int zal_ipod_set_repeat_sync(zal_ipod_handle *h, int mode);
/** WRITE_TAG. */
ZAL_API int zal_ipod_write_tag(zal_ipod_handle *h);
/** Synchronous form of zal_ipod_write_tag; the daemon's integer. */
ZAL_API int zal_ipod_write_tag_sync(zal_ipod_handle *h);
/** GET_COLOR_DISPLAY_IMAGE_LIMITS. _sync: 1 for any reply (the limits cached from a reply
 * hash, 0 for a missing key), 0 without a reply. */
ZAL_API int zal_ipod_get_color_display_image_limits(zal_ipod_handle *h);
/** Synchronous form of zal_ipod_get_color_display_image_limits. */
ZAL_API int zal_ipod_get_color_display_image_limits_sync(zal_ipod_handle *h);

/* Preferences. A setting number names one (class, value) pair: 0-1 class 0, 2-3 class 1,
 * 4-5 class 2, 6-7 class 3 (values 0, 1), 8-10 class 8 (values 1-3), 11-12 class 9,
 * 13-14 class 10, 15-16 class 12, 17-18 class 13 (values 0, 1); 255 means none. A class
 * other than 0, 1, 2, 3, 8, 9, 10, 12, 13 is sent as class 0. */
/** GET_PREFERENCE for the class. */
ZAL_API int zal_ipod_get_preference(zal_ipod_handle *h, uint32_t preference_class);
/** Synchronous form: the setting number of (class, answer); 255 for a pair without one,
 * an error or no answer. */
ZAL_API int zal_ipod_get_preference_sync(zal_ipod_handle *h, uint32_t preference_class);
/** SET_PREFERENCE with (class, the value of setting); a setting outside 1..18 sends 0. */
ZAL_API int zal_ipod_set_preference(zal_ipod_handle *h, uint32_t preference_class, int setting);
/** Synchronous form of zal_ipod_set_preference; the daemon's integer. */
ZAL_API int zal_ipod_set_preference_sync(zal_ipod_handle *h, uint32_t preference_class,
                                         int setting);
/** GET_PREFERENCE with the class as given (no setting numbers). */
ZAL_API int zal_ipod_get_ipod_preference(zal_ipod_handle *h, uint32_t preference_class);
/** Synchronous form: the raw value; 255 without a reply or for one that is no integer. */
ZAL_API int zal_ipod_get_ipod_preference_sync(zal_ipod_handle *h, uint32_t preference_class);
/** SET_PREFERENCE with (class, value) as given. */
ZAL_API int zal_ipod_set_ipod_preference(zal_ipod_handle *h, uint32_t preference_class, int value);
/** Synchronous form of zal_ipod_set_ipod_preference; the daemon's integer. */
ZAL_API int zal_ipod_set_ipod_preference_sync(zal_ipod_handle *h, uint32_t preference_class,
                                              int value);

/** HEALTH_EXAMINE (synchronous only; sent on any connected handle): sends [name, extra]
 * (extra left out when NULL; it is taken and freed) and returns the decoded reply, which
 * the caller frees with serialize_free; NULL without a reply. */
ZAL_API gval *zal_ipod_health_examine(zal_ipod_handle *h, const char *name, gval *extra);

/** The last known library revision: a copy kept by the handle (no traffic). */
ZAL_API void zal_ipod_set_last_known_librevision(zal_ipod_handle *h, const char *revision);
/** The stored revision or NULL; owned by the handle. */
ZAL_API const char *zal_ipod_last_known_librevision(zal_ipod_handle *h);
/** Forgets the stored revision. */
ZAL_API void zal_ipod_free_last_known_librevision(zal_ipod_handle *h);

/* Cache getters (no traffic, never fail). Texts are owned by the handle and valid until the
 * next reply or event replaces them; integers are -1 when unknown (and for a NULL handle).
 * Connect and every session open forget length, position, state, number of tracks, track
 * and chapter numbers, sample rate, time stamp and has artwork; texts survive. */
/** Title of the current track. */
ZAL_API const char *zal_ipod_current_track_title(zal_ipod_handle *h);
/** Chapter name of the current track. */
ZAL_API const char *zal_ipod_current_track_chapter(zal_ipod_handle *h);
/** Artist of the current track. */
ZAL_API const char *zal_ipod_current_track_artist(zal_ipod_handle *h);
/** Album of the current track. */
ZAL_API const char *zal_ipod_current_track_album(zal_ipod_handle *h);
/** Artwork name (track information or the "artwork transfer done" event). */
ZAL_API const char *zal_ipod_current_track_artwork_name(zal_ipod_handle *h);
/** Track length. */
ZAL_API int zal_ipod_current_track_length(zal_ipod_handle *h);
/** Track position. */
ZAL_API int zal_ipod_current_track_position(zal_ipod_handle *h);
/** Play state (the device's numbers: 0 stopped, 1 playing, 2 paused, ...). */
ZAL_API int zal_ipod_current_track_state(zal_ipod_handle *h);
/** Init state from the "init state" event. */
ZAL_API int zal_ipod_init_state(zal_ipod_handle *h);
/** Name of the playing application (a 256-byte buffer of the handle, "" before any). */
ZAL_API const char *zal_ipod_playing_app(zal_ipod_handle *h);
/** Number of tracks of the current play list. */
ZAL_API int zal_ipod_current_number_of_tracks(zal_ipod_handle *h);
/** Index of the current track (-1 for a track of length 0). */
ZAL_API int zal_ipod_current_track_index(zal_ipod_handle *h);
/** Current chapter index. */
ZAL_API int zal_ipod_current_chapter_index(zal_ipod_handle *h);
/** Chapter count (0 after a reset). */
ZAL_API int zal_ipod_current_chapter_count(zal_ipod_handle *h);
/** Length of the chapter last asked about. */
ZAL_API int zal_ipod_current_chapter_length(zal_ipod_handle *h);
/** Position in the chapter last asked about. */
ZAL_API int zal_ipod_current_chapter_position(zal_ipod_handle *h);
/** Sample rate of the current track. */
ZAL_API int zal_ipod_current_sample_rate(zal_ipod_handle *h);
/** Time stamp (seconds) of the last track information (0 when none). */
ZAL_API int zal_ipod_current_track_timestamp(zal_ipod_handle *h);
/** Microseconds of that time stamp. */
ZAL_API int zal_ipod_current_track_timestamp_usec(zal_ipod_handle *h);
/** Whether the current track has artwork. */
ZAL_API int zal_ipod_current_track_has_artwork(zal_ipod_handle *h);
/** Whether the current track has chapters. */
ZAL_API int zal_ipod_current_track_has_chapters(zal_ipod_handle *h);
/** Shuffle mode from the last event. */
ZAL_API int zal_ipod_current_shuffle_state(zal_ipod_handle *h);
/** Repeat mode from the last event. */
ZAL_API int zal_ipod_current_repeat_state(zal_ipod_handle *h);
/** Largest picture width the display accepts (colour display limits). */
ZAL_API int zal_ipod_get_color_display_image_limits_maxImageWidth(zal_ipod_handle *h);
/** Largest picture height the display accepts (the name is spelt as the reply key). */
ZAL_API int zal_ipod_get_color_display_image_limits_maxImageHeigh(zal_ipod_handle *h);
/** Pixel format the display accepts. */
ZAL_API int zal_ipod_get_color_display_image_limits_pixelFormat(zal_ipod_handle *h);

/* Artwork. The _sync forms wait at least 20 s (a shorter reply time-out is raised for the
 * call and restored after it) and return 1 when a picture was stored, -1 otherwise (the
 * previous picture then stays, except when a shared file named by the reply cannot be
 * mapped: the record is then empty). Pixels that the daemon shares through a file are
 * mapped, not copied; the mapping is kept while it is large enough. */
/** CURRENT_TRACK_ARTWORK with the device's artwork format number. */
ZAL_API int zal_ipod_current_track_artwork(zal_ipod_handle *h, int value);
/** Synchronous form of zal_ipod_current_track_artwork. */
ZAL_API int zal_ipod_current_track_artwork_sync(zal_ipod_handle *h, int value);
/** CURRENT_TRACK_POS_ARTWORK: the picture at a time position of the current track. */
ZAL_API int zal_ipod_current_track_pos_artwork(zal_ipod_handle *h, int value, int position);
/** Synchronous form of zal_ipod_current_track_pos_artwork. */
ZAL_API int zal_ipod_current_track_pos_artwork_sync(zal_ipod_handle *h, int value, int position);
/** GET_TRACK_ARTWORK_BY_UID: the picture of the track with this persistent identifier. */
ZAL_API int zal_ipod_track_artwork_by_uid(zal_ipod_handle *h, uint64_t uid);
/** Synchronous form of zal_ipod_track_artwork_by_uid. */
ZAL_API int zal_ipod_track_artwork_by_uid_sync(zal_ipod_handle *h, uint64_t uid);
/** CURRENT_TRACK_ARTWORK_TIMES with the device's artwork format number. */
ZAL_API int zal_ipod_current_track_artwork_times(zal_ipod_handle *h, int value);
/** Synchronous form: 1 with *times (malloc'ed, the caller frees it) holding *count time
 * positions; -1 when there are none (*count is then 0 or -1 and *times untouched), on
 * any failure, or for a reply that is not a list of integers (both left untouched). */
ZAL_API int zal_ipod_current_track_artwork_times_sync(zal_ipod_handle *h, int value,
                                                      int32_t **times, int32_t *count);
/** Pixel bytes of the last picture, or NULL. Owned by the handle; valid until the next
 * artwork reply, session open or close. Shared-file pixels change when the daemon writes
 * the file again. */
ZAL_API const unsigned char *zal_ipod_current_track_artwork_data(zal_ipod_handle *h);
/** Width of the last picture in pixels. */
ZAL_API uint16_t zal_ipod_current_track_artwork_width(zal_ipod_handle *h);
/** Height of the last picture in rows. */
ZAL_API uint16_t zal_ipod_current_track_artwork_height(zal_ipod_handle *h);
/** Bytes per row of the last picture. */
ZAL_API uint16_t zal_ipod_current_track_artwork_rowstride(zal_ipod_handle *h);
/** Pixel format of the last picture as the device gives it; 255: encoded data whose length
 * is given explicitly. */
ZAL_API uint8_t zal_ipod_current_track_artwork_pixel_format(zal_ipod_handle *h);
/** Bytes of the last picture: height x row stride, or the explicit data length when that
 * product is 0; never more than the bytes readable at the data pointer. */
ZAL_API uint32_t zal_ipod_current_track_artwork_length(zal_ipod_handle *h);

/* ---- Accessory input and video out -------------------------------------------------------
 * Buttons, rotation, HID, VoiceOver and video-out settings.
 * ---------------------------------------------------------------------------------- */

/* Each command has an asynchronous form (the transaction id, 0 when the handle has no ready
 * session: commands with parameters then log "not ready2 <name>" as a warning) and a _sync
 * form that waits and returns the daemon's integer, -1 on failure or an "error" reply (whose
 * text zal_ipod_get_error_message then returns), unless its comment says otherwise. The
 * numbers are the device protocol's (button masks, rotation fields, HID descriptor fields,
 * video-out options); the library sends them unchanged. Parameters typed uint8_t and
 * uint16_t go out as integers 0..255 and 0..65535, never sign-extended. */

/** Switches the device's video output on (ENTER_VIDEOOUTMODE). */
ZAL_API int zal_ipod_enter_videooutmode(zal_ipod_handle *h);
/** Synchronous form of zal_ipod_enter_videooutmode. */
ZAL_API int zal_ipod_enter_videooutmode_sync(zal_ipod_handle *h);
/** Switches the device's video output off (EXIT_VIDEOOUTMODE). */
ZAL_API int zal_ipod_exit_videooutmode(zal_ipod_handle *h);
/** Synchronous form of zal_ipod_exit_videooutmode. */
ZAL_API int zal_ipod_exit_videooutmode_sync(zal_ipod_handle *h);
/** Asks for the video-out options; flag is sent as 1 when non-zero, else 0. */
ZAL_API int zal_ipod_get_videooutoptions(zal_ipod_handle *h, int flag);
/** Synchronous form: the options the daemon answers. */
ZAL_API int zal_ipod_get_videooutoptions_sync(zal_ipod_handle *h, int flag);
/** Sets the video-out options. */
ZAL_API int zal_ipod_set_videooutoptions(zal_ipod_handle *h, int options);
/** Synchronous form of zal_ipod_set_videooutoptions. */
ZAL_API int zal_ipod_set_videooutoptions_sync(zal_ipod_handle *h, int options);
/** Sends one navigation input to the device's video-out menu. */
ZAL_API int zal_ipod_navigate_videoout(zal_ipod_handle *h, int value);
/** Synchronous form of zal_ipod_navigate_videoout. */
ZAL_API int zal_ipod_navigate_videoout_sync(zal_ipod_handle *h, int value);
/** Asks for the device's current mode (GET_MODE). */
ZAL_API int zal_ipod_get_mode(zal_ipod_handle *h);
/** Synchronous form: the mode number. */
ZAL_API int zal_ipod_get_mode_sync(zal_ipod_handle *h);
/** Tells the device the head unit's state changed (SET_STATECHANGE). */
ZAL_API int zal_ipod_set_statechange(zal_ipod_handle *h, int state);
/** Synchronous form of zal_ipod_set_statechange. */
ZAL_API int zal_ipod_set_statechange_sync(zal_ipod_handle *h, int state);
/** Asks the device to launch an application (its identifier text; NULL sends ""). */
ZAL_API int zal_ipod_launchapplication(zal_ipod_handle *h, const char *application);
/** Synchronous form of zal_ipod_launchapplication. */
ZAL_API int zal_ipod_launchapplication_sync(zal_ipod_handle *h, const char *application);
/** Simple button state (a bit mask of pressed buttons; 0 releases them all), one command per
 * button page: context, video, audio, radio and camera buttons. A press is a mask followed
 * by 0. */
ZAL_API int zal_ipod_simple_contextbutton(zal_ipod_handle *h, int value);
/** Synchronous form of zal_ipod_simple_contextbutton. */
ZAL_API int zal_ipod_simple_contextbutton_sync(zal_ipod_handle *h, int value);
/** Video button state (see zal_ipod_simple_contextbutton). */
ZAL_API int zal_ipod_simple_videobutton(zal_ipod_handle *h, int value);
/** Synchronous form of zal_ipod_simple_videobutton. */
ZAL_API int zal_ipod_simple_videobutton_sync(zal_ipod_handle *h, int value);
/** Audio button state (see zal_ipod_simple_contextbutton). */
ZAL_API int zal_ipod_simple_audiobutton(zal_ipod_handle *h, int value);
/** Synchronous form of zal_ipod_simple_audiobutton. */
ZAL_API int zal_ipod_simple_audiobutton_sync(zal_ipod_handle *h, int value);
/** Radio button state (see zal_ipod_simple_contextbutton). */
ZAL_API int zal_ipod_simple_radiobutton(zal_ipod_handle *h, int value);
/** Synchronous form of zal_ipod_simple_radiobutton. */
ZAL_API int zal_ipod_simple_radiobutton_sync(zal_ipod_handle *h, int value);
/** Camera button state (see zal_ipod_simple_contextbutton). */
ZAL_API int zal_ipod_simple_camerabutton(zal_ipod_handle *h, int value);
/** Synchronous form of zal_ipod_simple_camerabutton. */
ZAL_API int zal_ipod_simple_camerabutton_sync(zal_ipod_handle *h, int value);
/** Tells the device the head unit's video delay. */
ZAL_API int zal_ipod_set_video_delay(zal_ipod_handle *h, int delay);
/** Synchronous form of zal_ipod_set_video_delay. */
ZAL_API int zal_ipod_set_video_delay_sync(zal_ipod_handle *h, int delay);
/** Tells the device the current the accessory makes available to it. */
ZAL_API int zal_ipod_set_available_current(zal_ipod_handle *h, int current);
/** Synchronous form of zal_ipod_set_available_current. */
ZAL_API int zal_ipod_set_available_current_sync(zal_ipod_handle *h, int current);
/** Allows or stops the charging of the device's internal battery. */
ZAL_API int zal_ipod_set_internal_battery_charging_state(zal_ipod_handle *h, int state);
/** Synchronous form of zal_ipod_set_internal_battery_charging_state. */
ZAL_API int zal_ipod_set_internal_battery_charging_state_sync(zal_ipod_handle *h, int state);
/** Rotation input: three 32-bit fields, three 8-bit fields and two 16-bit fields, sent as an
 * array of eight integers in this order. */
ZAL_API int zal_ipod_rotation_input(zal_ipod_handle *h, int32_t field0, int32_t field1,
                                    int32_t field2, uint8_t byte0, uint8_t byte1, uint8_t byte2,
                                    uint16_t word0, uint16_t word1);
/** Synchronous form of zal_ipod_rotation_input. */
ZAL_API int zal_ipod_rotation_input_sync(zal_ipod_handle *h, int32_t field0, int32_t field1,
                                         int32_t field2, uint8_t byte0, uint8_t byte1,
                                         uint8_t byte2, uint16_t word0, uint16_t word1);
/** VoiceOver event: three 32-bit fields, three 8-bit fields and a text (NULL sends ""), sent
 * as an array of six integers and one string. */
ZAL_API int zal_ipod_voiceover_event(zal_ipod_handle *h, int32_t field0, int32_t field1,
                                     int32_t field2, uint8_t byte0, uint8_t byte1, uint8_t byte2,
                                     const char *text);
/** Synchronous form of zal_ipod_voiceover_event. */
ZAL_API int zal_ipod_voiceover_event_sync(zal_ipod_handle *h, int32_t field0, int32_t field1,
                                          int32_t field2, uint8_t byte0, uint8_t byte1,
                                          uint8_t byte2, const char *text);
/** Asks for a VoiceOver parameter (volume, speaking rate, ...). */
ZAL_API int zal_ipod_get_voiceover_parameter(zal_ipod_handle *h, int parameter);
/** Synchronous form: the parameter's "value" when the reply's "get_voiceover_parameter" flag
 * is non-zero, else -1. */
ZAL_API int zal_ipod_get_voiceover_parameter_sync(zal_ipod_handle *h, int parameter);
/** Sets a VoiceOver parameter. */
ZAL_API int zal_ipod_set_voiceover_parameter(zal_ipod_handle *h, int parameter, int value);
/** Synchronous form of zal_ipod_set_voiceover_parameter. */
ZAL_API int zal_ipod_set_voiceover_parameter_sync(zal_ipod_handle *h, int parameter, int value);
/** Asks for one property of the item under the VoiceOver cursor: types 0, 1 and 2 carry an
 * index pair and a name, type 3 the item's frame. A reply that arrives outside a wait is
 * decoded into the item record too (before the reply callback runs). */
ZAL_API int zal_ipod_get_current_voiceover_itemproperty(zal_ipod_handle *h, int type);
/** Synchronous form: 1 with the reply's type stored in the item record (the other types keep
 * what they had), -1 when the reply's flag is 0, its type is not 0..3 or no reply came. */
ZAL_API int zal_ipod_get_current_voiceover_itemproperty_sync(zal_ipod_handle *h, int type);
/** Sets the VoiceOver context. */
ZAL_API int zal_ipod_set_voiceover_context(zal_ipod_handle *h, int context);
/** Synchronous form of zal_ipod_set_voiceover_context. */
ZAL_API int zal_ipod_set_voiceover_context_sync(zal_ipod_handle *h, int context);
/** Registers a HID descriptor with the device: three 32-bit and two 8-bit fields, sent as an
 * array of five integers (the descriptor's bytes are the daemon's business). */
ZAL_API int zal_ipod_register_descriptor(zal_ipod_handle *h, int32_t field0, int32_t field1,
                                         int32_t field2, uint8_t byte0, uint8_t byte1);
/** Synchronous form of zal_ipod_register_descriptor. */
ZAL_API int zal_ipod_register_descriptor_sync(zal_ipod_handle *h, int32_t field0, int32_t field1,
                                              int32_t field2, uint8_t byte0, uint8_t byte1);
/** Sends a HID report: three 32-bit fields, as an array of three integers. */
ZAL_API int zal_ipod_ipod_hid_report(zal_ipod_handle *h, int32_t field0, int32_t field1,
                                     int32_t field2);
/** Synchronous form of zal_ipod_ipod_hid_report. */
ZAL_API int zal_ipod_ipod_hid_report_sync(zal_ipod_handle *h, int32_t field0, int32_t field1,
                                          int32_t field2);
/** Unregisters a HID descriptor; sent as an array holding the one integer. */
ZAL_API int zal_ipod_unregister_descriptor(zal_ipod_handle *h, int32_t descriptor);
/** Synchronous form of zal_ipod_unregister_descriptor. */
ZAL_API int zal_ipod_unregister_descriptor_sync(zal_ipod_handle *h, int32_t descriptor);

/* VoiceOver item record, as the last item property reply left it (0 and "" before any).
 * type is 0, 1 or 2; another type gives -1 (NULL for the name). */
/** Current index of the item of this property type (0..65535). */
ZAL_API int zal_ipod_voiceover_item_current_index(zal_ipod_handle *h, int type);
/** Last index of the item of this property type (0..65535). */
ZAL_API int zal_ipod_voiceover_item_last_index(zal_ipod_handle *h, int type);
/** Name of the item of this property type: a 128-byte buffer owned by the handle, holding at
 * most 127 characters (a longer name is cut) and always terminated. */
ZAL_API const char *zal_ipod_voiceover_item_name(zal_ipod_handle *h, int type);
/** Frame of the item (property type 3), each 0..65535; -1 for a NULL handle. */
ZAL_API int zal_ipod_voiceover_item_topleft_x(zal_ipod_handle *h);
/** See zal_ipod_voiceover_item_topleft_x. */
ZAL_API int zal_ipod_voiceover_item_topleft_y(zal_ipod_handle *h);
/** See zal_ipod_voiceover_item_topleft_x. */
ZAL_API int zal_ipod_voiceover_item_bottomright_x(zal_ipod_handle *h);
/** See zal_ipod_voiceover_item_topleft_x. */
ZAL_API int zal_ipod_voiceover_item_bottomright_y(zal_ipod_handle *h);

/* ---- Device information ------------------------------------------------------------------
 * Lingo versions and options, localization, equaliser, battery and power.
 * ---------------------------------------------------------------------------------- */

/* Most queries here are answered by a hash with a success flag named like the request
 * (for example "get_num_eqprofiles") beside the data: their _sync forms return -1, leaving
 * every output alone, when no reply came, the flag is 0 or missing, or the reply holds
 * "error" (its text is then kept for zal_ipod_get_error_message). Asynchronous forms return
 * the transaction id, or 0 when the handle has no ready session (those with a parameter
 * then log "not ready2 <name>" as a warning). */

/** Size of the caller's buffer for zal_ipod_get_indexed_eqprofile_name_sync. */
#define ZAL_EQPROFILE_NAME_SIZE 64

/** Asks for the protocol version of a lingo (command group). Writes
 * "zal_ipod_request_lingo_version, lingo=0x<lingo>" to standard error. A reply that arrives
 * outside a wait is decoded into the stored version too (before the reply callback). */
ZAL_API int zal_ipod_request_lingo_version(zal_ipod_handle *h, int lingo);
/** Synchronous form: 1 with major and minor stored (see zal_ipod_get_result_lingo_version),
 * -1 on failure ("Requesting lingo version failed!" on standard output when the daemon
 * answered with the flag 0). Writes its trace lines to standard error. */
ZAL_API int zal_ipod_request_lingo_version_sync(zal_ipod_handle *h, int lingo);
/** Asks for the options of a lingo. */
ZAL_API int zal_ipod_get_lingo_options(zal_ipod_handle *h, int lingo);
/** Synchronous form: the options, the first 8 bytes of the byte-string reply read most
 * significant first; 0 when no reply came or it is not a byte string of at least 8 bytes. */
ZAL_API uint64_t zal_ipod_get_lingo_options_sync(zal_ipod_handle *h, int lingo);
/** Asks for the localization text of type 0 or 1. A reply that arrives outside a wait is
 * stored too (before the reply callback). */
ZAL_API int zal_ipod_localization_info(zal_ipod_handle *h, int type);
/** Synchronous form: 1 with the text stored under the reply's type (see
 * zal_ipod_current_localization_info); -1 when no reply came, or the reply's type is not 0 or
 * 1 or it has no text (nothing is stored then). A text of 64 characters or more is cut to
 * 63. */
ZAL_API int zal_ipod_localization_info_sync(zal_ipod_handle *h, int type);
/** Asks for the index of the current equaliser profile. */
ZAL_API int zal_ipod_get_current_eqprofile_index(zal_ipod_handle *h);
/** Synchronous form: the index ("index" of a reply flagged "get_current_eqprofile_index"). */
ZAL_API int zal_ipod_get_current_eqprofile_index_sync(zal_ipod_handle *h);
/** Selects an equaliser profile; value is passed through to the device. */
ZAL_API int zal_ipod_set_current_eqprofile_index(zal_ipod_handle *h, int index, int value);
/** Synchronous form: the daemon's integer, -1 on failure. */
ZAL_API int zal_ipod_set_current_eqprofile_index_sync(zal_ipod_handle *h, int index, int value);
/** Asks for the number of equaliser profiles. */
ZAL_API int zal_ipod_get_num_eqprofiles(zal_ipod_handle *h);
/** Synchronous form: the number ("number" of a reply flagged "get_num_eqprofiles"). */
ZAL_API int zal_ipod_get_num_eqprofiles_sync(zal_ipod_handle *h);
/** Asks for the name of the equaliser profile at index. */
ZAL_API int zal_ipod_get_indexed_eqprofile_name(zal_ipod_handle *h, int index);
/** Synchronous form: 1 with the name copied into name, a buffer of ZAL_EQPROFILE_NAME_SIZE
 * (64) bytes: exactly 64 bytes are written, the rest after the text filled with NULs. A name
 * of 64 characters or more fills all 64 bytes and is NOT terminated: read at most 64 bytes
 * (or pass a 65-byte buffer whose last byte is 0). name may be NULL (nothing is copied). */
ZAL_API int zal_ipod_get_indexed_eqprofile_name_sync(zal_ipod_handle *h, int index, char *name);
/** Asks for the device's battery state and level. */
ZAL_API int zal_ipod_get_power_battery_state(zal_ipod_handle *h);
/** Synchronous form: 1 with "state" and "level" stored through the pointers (either may be
 * NULL); on -1 neither is touched. */
ZAL_API int zal_ipod_get_power_battery_state_sync(zal_ipod_handle *h, int *state, int *level);
/** Asks for the sound check setting. */
ZAL_API int zal_ipod_get_sound_check_state(zal_ipod_handle *h);
/** Synchronous form: the setting ("state" of a reply flagged "get_sound_check_state"). */
ZAL_API int zal_ipod_get_sound_check_state_sync(zal_ipod_handle *h);
/** Changes the sound check setting; value is passed through to the device. */
ZAL_API int zal_ipod_set_sound_check_state(zal_ipod_handle *h, int state, int value);
/** Synchronous form: the daemon's integer, -1 on failure. */
ZAL_API int zal_ipod_set_sound_check_state_sync(zal_ipod_handle *h, int state, int value);
/** Asks for the device's Bluetooth connection status. */
ZAL_API int zal_ipod_bt_connection_status(zal_ipod_handle *h);
/** Synchronous form: a copy of the reply's "current_bt_status" text, which the caller
 * releases with free(); NULL when no reply came or it has no such text. */
ZAL_API char *zal_ipod_bt_connection_status_sync(zal_ipod_handle *h);
/** Asks for the device's Wi-Fi connection information; it arrives as a
 * ZALIPOD_EVENT_WIFI_INFORMATION event. */
ZAL_API int zal_ipod_request_wifi_connection_info(zal_ipod_handle *h);
/** Synchronous form: the daemon's integer, -1 on failure. */
ZAL_API int zal_ipod_request_wifi_connection_info_sync(zal_ipod_handle *h);
/** Tells the device about the accessory's power source; both numbers are passed through. */
ZAL_API int zal_ipod_device_power_source_update(zal_ipod_handle *h, int a, int b);
/** Synchronous form: 0 once the reply came or the wait ended, whatever the reply. */
ZAL_API int zal_ipod_device_power_source_update_sync(zal_ipod_handle *h, int a, int b);
/** Asks the device to authenticate the accessory again. */
ZAL_API int zal_ipod_reauthentication(zal_ipod_handle *h, int value);
/** Synchronous form: the daemon's integer, -1 on failure. */
ZAL_API int zal_ipod_reauthentication_sync(zal_ipod_handle *h, int value);

/** Major number of the last lingo version answered (0 before any; -1 for a NULL handle). */
ZAL_API int zal_ipod_get_result_lingo_version_major(zal_ipod_handle *h);
/** Minor number of the last lingo version answered (0 before any; -1 for a NULL handle). */
ZAL_API int zal_ipod_get_result_lingo_version_minor(zal_ipod_handle *h);
/** "major.minor" of the last lingo version answered, owned by the handle (at most 7
 * characters; "" before any, and "" when the two numbers do not fit in 7 characters). */
ZAL_API const char *zal_ipod_get_result_lingo_version(zal_ipod_handle *h);
/** Localization text of type 0 or 1 (at most 63 characters, "" before any), owned by the
 * handle; NULL for another type. */
ZAL_API const char *zal_ipod_current_localization_info(zal_ipod_handle *h, int type);

/* ---- Communications and vehicle integration ----------------------------------------------
 * Telephony, external accessory datagrams, location, vehicle status and Wi-Fi.
 * ---------------------------------------------------------------------------------- */

/* Asynchronous forms return the transaction id, or 0 when the handle has no ready session
 * (those with a parameter then log "not ready2 <name>" as a warning); _sync forms return the
 * daemon's integer, -1 when no reply came or it was not an integer (an "error" reply's text
 * is kept for zal_ipod_get_error_message). What the device sends back arrives as events:
 * ZALIPOD_EVENT_TELEPHONY_CALLSTATE_INFORMATION, _TELEPHONY_UPDATE, _EAP_DATAGRAM,
 * _LOCATION_INFORMATION, _VEHICLE_STATUS_UPDATE and _WIFI_INFORMATION. */

/** Starts the device's call state reports; value is passed through. */
ZAL_API int zal_ipod_start_telephony_callstate_information(zal_ipod_handle *h, int value);
/** Synchronous form of zal_ipod_start_telephony_callstate_information. */
ZAL_API int zal_ipod_start_telephony_callstate_information_sync(zal_ipod_handle *h, int value);
/** Stops the call state reports. */
ZAL_API int zal_ipod_stop_telephony_callstate_information(zal_ipod_handle *h);
/** Synchronous form of zal_ipod_stop_telephony_callstate_information. */
ZAL_API int zal_ipod_stop_telephony_callstate_information_sync(zal_ipod_handle *h);
/** Starts the device's telephony status reports (signal, carrier, call counts, ...). */
ZAL_API int zal_ipod_start_telephony_update(zal_ipod_handle *h);
/** Synchronous form of zal_ipod_start_telephony_update. */
ZAL_API int zal_ipod_start_telephony_update_sync(zal_ipod_handle *h);
/** Stops the telephony status reports. */
ZAL_API int zal_ipod_stop_telephony_update(zal_ipod_handle *h);
/** Synchronous form of zal_ipod_stop_telephony_update. */
ZAL_API int zal_ipod_stop_telephony_update_sync(zal_ipod_handle *h);
/** Sends an EAP datagram to the application of session_id: [session_id, length, the length
 * bytes at data]. A negative length, or a NULL data with a positive length, sends nothing
 * (0, with an error logged). The transaction id also goes to the slot of identifier-list
 * requests: a reply that arrives outside a wait reaches the reply callback as 1. */
ZAL_API int zal_ipod_send_eap_datagram(zal_ipod_handle *h, int session_id, const void *data,
                                       int length);
/** Synchronous form of zal_ipod_send_eap_datagram. */
ZAL_API int zal_ipod_send_eap_datagram_sync(zal_ipod_handle *h, int session_id, const void *data,
                                            int length);
/** Answers the device's location request with location data text (NULL sends ""). */
ZAL_API int zal_ipod_send_location_information(zal_ipod_handle *h, const char *text);
/** Synchronous form of zal_ipod_send_location_information. */
ZAL_API int zal_ipod_send_location_information_sync(zal_ipod_handle *h, const char *text);
/** Tells the device the state of the head unit's Bluetooth component. */
ZAL_API int zal_ipod_send_bluetooth_component_information(zal_ipod_handle *h, int state);
/** Synchronous form of zal_ipod_send_bluetooth_component_information. */
ZAL_API int zal_ipod_send_bluetooth_component_information_sync(zal_ipod_handle *h, int state);
/** Answers the device's vehicle status request: five integers in this order, d keeping its
 * sign (-40 goes as -40) and e taken as unsigned (200 goes as 200). */
ZAL_API int zal_ipod_send_vehicle_status_update(zal_ipod_handle *h, int a, int b, int c, int16_t d,
                                                uint8_t e);
/** Synchronous form of zal_ipod_send_vehicle_status_update. */
ZAL_API int zal_ipod_send_vehicle_status_update_sync(zal_ipod_handle *h, int a, int b, int c,
                                                     int16_t d, uint8_t e);
/** Hands the device the head unit's Wi-Fi access point: [ssid, passphrase, first_value,
 * second_value] (NULL texts send ""). Sent on any connected handle, without a session too;
 * returns the transaction id. There is no _sync form: the reply is not decoded. */
ZAL_API int zal_ipod_send_accessory_wifi_configuration_information(zal_ipod_handle *h,
                                                                   const char *ssid,
                                                                   const char *passphrase,
                                                                   uint16_t first_value,
                                                                   uint16_t second_value);

/* ---- iAP1 database browsing --------------------------------------------------------------
 * Categories, records and track records of older devices.
 * ---------------------------------------------------------------------------------- */

/* Hierarchy numbers, category numbers, capability bits and durations are the device's; the
 * library passes them through. Each command has its transaction-id form and a _sync form
 * (same arguments) that waits and decodes. */

/** SET_HIERARCHY; on sending, the hierarchy becomes the one a browser reset restores.
 * _sync: the daemon's integer, -1 on failure. */
ZAL_API int zal_ipod_set_hierarchy(zal_ipod_handle *h, int hierarchy);
/** See zal_ipod_set_hierarchy. */
ZAL_API int zal_ipod_set_hierarchy_sync(zal_ipod_handle *h, int hierarchy);
/** SET_CATEGORY; on sending, the current category becomes category. */
ZAL_API int zal_ipod_set_category(zal_ipod_handle *h, int category);
/** Sets the current category (even when nothing can be sent), sends SET_CATEGORY and returns
 * the daemon's integer, the number of records in the category, also kept as the record
 * count; -1 (and a record count of -1) on failure. */
ZAL_API int zal_ipod_set_category_sync(zal_ipod_handle *h, int category);
/** SELECT_DB [record, category]: narrows the next category to one record. */
ZAL_API int zal_ipod_select_db(zal_ipod_handle *h, int record, int category);
/** As zal_ipod_select_db; the daemon's integer is kept as the record count (-1 on failure). */
ZAL_API int zal_ipod_select_db_sync(zal_ipod_handle *h, int record, int category);
/** GET_DB_RECORDS [offset, count]: names of records offset..offset+count-1. */
ZAL_API int zal_ipod_get_records(zal_ipod_handle *h, int offset, int count);
/** As zal_ipod_get_records; an array reply replaces the records cache (read with
 * zal_ipod_record) and its validity flag is returned; any other reply changes nothing and
 * gives 1; no reply gives -1. */
ZAL_API int zal_ipod_get_records_sync(zal_ipod_handle *h, int offset, int count);
/** INDEXED_TRACK_INFO for track index of the play queue. */
ZAL_API int zal_ipod_indexed_track_info(zal_ipod_handle *h, int index);
/** As zal_ipod_indexed_track_info: the track's information goes to the current-track cache as
 * for zal_ipod_current_track_info_sync; returns the reply's "indexed_track_info", -1 on failure. */
ZAL_API int zal_ipod_indexed_track_info_sync(zal_ipod_handle *h, int index);
/** GET_DB_ITUNES_INFO for an information type (0 library identifier, 1 last sync time,
 * others a count). */
ZAL_API int zal_ipod_get_db_itunes_info(zal_ipod_handle *h, int type);
/** As zal_ipod_get_db_itunes_info: 1 once the answer is stored (read it with the
 * zal_ipod_get_result_db_ accessors), -1 for no reply, an error, or an answer that lacks
 * the requested field (the stored field is then left as it was). The reply is also dumped
 * on standard output. */
ZAL_API int zal_ipod_get_db_itunes_info_sync(zal_ipod_handle *h, int type);
/** GET_DB_TRACK_INFO [offset, count, identifiers_only]: track records of the database. */
ZAL_API int zal_ipod_get_db_track_info(zal_ipod_handle *h, int offset, int count,
                                       int identifiers_only);
/** As zal_ipod_get_db_track_info: 1 once the result replaced the DB track info result,
 * -1 for no reply, an error reply or a reply that is not a record list. */
ZAL_API int zal_ipod_get_db_track_info_sync(zal_ipod_handle *h, int offset, int count,
                                            int identifiers_only);
/** GET_PB_TRACK_INFO [offset, count, identifiers_only]: track records of the play queue. */
ZAL_API int zal_ipod_get_pb_track_info(zal_ipod_handle *h, int offset, int count,
                                       int identifiers_only);
/** As zal_ipod_get_db_track_info, into the PB track info result. */
ZAL_API int zal_ipod_get_pb_track_info_sync(zal_ipod_handle *h, int offset, int count,
                                            int identifiers_only);

/** Current category (0 in a new handle and after a session opens). */
ZAL_API int zal_ipod_get_category(zal_ipod_handle *h);
/** Records in the current category as last reported; -1 after a failed request. */
ZAL_API int zal_ipod_record_count(zal_ipod_handle *h);
/** Name of record index from the records cache, or "" when the cache does not hold it (an
 * index outside the cached range also writes a line on standard output). The text lives
 * until the cache is replaced. */
ZAL_API const char *zal_ipod_record(zal_ipod_handle *h, int index);
/** Last DB / PB track info result (NULL before the first); owned by the handle and valid
 * until the next result of the same kind. */
ZAL_API const gval *zal_ipod_get_result_db_track_info(zal_ipod_handle *h);
/** See zal_ipod_get_result_db_track_info. */
ZAL_API const gval *zal_ipod_get_result_pb_track_info(zal_ipod_handle *h);
/** The 8 bytes of the device library identifier (type 0 of the library information). */
ZAL_API const uint8_t *zal_ipod_get_result_db_device_uid(zal_ipod_handle *h);
/** The 7 bytes of the last sync time (type 1 of the library information). */
ZAL_API const uint8_t *zal_ipod_get_result_db_last_sync_time(zal_ipod_handle *h);
/** The count of the last library information of another type; -1 without a handle. */
ZAL_API int zal_ipod_get_result_db_itunes_info_count(zal_ipod_handle *h);

/* Track info results. A result lists either identifiers only (each an 8-byte byte string)
 * or full records of eight elements (capability, name, artist, album, genre, composer,
 * duration, identifier). Track i counts from 0. Each accessor returns 1 and sets *out when
 * the result holds that field of track i with the right kind, else 0 with *out untouched.
 * Texts and bytes point into the result and live as long as it. */
/** Number of tracks in result; 0 for NULL. */
ZAL_API int zal_ipod_get_result_db_track_info_count(const gval *result);
/** Capability bits of track i (full records only). */
ZAL_API int zal_ipod_get_result_db_track_info_capability(const gval *result, int i, int *out);
/** Name of track i (full records only). */
ZAL_API int zal_ipod_get_result_db_track_info_name(const gval *result, int i, const char **out);
/** Artist of track i (full records only). */
ZAL_API int zal_ipod_get_result_db_track_info_artist(const gval *result, int i, const char **out);
/** Album of track i (full records only). */
ZAL_API int zal_ipod_get_result_db_track_info_album(const gval *result, int i, const char **out);
/** Genre of track i (full records only). */
ZAL_API int zal_ipod_get_result_db_track_info_genre(const gval *result, int i, const char **out);
/** Composer of track i (full records only). */
ZAL_API int zal_ipod_get_result_db_track_info_composer(const gval *result, int i, const char **out);
/** Duration of track i (full records only; the device's unit). */
ZAL_API int zal_ipod_get_result_db_track_info_duration(const gval *result, int i, int *out);
/** Persistent identifier of track i, 8 bytes most significant first, in either layout.
 * When the element is a byte string of another length *out is still set (to bytes that
 * must not be read as an identifier) and 0 is returned. */
ZAL_API int zal_ipod_get_result_db_track_info_uid(const gval *result, int i, const uint8_t **out);

/* ---- Library updates and play lists ------------------------------------------------------
 * Library update items, collections, play lists, Genius and play items.
 * ---------------------------------------------------------------------------------- */

/** A media library identifier (mlid) is shorter than this: at most 127 characters. */
#define MAXIMUM_MLID_LENGTH 128

/* Persistent identifiers are unsigned 64-bit numbers. Requests whose arguments break a
 * stated limit (an mlid of 128 characters or more, a list of 128 bytes or more, a negative
 * count or size, a missing list) are not sent: they log an error and return 0 (the _sync
 * form then returns -1, or 0 where it always does). */

/** MEDIA_LIB_UID: the identifier of the device's media library. */
ZAL_API int zal_ipod_get_media_library_unique_id(zal_ipod_handle *h);
/** As zal_ipod_get_media_library_unique_id: 1 when the reply is a string, copied with its
 * terminator into buffer but never more than size bytes (so a short buffer gets no
 * terminator); 0 otherwise, buffer untouched. */
ZAL_API int zal_ipod_get_media_library_unique_id_sync(zal_ipod_handle *h, char *buffer, int size);
/** SET_UPDATE_ITEMS: library mlid, listLength bytes of list (below MAXIMUM_MLID_LENGTH) and an
 * optional auxiliary string (NULL: none; at most 128 characters). */
ZAL_API int zal_ipod_set_update_items(zal_ipod_handle *h, const char *aux_string, const char *mlid,
                                      const void *list, int listLength);
/** As zal_ipod_set_update_items; returns 0 once the reply came or the wait ended. */
ZAL_API int zal_ipod_set_update_items_sync(zal_ipod_handle *h, const char *aux_string,
                                           const char *mlid, const void *list, int listLength);
/** START_LIB_UPDATE with the daemon's text; changes follow as "medialibrary_update" events. */
ZAL_API int zal_ipod_start_library_update(zal_ipod_handle *h, const char *text);
/** As zal_ipod_start_library_update; returns 0 once the reply came or the wait ended. */
ZAL_API int zal_ipod_start_library_update_sync(zal_ipod_handle *h, const char *text);
/** STOP_LIB_UPDATE with the daemon's text. */
ZAL_API int zal_ipod_stop_library_update(zal_ipod_handle *h, const char *text);
/** As zal_ipod_stop_library_update; returns 0 once the reply came or the wait ended. */
ZAL_API int zal_ipod_stop_library_update_sync(zal_ipod_handle *h, const char *text);
/** RESUME_LIB_UPDATE [first, second] (the daemon's texts, e.g. library and revision). */
ZAL_API int zal_ipod_resume_library_update(zal_ipod_handle *h, const char *first,
                                           const char *second);
/** As zal_ipod_resume_library_update; returns 0 once the reply came or the wait ended. */
ZAL_API int zal_ipod_resume_library_update_sync(zal_ipod_handle *h, const char *first,
                                                const char *second);
/** PLAYITEMS: plays count identifiers (uids) starting with the one at start. */
ZAL_API int zal_play_items(zal_ipod_handle *h, const uint64_t *uids, int count, int start);
/** As zal_play_items: the reply's "items_played", -1 for an error (its text kept), a
 * missing or malformed reply. */
ZAL_API int zal_play_items_sync(zal_ipod_handle *h, const uint64_t *uids, int count, int start);
/** PLAYCOLLECTION: plays collection_id of a collection type (0 play list or Genius mix,
 * 1 artist, 2 album, 4 genre, 5 composer; sent as one byte) of library mlid from
 * start_index. */
ZAL_API int zal_play_collection(zal_ipod_handle *h, uint64_t collection_id, int type,
                                int start_index, const char *mlid);
/** As zal_play_collection: the reply's "collection_played", -1 on failure. */
ZAL_API int zal_play_collection_sync(zal_ipod_handle *h, uint64_t collection_id, int type,
                                     int start_index, const char *mlid);
/** PREPARE_UID_LIST [first, second, size, size bytes]: hands the daemon an identifier list
 * (8 bytes each, most significant first) for zal_ipod_play_uid_list. */
ZAL_API int zal_ipod_prepare_uid_list(zal_ipod_handle *h, int first, int second, int size,
                                      const void *bytes);
/** As zal_ipod_prepare_uid_list: the daemon's integer, -1 on failure. */
ZAL_API int zal_ipod_prepare_uid_list_sync(zal_ipod_handle *h, int first, int second, int size,
                                           const void *bytes);
/** PLAY_UID_LIST: plays the prepared list from the track with this identifier. */
ZAL_API int zal_ipod_play_uid_list(zal_ipod_handle *h, const uint8_t uid[8]);
/** As zal_ipod_play_uid_list: the daemon's integer, -1 on failure. */
ZAL_API int zal_ipod_play_uid_list_sync(zal_ipod_handle *h, const uint8_t uid[8]);
/** CREATE_GENIUS_PLAYLIST [a, b] (the device's arguments). */
ZAL_API int zal_ipod_create_genius_playlist(zal_ipod_handle *h, int a, int b);
/** As zal_ipod_create_genius_playlist: the daemon's integer, -1 on failure. */
ZAL_API int zal_ipod_create_genius_playlist_sync(zal_ipod_handle *h, int a, int b);
/** REFRESH_GENIUS_PLAYLIST a. */
ZAL_API int zal_ipod_refresh_genius_playlist(zal_ipod_handle *h, int a);
/** As zal_ipod_refresh_genius_playlist: the daemon's integer, -1 on failure. */
ZAL_API int zal_ipod_refresh_genius_playlist_sync(zal_ipod_handle *h, int a);
/** IS_GENIUS_AVAILABLEFORTRACK [a, b]. */
ZAL_API int zal_ipod_is_genius_availablefortrack(zal_ipod_handle *h, int a, int b);
/** As zal_ipod_is_genius_availablefortrack: 0 when Genius is not available (or no reply),
 * otherwise the reply's non-zero "result", or 1. */
ZAL_API int zal_ipod_is_genius_availablefortrack_sync(zal_ipod_handle *h, int a, int b);
/** GET_PLAYLIST_INFO [a, b]. */
ZAL_API int zal_ipod_get_playlist_info(zal_ipod_handle *h, int a, int b);
/** As zal_ipod_get_playlist_info: the reply's "status", -1 when there is no information;
 * when data is not NULL the low 8 bits of the reply's "data" are stored there. */
ZAL_API int zal_ipod_get_playlist_info_sync(zal_ipod_handle *h, int a, int b, uint8_t *data);

/* ---- Media browser -----------------------------------------------------------------------
 * Categories, filtered queries, the selection stack and playing a selection.
 * ---------------------------------------------------------------------------------- */

/** Category numbers: 0 TOP, 1 PLAYLIST, 2 ARTIST, 3 ALBUM, 4 GENRE, 5 TRACK, 6 COMPOSER,
 * 7 AUDIOBOOK, 8 PODCAST, 9 NESTED_PLAYLIST, 10 GENIUS_MIXES, 11 ITUNES_U. */
#define ZAL_MEDIA_LIB_SELECTION_LEVELS 256
/** Most identifiers a selection plays (longer lists are cut to their first entries). */
#define ZAL_MEDIA_LIB_MAX_PLAY_ITEMS 8000

/** The name of a category number ("TRACK"); "UNKNOWN" outside 0 to 11. Constant string;
 * any thread. */
ZAL_API const char *zal_ipod_category_to_string(int category);
/** The number of a category name, exact and case-sensitive, for "PLAYLIST" to "ITUNES_U";
 * 0 for any other text (also "TOP", "UNKNOWN" and NULL). Any thread. */
ZAL_API int zal_ipod_string_to_category(const char *name);

/* Lists handed out by the browser (char ** results) are new arrays followed by one NULL
 * entry; unless a function says otherwise the caller frees each string and the array with
 * free(). The browser's state (the selection stack) has no lock: one thread walks it. */

/** GET_COLLECTION_ID [category_name, item_index]: the collection identifier of an item of a
 * top-level category. */
ZAL_API int zal_ipod_get_collection_identifier(zal_ipod_handle *h, const char *category_name,
                                               int item_index);
/** As zal_ipod_get_collection_identifier: the reply's "collection_id" text (an unsigned
 * 64-bit number), owned by the handle until the next call; NULL without one. */
ZAL_API const char *zal_ipod_get_collection_identifier_sync(zal_ipod_handle *h,
                                                            const char *category_name,
                                                            int item_index);
/** COUNT_ITEMS_IDENTIFIER_CURRENT_FILTER [levels, names of the current filter...]. */
ZAL_API int zal_ipod_count_item_identifiers_current_filter(zal_ipod_handle *h);
/** As zal_ipod_count_item_identifiers_current_filter: the reply's "count_item_identifiers",
 * -1 without one. */
ZAL_API int zal_ipod_count_item_identifiers_current_filter_sync(zal_ipod_handle *h);
/** GET_ITEMS_IDENTIFIER_CURRENT_FILTER [levels, offset, count, identifiers_only, names...]. */
ZAL_API int zal_ipod_get_items_identifier_current_filter(zal_ipod_handle *h, int offset, int count,
                                                         int identifiers_only);
/** As zal_ipod_get_items_identifier_current_filter: the strings of the reply after its first
 * element: per item its identifier (identifiers_only 1), or identifier, name, duration,
 * artist, album and genre (0). The strings stay owned by the handle until the next such
 * query; the caller frees only the array. NULL without a reply or for an empty one. */
ZAL_API const char **zal_ipod_get_item_identifiers_current_filter_sync(zal_ipod_handle *h,
                                                                       int offset, int count,
                                                                       int identifiers_only);
/** COUNT_ITEMS_CURRENT_CATEGORY [levels, names of the current filter...]. */
ZAL_API int zal_ipod_count_items_current_category(zal_ipod_handle *h);
/** As zal_ipod_count_items_current_category: the reply's "count_items_category", -1 without. */
ZAL_API int zal_ipod_count_items_current_category_sync(zal_ipod_handle *h);
/** GET_ITEMS_CURRENT_CATEGORY [levels, offset, count, names of the current filter...]. */
ZAL_API int zal_ipod_get_items_current_category(zal_ipod_handle *h, int offset, int count);
/** As zal_ipod_get_items_current_category: the reply becomes the records cache
 * (zal_ipod_record) and the names of items offset to offset+count-1 come back as a new list
 * of count strings ("" for items the reply did not hold); NULL without a reply. */
ZAL_API char **zal_ipod_get_items_current_category_sync(zal_ipod_handle *h, int offset, int count);

/** Number of categories offered beneath the item on top (11 with nothing selected, 0 under a
 * leaf); -1 with an error text while a category is on top. */
ZAL_API int zal_ipod_media_lib_get_categories_count(zal_ipod_handle *h);
/** The names of those categories as a new list; NULL with an error text while a category is
 * on top. */
ZAL_API char **zal_ipod_media_lib_get_categories(zal_ipod_handle *h);
/** Number of items of the category on top (iAP2: asked; iAP1: the last record count),
 * remembered in its level; -1 with an error text when no category is on top. */
ZAL_API int zal_ipod_media_lib_get_items_count(zal_ipod_handle *h);
/** The names of items offset to offset+count-1 of the category on top as a new list; the page
 * is remembered for zal_ipod_media_lib_select_item. NULL when the page is not within the
 * category (negative offset or count included) or the query failed. */
ZAL_API char **zal_ipod_media_lib_get_items(zal_ipod_handle *h, int offset, int count);

/** Starts the walk again at the top; iAP1 devices are sent category TOP and the hierarchy,
 * iAP2 keep it for later. 1, or 0 when an iAP1 command failed. */
ZAL_API int zal_ipod_media_lib_reset_selection(zal_ipod_handle *h, int hierarchy);
/** Number of levels on the selection stack (0 to ZAL_MEDIA_LIB_SELECTION_LEVELS). */
ZAL_API int zal_ipod_media_lib_get_current_selection_count(zal_ipod_handle *h);
/** The names of the levels (the current filter), level 0 first, as a new list. */
ZAL_API char **zal_ipod_media_lib_get_current_selection(zal_ipod_handle *h);
/** Absolute index of the item on top, 0 when a category (or nothing) is on top. */
ZAL_API int zal_ipod_media_lib_get_current_selection_start_index(zal_ipod_handle *h);
/** Pushes a category beneath the item on top (or at the top). 1; 0 when the iAP1 command
 * failed (the level is pushed all the same); -1 with an error text while a category is on
 * top or the stack is full (nothing pushed, nothing sent). */
ZAL_API int zal_ipod_media_lib_select_category(zal_ipod_handle *h, int category);
/** Pushes item index of the page last fetched with zal_ipod_media_lib_get_items. 1; -1 with
 * an error text when no category is on top, the index is outside the category or the stack
 * is full. Nothing is sent. */
ZAL_API int zal_ipod_media_lib_select_item(zal_ipod_handle *h, int index);
/** Keeps levels 0 to keep-1 and selects them again on the device (keep 0: a reset with the
 * stored hierarchy). 1; 0 when a step failed (the levels rebuilt so far stay); -1 with an
 * error text when there are not more than keep levels. */
ZAL_API int zal_ipod_media_lib_undo_selection(zal_ipod_handle *h, int keep);
/** Plays the first (at most ZAL_MEDIA_LIB_MAX_PLAY_ITEMS) of count identifiers from entry
 * start: iAP1 as a prepared identifier list, iAP2 as PLAYITEMS. The play command's result;
 * 0 without sending when start is beyond the list. */
ZAL_API int zal_ipod_media_lib_play_items(zal_ipod_handle *h, const uint64_t *uids, int count,
                                          int start);
/** Plays from where the walk stands, item index of the page on top (or of the category on
 * top), as a collection, an identifier list or a database record by device protocol; the
 * levels pushed on the way stay. 1, -1, or the failing step's result. */
ZAL_API int zal_ipod_media_lib_play_current_selection(zal_ipod_handle *h, int index);
/** Track information of tracks offset to offset+count-1 of the TRACK or AUDIOBOOK category on
 * top, for the track field accessors: identifiers only (1) or whole records (0). Owned by
 * the handle until the next request; NULL with an error text when another level is on top,
 * NULL when the tracks are not there or the query failed. */
ZAL_API const void *zal_ipod_media_lib_get_tracks_info(zal_ipod_handle *h, int identifiers_only,
                                                       int offset, int count);
/** Identifier of track i of the last zal_ipod_media_lib_get_tracks_info result; 1 or 0 (also
 * for any other result or a track outside it). */
ZAL_API int zal_ipod_media_lib_get_track_uid(zal_ipod_handle *h, const void *result, int i,
                                             uint64_t *uid);
/** Duration of track i (0 for identifier-only results on iAP2); 1 or 0. */
ZAL_API int zal_ipod_media_lib_get_track_duration(zal_ipod_handle *h, const void *result, int i,
                                                  uint32_t *duration);
/** Name of track i as a new string the caller frees ("" when the result has none); 1 or 0. */
ZAL_API int zal_ipod_media_lib_get_track_name(zal_ipod_handle *h, const void *result, int i,
                                              char **text);
/** Artist of track i, as zal_ipod_media_lib_get_track_name. */
ZAL_API int zal_ipod_media_lib_get_track_artist(zal_ipod_handle *h, const void *result, int i,
                                                char **text);
/** Album of track i, as zal_ipod_media_lib_get_track_name. */
ZAL_API int zal_ipod_media_lib_get_track_album(zal_ipod_handle *h, const void *result, int i,
                                               char **text);
/** Genre of track i, as zal_ipod_media_lib_get_track_name. */
ZAL_API int zal_ipod_media_lib_get_track_genre(zal_ipod_handle *h, const void *result, int i,
                                               char **text);


/* ---- Connection state --------------------------------------------------------------------
 * Learning that the connection was lost and came back.
 * ---------------------------------------------------------------------------------- */

/** Connection state as the connection callback reports it. */
typedef enum zal_ipod_connection_state {
    ZALIPOD_CONNECTION_LOST = 0,    /**< the daemon went away; the library will reconnect */
    ZALIPOD_CONNECTION_RESTORED = 1 /**< connected again, device list fetched anew */
} zal_ipod_connection_state;

/** Connection callback; state is a zal_ipod_connection_state. */
typedef void (*zal_ipod_connection_cb)(zal_ipod_handle *h, int state, void *user);

/** Asks to be told when the connection to the daemon is lost and when it is made again,
 * so that an application can open its session and resubscribe after the daemon
 * restarted (the daemon forgets sessions with their connection; the handle's session
 * state is kept as it was, so open the session again on RESTORED).
 *
 * Setting a callback also changes how an orderly close by the daemon is treated: without
 * one, the socket is kept until a send to it fails; with one, the close counts as lost at
 * once and the reader starts reconnecting (to the connect address or ZALIPODDAEMON, as any
 * reconnect). Each loss is reported once (LOST), each successful reconnect once
 * (RESTORED); several changes noticed between two dispatches are reported in order,
 * ending with the current state.
 *
 * The callback runs where events are delivered (zal_ipod_read, zal_ipod_events_iterate,
 * the loop thread), with no library lock held: it may send commands, the _sync forms
 * included. A change noticed while it runs is reported after it returns. NULL removes the
 * callback and restores the default treatment of an orderly close. Any thread may set
 * it. */
ZAL_API void zal_ipod_set_connection_cb(zal_ipod_handle *h, zal_ipod_connection_cb cb, void *user);

ZAL_END_DECLS

#endif /* ZAL_IPOD_2_H */
