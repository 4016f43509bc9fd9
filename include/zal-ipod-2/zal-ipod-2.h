/*
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

/* A connection to the daemon. Opaque; made by zal_ipod_connect, ended by zal_ipod_close. */
typedef struct zal_ipod_handle zal_ipod_handle;

/* One received packet, payload still encoded. A record returned by zal_ipod_wait_for_tid
 * belongs to the caller, who releases it with zal_ipod_reply_free. */
typedef struct zal_ipod_reply {
    uint16_t tid;
    uint16_t opcode; /* ZAL_OP_RETURN or ZAL_OP_ERROR for replies */
    uint32_t length; /* payload bytes */
    unsigned char *payload;
    struct zal_ipod_reply *next;
} zal_ipod_reply;

/* What a command hands to zal_ipod_send_packet; the sender fills in tid. The payload
 * stays the caller's. */
typedef struct zal_ipod_send_record {
    uint16_t tid;
    uint16_t opcode;
    uint32_t reserved0;
    gval *payload; /* NULL: no payload */
    uint32_t reserved1;
    uint32_t reserved2;
} zal_ipod_send_record;

/* Event kinds, as zal_ipod_event_type() returns them. */
enum {
    ZALIPOD_EVENT_CONNECTED = 1,
    ZALIPOD_EVENT_DISCONNECTED = 2,
    ZALIPOD_EVENT_DETECTION_FAILED = 3,
    ZALIPOD_EVENT_AUTHENTICATED = 4,
    ZALIPOD_EVENT_MODE_CHANGED = 5,
    ZALIPOD_EVENT_PLAYSTATE_CHANGED = 6,
    ZALIPOD_EVENT_TRACK_CHANGED = 7,
    ZALIPOD_EVENT_TRACKINFO_RETRIEVED = 8, /* never produced */
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
    ZALIPOD_EVENT_TRACK_IS_AUDIOBOOK = 25, /* also "track contains video": same kind */
    ZALIPOD_EVENT_SHUFFLE_MODE_CHANGED = 26,
    ZALIPOD_EVENT_REPEAT_MODE_CHANGED = 27,
    ZALIPOD_EVENT_DISCONNECTED_HOSTMODE = 28,
    ZALIPOD_EVENT_ROLE_SWITCHED = 29,
    ZALIPOD_EVENT_TELEPHONY_VCARD_INFORMATION = 30,
    ZALIPOD_EVENT_DEVICE_NAME = 31,
    ZALIPOD_EVENT_WIRELESS_CARPLAY_UPDATE = 32,
    ZALIPOD_EVENT_UNKNOWN = 33
};

/* An event. The dispatcher's record lives only during the event callback; keep one with
 * zal_ipod_event_clone_data and release the clone with zal_ipod_event_free. */
typedef struct zal_ipod_event {
    int32_t kind;     /* ZALIPOD_EVENT_* */
    uint16_t session; /* the event's session number */
    char serial[256]; /* serial of the device concerned, "" when none came */
    gval *data;       /* owned copy of the event's data, or NULL */
} zal_ipod_event;

/* Callbacks; their results are ignored. The event record is released when the callback
 * returns. `error` is the handle's error text (owned by the handle) or NULL. */
typedef int (*zal_ipod_event_cb)(zal_ipod_handle *h, zal_ipod_event *event, void *user);
typedef int (*zal_ipod_reply_cb)(zal_ipod_handle *h, uint16_t tid, int32_t result,
                                 const char *error, void *user);

/* ---------------------------------------------------------------------------------------
 * Connection
 * ------------------------------------------------------------------------------------- */

/* Connects to the daemon's local socket and fetches the device list. `address` (may be
 * NULL) is only used to connect again after the connection was lost: "host:port" (TCP;
 * port 0 means 1910, an empty host 0.0.0.0), "path:-1" or "path" (a local socket file).
 * Without it the environment variable ZALIPODDAEMON is read. NULL when unreachable. */
ZAL_API zal_ipod_handle *zal_ipod_connect(const char *address);
/* Releases the handle. Stop the loop thread first (zal_ipod_set_loopthread(h, 0)). */
ZAL_API void zal_ipod_close(zal_ipod_handle *h);
/* The socket, for applications that wait on it themselves and then call zal_ipod_read;
 * -1 while disconnected. */
