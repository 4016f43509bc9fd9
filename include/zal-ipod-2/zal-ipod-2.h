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

/* ---- Accessory input and video out -------------------------------------------------------
 * Buttons, rotation, HID, VoiceOver and video-out settings.
 * ---------------------------------------------------------------------------------- */

/* ---- Device information ------------------------------------------------------------------
 * Lingo versions and options, localization, equaliser, battery and power.
 * ---------------------------------------------------------------------------------- */

/* ---- Communications and vehicle integration ----------------------------------------------
 * Telephony, external accessory datagrams, location, vehicle status and Wi-Fi.
 * ---------------------------------------------------------------------------------- */

/* ---- iAP1 database browsing --------------------------------------------------------------
 * Categories, records and track records of older devices.
 * ---------------------------------------------------------------------------------- */

/* ---- Library updates and play lists ------------------------------------------------------
 * Library update items, collections, play lists, Genius and play items.
 * ---------------------------------------------------------------------------------- */

/* ---- Media browser -----------------------------------------------------------------------
 * Categories, filtered queries, the selection stack and playing a selection.
 * ---------------------------------------------------------------------------------- */

/* ---- Connection state --------------------------------------------------------------------
 * Learning that the connection was lost and came back.
 * ---------------------------------------------------------------------------------- */

/** Connection state as the connection callback reports it. */
typedef enum zal_ipod_connection_state {
    ZALIPOD_CONNECTION_LOST = 0,     /**< the daemon went away; the library will reconnect */
    ZALIPOD_CONNECTION_RESTORED = 1  /**< connected again, device list fetched anew */
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
ZAL_API void zal_ipod_set_connection_cb(zal_ipod_handle *h, zal_ipod_connection_cb cb,
                                        void *user);

ZAL_END_DECLS

#endif /* ZAL_IPOD_2_H */