ZAL_API int zal_ipod_fd(zal_ipod_handle *h);
/* 1 once a reconnection went over TCP, else 0. */
ZAL_API int zal_ipod_is_remote(zal_ipod_handle *h);
/* -1 disconnected, 0 no session open or not ready yet, 1 ready for commands. */
ZAL_API int zal_ipod_is_ready(zal_ipod_handle *h);
/* Reply time-out of the _sync forms (whole seconds count; default 5 s). */
ZAL_API void zal_ipod_set_read_timeout(zal_ipod_handle *h, unsigned int seconds,
                                       unsigned int microseconds);
/* Tells the daemon that the application is attached (no reply expected); returns the
 * number of bytes written, -1 on failure. */
ZAL_API int zal_ipod_notify_attached(zal_ipod_handle *h);

/* ---------------------------------------------------------------------------------------
 * Packets and transactions (commands use these; applications rarely need them)
 * ------------------------------------------------------------------------------------- */

/* Sends one packet; fills record->tid; returns the number of bytes written or -1. */
ZAL_API int zal_ipod_send_packet(zal_ipod_handle *h, zal_ipod_send_record *record);
/* Sends HELLO; returns its transaction id. */
ZAL_API uint16_t zal_ipod_hello(zal_ipod_handle *h);
/* Waits for the reply to tid; NULL on time-out or lost connection. Release the record
 * with zal_ipod_reply_free. */
ZAL_API zal_ipod_reply *zal_ipod_wait_for_tid(zal_ipod_handle *h, uint16_t tid);
ZAL_API void zal_ipod_reply_free(zal_ipod_reply *reply);
/* The "error" text of the last reply that carried one, or NULL; owned by the handle. */
ZAL_API const char *zal_ipod_get_error_message(zal_ipod_handle *h);

/* ---------------------------------------------------------------------------------------
 * Events, replies and the event loop
 * ------------------------------------------------------------------------------------- */

/* NULL removes the callback. */
ZAL_API void zal_ipod_set_event_cb(zal_ipod_handle *h, zal_ipod_event_cb cb, void *user);
/* With a reply callback set, replies no _sync call took go to it (use the asynchronous
 * forms then: a _sync wait may lose its reply to the callback). */
ZAL_API void zal_ipod_set_reply_cb(zal_ipod_handle *h, zal_ipod_reply_cb cb, void *user);
/* Delivers what is queued: events, and replies while a reply callback is set. */
ZAL_API void zal_ipod_pending_event(zal_ipod_handle *h);
/* One read pass (at most 0.5 s); dispatches when it queued something. Returns the number
 * of packets read, -1 when the connection failed. */
ZAL_API int zal_ipod_read(zal_ipod_handle *h);
/* One read pass, then the dispatcher; returns 0. */
ZAL_API int zal_ipod_events_iterate(zal_ipod_handle *h);
/* run != 0 starts the loop thread "IAP2EventThread"; run == 0 stops and joins it. */
ZAL_API int zal_ipod_set_loopthread(zal_ipod_handle *h, int run);

/* ---------------------------------------------------------------------------------------
 * Devices and sessions
 * ------------------------------------------------------------------------------------- */

/* Index-based accessors on the device list; an invalid index gives the default (0, NULL,
 * or -1 for the protocol). Strings stay valid until the list changes. */
ZAL_API int zal_ipod_device_count(zal_ipod_handle *h);
ZAL_API const char *zal_ipod_device_serial(zal_ipod_handle *h, int index);
ZAL_API int zal_ipod_device_transport_mode(zal_ipod_handle *h, int index);
ZAL_API int zal_ipod_device_usb_bus(zal_ipod_handle *h, int index);
ZAL_API int zal_ipod_device_usb_address(zal_ipod_handle *h, int index);
ZAL_API int zal_ipod_device_rfcomm_id(zal_ipod_handle *h, int index);
ZAL_API int zal_ipod_device_used(zal_ipod_handle *h, int index);
ZAL_API int zal_ipod_device_authenticated(zal_ipod_handle *h, int index);
ZAL_API int zal_ipod_device_is_extended(zal_ipod_handle *h, int index);
/* "protocolinuse" of the entry: 2 for iAP2; -1 by default. */
ZAL_API int zal_ipod_device_protocol(zal_ipod_handle *h, int index);
/* Name from the last device-name event, or NULL. */
ZAL_API const char *zal_ipod_device_name(zal_ipod_handle *h);

/* Opens a session on the device at index; the reply makes the handle ready. */
ZAL_API int zal_ipod_open_session(zal_ipod_handle *h, int device_index);
ZAL_API int zal_ipod_open_session_sync(zal_ipod_handle *h, int device_index);
ZAL_API int zal_ipod_close_session(zal_ipod_handle *h);
ZAL_API int zal_ipod_close_session_sync(zal_ipod_handle *h);
ZAL_API int zal_ipod_current_session(zal_ipod_handle *h);
ZAL_API int zal_ipod_is_session_opened(zal_ipod_handle *h);

/* ---------------------------------------------------------------------------------------
 * Event records
 * ------------------------------------------------------------------------------------- */

/* Kind of the event; ZALIPOD_EVENT_UNKNOWN for NULL. */
ZAL_API int zal_ipod_event_type(const zal_ipod_event *event);
/* Serial of the device concerned (from the data for CONNECTED and DISCONNECTED). */
ZAL_API const char *zal_ipod_event_get_serial(const zal_ipod_event *event);
/* A deep copy the caller releases with zal_ipod_event_free; NULL when out of memory. */
ZAL_API zal_ipod_event *zal_ipod_event_clone_data(const zal_ipod_event *event);
ZAL_API void zal_ipod_event_free(zal_ipod_event *event);
ZAL_API void zal_ipod_event_free_data(zal_ipod_event *event);

/* Accessors: each returns its default (-1 for integers unless said, NULL for strings)
 * when the event is of another kind or lacks the field. */
ZAL_API const char *zal_ipod_event_connected_serial(const zal_ipod_event *event);
ZAL_API const char *zal_ipod_event_disconnected_serial(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_authenticated(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_mode_changed(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_time_position(const zal_ipod_event *event);
/* Default -2. */
ZAL_API int zal_ipod_event_get_media_lib_update_progress(const zal_ipod_event *event);
ZAL_API const char *zal_ipod_event_bluetooth_status(const zal_ipod_event *event);
ZAL_API const char *zal_ipod_event_get_playing_app(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_shuffle_status(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_role_switched(const zal_ipod_event *event);

ZAL_API int zal_ipod_event_eap_datagram_session_id(const zal_ipod_event *event);
ZAL_API int zal_ipod_event_eap_datagram_protocol_index(const zal_ipod_event *event);
/* The datagram bytes; their count goes to *length (left unchanged on NULL). */
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
/* 1 with the text stored through `out`; -1 (out unchanged) when absent. */
ZAL_API int zal_ipod_event_wifi_information_ssid(const zal_ipod_event *event, const char **out);
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

/* ---------------------------------------------------------------------------------------
 * Simple commands (no argument; _sync returns the daemon's integer or -1)
 * Keep-alive is sent on any connected handle; the others need a ready handle.
 * ------------------------------------------------------------------------------------- */

#define ZAL_IPOD_SIMPLE_COMMAND(name)                \
    ZAL_API int zal_ipod_##name(zal_ipod_handle *h); \
    ZAL_API int zal_ipod_##name##_sync(zal_ipod_handle *h);

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

#undef ZAL_IPOD_SIMPLE_COMMAND

/* ---- Runtime configuration ---------------------------------------------------------------
 * The daemon's configuration keys, read and written on any connected handle (no session
 * needed). The keys and their values are the daemon's; the library passes them through. */
/* SET_CONFIG with key and value; returns the request's transaction id. */
ZAL_API uint16_t zal_ipod_set_config(zal_ipod_handle *h, const char *key, const char *value);
/* 1 when the daemon updated its configuration or its running context, 0 when neither
 * (each refusal logged as an error), -1 without a reply. */
ZAL_API int zal_ipod_set_config_sync(zal_ipod_handle *h, const char *key, const char *value);
/* GET_CONFIG for key; returns the request's transaction id. */
ZAL_API uint16_t zal_ipod_get_config(zal_ipod_handle *h, const char *key);
/* 1 with the value copied whole into out (room for the longest value the daemon returns),
 * else the daemon's error code, else -2 (no reply or neither in it; out untouched). */
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

/* Hierarchy numbers, category numbers, capability bits and durations are the device's; the
 * library passes them through. Each command has its transaction-id form and a _sync form
 * (same arguments) that waits and decodes. */

/* SET_HIERARCHY; on sending, the hierarchy becomes the one a browser reset restores.
 * _sync: the daemon's integer, -1 on failure. */
ZAL_API int zal_ipod_set_hierarchy(zal_ipod_handle *h, int hierarchy);
/* See zal_ipod_set_hierarchy. */
ZAL_API int zal_ipod_set_hierarchy_sync(zal_ipod_handle *h, int hierarchy);
/* SET_CATEGORY; on sending, the current category becomes category. */
ZAL_API int zal_ipod_set_category(zal_ipod_handle *h, int category);
/* Sets the current category (even when nothing can be sent), sends SET_CATEGORY and returns
 * the daemon's integer, the number of records in the category, also kept as the record
 * count; -1 (and a record count of -1) on failure. */
ZAL_API int zal_ipod_set_category_sync(zal_ipod_handle *h, int category);
/* SELECT_DB [record, category]: narrows the next category to one record. */
ZAL_API int zal_ipod_select_db(zal_ipod_handle *h, int record, int category);
/* As zal_ipod_select_db; the daemon's integer is kept as the record count (-1 on failure). */
ZAL_API int zal_ipod_select_db_sync(zal_ipod_handle *h, int record, int category);
/* GET_DB_RECORDS [offset, count]: names of records offset..offset+count-1. */
ZAL_API int zal_ipod_get_records(zal_ipod_handle *h, int offset, int count);
/* As zal_ipod_get_records; an array reply replaces the records cache (read with
 * zal_ipod_record) and its validity flag is returned; any other reply changes nothing and
 * gives 1; no reply gives -1. */
ZAL_API int zal_ipod_get_records_sync(zal_ipod_handle *h, int offset, int count);
/* INDEXED_TRACK_INFO for track index of the play queue. */
ZAL_API int zal_ipod_indexed_track_info(zal_ipod_handle *h, int index);
/* As zal_ipod_indexed_track_info: the integer "indexed_track_info" of the reply, -1 on failure. */
ZAL_API int zal_ipod_indexed_track_info_sync(zal_ipod_handle *h, int index);
/* GET_DB_ITUNES_INFO for an information type (0 library identifier, 1 last sync time,
 * others a count). */
ZAL_API int zal_ipod_get_db_itunes_info(zal_ipod_handle *h, int type);
/* As zal_ipod_get_db_itunes_info: 1 once the answer is stored (read it with the
 * zal_ipod_get_result_db_ accessors), -1 for no reply, an error, or an answer that lacks
 * the requested field (the stored field is then left as it was). The reply is also dumped
 * on standard output. */
ZAL_API int zal_ipod_get_db_itunes_info_sync(zal_ipod_handle *h, int type);
/* GET_DB_TRACK_INFO [offset, count, identifiers_only]: track records of the database. */
ZAL_API int zal_ipod_get_db_track_info(zal_ipod_handle *h, int offset, int count,
                                       int identifiers_only);
/* As zal_ipod_get_db_track_info: 1 once the result replaced the DB track info result,
 * -1 for no reply, an error reply or a reply that is not a record list. */
ZAL_API int zal_ipod_get_db_track_info_sync(zal_ipod_handle *h, int offset, int count,
                                            int identifiers_only);
/* GET_PB_TRACK_INFO [offset, count, identifiers_only]: track records of the play queue. */
ZAL_API int zal_ipod_get_pb_track_info(zal_ipod_handle *h, int offset, int count,
                                       int identifiers_only);
/* As zal_ipod_get_db_track_info, into the PB track info result. */
ZAL_API int zal_ipod_get_pb_track_info_sync(zal_ipod_handle *h, int offset, int count,
                                            int identifiers_only);

/* Current category (0 in a new handle and after a session opens). */
ZAL_API int zal_ipod_get_category(zal_ipod_handle *h);
/* Records in the current category as last reported; -1 after a failed request. */
ZAL_API int zal_ipod_record_count(zal_ipod_handle *h);
/* Name of record index from the records cache, or "" when the cache does not hold it (an
 * index outside the cached range also writes a line on standard output). The text lives
 * until the cache is replaced. */
ZAL_API const char *zal_ipod_record(zal_ipod_handle *h, int index);
/* Last DB / PB track info result (NULL before the first); owned by the handle and valid
 * until the next result of the same kind. */
ZAL_API const gval *zal_ipod_get_result_db_track_info(zal_ipod_handle *h);
/* See zal_ipod_get_result_db_track_info. */
ZAL_API const gval *zal_ipod_get_result_pb_track_info(zal_ipod_handle *h);
/* The 8 bytes of the device library identifier (type 0 of the library information). */
ZAL_API const uint8_t *zal_ipod_get_result_db_device_uid(zal_ipod_handle *h);
/* The 7 bytes of the last sync time (type 1 of the library information). */
ZAL_API const uint8_t *zal_ipod_get_result_db_last_sync_time(zal_ipod_handle *h);
/* The count of the last library information of another type; -1 without a handle. */
ZAL_API int zal_ipod_get_result_db_itunes_info_count(zal_ipod_handle *h);

/* Track info results. A result lists either identifiers only (each an 8-byte byte string)
 * or full records of eight elements (capability, name, artist, album, genre, composer,
 * duration, identifier). Track i counts from 0. Each accessor returns 1 and sets *out when
 * the result holds that field of track i with the right kind, else 0 with *out untouched.
 * Texts and bytes point into the result and live as long as it. */
/* Number of tracks in result; 0 for NULL. */
ZAL_API int zal_ipod_get_result_db_track_info_count(const gval *result);
/* Capability bits of track i (full records only). */
ZAL_API int zal_ipod_get_result_db_track_info_capability(const gval *result, int i, int *out);
/* Name of track i (full records only). */
ZAL_API int zal_ipod_get_result_db_track_info_name(const gval *result, int i, const char **out);
/* Artist of track i (full records only). */
ZAL_API int zal_ipod_get_result_db_track_info_artist(const gval *result, int i, const char **out);
/* Album of track i (full records only). */
ZAL_API int zal_ipod_get_result_db_track_info_album(const gval *result, int i, const char **out);
/* Genre of track i (full records only). */
ZAL_API int zal_ipod_get_result_db_track_info_genre(const gval *result, int i, const char **out);
/* Composer of track i (full records only). */
ZAL_API int zal_ipod_get_result_db_track_info_composer(const gval *result, int i, const char **out);
/* Duration of track i (full records only; the device's unit). */
ZAL_API int zal_ipod_get_result_db_track_info_duration(const gval *result, int i, int *out);
/* Persistent identifier of track i, 8 bytes most significant first, in either layout.
 * When the element is a byte string of another length *out is still set (to bytes that
 * must not be read as an identifier) and 0 is returned. */
ZAL_API int zal_ipod_get_result_db_track_info_uid(const gval *result, int i, const uint8_t **out);

/* ---- Library updates and play lists ------------------------------------------------------
 * Library update items, collections, play lists, Genius and play items.
 * ---------------------------------------------------------------------------------- */

/* A media library identifier (mlid) is shorter than this: at most 127 characters. */
#define MAXIMUM_MLID_LENGTH 128

/* Persistent identifiers are unsigned 64-bit numbers. Requests whose arguments break a
 * stated limit (an mlid of 128 characters or more, a list of 128 bytes or more, a negative
 * count or size, a missing list) are not sent: they log an error and return 0 (the _sync
 * form then returns -1, or 0 where it always does). */

/* MEDIA_LIB_UID: the identifier of the device's media library. */
ZAL_API int zal_ipod_get_media_library_unique_id(zal_ipod_handle *h);
/* As zal_ipod_get_media_library_unique_id: 1 when the reply is a string, copied with its
 * terminator into buffer but never more than size bytes (so a short buffer gets no
 * terminator); 0 otherwise, buffer untouched. */
ZAL_API int zal_ipod_get_media_library_unique_id_sync(zal_ipod_handle *h, char *buffer, int size);
/* SET_UPDATE_ITEMS: library mlid, listLength bytes of list (below MAXIMUM_MLID_LENGTH) and an
 * optional auxiliary string (NULL: none; at most 128 characters). */
ZAL_API int zal_ipod_set_update_items(zal_ipod_handle *h, const char *aux_string, const char *mlid,
                                      const void *list, int listLength);
/* As zal_ipod_set_update_items; returns 0 once the reply came or the wait ended. */
ZAL_API int zal_ipod_set_update_items_sync(zal_ipod_handle *h, const char *aux_string,
                                           const char *mlid, const void *list, int listLength);
/* START_LIB_UPDATE with the daemon's text; changes follow as "medialibrary_update" events. */
ZAL_API int zal_ipod_start_library_update(zal_ipod_handle *h, const char *text);
/* As zal_ipod_start_library_update; returns 0 once the reply came or the wait ended. */
ZAL_API int zal_ipod_start_library_update_sync(zal_ipod_handle *h, const char *text);
/* STOP_LIB_UPDATE with the daemon's text. */
ZAL_API int zal_ipod_stop_library_update(zal_ipod_handle *h, const char *text);
/* As zal_ipod_stop_library_update; returns 0 once the reply came or the wait ended. */
ZAL_API int zal_ipod_stop_library_update_sync(zal_ipod_handle *h, const char *text);
/* RESUME_LIB_UPDATE [first, second] (the daemon's texts, e.g. library and revision). */
ZAL_API int zal_ipod_resume_library_update(zal_ipod_handle *h, const char *first,
                                           const char *second);
/* As zal_ipod_resume_library_update; returns 0 once the reply came or the wait ended. */
ZAL_API int zal_ipod_resume_library_update_sync(zal_ipod_handle *h, const char *first,
                                                const char *second);
/* PLAYITEMS: plays count identifiers (uids) starting with the one at start. */
ZAL_API int zal_play_items(zal_ipod_handle *h, const uint64_t *uids, int count, int start);
/* As zal_play_items: the reply's "items_played", -1 for an error (its text kept), a
 * missing or malformed reply. */
ZAL_API int zal_play_items_sync(zal_ipod_handle *h, const uint64_t *uids, int count, int start);
/* PLAYCOLLECTION: plays collection_id of a collection type (0 play list or Genius mix,
 * 1 artist, 2 album, 4 genre, 5 composer; sent as one byte) of library mlid from
 * start_index. */
ZAL_API int zal_play_collection(zal_ipod_handle *h, uint64_t collection_id, int type,
                                int start_index, const char *mlid);
/* As zal_play_collection: the reply's "collection_played", -1 on failure. */
ZAL_API int zal_play_collection_sync(zal_ipod_handle *h, uint64_t collection_id, int type,
                                     int start_index, const char *mlid);
/* PREPARE_UID_LIST [first, second, size, size bytes]: hands the daemon an identifier list
 * (8 bytes each, most significant first) for zal_ipod_play_uid_list. */
ZAL_API int zal_ipod_prepare_uid_list(zal_ipod_handle *h, int first, int second, int size,
                                      const void *bytes);
/* As zal_ipod_prepare_uid_list: the daemon's integer, -1 on failure. */
ZAL_API int zal_ipod_prepare_uid_list_sync(zal_ipod_handle *h, int first, int second, int size,
                                           const void *bytes);
/* PLAY_UID_LIST: plays the prepared list from the track with this identifier. */
ZAL_API int zal_ipod_play_uid_list(zal_ipod_handle *h, const uint8_t uid[8]);
/* As zal_ipod_play_uid_list: the daemon's integer, -1 on failure. */
ZAL_API int zal_ipod_play_uid_list_sync(zal_ipod_handle *h, const uint8_t uid[8]);
/* CREATE_GENIUS_PLAYLIST [a, b] (the device's arguments). */
ZAL_API int zal_ipod_create_genius_playlist(zal_ipod_handle *h, int a, int b);
/* As zal_ipod_create_genius_playlist: the daemon's integer, -1 on failure. */
ZAL_API int zal_ipod_create_genius_playlist_sync(zal_ipod_handle *h, int a, int b);
/* REFRESH_GENIUS_PLAYLIST a. */
ZAL_API int zal_ipod_refresh_genius_playlist(zal_ipod_handle *h, int a);
/* As zal_ipod_refresh_genius_playlist: the daemon's integer, -1 on failure. */
ZAL_API int zal_ipod_refresh_genius_playlist_sync(zal_ipod_handle *h, int a);
/* IS_GENIUS_AVAILABLEFORTRACK [a, b]. */
ZAL_API int zal_ipod_is_genius_availablefortrack(zal_ipod_handle *h, int a, int b);
/* As zal_ipod_is_genius_availablefortrack: 0 when Genius is not available (or no reply),
 * otherwise the reply's non-zero "result", or 1. */
ZAL_API int zal_ipod_is_genius_availablefortrack_sync(zal_ipod_handle *h, int a, int b);
/* GET_PLAYLIST_INFO [a, b]. */
ZAL_API int zal_ipod_get_playlist_info(zal_ipod_handle *h, int a, int b);
/* As zal_ipod_get_playlist_info: the reply's "status", -1 when there is no information;
 * when data is not NULL the low 8 bits of the reply's "data" are stored there. */
ZAL_API int zal_ipod_get_playlist_info_sync(zal_ipod_handle *h, int a, int b, uint8_t *data);

/* ---- Media browser -----------------------------------------------------------------------
 * Categories, filtered queries, the selection stack and playing a selection.
 * ---------------------------------------------------------------------------------- */

/* Category numbers: 0 TOP, 1 PLAYLIST, 2 ARTIST, 3 ALBUM, 4 GENRE, 5 TRACK, 6 COMPOSER,
 * 7 AUDIOBOOK, 8 PODCAST, 9 NESTED_PLAYLIST, 10 GENIUS_MIXES, 11 ITUNES_U. */
#define ZAL_MEDIA_LIB_SELECTION_LEVELS 256
/* Most identifiers a selection plays (longer lists are cut to their first entries). */
#define ZAL_MEDIA_LIB_MAX_PLAY_ITEMS 8000

/* The name of a category number ("TRACK"); "UNKNOWN" outside 0 to 11. Constant string;
 * any thread. */
ZAL_API const char *zal_ipod_category_to_string(int category);
/* The number of a category name, exact and case-sensitive, for "PLAYLIST" to "ITUNES_U";
 * 0 for any other text (also "TOP", "UNKNOWN" and NULL). Any thread. */
ZAL_API int zal_ipod_string_to_category(const char *name);

/* Lists handed out by the browser (char ** results) are new arrays followed by one NULL
 * entry; unless a function says otherwise the caller frees each string and the array with
 * free(). The browser's state (the selection stack) has no lock: one thread walks it. */

/* GET_COLLECTION_ID [category_name, item_index]: the collection identifier of an item of a
 * top-level category. */
ZAL_API int zal_ipod_get_collection_identifier(zal_ipod_handle *h, const char *category_name,
                                               int item_index);
/* As zal_ipod_get_collection_identifier: the reply's "collection_id" text (an unsigned
 * 64-bit number), owned by the handle until the next call; NULL without one. */
ZAL_API const char *zal_ipod_get_collection_identifier_sync(zal_ipod_handle *h,
                                                            const char *category_name,
                                                            int item_index);
/* COUNT_ITEMS_IDENTIFIER_CURRENT_FILTER [levels, names of the current filter...]. */
ZAL_API int zal_ipod_count_item_identifiers_current_filter(zal_ipod_handle *h);
/* As zal_ipod_count_item_identifiers_current_filter: the reply's "count_item_identifiers",
 * -1 without one. */
ZAL_API int zal_ipod_count_item_identifiers_current_filter_sync(zal_ipod_handle *h);
/* GET_ITEMS_IDENTIFIER_CURRENT_FILTER [levels, offset, count, identifiers_only, names...]. */
ZAL_API int zal_ipod_get_items_identifier_current_filter(zal_ipod_handle *h, int offset, int count,
                                                         int identifiers_only);
/* As zal_ipod_get_items_identifier_current_filter: the strings of the reply after its first
 * element: per item its identifier (identifiers_only 1), or identifier, name, duration,
 * artist, album and genre (0). The strings stay owned by the handle until the next such
 * query; the caller frees only the array. NULL without a reply or for an empty one. */
ZAL_API const char **zal_ipod_get_item_identifiers_current_filter_sync(zal_ipod_handle *h,
                                                                       int offset, int count,
                                                                       int identifiers_only);
/* COUNT_ITEMS_CURRENT_CATEGORY [levels, names of the current filter...]. */
ZAL_API int zal_ipod_count_items_current_category(zal_ipod_handle *h);
/* As zal_ipod_count_items_current_category: the reply's "count_items_category", -1 without. */
ZAL_API int zal_ipod_count_items_current_category_sync(zal_ipod_handle *h);
/* GET_ITEMS_CURRENT_CATEGORY [levels, offset, count, names of the current filter...]. */
ZAL_API int zal_ipod_get_items_current_category(zal_ipod_handle *h, int offset, int count);
/* As zal_ipod_get_items_current_category: the reply becomes the records cache
 * (zal_ipod_record) and the names of items offset to offset+count-1 come back as a new list
 * of count strings ("" for items the reply did not hold); NULL without a reply. */
ZAL_API char **zal_ipod_get_items_current_category_sync(zal_ipod_handle *h, int offset, int count);

/* Number of categories offered beneath the item on top (11 with nothing selected, 0 under a
 * leaf); -1 with an error text while a category is on top. */
ZAL_API int zal_ipod_media_lib_get_categories_count(zal_ipod_handle *h);
/* The names of those categories as a new list; NULL with an error text while a category is
 * on top. */
ZAL_API char **zal_ipod_media_lib_get_categories(zal_ipod_handle *h);
/* Number of items of the category on top (iAP2: asked; iAP1: the last record count),
 * remembered in its level; -1 with an error text when no category is on top. */
ZAL_API int zal_ipod_media_lib_get_items_count(zal_ipod_handle *h);
/* The names of items offset to offset+count-1 of the category on top as a new list; the page
 * is remembered for zal_ipod_media_lib_select_item. NULL when the page is not within the
 * category (negative offset or count included) or the query failed. */
ZAL_API char **zal_ipod_media_lib_get_items(zal_ipod_handle *h, int offset, int count);

/* Starts the walk again at the top; iAP1 devices are sent category TOP and the hierarchy,
 * iAP2 keep it for later. 1, or 0 when an iAP1 command failed. */
ZAL_API int zal_ipod_media_lib_reset_selection(zal_ipod_handle *h, int hierarchy);
/* Number of levels on the selection stack (0 to ZAL_MEDIA_LIB_SELECTION_LEVELS). */
ZAL_API int zal_ipod_media_lib_get_current_selection_count(zal_ipod_handle *h);
/* The names of the levels (the current filter), level 0 first, as a new list. */
ZAL_API char **zal_ipod_media_lib_get_current_selection(zal_ipod_handle *h);
/* Absolute index of the item on top, 0 when a category (or nothing) is on top. */
ZAL_API int zal_ipod_media_lib_get_current_selection_start_index(zal_ipod_handle *h);
/* Pushes a category beneath the item on top (or at the top). 1; 0 when the iAP1 command
 * failed (the level is pushed all the same); -1 with an error text while a category is on
 * top or the stack is full (nothing pushed, nothing sent). */
ZAL_API int zal_ipod_media_lib_select_category(zal_ipod_handle *h, int category);
/* Pushes item index of the page last fetched with zal_ipod_media_lib_get_items. 1; -1 with
 * an error text when no category is on top, the index is outside the category or the stack
 * is full. Nothing is sent. */
ZAL_API int zal_ipod_media_lib_select_item(zal_ipod_handle *h, int index);
/* Keeps levels 0 to keep-1 and selects them again on the device (keep 0: a reset with the
 * stored hierarchy). 1; 0 when a step failed (the levels rebuilt so far stay); -1 with an
 * error text when there are not more than keep levels. */
ZAL_API int zal_ipod_media_lib_undo_selection(zal_ipod_handle *h, int keep);
/* Plays the first (at most ZAL_MEDIA_LIB_MAX_PLAY_ITEMS) of count identifiers from entry
 * start: iAP1 as a prepared identifier list, iAP2 as PLAYITEMS. The play command's result;
 * 0 without sending when start is beyond the list. */
ZAL_API int zal_ipod_media_lib_play_items(zal_ipod_handle *h, const uint64_t *uids, int count,
                                          int start);
/* Plays from where the walk stands, item index of the page on top (or of the category on
 * top), as a collection, an identifier list or a database record by device protocol; the
 * levels pushed on the way stay. 1, -1, or the failing step's result. */
ZAL_API int zal_ipod_media_lib_play_current_selection(zal_ipod_handle *h, int index);
/* Track information of tracks offset to offset+count-1 of the TRACK or AUDIOBOOK category on
 * top, for the track field accessors: identifiers only (1) or whole records (0). Owned by
 * the handle until the next request; NULL with an error text when another level is on top,
 * NULL when the tracks are not there or the query failed. */
ZAL_API const void *zal_ipod_media_lib_get_tracks_info(zal_ipod_handle *h, int identifiers_only,
                                                       int offset, int count);
/* Identifier of track i of the last zal_ipod_media_lib_get_tracks_info result; 1 or 0 (also
 * for any other result or a track outside it). */
ZAL_API int zal_ipod_media_lib_get_track_uid(zal_ipod_handle *h, const void *result, int i,
                                             uint64_t *uid);
/* Duration of track i (0 for identifier-only results on iAP2); 1 or 0. */
ZAL_API int zal_ipod_media_lib_get_track_duration(zal_ipod_handle *h, const void *result, int i,
                                                  uint32_t *duration);
/* Name of track i as a new string the caller frees ("" when the result has none); 1 or 0. */
ZAL_API int zal_ipod_media_lib_get_track_name(zal_ipod_handle *h, const void *result, int i,
                                              char **text);
/* Artist of track i, as zal_ipod_media_lib_get_track_name. */
ZAL_API int zal_ipod_media_lib_get_track_artist(zal_ipod_handle *h, const void *result, int i,
                                                char **text);
/* Album of track i, as zal_ipod_media_lib_get_track_name. */
ZAL_API int zal_ipod_media_lib_get_track_album(zal_ipod_handle *h, const void *result, int i,
                                               char **text);
/* Genre of track i, as zal_ipod_media_lib_get_track_name. */
ZAL_API int zal_ipod_media_lib_get_track_genre(zal_ipod_handle *h, const void *result, int i,
                                               char **text);


/* ---- Connection state --------------------------------------------------------------------
 * Learning that the connection was lost and came back.
 * ---------------------------------------------------------------------------------- */

ZAL_END_DECLS

#endif /* ZAL_IPOD_2_H */
